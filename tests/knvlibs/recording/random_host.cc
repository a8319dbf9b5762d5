#include "tests/knvlibs/recording/random_host.h"

#include <algorithm>
#include <cstring>

#include <knvlibs/ksi_status.h>

namespace ksi {
namespace {

const Node& CatalogueNode(uint32_t node) { return *FindNode(RecordedNodes()[node].path); }

}  // namespace

const std::vector<MomentReading>& RandomHost::Next() {
  std::erase_if(readings_, [this](const MomentReading&) { return OneIn(40); });
  for (MomentReading& reading : readings_) Change(reading);
  const size_t wanted = 20 + Below(60);
  while (readings_.size() < wanted) {
    MomentReading reading = MakeReading(static_cast<uint32_t>(Below(RecordedNodes().size())));
    if (std::ranges::find(readings_, reading.question, &MomentReading::question) ==
        readings_.end()) {
      readings_.push_back(std::move(reading));
    }
  }
  SortReadings(readings_);
  return readings_;
}

OwnKey RandomHost::MakeKey(Instance instance) {
  if (instance == Instance::kNone) return std::string();
  // Few, so that what went often comes back.
  const uint64_t number = Below(6);
  if (KindOf(instance) == KeyKind::kText) return "name " + std::to_string(number);
  return static_cast<int64_t>(number == 5 ? uint64_t{1} << 63 : number * 1000);
}

MomentReading RandomHost::MakeReading(uint32_t node) {
  const Node& known = CatalogueNode(node);
  const RecordedNode& recorded = RecordedNodes()[node];
  const Keying& keying = recorded.kind == Kind::kValue ? known.valueKeys : known.listKeys;
  MomentReading reading;
  reading.question.node = node;
  for (size_t i = 0; i < kMaxKeys; ++i) reading.question.keys[i] = MakeKey(keying.at[i]);
  reading.answer.record.resize(recorded.recordSize);
  Change(reading);
  return reading;
}

void RandomHost::Change(MomentReading& reading) {
  const RecordedNode& node = RecordedNodes()[reading.question.node];
  Answer& answer = reading.answer;
  if (OneIn(30)) {
    answer = {OneIn(2) ? KSI_STATUS_NOT_FOUND : KSI_STATUS_PERMISSION_DENIED, {}, {}};
  } else if (answer.status != kOk && OneIn(3)) {
    answer = {kOk, Bytes(node.recordSize), {}};
  }
  if (answer.status != kOk || OneIn(2)) return;
  if (node.kind == Kind::kValue) {
    ChangeRecord(node, answer.record);
  } else {
    ChangeList(answer.entries,
               KindOf(CatalogueNode(reading.question.node).entries) == KeyKind::kNumber);
  }
}

void RandomHost::ChangeRecord(const RecordedNode& node, Bytes& record) {
  for (const RecordCell& cell : node.cells) {
    if (!OneIn(5)) continue;
    uint64_t bits = 0;
    std::memcpy(&bits, record.data() + cell.offset, cell.width);
    switch (Below(5)) {
      case 0:
        bits = random_();
        break;
      case 1:
        bits = UINT64_MAX;
        break;
      case 2:
        bits = 0;
        break;
      default:
        bits += Below(9) - 4;
    }
    std::memcpy(record.data() + cell.offset, &bits, cell.width);
  }
}

void RandomHost::ChangeList(std::vector<OwnKey>& entries, bool isOfNumbers) {
  if (OneIn(10)) std::ranges::shuffle(entries, random_);
  std::erase_if(entries, [this](const OwnKey&) { return OneIn(4); });
  for (uint64_t more = Below(4); more != 0; --more) {
    const auto at = entries.begin() + static_cast<ptrdiff_t>(Below(entries.size() + 1));
    const uint64_t number = Below(20);
    if (isOfNumbers) {
      entries.insert(at, static_cast<int64_t>(OneIn(5) ? random_() : number));
    } else {
      entries.insert(at, std::string(number, 'x') + std::to_string(number));
    }
  }
}

}  // namespace ksi
