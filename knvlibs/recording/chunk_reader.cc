#include "knvlibs/recording/chunk_reader.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <limits>
#include <numeric>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/frame.h"
#include "knvlibs/recording/list_edit.h"

namespace ksi {
namespace {

constexpr Status kDamaged = KSI_STATUS_METADATA_READ_ERROR;

// Those of an honest file, several times over.
constexpr size_t kMostNodes = 4096;

Status StatusIf(bool isGood) { return isGood ? kOk : kDamaged; }

// The cells of a node; false if they do not cover its record.
bool TakeCells(ByteReader& in, RecordedNode& node) {
  const uint64_t count = in.Bounded(node.recordSize);
  size_t at = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    const uint8_t written = in.Byte();
    const auto width = static_cast<uint8_t>(written / 2);
    if (width == 0 || width > RecordCell::kWidest || at + width > node.recordSize) return false;
    node.cells.push_back({static_cast<uint16_t>(at), width, written % 2 == 1});
    at += width;
  }
  return in.IsGood() && at == node.recordSize;
}

bool TakeNode(ByteReader& in, RecordedNode& node) {
  node.path = in.Text();
  node.kind = static_cast<Kind>(in.Bounded(1));
  node.recordSize = static_cast<uint16_t>(in.Bounded(kMaxRecordSize));
  return TakeCells(in, node);
}

bool TakeHost(ByteReader& in, HostIdentity& host) {
  host = {};
  for (std::string* text : {&host.signature, &host.built, &host.name, &host.boot}) {
    *text = in.Text();
  }
  host.nodes.resize(in.Bounded(kMostNodes));
  return std::ranges::all_of(host.nodes, [&in](RecordedNode& node) { return TakeNode(in, node); });
}

MomentFacts TakeMoment(ByteReader& in, const MomentFacts& before) {
  MomentFacts facts;
  facts.taken = chunk::Plus(before.taken, in.Signed());
  facts.uptime = chunk::Plus(before.uptime, in.Signed());
  facts.duration = in.Unsigned();
  facts.cpu = in.Unsigned();
  facts.skipped = in.Unsigned();
  facts.loss = static_cast<Status>(in.Bounded(std::numeric_limits<Status>::max()));
  facts.refused = in.Unsigned();
  facts.failed = in.Unsigned();
  return facts;
}

// What the first frame holds; `host` stays as it is if the part starts no chunk.
bool TakeIndex(ByteReader in, bool& starts, HostIdentity& host, std::vector<MomentFacts>& facts) {
  starts = in.Bounded(1) == 1;
  if (starts && !TakeHost(in, host)) return false;
  const uint64_t count = in.Bounded(chunk::kMostMoments);
  facts.clear();
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    facts.push_back(TakeMoment(in, facts.empty() ? MomentFacts() : facts.back()));
  }
  return in.IsAtEnd() && count != 0;
}

// The two frames of a part; the second stays packed if `changes` is null.
Status UnpackPart(ByteView part, Bytes& facts, Bytes* changes) {
  uint32_t size = 0;
  if (part.size() < chunk::kPrefixSize) return kDamaged;
  std::memcpy(&size, part.data(), chunk::kPrefixSize);
  part = part.subspan(chunk::kPrefixSize);
  if (size > part.size()) return kDamaged;
  Status status = Unpack(part.first(size), facts);
  if (status == kOk && changes != nullptr) status = Unpack(part.subspan(size), *changes);
  return status;
}

size_t SizeOf(const std::vector<Key>& entries) {
  return std::accumulate(
      entries.begin(), entries.end(), size_t{0},
      [](size_t sum, const Key& entry) { return sum + sizeof entry + entry.text.size(); });
}

}  // namespace

// The streams of a node of a part.
class ChunkReader::Columns {
 public:
  Columns(Part& part, size_t node)
      : streams_(part.streams[node]), count_(part.count), last_(part.last) {
    NextGap();
  }

  // The next cell. `cameNow`: the reading came with the part, at its moment `came`.
  void TakeCell(const RecordCell& cell, bool cameNow, size_t came, std::span<std::byte> bytes) {
    if (cameNow) TakeFirst(cell, bytes);
    if (gap_-- != 0) return;
    size_t moment = cameNow ? came + 1 : 0;
    const uint64_t count = streams_[chunk::kCounts].Bounded(count_) + 1;
    uint64_t bits = 0;
    std::memcpy(&bits, bytes.data(), cell.width);
    for (uint64_t i = 0; i < count && streams_[chunk::kDeltas].IsGood(); ++i, ++moment) {
      moment += streams_[chunk::kSteps].Bounded(count_);
      const auto delta =
          static_cast<uint64_t>(streams_[chunk::kDeltas].Signed(streams_[chunk::kMore]));
      if (moment <= last_) bits += delta;
    }
    std::memcpy(bytes.data(), &bits, cell.width);
    NextGap();
  }

