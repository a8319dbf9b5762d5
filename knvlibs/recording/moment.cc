#include "knvlibs/recording/moment.h"

#include <algorithm>

namespace ksi {
namespace {

void AddRaw(size_t from, size_t to, std::vector<RecordCell>& cells) {
  for (; from < to; from += RecordCell::kWidest) {
    cells.push_back({static_cast<uint16_t>(from),
                     static_cast<uint8_t>(std::min(RecordCell::kWidest, to - from)), false});
  }
}

// The figures of a record are cells, and so is, in pieces, what lies between them.
std::vector<RecordCell> CellsOf(const Node& node) {
  std::vector<Field> fields(node.fields.begin(), node.fields.end());
  std::ranges::sort(fields, {}, &Field::offset);
  std::vector<RecordCell> cells;
  size_t at = 0;
  for (const Field& field : fields) {
    if (field.type == FieldType::kText) continue;
    AddRaw(at, field.offset, cells);
    cells.push_back({field.offset, static_cast<uint8_t>(field.width), true});
    at = field.offset + field.width;
  }
  AddRaw(at, node.recordSize, cells);
  return cells;
}

std::vector<RecordedNode> NodesOfCatalogue() {
  std::vector<RecordedNode> nodes;
  for (const Node& node : Catalogue()) {
    const std::string path(node.path);
    if (node.HasValue()) nodes.push_back({path, Kind::kValue, node.recordSize, CellsOf(node)});
    if (node.HasList()) nodes.push_back({path, Kind::kList, 0, {}});
  }
  return nodes;
}

}  // namespace

const std::vector<RecordedNode>& RecordedNodes() {
  static const std::vector<RecordedNode> nodes = NodesOfCatalogue();
  return nodes;
}

NodePlaces::NodePlaces(std::span<const RecordedNode> nodes) {
  for (auto& places : places_) places.assign(Catalogue().size(), kNowhere);
  for (size_t i = 0; i < nodes.size(); ++i) {
    const Node* node = FindNode(nodes[i].path);
    if (node != nullptr) places_[static_cast<size_t>(nodes[i].kind)][IdOf(*node) - 1u] = i;
  }
}

Key ViewOf(const OwnKey& key) {
  if (const auto* number = std::get_if<int64_t>(&key)) return {KeyKind::kNumber, *number, {}};
  return {KeyKind::kText, 0, std::get<std::string>(key)};
}

OwnKey OwnOf(const Key& key) {
  if (key.kind == KeyKind::kNumber) return key.number;
  return std::string(key.text);
}

void SortReadings(std::vector<MomentReading>& readings) {
  const auto before = [](const MomentReading& a, const MomentReading& b) {
    return a.question < b.question;
  };
  if (!std::ranges::is_sorted(readings, before)) std::ranges::sort(readings, before);
}

}  // namespace ksi
