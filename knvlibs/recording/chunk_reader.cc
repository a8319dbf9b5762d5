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
    if (width == 0 || width > chunk::kWidestCell || at + width > node.recordSize) return false;
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

size_t SizeOf(const std::vector<OwnKey>& entries) {
  return std::accumulate(entries.begin(), entries.end(), size_t{0},
                         [](size_t sum, const OwnKey& entry) {
                           const auto* text = std::get_if<std::string>(&entry);
                           return sum + sizeof entry + (text == nullptr ? 0 : text->size());
                         });
}

}  // namespace

// The streams of the cells.
class ChunkReader::Columns {
 public:
  Columns(std::array<ByteReader, chunk::kStreams>& streams, size_t count, size_t last)
      : streams_(streams), count_(count), last_(last) {}

  [[nodiscard]] bool Take(ChunkReader& reader) {
    std::vector<std::vector<size_t>> columns(reader.host_.nodes.size());
    for (size_t i = 0; i < reader.states_.size(); ++i) {
      if (reader.states_[i].hasCells) columns[reader.readings_[i].question.node].push_back(i);
    }
    NextGap();
    for (size_t node = 0; node < columns.size(); ++node) {
      for (const RecordCell& cell : reader.host_.nodes[node].cells) {
        for (const size_t i : columns[node]) {
          TakeCell(cell, reader.states_[i], reader.readings_[i].answer.record);
        }
      }
    }
    return IsGood() && !hasGap_;
  }

 private:
  void NextGap() {
    hasGap_ = streams_[chunk::kGaps].Left() != 0;
    gap_ = hasGap_ ? streams_[chunk::kGaps].Unsigned() : UINT64_MAX;
  }

  void TakeCell(const RecordCell& cell, const State& state, Bytes& record) {
    if (state.cameNow) TakeFirst(cell, record);
    if (gap_-- != 0) return;
    size_t moment = state.cameNow ? state.came + 1 : 0;
    const uint64_t count = streams_[chunk::kCounts].Bounded(count_) + 1;
    uint64_t bits = chunk::BitsOf(cell, record);
    for (uint64_t i = 0; i < count && streams_[chunk::kDeltas].IsGood(); ++i, ++moment) {
      moment += streams_[chunk::kSteps].Bounded(count_);
      const auto delta = static_cast<uint64_t>(streams_[chunk::kDeltas].Signed());
      if (moment <= last_) bits += delta;
    }
    chunk::PutBits(cell, bits, record);
    NextGap();
  }

  void TakeFirst(const RecordCell& cell, Bytes& record) {
    if (cell.isFigure) {
      chunk::PutBits(cell, static_cast<uint64_t>(streams_[chunk::kFirst].Signed()), record);
    } else {
      const ByteView raw = streams_[chunk::kRaw].Raw(cell.width);
      std::ranges::copy(raw, record.begin() + cell.offset);
    }
  }

  bool IsGood() const {
    return std::all_of(
        streams_.begin() + chunk::kFirst, streams_.end(),
        [](const ByteReader& stream) { return stream.IsGood() && stream.Left() == 0; });
  }

  std::array<ByteReader, chunk::kStreams>& streams_;
  size_t count_;  // of moments
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
  Bytes changes;
  bool starts = false;
  std::vector<MomentFacts> facts;
  const Status status = UnpackPart(part, index, &changes);
  if (status != kOk) return status;
  if (!TakeIndex(ByteReader(index), starts, host_, facts) || starts == hasStarted_) return kDamaged;
  hasStarted_ = true;
  last = std::min(last, facts.size() - 1);
  facts_ = facts[last];

  ByteReader in(changes);
  std::array<uint64_t, chunk::kStreams> sizes;
  for (uint64_t& size : sizes) size = in.Unsigned();
  std::array<ByteReader, chunk::kStreams> streams;
  for (size_t i = 0; i < streams.size(); ++i) streams[i] = ByteReader(in.Raw(sizes[i]));
  if (!in.IsAtEnd() || !TakeEvents(streams[chunk::kEvents], facts.size(), last) ||
      !Columns(streams, facts.size(), last).Take(*this)) {
    return kDamaged;
  }
  for (size_t i = 0; i < states_.size(); ++i) {
    State& state = states_[i];
    state.cameNow = false;
    state.hasCells = state.hasCells && state.isThere;
    if (!state.isThere) readings_[i] = {};
  }
  return kOk;
}

bool ChunkReader::TakeEvents(ByteReader in, size_t count, size_t last) {
  for (size_t moment = 0; moment < count; ++moment) {
    const bool isWanted = moment <= last;
    if (!TakeGone(in, isWanted) || !TakeCome(in, moment, isWanted) || !TakeEdits(in, isWanted)) {
      return false;
    }
  }
  return in.IsAtEnd();
}

bool ChunkReader::TakeGone(ByteReader& in, bool isWanted) {
  const uint64_t count = in.Bounded(readings_.size());
  uint64_t number = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i, ++number) {
    number += in.Bounded(readings_.size());
    if (number >= readings_.size()) return false;
    if (isWanted) states_[number].isThere = false;
  }
  return in.IsGood();
}

bool ChunkReader::TakeCome(ByteReader& in, size_t moment, bool isWanted) {
  constexpr size_t kSmallest = 4;  // bytes of one that comes
  const uint64_t count =
      in.Bounded(std::min(kMostReadings - readings_.size(), in.Left() / kSmallest));
  if (readings_.empty()) {
    readings_.reserve(count);
    states_.reserve(count);
  }
  int64_t number = 0;
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    Reading& come = readings_.emplace_back();
    come.question.node = static_cast<uint32_t>(in.Unsigned());
    for (OwnKey& key : come.question.keys) key = TakeEntry(in, number);
    come.answer.status = static_cast<Status>(in.Bounded(std::numeric_limits<Status>::max()));
    if (!in.IsGood() || come.question.node >= host_.nodes.size()) return false;
    const RecordedNode& node = host_.nodes[come.question.node];
    const bool hasCells = come.answer.status == kOk && node.recordSize != 0;
    if (hasCells) come.answer.record.resize(node.recordSize);
    bytes_ += node.recordSize;
    if (bytes_ > kMostBytes) return false;
    states_.push_back({isWanted, true, hasCells, moment});
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
    Answer& answer = readings_[number].answer;
    bytes_ -= SizeOf(answer.entries);
    if (!TakeEdit(in, answer.entries)) return false;
    const size_t size = SizeOf(answer.entries);
    bytes_ += size;
    work_ += size;
    if (bytes_ > kMostBytes || work_ > kMostWork) return false;
  }
  return in.IsGood();
}

std::vector<Reading> ChunkReader::TakeReadings() {
  size_t kept = 0;
  for (size_t i = 0; i < readings_.size(); ++i) {
    if (!states_[i].isThere) continue;
    if (kept != i) readings_[kept] = std::move(readings_[i]);
    ++kept;
  }
  readings_.resize(kept);
  states_.clear();
  return std::exchange(readings_, {});
}

}  // namespace ksi