  // Whether all has been taken, and nothing was wanting.
  bool IsAtEnd() const {
    return !hasGap_ &&
           std::ranges::all_of(streams_, [](const ByteReader& stream) { return stream.IsAtEnd(); });
  }

 private:
  void NextGap() {
    hasGap_ = streams_[chunk::kGaps].Left() != 0;
    gap_ = hasGap_ ? streams_[chunk::kGaps].Unsigned() : UINT64_MAX;
  }

  void TakeFirst(const RecordCell& cell, std::span<std::byte> bytes) {
    if (cell.isFigure) {
      const int64_t figure = streams_[chunk::kFirst].Signed();
      std::memcpy(bytes.data(), &figure, cell.width);
    } else {
      std::ranges::copy(streams_[chunk::kRaw].Raw(cell.width), bytes.begin());
    }
  }

  std::array<ByteReader, chunk::kStreams>& streams_;
  size_t count_;
  size_t last_;
  uint64_t gap_ = 0;
  bool hasGap_ = false;
};

Status ChunkReader::TakeFacts(ByteView part, HostIdentity& host, std::vector<MomentFacts>& facts) {
  Bytes index;
  bool starts = false;
  const Status status = UnpackPart(part, index, nullptr);
  return status == kOk ? StatusIf(TakeIndex(ByteReader(index), starts, host, facts)) : status;
}

Status ChunkReader::Take(ByteView part, size_t last) {
  Bytes index;
  Part taken;
  bool starts = false;
  std::vector<MomentFacts> facts;
  const Status status = UnpackPart(part, index, &taken.changes);
  if (status != kOk) return status;
  if (!TakeIndex(ByteReader(index), starts, host_, facts) || starts != parts_.empty()) {
    return kDamaged;
  }
  bytes_ += taken.changes.size();
  if (bytes_ > kMostBytes) return kDamaged;
  nodes_.resize(host_.nodes.size());
  taken.count = facts.size();
  taken.last = std::min(last, facts.size() - 1);
  facts_ = facts[taken.last];
  ByteReader events;
  const bool isGood = TakeStreams(taken, events);
  parts_.push_back(std::move(taken));
  return StatusIf(isGood && TakeEvents(events, parts_.back()));
}

bool ChunkReader::TakeStreams(Part& part, ByteReader& events) const {
  ByteReader in(part.changes);
  const uint64_t eventsSize = in.Unsigned();
  std::vector<std::array<uint64_t, chunk::kStreams>> sizes(host_.nodes.size());
  for (auto& each : sizes) {
    for (uint64_t& size : each) size = in.Unsigned();
  }
  events = ByteReader(in.Raw(eventsSize));
  part.streams.resize(sizes.size());
  for (size_t kind = 0; kind < chunk::kStreams; ++kind) {
    for (size_t node = 0; node < sizes.size(); ++node) {
      part.streams[node][kind] = ByteReader(in.Raw(sizes[node][kind]));
    }
  }
  return in.IsAtEnd();
}

bool ChunkReader::TakeEvents(ByteReader in, const Part& part) {
  for (size_t moment = 0; moment < part.count; ++moment) {
    const bool isWanted = moment <= part.last;
    if (!TakeGone(in, isWanted) || !TakeCome(in, moment, isWanted) || !TakeEdits(in, isWanted)) {
      return false;
    }
  }
  return in.IsAtEnd();
}

bool ChunkReader::TakeGone(ByteReader& in, bool isWanted) {
  const auto part = static_cast<uint32_t>(parts_.size() - 1);
  const uint64_t count = in.Bounded(readings_.size());
  uint64_t number = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i, ++number) {
    number += in.Bounded(readings_.size());
    if (number >= readings_.size()) return false;
    if (!isWanted) continue;
    readings_[number].wentIn = std::min(readings_[number].wentIn, part);
    lists_.erase(number);
  }
  return in.IsGood();
}

