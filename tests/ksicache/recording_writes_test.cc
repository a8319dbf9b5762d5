// What of a recording can be found after each single write to it: by whoever comes after a recorder
// that was killed, who copies the file meanwhile, or who finds it after a loss of power.
//
// A run looks after some of the writes. FULL_SWEEP=1 in the environment looks after all.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/recording/recording_file.h"
#include "tests/knvlibs/cache_fixture.h"
#include "tests/ksicache/write_log.h"
#include "tools/ksicache/recording_store.h"

namespace ksi {
namespace {

using ksicache::RecordingStore;
using Part = RecordingFile::Part;

constexpr int64_t kUnbounded = int64_t{1} << 40;

// So many that the oldest ones have to leave the smallest file.
constexpr int64_t kMoments = 1200;

bool IsFullSweep() { return std::getenv("FULL_SWEEP") != nullptr; }

// The moments from `first` on, before `end`.
struct Range {
  int64_t first = 0;
  int64_t end = 0;
};

Range Common(const Range& a, const Range& b) {
  return {std::max(a.first, b.first), std::min(a.end, b.end)};
}

// Writes a recording as a recorder does, with parts of any bytes, and remembers what it wrote and
// when.
class Writer {
 public:
  Writer(const std::string& fileName, int64_t maxSize)
      : store_(fileName, maxSize), before_(FileContent(fileName)) {
    Mark();
  }

  void AddSingle(size_t size) {
    if (next_ - chunk_ == kChunk) chunk_ = next_;
    const Bytes content = MakeContent(size);
    contents_[{next_, 1}] = content;
    store_.Add(PartOf(next_, 1), content);
    ++next_;
    Mark();
  }

  // Packs the moments that have not been packed.
  void Replace(size_t size) {
    const int64_t count = next_ - packed_;
    const Bytes content = MakeContent(size);
    contents_[{packed_, count}] = content;
    store_.Replace(PartOf(packed_, count), content);
    packed_ = next_;
    Mark();
    synced_.back() = Now();
  }

  void Sync() {
    store_.Sync();
    Mark();
    synced_.back() = Now();
  }

  // Adds moments until there are so many, packed now and then; a moment takes up to `size` bytes,
  // and what is packed up to `packedSize`.
  void Fill(int64_t count, size_t size, size_t packedSize) {
    while (next_ < count) {
      AddSingle(1 + random_() % size);
      if (next_ % 3 == 0) Sync();
      if (next_ - packed_ == kPacked) Replace(1 + random_() % packedSize);
    }
  }

  RecordingStore& Store() { return store_; }
  const std::vector<WriteLog::Write>& Writes() const { return log_.All(); }
  const std::string& Before() const { return before_; }

  // The moments that were there before and after a write, whatever it was part of.
  Range ThereAt(size_t writes) const {
    const size_t next = StepAfter(writes);
    return next == marks_.size() ? ranges_.back() : Common(ranges_[next - 1], ranges_[next]);
  }

  // Those that were there after one write and until after another.
  Range ThereBetween(size_t from, size_t to) const { return Common(ThereAt(from), ThereAt(to)); }

  // Those that had been brought to the disk at a write, and that were not taken away since.
  Range SyncedAt(size_t writes) const {
    const Range there = ThereAt(writes);
    return {there.first, std::min(there.end, synced_[StepAfter(writes) - 1].end)};
  }

  // After so many writes what a copy that began at `from` may have seen can be written over.
  size_t LongestCopyFrom(size_t from) const {
    return marks_[std::min(StepAfter(from) + static_cast<size_t>(kPacked), marks_.size()) - 1];
  }

  // The counts of writes before each step in which moments were taken away.
  std::vector<size_t> BeforeRemovals() const {
    std::vector<size_t> before;
    for (size_t step = 1; step < marks_.size(); ++step) {
      if (ranges_[step].first != ranges_[step - 1].first) before.push_back(marks_[step - 1]);
    }
    return before;
  }

  // Null: no part of such moments was ever written.
  const Bytes* ContentOf(const Part& part) const {
    const auto found = contents_.find({part.number, part.moments});
    return found == contents_.end() ? nullptr : &found->second;
  }

 private:
  static constexpr int64_t kPacked = 10;
  static constexpr int64_t kChunk = 40;

  Bytes MakeContent(size_t size) {
    Bytes content(size);
    for (size_t at = 0; at + sizeof(uint64_t) <= size; at += sizeof(uint64_t)) {
      const uint64_t number = random_();
      std::memcpy(content.data() + at, &number, sizeof number);
    }
    return content;
  }

