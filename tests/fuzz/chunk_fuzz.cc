// Parts of a chunk of a recording, as they are before they are packed: the checks of what packs
// them keep out most of what is changed afterwards.
//
// The input is, for each part, up to which moment it is taken (255: to its end), the sizes of its
// facts and of its changes in 2 bytes each, little-endian, and these.
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <span>
#include <utility>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/recording/chunk_writer.h"
#include "knvlibs/recording/frame.h"
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

ksi::Bytes Packed(ksi::ByteView content) { return ksi::Pack(std::span(&content, 1)); }

ksi::Bytes PartOf(ksi::ByteView facts, ksi::ByteView changes) {
  const ksi::Bytes head = Packed(facts);
  const auto size = static_cast<uint32_t>(head.size());
  ksi::ByteWriter part;
  part.Raw(std::as_bytes(std::span(&size, 1)));
  part.Raw(head);
  part.Raw(Packed(changes));
  return part.All();
}

bool AreDifferent(const std::vector<ksi::MomentReading>& sorted) {
  return std::ranges::adjacent_find(sorted, {}, &ksi::MomentReading::question) == sorted.end();
}

// What was read can be written, and is read again.
void WriteAgain(const ksi::ChunkReader& reader, const std::vector<ksi::MomentReading>& readings) {
  ksi::ChunkWriter writer(reader.Host());
  writer.Add(reader.Facts(), readings);
  ksi::ChunkReader again;
  std::vector<ksi::MomentReading> read;
  Require(again.Take(writer.PartFrom(0)) == ksi::kOk, "what is written is a part");
  Require(again.ReadAll(read) == ksi::kOk, "what is written can be read");
  ksi::SortReadings(read);
  Require(again.Host() == reader.Host() && again.Facts() == reader.Facts() && read == readings,
          "what is read is what was written");
}

void Look(ksi::ChunkReader& reader) {
  std::vector<ksi::MomentReading> readings;
  if (reader.ReadAll(readings) != ksi::kOk) return;
  for (const ksi::MomentReading& each : readings) {
    Require(each.question.node < reader.Host().nodes.size(), "a reading is of a node");
    const size_t size = reader.Host().nodes[each.question.node].recordSize;
    Require(each.answer.record.size() == (each.answer.status == ksi::kOk ? size : 0),
            "a record has its size");
  }
  ksi::SortReadings(readings);
  if (reader.Size() < kSmall && AreDifferent(readings)) WriteAgain(reader, readings);
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  constexpr uint8_t kWhole = 255;
  ksi::ByteReader in(std::as_bytes(std::span(data, size)));
  ksi::ChunkReader reader;
  while (in.Left() != 0) {
    const uint8_t last = in.Byte();
    const size_t factsSize = TakeSize(in);
    const size_t changesSize = TakeSize(in);
    const ksi::ByteView facts = in.Raw(factsSize);
    const ksi::ByteView changes = in.Raw(changesSize);
    if (!in.IsGood()) break;
    if (reader.Take(PartOf(facts, changes), last == kWhole ? SIZE_MAX : last) != ksi::kOk) break;
    Look(reader);
    if (last != kWhole) break;
  }
  return 0;
}
