#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/recording/chunk_writer.h"

#include <gtest/gtest.h>

#include <cstring>
#include <optional>
#include <vector>

#include <knvlibs/ksi_status.h>
#include "tests/knvlibs/recording/random_host.h"

namespace ksi {
namespace {

HostIdentity Host() {
  return {std::string(32, 'a'), "Nov 21 2026 10:00:00", "host", "boot", RecordedNodes()};
}

MomentFacts FactsOf(size_t i) {
  const auto number = static_cast<int64_t>(i);
  return {number * 5'000'000 - (i == 7 ? 3'600'000'000 : 0),
          number * 5'000'000,
          i,
          2 * i,
          i % 3,
          i % 5 == 0 ? KSI_STATUS_IO_ERROR : kOk,
          i % 4,
          i % 2};
}

std::vector<MomentReading> ReadingsOf(ChunkReader& reader) {
  Moment moment;
  EXPECT_EQ(reader.ReadAll(moment), kOk);
  SortReadings(moment.readings);
  return moment.readings;
}

constexpr size_t kMoments = 24;

class ChunkTest : public testing::TestWithParam<uint32_t> {
 protected:
  ChunkTest() {
    RandomHost host(GetParam());
    for (size_t i = 0; i < kMoments; ++i) {
      moments_.push_back(host.Next());
      writer_.Add(FactsOf(i), moments_.back());
      singles_.push_back(writer_.PartFrom(i));
    }
  }

  std::vector<std::vector<MomentReading>> moments_;
  ChunkWriter writer_{Host()};
  std::vector<Bytes> singles_;  // of each moment its part
};

TEST_P(ChunkTest, EachMomentIsAsItWas) {
  const Bytes part = writer_.PartFrom(0);
  for (size_t i = 0; i < kMoments; ++i) {
    ChunkReader reader;
    ASSERT_EQ(reader.Take(part, i), kOk);
    EXPECT_EQ(reader.Facts(), FactsOf(i));
    EXPECT_EQ(reader.Host(), Host());
    EXPECT_EQ(ReadingsOf(reader), moments_[i]) << "moment " << i;
  }
}

TEST_P(ChunkTest, PartsOfSingleMomentsContinueEachOther) {
  for (size_t last = 0; last < kMoments; ++last) {
    ChunkReader reader;
    for (size_t i = 0; i <= last; ++i) ASSERT_EQ(reader.Take(singles_[i]), kOk) << i;
    EXPECT_EQ(reader.Facts(), FactsOf(last));
    EXPECT_EQ(ReadingsOf(reader), moments_[last]) << "moment " << last;
  }
}

TEST_P(ChunkTest, AChunkIsContinuedByAPartOfMany) {
  ChunkReader reader;
  ASSERT_EQ(reader.Take(singles_[0]), kOk);
  ASSERT_EQ(reader.Take(singles_[1]), kOk);
  ASSERT_EQ(reader.Take(writer_.PartFrom(2), 5), kOk);
  EXPECT_EQ(ReadingsOf(reader), moments_[7]);
}

// What one asks for at each moment, another at some and a third never.
TEST_P(ChunkTest, MomentsFollowEachOther) {
  ChunkReader all;
  ChunkReader some;
  ASSERT_EQ(all.Take(writer_.PartFrom(0), 0), kOk);
  ASSERT_EQ(some.Take(singles_[0]), kOk);
  for (size_t i = 0; i < kMoments; ++i) {
    if (i != 0) {
      ASSERT_TRUE(all.HasNext());
      all.Next();
      ASSERT_FALSE(some.HasNext());
      ASSERT_EQ(some.Take(singles_[i]), kOk);
    }
    EXPECT_EQ(all.Facts(), FactsOf(i));
    EXPECT_EQ(ReadingsOf(all), moments_[i]) << "moment " << i;
    if (i % 5 == 3) {
      EXPECT_EQ(ReadingsOf(some), moments_[i]) << "moment " << i;
    }
  }
  EXPECT_FALSE(all.HasNext());
}

// A part of many is left in its midst only by who goes on to its end.
TEST_P(ChunkTest, APartIsGoneThroughBeforeTheNext) {
  ChunkWriter writer(Host());
  RandomHost host(GetParam());
  for (size_t i = 0; i < 10; ++i) writer.Add(FactsOf(i), host.Next());
  ChunkReader reader;
  ASSERT_EQ(reader.Take(writer.PartFrom(0), 3), kOk);
  EXPECT_EQ(ReadingsOf(reader), moments_[3]);
  while (reader.HasNext()) reader.Next();
  ASSERT_EQ(reader.Take(writer_.PartFrom(10), 4), kOk);
  EXPECT_EQ(ReadingsOf(reader), moments_[14]);
}

TEST_P(ChunkTest, FactsAreToldWithoutTheChanges) {
  HostIdentity host;
  std::vector<MomentFacts> facts;
  ASSERT_EQ(ChunkReader::TakeFacts(writer_.PartFrom(0), host, facts), kOk);
  EXPECT_EQ(host, Host());
  ASSERT_EQ(facts.size(), kMoments);
  for (size_t i = 0; i < kMoments; ++i) EXPECT_EQ(facts[i], FactsOf(i));
}

INSTANTIATE_TEST_SUITE_P(Series, ChunkTest, testing::Range(0u, 1000u, 37u));

TEST(ChunkReaderTest, APartThatIsDamagedIsRefused) {
  RandomHost host(1);
  ChunkWriter writer(Host());
  for (size_t i = 0; i < 5; ++i) writer.Add(FactsOf(i), host.Next());
  const Bytes part = writer.PartFrom(0);
  for (size_t size = 0; size < part.size(); ++size) {
    ChunkReader reader;
    EXPECT_EQ(reader.Take({part.begin(), part.begin() + static_cast<ptrdiff_t>(size)}),
              KSI_STATUS_METADATA_READ_ERROR)
        << size;
  }
  for (size_t bit = 0; bit < part.size() * 8; ++bit) {
    Bytes flipped = part;
    flipped[bit / 8] ^= std::byte{1} << bit % 8;
    ChunkReader reader;
    Moment moment;
    if (reader.Take(flipped) == kOk && reader.ReadAll(moment) == kOk) {
      // There are bits of a frame that say nothing of its content.
      EXPECT_EQ(reader.Facts(), FactsOf(4)) << bit;
    }
  }
}

// The records of a node; none if it cannot be read.
std::optional<std::vector<Bytes>> RecordsOf(ChunkReader& chunk, size_t node) {
  const NodeReader* reader = nullptr;
  if (chunk.ReadNode(node, &reader) != kOk) return std::nullopt;
  std::vector<Bytes> records;
  for (const uint32_t number : reader->Present()) {
    const ByteView record = reader->At(number).record;
    records.emplace_back(record.begin(), record.end());
  }
  return records;
}

// Nodes lie together in frames.
TEST(ChunkReaderTest, WhereOneNodeIsDamagedTheOthersAreRefusedOrAsTheyWere) {
  RandomHost host(1);
  ChunkWriter writer(Host());
  for (size_t i = 0; i < 5; ++i) writer.Add(FactsOf(i), host.Next());
  const Bytes part = writer.PartFrom(0);
  ChunkReader whole;
  ASSERT_EQ(whole.Take(part), kOk);
  size_t refused = 0;
  for (size_t at = 0; at < part.size(); ++at) {
    Bytes damaged = part;
    damaged[at] ^= std::byte{0x10};
    ChunkReader reader;
    if (reader.Take(damaged) != kOk) continue;
    for (size_t node = 0; node < Host().nodes.size(); ++node) {
      const auto records = RecordsOf(reader, node);
      refused += records ? 0 : 1;
      if (records.has_value()) {
        ASSERT_EQ(records, RecordsOf(whole, node)) << at;
      }
    }
  }
  EXPECT_GT(refused, part.size() / 2) << "most of a part is frames with several nodes";
}

TEST(ChunkReaderTest, PartsAreTakenInTheirOrderOnly) {
  RandomHost host(2);
  ChunkWriter writer(Host());
  writer.Add(FactsOf(0), host.Next());
  const Bytes first = writer.PartFrom(0);
  writer.Add(FactsOf(1), host.Next());
  ChunkReader reader;
  EXPECT_EQ(reader.Take(writer.PartFrom(1)), KSI_STATUS_METADATA_READ_ERROR);
  ChunkReader twice;
  ASSERT_EQ(twice.Take(first), kOk);
  EXPECT_EQ(twice.Take(first), KSI_STATUS_METADATA_READ_ERROR);
}

}  // namespace
}  // namespace ksi