  Part PartOf(int64_t number, int64_t moments) const {
    return {0, moments, number, chunk_, number * 1000, (number + moments) * 1000 - 1, 0, 0};
  }

  Range Now() const {
    const std::vector<Part>& parts = store_.Parts();
    return parts.empty() ? Range() : Range{parts.front().number, parts.back().End()};
  }

  void Mark() {
    marks_.push_back(log_.Count());
    ranges_.push_back(Now());
    synced_.push_back(synced_.empty() ? Range() : synced_.back());
  }

  // The first step that was not over when there were so many writes; the one after the last.
  size_t StepAfter(size_t writes) const {
    return static_cast<size_t>(std::ranges::upper_bound(marks_, writes) - marks_.begin());
  }

  RecordingStore store_;
  std::string before_;
  WriteLog log_;
  std::mt19937_64 random_{1};
  std::map<std::pair<int64_t, int64_t>, Bytes> contents_;
  // Of each step the count of writes after it, and the moments there are and that are synced.
  std::vector<size_t> marks_;
  std::vector<Range> ranges_;
  std::vector<Range> synced_;
  int64_t next_ = 0;
  int64_t packed_ = 0;
  int64_t chunk_ = 0;
};

std::unique_ptr<RecordingFile> OpenFile(const std::string& name) {
  auto database = std::make_unique<CacheDatabase>();
  std::unique_ptr<RecordingFile> file;
  std::string why;
  EXPECT_EQ(database->Open(name.c_str()), kOk) << database->Why();
  EXPECT_EQ(RecordingFile::Make(std::move(database), &file, &why), kOk) << why;
  return file;
}

class RecordingWrites : public testing::Test {
 protected:
  void SetUp() override {
    const Bytes empty = RecordingStore::Empty("host");
    WriteContent(file_, {reinterpret_cast<const char*>(empty.data()), empty.size()});
  }

  // Expects all these moments, and each part that has some of them to be as it was written.
  static void ExpectMoments(const Writer& writer, const std::string& name, const Range& wanted) {
    const std::unique_ptr<RecordingFile> file = OpenFile(name);
    ASSERT_NE(file, nullptr);
    int64_t at = wanted.first;
    for (const Part& part : file->Parts()) {
      if (part.End() <= at || part.number >= wanted.end) continue;
      ASSERT_EQ(part.number, std::min(at, part.number)) << "no moment " << at;
      ASSERT_NO_FATAL_FAILURE(ExpectContent(writer, *file, part));
      at = part.End();
    }
    ASSERT_GE(at, wanted.end) << "no moment " << at;
  }

  // And no other part to be anything else.
  static void ExpectAllGood(const Writer& writer, const std::string& name) {
    const std::unique_ptr<RecordingFile> file = OpenFile(name);
    ASSERT_NE(file, nullptr);
    for (const Part& part : file->Parts()) {
      ASSERT_NO_FATAL_FAILURE(ExpectContent(writer, *file, part));
    }
  }

  static void ExpectContent(const Writer& writer, RecordingFile& file, const Part& part) {
    Bytes content;
    ASSERT_EQ(file.ReadPart(part, content), kOk) << part.number << ": " << file.Why();
    const Bytes* written = writer.ContentOf(part);
    ASSERT_NE(written, nullptr) << part.number;
    ASSERT_TRUE(content == *written) << part.number << " of " << part.moments;
  }

  // Looks at the file after those of the writes that `isWanted` takes.
  template <class IsWanted>
  void ExpectWholeAfterWrites(const Writer& writer, IsWanted&& isWanted) const {
    const Image image(writer.Before());
    for (size_t i = 0; i < writer.Writes().size(); ++i) {
      image.Apply(writer.Writes()[i]);
      if (!isWanted(i)) continue;
      SCOPED_TRACE("after write " + std::to_string(i));
      ASSERT_NO_FATAL_FAILURE(ExpectMoments(writer, image.Name(), writer.ThereAt(i + 1)));
      ASSERT_NO_FATAL_FAILURE(ExpectAllGood(writer, image.Name()));
    }
  }

