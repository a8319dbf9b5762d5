// Recordings that are small and hold much: whatever looks into them ends before long, in bounded
// memory, and says what is wrong.
#include <algorithm>
#include <cstdint>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/chunk_writer.h"
#include "knvlibs/recording/frame.h"
#include "knvlibs/recording/list_edit.h"
#include "tests/ksicache/recording_fixture.h"

namespace ksi {
namespace {

using ksicache::RecordingStore;

class RecordingWork : public RecordingTest {
 protected:
  RecordingWork() { MakeEmpty(file_); }

  static size_t PlaceOf(const std::string& path, Kind kind) {
    const auto node = std::ranges::find_if(RecordedNodes(), [&](const RecordedNode& each) {
      return each.path == path && each.kind == kind;
    });
    return static_cast<size_t>(node - RecordedNodes().begin());
  }

  // So many values of nothing but zeros, with keys from `first` on.
  static std::vector<MomentReading> Zeros(size_t count, int64_t first = 0) {
    const size_t node = PlaceOf("sched/groups/groupFlags", Kind::kValue);
    std::vector<MomentReading> readings(count);
    for (MomentReading& reading : readings) {
      reading.question.node = static_cast<uint32_t>(node);
      reading.question.keys[0].emplace<int64_t>(first++);
      reading.answer.record.resize(RecordedNodes()[node].recordSize);
    }
    return readings;
  }

  // What the index of a chunk's first moment says before it comes to the nodes: what it does if
  // none has anything, but for a byte for each.
  static Bytes HeadOfOne() {
    MomentFacts facts;
    facts.taken = kStart;
    ChunkWriter writer(Host());
    writer.Add(facts, {});
    Bytes index;
    EXPECT_EQ(
        Unpack(ByteView(writer.PartFrom(0)).subspan(chunk::kPrefixSize), kLargestFrame, index),
        kOk);
    index.resize(index.size() - RecordedNodes().size());
    return index;
  }

  // The first moment of a chunk with them, and one more, in which one of them may have changed.
  static std::pair<Bytes, Bytes> PartsWithZeros(size_t count, uint8_t change = 0) {
    MomentFacts facts;
    facts.taken = kStart;
    std::vector<MomentReading> readings = Zeros(count);
    ChunkWriter writer(Host());
    writer.Add(facts, readings);
    Bytes start = writer.PartFrom(0);
    readings[0].answer.record[0] = std::byte{change};
    writer.Add(facts, readings);
    return {std::move(start), writer.PartFrom(1)};
  }

  static Bytes PartOf(ByteView facts, ByteView changes) {
    const auto size = static_cast<uint32_t>(facts.size());
    ByteWriter part;
    part.Raw(std::as_bytes(std::span(&size, 1)));
    part.Raw(facts);
    part.Raw(changes);
    return part.All();
  }

  // Adds so many chunks of one moment each.
  void AddChunks(int64_t count, ByteView content) const {
    RecordingStore store(file_, kUnbounded);
    for (int64_t i = 0; i < count; ++i) store.Add({0, 1, i, i, kStart, kStart, 0, 0}, content);
  }

  // Adds moments of the first chunk.
  void AddMoments(int64_t first, int64_t end, ByteView content) const {
    RecordingStore store(file_, kUnbounded);
    for (int64_t i = first; i < end; ++i) {
      store.Add({0, 1, i, 0, kStart, kStart, 0, 0}, content);
    }
  }

  // A small file of so many moments that are all the same.
  void RecordAlike(const std::vector<MomentReading>& readings, int64_t count) const {
    MomentFacts facts;
    ChunkWriter writer(Host());
    for (int64_t i = 0; i < count; ++i) {
      facts.taken = kStart + i * kSecond;
      writer.Add(facts, readings);
    }
    const Bytes empty = RecordingStore::Empty("h", 1);
    WriteContent(file_, {reinterpret_cast<const char*>(empty.data()), empty.size()});
    RecordingStore(file_, kUnbounded)
        .Add({0, count, 0, 0, kStart, facts.taken, 0, 0}, writer.PartFrom(0));
  }

  // The program where neither much memory nor much time is to be had.
  static void ExpectEnds(const std::vector<std::string>& args, const std::string& out,
                         const std::string& err) {
    ExpectBounded([&] {
      const harness::Result result = Run(args);
      EXPECT_EQ(result.status, 1);
      EXPECT_EQ(result.out, out);
      EXPECT_EQ(result.err, err);
    });
  }

