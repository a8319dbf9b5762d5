// Parts of a chunk of a recording, as they are before they are packed: the checks of what packs
// them keep out most of what is changed afterwards.
//
// The input is, for each part, up to which moment it is taken (255: to its end), the size of the
// head of its index in 2 bytes, little-endian, and the head; the number of its nodes, and of each
// the size of what happened to it in 2 bytes, and that.
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <span>
#include <utility>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/recording/chunk_writer.h"
#include "tests/fuzz/target.h"

namespace {

// Larger moments are read, and no more.
constexpr size_t kSmall = size_t{4} << 20;

void Require(bool kept, const char* what) {
  if (kept) return;
  std::fprintf(stderr, "not kept: %s\n", what);
  std::abort();
}

size_t TakeSize(ksi::ByteReader& in) {
  const size_t low = in.Byte();
  return low | size_t{in.Byte()} << 8;
}

ksi::ByteView TakeSized(ksi::ByteReader& in) { return in.Raw(TakeSize(in)); }

std::vector<std::vector<ksi::Bytes>> TakeNodes(ksi::ByteReader& in) {
  std::vector<std::vector<ksi::Bytes>> nodes(in.Byte());
  for (std::vector<ksi::Bytes>& pieces : nodes) {
    const ksi::ByteView content = TakeSized(in);
    if (!content.empty()) pieces.emplace_back(content.begin(), content.end());
  }
  return nodes;
}

bool AreDifferent(const std::vector<ksi::MomentReading>& sorted) {
  return std::ranges::adjacent_find(sorted, {}, &ksi::MomentReading::question) == sorted.end();
}

// What was read can be written, and is read again.
void WriteAgain(const ksi::Moment& moment) {
  ksi::ChunkWriter writer(moment.host);
  writer.Add(moment.facts, moment.readings);
  ksi::ChunkReader again;
  ksi::Moment read;
  Require(again.Take(writer.PartFrom(0)) == ksi::kOk, "what is written is a part");
  Require(again.ReadAll(read) == ksi::kOk, "what is written can be read");
  ksi::SortReadings(read.readings);
  Require(
      read.host == moment.host && read.facts == moment.facts && read.readings == moment.readings,
      "what is read is what was written");
}

void Look(ksi::ChunkReader& reader) {
  ksi::Moment moment;
  if (reader.ReadAll(moment) != ksi::kOk) return;
  for (const ksi::MomentReading& each : moment.readings) {
    Require(each.question.node < moment.host.nodes.size(), "a reading is of a node");
    const size_t size = moment.host.nodes[each.question.node].recordSize;
    Require(each.answer.record.size() == (each.answer.status == ksi::kOk ? size : 0),
            "a record has its size");
  }
  ksi::SortReadings(moment.readings);
  if (reader.Size() < kSmall && AreDifferent(moment.readings)) WriteAgain(moment);
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  constexpr uint8_t kWhole = 255;
  ksi::ByteReader in(std::as_bytes(std::span(data, size)));
  ksi::ChunkReader reader;
  while (in.Left() != 0) {
    const uint8_t last = in.Byte();
    const ksi::ByteView head = TakeSized(in);
    const auto nodes = TakeNodes(in);
    if (!in.IsGood()) break;
    if (reader.Take(ksi::MakePart(head, nodes), last == kWhole ? SIZE_MAX : last) != ksi::kOk) {
      break;
    }
    Look(reader);
    // The moments that it was not taken to are gone through.
    for (; reader.HasNext(); Look(reader)) reader.Next();
  }
  return 0;
}
