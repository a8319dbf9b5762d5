#include "knvlibs/recording/moment_source.h"

#include <algorithm>
#include <compare>
#include <cstring>
#include <utility>

#include <knvlibs/ksi_status.h>

namespace ksi {
namespace {

constexpr uint32_t kNowhere = UINT32_MAX;

// What holds so many lists is at least so large.
uint64_t SizeOf(const Moment& moment) {
  uint64_t size = 0;
  for (const Reading& reading : moment.readings) size += 1 + reading.answer.entries.size();
  return size * sizeof(OwnKey);
}

std::strong_ordering Compare(const OwnKey& own, const Key& key) {
  if (const auto* number = std::get_if<int64_t>(&own)) {
    return key.kind == KeyKind::kNumber ? *number <=> key.number : std::strong_ordering::less;
  }
  return key.kind == KeyKind::kText ? std::string_view(std::get<std::string>(own)) <=> key.text
                                    : std::strong_ordering::greater;
}

// In the order of questions.
std::strong_ordering Compare(const Question& question, uint32_t node, const Keys& keys) {
  constexpr Key kAbsent{KeyKind::kText, 0, {}};
  if (question.node != node) return question.node <=> node;
  for (size_t i = 0; i < kMaxKeys; ++i) {
    const auto order = Compare(question.keys[i], i < keys.count ? keys[i] : kAbsent);
    if (order != 0) return order;
  }
  return std::strong_ordering::equal;
}

}  // namespace

MomentSource::MomentSource(Moment moment) : moment_(std::move(moment)), walk_(SizeOf(moment_)) {
  SortReadings(moment_.readings);
  for (auto& places : places_) places.assign(Catalogue().size(), kNowhere);
  for (uint32_t i = 0; i < moment_.host.nodes.size(); ++i) {
    const RecordedNode& recorded = moment_.host.nodes[i];
    const Node* node = FindNode(recorded.path);
    if (node != nullptr) places_[static_cast<size_t>(recorded.kind)][IdOf(*node) - 1u] = i;
  }
}

const Answer* MomentSource::Find(const Node& node, Kind kind, const Keys& keys) const {
  const uint32_t place = places_[static_cast<size_t>(kind)][IdOf(node) - 1u];
  const auto found = std::partition_point(
      moment_.readings.begin(), moment_.readings.end(),
      [&](const Reading& each) { return Compare(each.question, place, keys) < 0; });
  const bool isThere =
      found != moment_.readings.end() && Compare(found->question, place, keys) == 0;
  return isThere ? &found->answer : nullptr;
}

Status MomentSource::Value(const Node& node, const Keys& keys, Buffer record) {
  const Answer* answer = Find(node, Kind::kValue, keys);
  if (answer == nullptr) return KSI_STATUS_NOT_FOUND;
  if (answer->status != kOk) return answer->status;
  if (answer->record.size() != record.size()) return KSI_STATUS_LENGTH_MISMATCH;
  std::ranges::copy(answer->record, record.begin());
  return kOk;
}

Status MomentSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  Status status = walk_.Begin(node, keys);
  if (status != kOk) return status;
  const Answer* answer = Find(node, Kind::kList, keys);
  if (answer == nullptr) return KSI_STATUS_NOT_FOUND;
  if (answer->status != kOk) return answer->status;
  const size_t before = instances.Count();
  for (const OwnKey& entry : answer->entries) {
    const Key key = ViewOf(entry);
    if (key.kind != KindOf(node.entries)) return KSI_STATUS_METADATA_READ_ERROR;
    status = key.kind == KeyKind::kNumber ? instances.AddNumber(static_cast<uint64_t>(key.number))
                                          : instances.AddText(key.text);
    if (status != kOk) return status;
  }
  walk_.End(node, instances, before);
  return kOk;
}

}  // namespace ksi
