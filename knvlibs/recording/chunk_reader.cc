#include "knvlibs/recording/chunk_reader.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/frame.h"

namespace ksi {
namespace {

constexpr Status kDamaged = KSI_STATUS_METADATA_READ_ERROR;

// Those of an honest file, several times over.
constexpr size_t kMostNodes = 4096;
constexpr size_t kMostIndex = size_t{1} << 20;  // bytes

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

// The index of a part but for its end, which is on the nodes; `host` stays as it is if the part
// starts no chunk.
bool TakeIndex(ByteReader& in, bool& starts, HostIdentity& host, std::vector<MomentFacts>& facts) {
  starts = in.Bounded(1) == 1;
  if (starts && !TakeHost(in, host)) return false;
  const uint64_t count = in.Bounded(chunk::kMostMoments);
  facts.clear();
  for (uint64_t i = 0; i < count && in.IsGood(); ++i) {
    facts.push_back(TakeMoment(in, facts.empty() ? MomentFacts() : facts.back()));
  }
  return in.IsGood() && count != 0;
}

// Unpacks the index of a part; the frames that follow stay packed.
Status UnpackIndex(ByteView part, Bytes& index, ByteView& frames) {
  uint32_t size = 0;
  if (part.size() < chunk::kPrefixSize) return kDamaged;
  std::memcpy(&size, part.data(), chunk::kPrefixSize);
  part = part.subspan(chunk::kPrefixSize);
  if (size > part.size()) return kDamaged;
  frames = part.subspan(size);
  return Unpack(part.first(size), kMostIndex, index);
}

}  // namespace

Status ChunkReader::TakeFacts(ByteView part, HostIdentity& host, std::vector<MomentFacts>& facts) {
  Bytes index;
  ByteView frames;
  bool starts = false;
  const Status status = UnpackIndex(part, index, frames);
  if (status != kOk) return status;
  ByteReader in(index);
  return TakeIndex(in, starts, host, facts) ? kOk : kDamaged;
}

Status ChunkReader::Take(Bytes packed, size_t last) {
  Bytes index;
  ByteView frames;
  bool starts = false;
  const size_t before = parts_.size();
  Part& part = parts_.emplace_back();
  part.packed = std::move(packed);
  Status status = UnpackIndex(part.packed, index, frames);
  if (status != kOk) return status;
  ByteReader in(index);
  if (!TakeIndex(in, starts, host_, facts_) || starts != (before == 0)) return kDamaged;
  if (starts) {
    for (const RecordedNode& node : host_.nodes) nodes_.emplace_back(node, *budget_);
    taken_.assign(nodes_.size(), 0);
  }
  part.count = facts_.size();
  moment_ = std::min(last, facts_.size() - 1);
  return TakePlaces(in, frames, part);
}

// Where the nodes lie in the frames.
Status ChunkReader::TakePlaces(ByteReader& in, ByteView packed, Part& part) {
  std::vector<uint64_t> sizes;
  for (size_t node = 0; node < nodes_.size(); ++node) {
    sizes.push_back(in.Unsigned());
    if (!ChunkBudget::Spend(budget_->bytes, sizes.back())) return kDamaged;
    size_ += sizes.back();
  }
  part.places.resize(nodes_.size());
  ByteReader frames(packed);
  for (const std::vector<size_t>& nodes : chunk::FramesOf(sizes)) {
    Frame& frame = part.frames.emplace_back();
    frame.packed = frames.Raw(in.Unsigned());
    for (const size_t node : nodes) {
      part.places[node] = {part.frames.size() - 1, frame.size, sizes[node]};
      frame.size += sizes[node];
    }
  }
  return in.IsAtEnd() && frames.IsAtEnd() ? kOk : kDamaged;
}

Status ChunkReader::UnpackFrame(const Frame& frame, Bytes& content) {
  // What is damaged is so for each of its nodes.
  Bytes unpacked;
  const Status status = Unpack(frame.packed, frame.size, unpacked);
  if (status != kOk) return status;
  if (unpacked.size() != frame.size) return kDamaged;
  content = std::move(unpacked);
  return kOk;
}

Status ChunkReader::CheckSingles() {
  Status status = kOk;
  for (Part& part : parts_) {
    if (part.count > 1) continue;
    for (Frame& frame : part.frames) {
      if (status == kOk && frame.content.empty()) status = UnpackFrame(frame, frame.content);
    }
  }
  return status;
}

// What it holds is not kept.
Status ChunkReader::CheckLastPart() const {
  Bytes content;
  Status status = kOk;
  for (const Frame& frame : parts_.back().frames) {
    if (status == kOk) status = UnpackFrame(frame, content);
  }
  return status;
}

// What happened to a node in a part.
Status ChunkReader::ContentOf(Part& part, size_t node, ByteView& content) {
  const Place& place = part.places[node];
  content = {};
  if (place.size == 0) return kOk;
  Frame& frame = part.frames[place.frame];
  if (frame.content.empty()) {
    const Status status = UnpackFrame(frame, frame.content);
    if (status != kOk) return status;
  }
  content = ByteView(frame.content).subspan(place.from, place.size);
  return kOk;
}

// How far a part is taken: all of it, if others follow.
size_t ChunkReader::MomentIn(size_t part) const {
  return part + 1 < parts_.size() ? parts_[part].count - 1 : moment_;
}

Status ChunkReader::ReadNode(size_t node, const NodeReader** reader) {
  const Status status = TakeParts(node);
  if (status != kOk) taken_[node] = kNotGood;
  *reader = &nodes_[node];
  return status;
}

// Brings a node to the moment.
Status ChunkReader::TakeParts(size_t node) {
  NodeReader& reader = nodes_[node];
  size_t& taken = taken_[node];
  if (taken == kNotGood) return kDamaged;
  bool isGood = taken == 0 || reader.GoTo(MomentIn(taken - 1));
  for (; isGood && taken < parts_.size(); ++taken) {
    ByteView content;
    const Status status = ContentOf(parts_[taken], node, content);
    if (status != kOk) return status;
    isGood = reader.Take(content, parts_[taken].count, MomentIn(taken));
  }
  return isGood ? kOk : kDamaged;
}

Status ChunkReader::ReadAll(Moment& moment) {
  moment = {host_, Facts(), {}};
  for (uint32_t node = 0; node < nodes_.size(); ++node) {
    const NodeReader* reader = nullptr;
    const Status status = ReadNode(node, &reader);
    if (status != kOk) return status;
    for (const uint32_t number : reader->Present()) {
      const NodeReader::View view = reader->At(number);
      MomentReading& reading = moment.readings.emplace_back();
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