  // Looks at copies of the file that were made while it was written: each page of a copy is of
  // another time, and none older than the one before it.
  static void ExpectCopiesWhole(const Writer& writer) {
    std::mt19937_64 random(2);
    constexpr size_t kPage = 4096;
    const std::vector<WriteLog::Write>& writes = writer.Writes();
    std::vector<size_t> begins(IsFullSweep() ? 2000 : 100);
    for (size_t& begin : begins) begin = random() % writes.size();
    // Where what is copied first is taken away, and may be written over before its end is copied.
    const std::vector<size_t> removals = writer.BeforeRemovals();
    ASSERT_GT(removals.size(), 3u);
    begins.insert(begins.end(), removals.begin(), removals.end());
    std::ranges::sort(begins);
    std::string before = writer.Before();
    size_t applied = 0;
    for (const size_t from : begins) {
      for (; applied < from; ++applied) Apply(writes[applied], before);
      std::string source = before;
      const size_t end = from + 1 + random() % (writer.LongestCopyFrom(from) - from);
      SCOPED_TRACE(std::to_string(from) + " to " + std::to_string(end));
      std::string copy;
      size_t at = from;
      while (copy.size() < source.size()) {
        // Now and then it waits.
        const size_t until = random() % 20 == 0 ? at + random() % (end - from) : at;
        for (; at < std::min(until, end); ++at) Apply(writes[at], source);
        copy.append(source, copy.size(), kPage);
      }
      const Image image(copy);
      ASSERT_NO_FATAL_FAILURE(ExpectMoments(writer, image.Name(), writer.ThereBetween(from, at)));
      ASSERT_NO_FATAL_FAILURE(ExpectAllGood(writer, image.Name()));
    }
  }

  TestDirectory directory_;
  std::string file_ = directory_.Path("r.ksi");
};

TEST_F(RecordingWrites, AfterEachTheFileIsWhole) {
  Writer writer(file_, RecordingStore::kSmallestFile);
  writer.Fill(kMoments, 10000, 80000);
  EXPECT_GT(writer.Store().Parts().front().number, 0);  // some had to leave
  const size_t stride = IsFullSweep() ? 1 : 41;
  ExpectWholeAfterWrites(writer, [stride](size_t i) { return i % stride == 0; });
}

// The pages that lead to others are what a table's growth changes.
TEST_F(RecordingWrites, AfterEachGrowthTheFileIsWhole) {
  Writer writer(file_, kUnbounded);
  writer.Fill(100, 1'000'000, 8'000'000);
  // All that a table's end takes is another one on the same page.
  off_t last = 0;
  ExpectWholeAfterWrites(writer, [&writer, &last](size_t i) {
    const WriteLog::Write& write = writer.Writes()[i];
    constexpr char kInner = 5;
    if (write.bytes.size() != 4096 || write.bytes[0] != kInner) return false;
    return IsFullSweep() || write.offset != std::exchange(last, write.offset);
  });
}

TEST_F(RecordingWrites, CopiesMeanwhileAreWhole) {
  Writer writer(file_, RecordingStore::kSmallestFile);
  writer.Fill(kMoments, 10000, 80000);
  ExpectCopiesWhole(writer);
}

// What is packed tells nothing of how soon freed blocks are written again.
TEST_F(RecordingWrites, CopiesOfMomentsThatPackWellAreWhole) {
  Writer writer(file_, RecordingStore::kSmallestFile);
  writer.Fill(2 * kMoments, 30000, 40000);
  ExpectCopiesWhole(writer);
}

// What was written since the last sync is on the disk or not, page by page.
TEST_F(RecordingWrites, ALossOfPowerTakesWhatWasNotSynced) {
  Writer writer(file_, RecordingStore::kSmallestFile);
  writer.Fill(kMoments, 10000, 80000);
  std::mt19937_64 random(3);
  std::string synced = writer.Before();
  std::vector<WriteLog::Write> since;
  const uint64_t stride = IsFullSweep() ? 1 : 40;
  for (size_t i = 0; i < writer.Writes().size(); ++i) {
    const WriteLog::Write& write = writer.Writes()[i];
    if (write.IsSync()) {
      for (const WriteLog::Write& each : since) Apply(each, synced);
      since.clear();
      continue;
    }
    since.push_back(write);
    if (random() % stride != 0) continue;
    SCOPED_TRACE("after write " + std::to_string(i));
    std::string content = synced;
    for (const WriteLog::Write& each : since) {
      if (random() % 2 == 0) Apply(each, content);
    }
    const Image image(content);
    ASSERT_NO_FATAL_FAILURE(ExpectMoments(writer, image.Name(), writer.SyncedAt(i + 1)));
  }
}

}  // namespace
}  // namespace ksi