bool ChunkReader::TakeCome(ByteReader& in, size_t moment, bool isWanted) {
  constexpr size_t kSmallest = 4;  // bytes of one that comes
  const auto part = static_cast<uint32_t>(parts_.size() - 1);
  const uint64_t count =
      in.Bounded(std::min(kMostReadings - readings_.size(), in.Left() / kSmallest));
  if (readings_.empty()) readings_.reserve(count);
  int64_t number = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    ReadingState& come = readings_.emplace_back();
    const uint64_t node = in.Unsigned();
    for (Key& key : come.keys) key = TakeEntry(in, number);
    come.status = static_cast<Status>(in.Bounded(std::numeric_limits<Status>::max()));
    if (!in.IsGood() || node >= nodes_.size()) return false;
    come.node = static_cast<uint32_t>(node);
    come.place = static_cast<uint32_t>(nodes_[node].readings.size());
    come.cameIn = part;
    come.came = static_cast<uint32_t>(moment);
    if (!isWanted) come.wentIn = part;
    nodes_[node].readings.push_back(readings_.size() - 1);
    bytes_ += host_.nodes[node].recordSize;
    if (bytes_ > kMostBytes) return false;
  }
  return in.IsGood();
}

bool ChunkReader::TakeEdits(ByteReader& in, bool isWanted) {
  const uint64_t count = in.Bounded(in.Left());
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    const uint64_t number = in.Unsigned();
    if (number >= readings_.size()) return false;
    if (!isWanted) {
      PassEdit(in);
      continue;
    }
    std::vector<Key>& entries = lists_[number];
    bytes_ -= SizeOf(entries);
    if (!TakeEdit(in, entries)) return false;
    const size_t size = SizeOf(entries);
    bytes_ += size;
    work_ += size;
    if (bytes_ > kMostBytes || work_ > kMostWork) return false;
  }
  return in.IsGood();
}

// Brings the records of a node up to the last part.
bool ChunkReader::TakeRecords(size_t node) {
  NodeRecords& to = nodes_[node];
  const RecordedNode& known = host_.nodes[node];
  to.records.resize(to.readings.size() * known.recordSize);
  for (; to.partsTaken < parts_.size(); ++to.partsTaken) {
    const size_t part = to.partsTaken;
    std::vector<const ReadingState*> present;
    for (const size_t number : to.readings) {
      const ReadingState& each = readings_[number];
      if (each.status == kOk && each.cameIn <= part && each.wentIn >= part) {
        present.push_back(&each);
      }
    }
    Columns columns(parts_[part], node);
    for (const RecordCell& cell : known.cells) {
      for (const ReadingState* each : present) {
        columns.TakeCell(
            cell, each->cameIn == part, each->came,
            std::span(to.records).subspan(each->place * size_t{known.recordSize} + cell.offset));
      }
    }
    if (!columns.IsAtEnd()) return false;
  }
  return true;
}

Status ChunkReader::ReadNode(size_t node, std::vector<size_t>& numbers) {
  numbers.clear();
  if (!TakeRecords(node)) return kDamaged;
  for (const size_t number : nodes_[node].readings) {
    if (readings_[number].wentIn == kStays) numbers.push_back(number);
  }
  return kOk;
}

ChunkReader::View ChunkReader::At(size_t number) const {
  const ReadingState& state = readings_[number];
  View view = {state.keys, state.status, {}, {}};
  if (state.status != kOk) return view;
  const size_t size = host_.nodes[state.node].recordSize;
  view.record = ByteView(nodes_[state.node].records).subspan(state.place * size, size);
  const auto list = lists_.find(number);
  if (list != lists_.end()) view.entries = list->second;
  return view;
}

Status ChunkReader::ReadAll(std::vector<MomentReading>& readings) {
  readings.clear();
  std::vector<size_t> numbers;
  for (uint32_t node = 0; node < nodes_.size(); ++node) {
    const Status status = ReadNode(node, numbers);
    if (status != kOk) return status;
    for (const size_t number : numbers) {
      const View view = At(number);
      MomentReading& reading = readings.emplace_back();
      reading.question.node = node;
      for (size_t i = 0; i < kMaxKeys; ++i) reading.question.keys[i] = OwnOf(view.keys[i]);
      reading.answer.status = view.status;
      reading.answer.record.assign(view.record.begin(), view.record.end());
      for (const Key& entry : view.entries) reading.answer.entries.push_back(OwnOf(entry));
    }
  }
  return kOk;
}

}  // namespace ksi
