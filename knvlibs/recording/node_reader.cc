#include "knvlibs/recording/node_reader.h"

#include <algorithm>
#include <compare>
#include <cstring>
#include <limits>
#include <numeric>
#include <utility>

#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/list_edit.h"

namespace ksi {
namespace {

// What it takes to bring a reading into order, as bytes of lists.
constexpr size_t kEachSorted = 16;
constexpr size_t kEachMerged = 4;

std::strong_ordering Compare(const Key& a, const Key& b) {
  if (a.kind != b.kind) return a.kind <=> b.kind;
  return a.kind == KeyKind::kNumber ? a.number <=> b.number : a.text <=> b.text;
}

bool IsBefore(const NodeReader::KeyPair& a, const NodeReader::KeyPair& b) {
  const auto first = Compare(a[0], b[0]);
  return std::is_lt(std::is_eq(first) ? Compare(a[1], b[1]) : first);
}

size_t SizeOf(const std::vector<Key>& entries) {
  return std::accumulate(
      entries.begin(), entries.end(), size_t{0},
      [](size_t sum, const Key& entry) { return sum + sizeof entry + entry.text.size(); });
}

void AddTo(std::span<std::byte> cell, uint64_t delta) {
  uint64_t bits = 0;
  std::memcpy(&bits, cell.data(), cell.size());
  bits += delta;
  std::memcpy(cell.data(), &bits, cell.size());
}

}  // namespace

bool NodeReader::Take(ByteView content, size_t count, size_t moment) {
  Forget();
  if (content.empty()) return true;
  ByteReader in(content);
  std::array<uint64_t, chunk::kStreams> sizes = {};
  for (uint64_t& size : sizes) size = in.Unsigned();
  Streams streams;
  for (size_t i = 0; i < sizes.size(); ++i) streams[i] = ByteReader(in.Raw(sizes[i]));
  const size_t old = readings_.size();
  const ByteReader events = std::exchange(streams[chunk::kEvents], {});
  return in.IsAtEnd() && Hold(sizes[chunk::kDeltas] * sizeof(Change)) &&
         TakeEvents(events, count) && TakeCells(streams, old, count, moment) && GoTo(moment);
}

// What happened in the part before has been taken to its end.
void NodeReader::Forget() {
  events_.clear();
  changes_.clear();
  nextEvent_ = nextChange_ = 0;
  budget_->bytes += std::exchange(held_, 0);
}

bool NodeReader::Hold(size_t bytes) {
  held_ += bytes;
  return ChunkBudget::Spend(budget_->bytes, bytes);
}

// Cells have those that were there before the part, of which `old` have been numbered, and those
// that come in it.
bool NodeReader::TakeCells(Streams& streams, size_t old, size_t count, size_t moment) {
  const size_t size = node_->recordSize;
  if (!ChunkBudget::Spend(budget_->bytes, readings_.size() * size - records_.size()) ||
      !ChunkBudget::Spend(budget_->work, kEachSorted * readings_.size())) {
    return false;
  }
  records_.resize(readings_.size() * size);
  const auto hasFailed = [this](uint32_t number) { return readings_[number].status != kOk; };
  std::vector<uint32_t> members = present_;
  std::erase_if(members, hasFailed);
  std::ranges::sort(members);
  const size_t there = members.size();
  for (auto number = static_cast<uint32_t>(old); number < readings_.size(); ++number) {
    if (!hasFailed(number)) members.push_back(number);
  }
  TakeFirst(streams, std::span(members).subspan(there));
  const bool isGood = TakeChanges(streams, members, there, count, moment);
  std::ranges::sort(changes_, {}, &Change::moment);
  return isGood && std::ranges::all_of(streams, &ByteReader::IsAtEnd);
}

std::span<std::byte> NodeReader::BytesOf(const RecordCell& cell, uint32_t number) {
  return std::span(records_).subspan(number * size_t{node_->recordSize} + cell.offset, cell.width);
}

// The cells of those that come.
void NodeReader::TakeFirst(Streams& streams, std::span<const uint32_t> come) {
  for (const RecordCell& cell : node_->cells) {
    for (const uint32_t number : come) {
      const std::span<std::byte> bytes = BytesOf(cell, number);
      if (cell.isFigure) {
        const int64_t figure = streams[chunk::kFirst].Signed();
        std::memcpy(bytes.data(), &figure, bytes.size());
      } else {
        std::ranges::copy(streams[chunk::kRaw].Raw(cell.width), bytes.begin());
      }
    }
  }
}

// The cells that changed; those before `there` of the members were there before the part.
bool NodeReader::TakeChanges(Streams& streams, std::span<const uint32_t> members, size_t there,
                             size_t count, size_t moment) {
  ByteReader& gaps = streams[chunk::kGaps];
  const size_t all = node_->cells.size() * members.size();
  for (size_t at = 0; gaps.Left() != 0; ++at) {
    at += gaps.Bounded(all);
    if (at >= all || !gaps.IsGood()) return false;
    const size_t member = at % members.size();
    const uint32_t number = members[member];
    const size_t from = member < there ? 0 : readings_[number].came + 1;
    if (!TakeChangesOf(streams, node_->cells[at / members.size()], number, from, count, moment)) {
      return false;
    }
  }
  return true;
}

// The changes of a cell from the moment `from` of the part on: those up to `moment` are made, later
// ones are kept.
bool NodeReader::TakeChangesOf(Streams& streams, const RecordCell& cell, uint32_t number,
                               size_t from, size_t count, size_t moment) {
  const std::span<std::byte> bytes = BytesOf(cell, number);
  const auto place = static_cast<uint32_t>(bytes.data() - records_.data());
  const uint64_t changes = streams[chunk::kCounts].Bounded(count) + 1;
  uint64_t now = 0;
  size_t at = from;
  for (uint64_t i = 0; i < changes; ++i, ++at) {
    at += streams[chunk::kSteps].Bounded(count);
    const auto delta = static_cast<uint64_t>(streams[chunk::kDeltas].Signed(streams[chunk::kMore]));
    if (at >= count) return false;
    if (at <= moment) {
      now += delta;
    } else {
      changes_.push_back({place, static_cast<uint16_t>(at), cell.width, delta});
    }
  }
  AddTo(bytes, now);
  return true;
}

bool NodeReader::TakeEvents(ByteReader in, size_t count) {
  for (size_t moment = 0; in.Left() != 0; ++moment) {
    Event& event = events_.emplace_back();
    moment += in.Bounded(count);
    event.moment = moment;
    if (moment >= count || !TakeGone(in, event) || !TakeCome(in, event) || !TakeEdits(in, event)) {
      return false;
    }
  }
  return in.IsGood();
}

bool NodeReader::TakeGone(ByteReader& in, Event& event) const {
  const uint64_t count = in.Bounded(readings_.size());
  uint64_t number = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i, ++number) {
    number += in.Bounded(readings_.size());
    if (number >= readings_.size()) return false;
    event.gone.push_back(static_cast<uint32_t>(number));
  }
  return in.IsGood();
}