  static std::string Repeat(const std::string& text, int times) {
    std::string all;
    for (int i = 0; i < times; ++i) all += text;
    return all;
  }

  const std::string file_ = Path("r.ksi");
};

// What is the same from moment to moment takes no room.
TEST_F(RecordingWork, CheckEndsByTheSizeOfTheFile) {
  AddChunks(30, PartsWithZeros(100'000).first);
  ExpectEnds({"check", file_},
             file_ + ": damaged: its moments hold more than a file of its size does\n", "");
}

TEST_F(RecordingWork, FactsAreNoLargerThanFactsAre) {
  const Bytes zeros(kLargestFrame);
  const ByteView pieces[] = {zeros};
  const Bytes frame = Pack(pieces);
  constexpr int kParts = 1500;
  AddChunks(kParts, PartOf(frame, frame));
  const std::string damaged = "damaged: the part of 2026-11-21T10:00:00Z is damaged\n";
  ExpectEnds({"check", file_}, Repeat(file_ + "@2026-11-21T10:00:00Z: " + damaged, kParts), "");
  ExpectEnds({"moments", file_}, "taken                   bytes  took ms  cpu ms  remarks\n",
             Repeat("ksicache: " + file_ + ": " + damaged, kParts));
}

TEST_F(RecordingWork, MomentsInARowAreUnpackedOnce) {
  constexpr int64_t kMoments = 2500;
  const auto [start, more] = PartsWithZeros(10);
  AddChunks(1, start);
  AddMoments(1, kMoments, more);
  ExpectBounded([this] {
    const std::unique_ptr<RecordingFile> file = OpenFile(file_);
    Moment moment;
    ChunkReader reader;
    for (int64_t i = 0; i < kMoments; ++i) {
      ASSERT_EQ(file->ReadWhole(i, reader, moment, i - 1), kOk) << i;
    }
    EXPECT_EQ(moment.readings, Zeros(10));
    EXPECT_LT(file->Taken(), kMoments * 70'000u);
  });
}

TEST_F(RecordingWork, ManyReadingsThatChangeInManyPartsAreDamage) {
#ifdef TALLY_SANITIZED
  GTEST_SKIP() << "sanitizers take more than ten times as long to come to the bound";
#endif
  const auto [start, more] = PartsWithZeros(300'000, 1);
  AddChunks(1, start);
  AddMoments(1, 500, more);
  ExpectEnds({"extract", file_, Path("out.ksi")}, "",
             "ksicache: " + file_ +
                 ": damaged: the moment of 2026-11-21T10:00:00Z: the part of 2026-11-21T10:00:00Z "
                 "is damaged\n");
}

// Each moment has all readings: as many as moments times readings, in a few KB.
TEST_F(RecordingWork, JoinEndsByTheSizeOfTheFile) {
#ifdef TALLY_SANITIZED
  GTEST_SKIP() << "sanitizers take more than ten times as long to come to the bound";
#endif
  RecordAlike(Zeros(20'000), 4096);
  ExpectBounded([this] {
    const harness::Result result = Run({"join", Path("out.rec"), file_});
    EXPECT_EQ(result.status, 1);
    EXPECT_NE(result.err.find(": damaged: its moments hold more than a file of its size does: "),
              std::string::npos)
        << result.err;
  });
}

TEST_F(RecordingWork, ExportEndsByTheSizeOfTheFile) {
#ifdef TALLY_SANITIZED
  GTEST_SKIP() << "sanitizers take more than ten times as long to come to the bound";
#endif
  // A group with so many below it that each moment takes a while.
  MomentReading groups;
  const auto node =
      std::ranges::find(RecordedNodes(), "sched/groups/members/groups", &RecordedNode::path);
  groups.question.node = static_cast<uint32_t>(node - RecordedNodes().begin());
  groups.question.keys[0].emplace<int64_t>(0);
  for (int64_t group = 1; group <= 20'000; ++group) groups.answer.entries.emplace_back(group);
  RecordAlike({groups}, 4096);
  ExpectBounded([this] {
    const harness::Result result = Run({"export", "group-stats", file_ + "@.."});
    EXPECT_EQ(result.status, 1);
    EXPECT_NE(result.err.find(": damaged: its moments hold more than a file of its size does\n"),
              std::string::npos)
        << result.err.substr(0, 4096);
  });
}

// Entries that count on by one take no room.
TEST_F(RecordingWork, AListHasABoundOfEntries) {
  constexpr size_t kMany = 25'000'000;
  ByteWriter events;
  for (const unsigned number : {0U, 0U, 1U}) events.Unsigned(number);
  int64_t before = 0;
  for (int key = 0; key < 2; ++key) PutEntry(std::string(), before, events);
  for (const unsigned number : {0U, 1U, 0U, 0U, 0U}) events.Unsigned(number);
  events.Unsigned(kMany);
  for (size_t i = 0; i < kMany; ++i) PutEntry(static_cast<int64_t>(i), before, events);
  for (int i = 0; i < 3; ++i) events.Unsigned(0);
  ByteWriter sizes;
  sizes.Unsigned(events.All().size());
  for (size_t i = 1; i < chunk::kStreams; ++i) sizes.Unsigned(0);
  std::vector<std::vector<Bytes>> nodes(RecordedNodes().size());
  nodes[PlaceOf("system/heaps", Kind::kList)] = {sizes.All(), events.All()};
  AddChunks(1, MakePart(HeadOfOne(), nodes));
  ExpectEnds({"extract", file_, Path("out.ksi")}, "",
             "ksicache: " + file_ +
                 ": damaged: the moment of 2026-11-21T10:00:00Z: the part of 2026-11-21T10:00:00Z "
                 "is damaged\n");
}

TEST_F(RecordingWork, NothingIsWrittenThatIsNotRead) {
  std::vector<MomentReading> readings(1);
  readings[0].question.node = static_cast<uint32_t>(PlaceOf("system/heaps", Kind::kList));
  std::vector<OwnKey>& entries = readings[0].answer.entries;
  for (size_t i = 0; i < chunk::kMostEntries; ++i) entries.emplace_back(static_cast<int64_t>(i));
  MomentFacts facts;
  facts.taken = kStart;
  ChunkWriter writer(Host());
  writer.Add(facts, readings);
  AddChunks(1, writer.PartFrom(0));
  Moment moment;
  ChunkReader reader;
  EXPECT_EQ(OpenFile(file_)->ReadWhole(0, reader, moment), kOk);
  EXPECT_EQ(moment.readings, readings);
  entries.emplace_back(-1);
  EXPECT_THROW(writer.Add(facts, readings), std::length_error);
}

// Readings that come and go are numbered on and on.
TEST_F(RecordingWork, AChunkThatHasNumberedManyReadingsEnds) {
  RecordingStore store(file_, kUnbounded);
  ksicache::Recorder recorder(store);
  MomentFacts facts;
  std::vector<MomentReading> readings;
  for (int64_t i = 0; i < 3; ++i) {
    readings = Zeros(400'000, 400'000 * i);
    facts.taken = kStart + i * kSecond;
    recorder.Add(Host(), facts, readings);
  }
  EXPECT_EQ(store.Parts().front().chunk, 0);
  EXPECT_EQ(store.Parts().back().chunk, 2);
  const std::unique_ptr<RecordingFile> file = store.Read();
  Moment moment;
  ChunkReader reader;
  ASSERT_EQ(file->ReadWhole(2, reader, moment), kOk);
  EXPECT_EQ(moment.readings, readings);
  EXPECT_EQ(file->ReadWhole(1, reader, moment), kOk);
}

TEST_F(RecordingWork, AChunkHasABoundOfMoments) {
  const auto [start, more] = PartsWithZeros(10);
  AddChunks(1, start);
  AddMoments(1, 2, more);
  const auto expect = [this](const std::string& number, const std::string& why) {
    RunSql(file_, "UPDATE part SET number = " + number + " WHERE number > 0 AND moments = 1");
    const std::string name = file_ + "@2026-11-21T10:00:00Z";
    ExpectFailure({"dump", name}, name + ": damaged: the part of 2026-11-21T10:00:00Z " + why);
  };
  expect("4095", "has not all that it continues");
  expect("4096", "is not understood");
}

TEST_F(RecordingWork, PartsHaveBlocksOfTheirOwn) {
  AddChunks(1, PartsWithZeros(10).first);
  RunSql(file_,
         "WITH RECURSIVE n(x) AS (VALUES(1) UNION ALL SELECT x + 1 FROM n WHERE x < 400) "
         "INSERT INTO part SELECT NULL, 1, x, x, first, last, size, block FROM part, n "
         "WHERE number = 0");
  ExpectFailure({"moments", file_}, file_ + ": damaged: its parts are larger than it");
}

}  // namespace
}  // namespace ksi
