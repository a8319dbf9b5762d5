#include "knvlibs/recording/moment_source.h"

#include <algorithm>
#include <compare>
#include <utility>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_status.h>
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

constexpr Key kAbsent{KeyKind::kText, 0, {}};

std::strong_ordering Compare(const Key& a, const Key& b) {
  if (a.kind != b.kind) return a.kind <=> b.kind;
  return a.kind == KeyKind::kNumber ? a.number <=> b.number : a.text <=> b.text;
}

std::strong_ordering Compare(const std::array<Key, kMaxKeys>& a,
                             const std::array<Key, kMaxKeys>& b) {
  const auto first = Compare(a[0], b[0]);
  return std::is_eq(first) ? Compare(a[1], b[1]) : first;
}

}  // namespace

MomentSource::MomentSource(std::string fileName, ChunkReader moment)
    : fileName_(std::move(fileName)),
      moment_(std::move(moment)),
      walk_(moment_.Size()),
      places_(moment_.Host().nodes),
      readings_(moment_.Host().nodes.size()) {}

Status MomentSource::Damaged(const Node& node) {
  if (!std::exchange(told_, true)) {
    Warning("%s: %.*s: is damaged\n", Printable(fileName_).c_str(),
            static_cast<int>(node.path.size()), node.path.data());
  }
  return KSI_STATUS_METADATA_READ_ERROR;
}

// The reading of a node's value or list; one that failed fails again.
Status MomentSource::Find(const Node& node, Kind kind, const Keys& keys, ChunkReader::View& view) {
  const size_t place = places_.Of(node, kind);
  if (place == NodePlaces::kNowhere) return KSI_STATUS_NOT_FOUND;
  std::optional<std::vector<size_t>>& readings = readings_[place];
  const auto keysOf = [this](size_t number) { return moment_.At(number).keys; };
  const auto before = [](const auto& a, const auto& b) { return std::is_lt(Compare(a, b)); };
  if (!readings) {
    std::vector<size_t> numbers;
    if (moment_.ReadNode(place, numbers) != kOk) return Damaged(node);
    if (!std::ranges::is_sorted(numbers, before, keysOf)) {
      std::ranges::sort(numbers, before, keysOf);
    }
    readings = std::move(numbers);
  }
  std::array<Key, kMaxKeys> wanted = {kAbsent, kAbsent};
  std::copy_n(keys.at, keys.count, wanted.begin());
  const auto found = std::ranges::lower_bound(*readings, wanted, before, keysOf);
  if (found == readings->end() || std::is_neq(Compare(keysOf(*found), wanted))) {
    return KSI_STATUS_NOT_FOUND;
  }
  view = moment_.At(*found);
  return view.status;
}

Status MomentSource::Value(const Node& node, const Keys& keys, Buffer record) {
  ChunkReader::View view = {};
  const Status status = Find(node, Kind::kValue, keys, view);
  if (status != kOk) return status;
  if (view.record.size() != record.size()) return KSI_STATUS_LENGTH_MISMATCH;
  std::ranges::copy(view.record, record.begin());
  return kOk;
}

Status MomentSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  ChunkReader::View view = {};
  Status status = walk_.Begin(node, keys);
  if (status == kOk) status = Find(node, Kind::kList, keys, view);
  if (status != kOk) return status;
  const size_t before = instances.Count();
  for (const Key& entry : view.entries) {
    if (entry.kind != KindOf(node.entries)) return Damaged(node);
    status = entry.kind == KeyKind::kNumber
                 ? instances.AddNumber(static_cast<uint64_t>(entry.number))
                 : instances.AddText(entry.text);
    if (status != kOk) return status;
  }
  walk_.End(node, instances, before);
  return kOk;
}

}  // namespace ksi