bool NodeReader::TakeCome(ByteReader& in, Event& event) {
  constexpr size_t kSmallest = 3;  // bytes of one that comes
  const uint64_t count = in.Bounded(in.Left() / kSmallest);
  if (!ChunkBudget::Spend(budget_->readings, count)) return false;
  if (readings_.empty()) readings_.reserve(count);
  event.come = static_cast<uint32_t>(readings_.size());
  int64_t number = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    ReadingState& come = readings_.emplace_back();
    for (Key& key : come.keys) key = TakeEntry(in, number);
    come.status = static_cast<Status>(in.Bounded(std::numeric_limits<Status>::max()));
    come.came = event.moment;
  }
  event.end = static_cast<uint32_t>(readings_.size());
  return in.IsGood();
}

bool NodeReader::TakeEdits(ByteReader& in, Event& event) {
  const uint64_t count = in.Bounded(in.Left());
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    const uint64_t number = in.Unsigned();
    if (number >= readings_.size()) return false;
    event.edits.push_back({static_cast<uint32_t>(number), in});
    PassEdit(in);
    if (!Hold(sizeof(Edit))) return false;
  }
  return in.IsGood();
}

bool NodeReader::GoTo(size_t moment) {
  for (; nextChange_ < changes_.size() && changes_[nextChange_].moment <= moment; ++nextChange_) {
    const Change& change = changes_[nextChange_];
    AddTo(std::span(records_).subspan(change.place, change.width), change.delta);
  }
  for (; nextEvent_ < events_.size() && events_[nextEvent_].moment <= moment; ++nextEvent_) {
    if (!Apply(events_[nextEvent_])) return false;
  }
  return true;
}

