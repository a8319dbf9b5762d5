#include "knvlibs/recording/chunk_writer.h"

#include <algorithm>
#include <span>
#include <stdexcept>
#include <utility>

#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/frame.h"

namespace ksi {
namespace {

void PutHost(const HostIdentity& host, ByteWriter& out) {
  for (const std::string* text : {&host.signature, &host.built, &host.name, &host.boot}) {
    out.Text(*text);
  }
  out.Unsigned(host.nodes.size());
  for (const RecordedNode& node : host.nodes) {
    out.Text(node.path);
    out.Byte(static_cast<uint8_t>(node.kind));
    out.Unsigned(node.recordSize);
    out.Unsigned(node.cells.size());
    for (const RecordCell& cell : node.cells) {
      out.Byte(static_cast<uint8_t>(2 * cell.width + (cell.isFigure ? 1 : 0)));
    }
  }
}

void PutFacts(const MomentFacts& facts, const MomentFacts& before, ByteWriter& out) {
  out.Signed(chunk::Minus(facts.taken, before.taken));
  out.Signed(chunk::Minus(facts.uptime, before.uptime));
  for (const uint64_t number : {facts.duration, facts.cpu, facts.skipped, uint64_t{facts.loss},
                                facts.refused, facts.failed}) {
    out.Unsigned(number);
  }
}

uint64_t SizeOf(const std::vector<Bytes>& pieces) {
  uint64_t size = 0;
  for (const Bytes& piece : pieces) size += piece.size();
  return size;
}

size_t EntriesOf(const std::vector<MomentReading>& readings) {
  size_t entries = 0;
  for (const MomentReading& reading : readings) entries += reading.answer.entries.size();
  return entries;
}

Bytes PackNodes(const std::vector<size_t>& nodes, const std::vector<std::vector<Bytes>>& pieces) {
  std::vector<ByteView> packed;
  for (const size_t node : nodes)
    packed.insert(packed.end(), pieces[node].begin(), pieces[node].end());
  return Pack(packed);
}

}  // namespace

Bytes MakePart(ByteView head, const std::vector<std::vector<Bytes>>& nodes) {
  ByteWriter index;
  index.Raw(head);
  std::vector<uint64_t> sizes;
  for (const std::vector<Bytes>& pieces : nodes) {
    sizes.push_back(SizeOf(pieces));
    index.Unsigned(sizes.back());
  }
  ByteWriter frames;
  for (const std::vector<size_t>& together : chunk::FramesOf(sizes)) {
    const Bytes frame = PackNodes(together, nodes);
    index.Unsigned(frame.size());
    frames.Raw(frame);
  }
  const ByteView whole[] = {index.All()};
  const Bytes first = Pack(whole);
  const auto size = static_cast<uint32_t>(first.size());
  ByteWriter part;
  part.Raw(std::as_bytes(std::span(&size, 1)));
  part.Raw(first);
  part.Raw(frames.All());
  return part.All();
}

ChunkWriter::ChunkWriter(HostIdentity host) : host_(std::move(host)) {
  for (const RecordedNode& node : host_.nodes) nodes_.emplace_back(node);
}

size_t ChunkWriter::Readings() const {
  size_t readings = 0;
  for (const NodeWriter& node : nodes_) readings += node.Readings();
  return readings;
}

void ChunkWriter::Add(const MomentFacts& facts, const std::vector<MomentReading>& readings) {
  if (Readings() + readings.size() > chunk::kMostReadings ||
      EntriesOf(readings) > chunk::kMostEntries) {
    throw std::length_error("more than a recording holds");
  }
  auto at = readings.begin();
  for (size_t node = 0; node < nodes_.size(); ++node) {
    const auto end = std::find_if(at, readings.end(), [node](const MomentReading& each) {
      return each.question.node != node;
    });
    nodes_[node].Add({at, end});
    at = end;
  }
  moments_.push_back(facts);
}

Bytes ChunkWriter::PartFrom(size_t from) const {
  std::vector<std::vector<Bytes>> nodes;
  for (const NodeWriter& node : nodes_) nodes.push_back(node.PiecesFrom(from));
  return MakePart(HeadFrom(from), nodes);
}

Bytes ChunkWriter::HeadFrom(size_t from) const {
  ByteWriter out;
  out.Byte(from == 0 ? 1 : 0);
  if (from == 0) PutHost(host_, out);
  out.Unsigned(moments_.size() - from);
  MomentFacts before;
  for (const MomentFacts& facts : std::span(moments_).subspan(from)) {
    PutFacts(facts, before, out);
    before = facts;
  }
  return out.All();
}

}  // namespace ksi
