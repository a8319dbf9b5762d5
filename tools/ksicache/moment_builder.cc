#include "tools/ksicache/moment_builder.h"

#include <algorithm>
#include <utility>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

uint32_t PlaceOf(const ksi::Node& node, ksi::Kind kind) {
  static const ksi::NodePlaces places(ksi::RecordedNodes());
  return static_cast<uint32_t>(places.Of(node, kind));
}

// The recorded nodes as those of the catalogue.
std::vector<const ksi::Node*> NodesOf(const std::vector<ksi::RecordedNode>& recorded) {
  std::vector<const ksi::Node*> nodes;
  for (const ksi::RecordedNode& each : recorded) {
    const ksi::Node* node = ksi::FindNode(each.path);
    const bool isSame = node != nullptr &&
                        each.recordSize == (each.kind == ksi::Kind::kValue ? node->recordSize : 0);
    nodes.push_back(isSame ? node : nullptr);
  }
  return nodes;
}

// The keys that a question has, as many as its node takes.
ksi::Keys KeysOf(const ksi::Question& question, const ksi::Node& node, ksi::Kind kind) {
  const ksi::Keying& keying = kind == ksi::Kind::kValue ? node.valueKeys : node.listKeys;
  ksi::Keys keys;
  for (; keys.count < keying.Count(); ++keys.count) {
    keys.at[keys.count] = ksi::ViewOf(question.keys[keys.count]);
    if (keys.at[keys.count].kind != ksi::KindOf(keying.at[keys.count])) {
      throw DataError("damaged: " + std::string(node.path) + " has keys that it does not take");
    }
  }
  return keys;
}

void PutReading(const ksi::RecordedNode& recorded, const ksi::Node& node,
                const ksi::MomentReading& reading, ReadingSink& sink) {
  const ksi::Keys keys = KeysOf(reading.question, node, recorded.kind);
  const ksi::Answer& answer = reading.answer;
  if (answer.status != ksi::kOk) {
    sink.AddFailure(node, recorded.kind, keys, answer.status);
  } else if (recorded.kind == ksi::Kind::kValue) {
    sink.AddValue(node, keys, answer.record);
  } else {
    std::vector<ksi::Key> entries;
    for (const ksi::OwnKey& entry : answer.entries) entries.push_back(ksi::ViewOf(entry));
    sink.AddList(node, keys, entries);
  }
}

}  // namespace

ksi::MomentReading& MomentBuilder::Add(const ksi::Node& node, ksi::Kind kind,
                                       const ksi::Keys& keys) {
  ksi::MomentReading& reading = readings_.emplace_back();
  reading.question.node = PlaceOf(node, kind);
  for (size_t i = 0; i < keys.count; ++i) reading.question.keys[i] = ksi::OwnOf(keys[i]);
  return reading;
}

void MomentBuilder::AddValue(const ksi::Node& node, const ksi::Keys& keys,
                             std::span<const std::byte> record) {
  Add(node, ksi::Kind::kValue, keys).answer.record.assign(record.begin(), record.end());
}

void MomentBuilder::AddList(const ksi::Node& node, const ksi::Keys& keys,
                            std::span<const ksi::Key> entries) {
  std::vector<ksi::OwnKey>& own = Add(node, ksi::Kind::kList, keys).answer.entries;
  for (const ksi::Key& entry : entries) own.push_back(ksi::OwnOf(entry));
}

void MomentBuilder::AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                               ksi::Status status) {
  Add(node, kind, keys).answer.status = status;
}

std::vector<ksi::MomentReading> MomentBuilder::Take() {
  ksi::SortReadings(readings_);
  return std::exchange(readings_, {});
}

void PutReadings(const ksi::Moment& moment, ReadingSink& sink) {
  const std::vector<const ksi::Node*> nodes = NodesOf(moment.host.nodes);
  for (const ksi::MomentReading& reading : moment.readings) {
    const ksi::RecordedNode& recorded = moment.host.nodes[reading.question.node];
    const ksi::Node* node = nodes[reading.question.node];
    if (node == nullptr) {
      throw DataError("its node " + Cut(recorded.path) + " is not of this version");
    }
    PutReading(recorded, *node, reading, sink);
  }
}

}  // namespace ksicache