bool NodeReader::Apply(const Event& event) {
  for (const uint32_t number : event.gone) {
    readings_[number].isThere = false;
    const auto list = lists_.find(number);
    if (list == lists_.end()) continue;
    budget_->entries += list->second.size();
    lists_.erase(list);
  }
  for (uint32_t number = event.come; number < event.end; ++number) {
    readings_[number].isThere = true;
  }
  UpdatePresent(event);
  if (!ChunkBudget::Spend(budget_->work, kEachMerged * present_.size())) return false;
  return std::ranges::all_of(event.edits, [this](const Edit& edit) { return Apply(edit); });
}

bool NodeReader::Apply(const Edit& edit) {
  std::vector<Key>& entries = lists_[edit.reading];
  budget_->bytes += SizeOf(entries);
  budget_->entries += entries.size();
  ByteReader in = edit.edit;
  if (!TakeEdit(in, budget_->entries, entries)) {
    lists_.erase(edit.reading);  // which nobody accounts for any more
    return false;
  }
  budget_->entries -= entries.size();
  const size_t size = SizeOf(entries);
  return ChunkBudget::Spend(budget_->bytes, size) && ChunkBudget::Spend(budget_->work, size);
}

// Keeps the readings that are there in the order of their keys.
void NodeReader::UpdatePresent(const Event& event) {
  const auto keysOf = [this](uint32_t number) -> const KeyPair& { return readings_[number].keys; };
  const auto isGone = [this](uint32_t number) { return !readings_[number].isThere; };
  if (!event.gone.empty()) std::erase_if(present_, isGone);
  const size_t old = present_.size();
  for (uint32_t number = event.come; number < event.end; ++number) present_.push_back(number);
  const std::span<uint32_t> come = std::span(present_).subspan(old);
  if (!std::ranges::is_sorted(come, IsBefore, keysOf)) std::ranges::sort(come, IsBefore, keysOf);
  std::ranges::inplace_merge(present_, present_.begin() + static_cast<ptrdiff_t>(old), IsBefore,
                             keysOf);
}

NodeReader::View NodeReader::At(uint32_t number) const {
  const ReadingState& state = readings_[number];
  View view = {state.keys, state.status, {}, {}};
  if (state.status != kOk) return view;
  view.record = ByteView(records_).subspan(size_t{number} * node_->recordSize, node_->recordSize);
  const auto list = lists_.find(number);
  if (list != lists_.end()) view.entries = list->second;
  return view;
}

bool NodeReader::Find(const KeyPair& keys, View& view) const {
  const auto keysOf = [this](uint32_t number) -> const KeyPair& { return readings_[number].keys; };
  const auto found = std::ranges::lower_bound(present_, keys, IsBefore, keysOf);
  if (found == present_.end() || IsBefore(keys, keysOf(*found))) return false;
  view = At(*found);
  return true;
}

}  // namespace ksi
