// What `ksicache join` makes of recordings of clocks that were set, and of damaged ones.
#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/times.h"
#include "tests/ksicache/recording_fixture.h"

namespace ksi {
namespace {

class RecordingJoin : public RecordingTest {
 protected:
  // A moment so many seconds after kStart by the clock on the wall, and after the boot of that
  // name; none if it is empty.
  static Moment At(int64_t taken, const std::string& boot, int64_t uptime) {
    Moment moment = MakeMoments(1, 1).front();
    moment.host.boot = boot;
    moment.facts.taken = kStart + taken * kSecond;
    moment.facts.uptime = uptime * kSecond;
    return moment;
  }

  // An hour from 10:00 on, then the clock is set back to 10:30 for another one; a moment a minute.
  static std::vector<Moment> SetBack(const std::string& boot) {
    std::vector<Moment> moments;
    for (int64_t minute = 0; minute < 120; ++minute) {
      const int64_t wall = minute < 60 ? minute : minute - 30;
      moments.push_back(At(60 * wall, boot, boot.empty() ? 0 : 60 * (minute + 1)));
    }
    return moments;
  }

  static std::vector<Moment> From(const std::vector<Moment>& moments, size_t first, size_t end) {
    return {moments.begin() + static_cast<ptrdiff_t>(first),
            moments.begin() + static_cast<ptrdiff_t>(end)};
  }

  void ExpectJoined(const std::vector<std::string>& names, const std::vector<Moment>& moments) {
    std::vector<std::string> words = {"join", "--force", Path("out.rec")};
    words.insert(words.end(), names.begin(), names.end());
    Output(words);
    const std::unique_ptr<RecordingFile> file = OpenFile(Path("out.rec"));
    ASSERT_EQ(file->Parts().back().End(), static_cast<int64_t>(moments.size()));
    ExpectMoments(*file, moments);
  }

  const std::string a_ = Path("a.rec");
  const std::string b_ = Path("b.rec");
};

TEST_F(RecordingJoin, AClockThatWasSetBackMixesNothing) {
  for (const std::string boot : {"x", ""}) {
    SCOPED_TRACE(boot);
    const std::vector<Moment> all = SetBack(boot);
    Record(a_, all);
    ExpectJoined({a_}, all);
    // Copies of a recording, taken meanwhile and later.
    Record(b_, From(all, 0, 80));
    ExpectJoined({a_, b_}, all);
    ExpectJoined({b_, a_}, all);
  }
  // Parts of it, which have some in common.
  const std::vector<Moment> all = SetBack("x");
  Record(a_, From(all, 0, 70));
  Record(b_, From(all, 50, 120));
  ExpectJoined({b_, a_}, all);
}

TEST_F(RecordingJoin, BootsStayApart) {
  // The clock was wrong after the second boot, until it was right.
  std::vector<Moment> all;
  for (int64_t i = 0; i < 50; ++i) all.push_back(At(5 * i, "x", 100 + 5 * i));
  for (int64_t i = 0; i < 50; ++i) all.push_back(At(5 * i - 100, "y", 10 + 5 * i));
  for (int64_t i = 50; i < 80; ++i) all.push_back(At(5 * i + 300, "y", 10 + 5 * i));
  Record(a_, all);
  Record(b_, From(all, 20, 70));
  ExpectJoined({a_, b_}, all);
  Record(a_, From(all, 0, 45));
  Record(b_, From(all, 40, 130));
  ExpectJoined({b_, a_}, all);
}

TEST_F(RecordingJoin, OfADamagedRecordingIsWhatCanBeRead) {
  const std::vector<Moment> moments = MakeMoments(1, 500);
  Record(a_, moments);
  // The second part of the first chunk.
  const std::vector<RecordingFile::Part> parts = OpenFile(a_)->Parts();
  ASSERT_EQ(parts[6].chunk, 240);
  RunSql(a_, "UPDATE block SET data = zeroblob(4572) WHERE id = " + std::to_string(parts[1].block));
  const harness::Result result = Run({"join", b_, a_});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + a_ +
                            "@2026-11-21T10:03:20Z: damaged: the part of 2026-11-21T10:03:20Z has "
                            "not all its blocks: 200 moments left out\n");
  const std::unique_ptr<RecordingFile> file = OpenFile(b_);
  ASSERT_EQ(file->Parts().back().End(), 300);
  ExpectMoments(*file, From(moments, 0, 40));
  ExpectMoments(*file, From(moments, 240, 500), 40);
  // Nothing at all of it makes none.
  RunSql(a_, "UPDATE block SET data = zeroblob(4572)");
  EXPECT_EQ(Run({"join", "--force", b_, a_}).status, 1);
  EXPECT_EQ(OpenFile(b_)->Parts().back().End(), 300);
}

// What a part holds of its last moment alone.
TEST_F(RecordingJoin, AMomentThatCannotBeReadIsNamed) {
  const std::vector<Moment> moments = MakeMoments(1, 20);
  Record(a_, moments);
  const RecordingFile::Part last = OpenFile(a_)->Parts().back();
  ASSERT_EQ(last.moments, 1);
  RunSql(a_, "UPDATE block SET data = zeroblob(4572) WHERE id = " + std::to_string(last.block));
  const harness::Result result = Run({"join", b_, a_});
  EXPECT_EQ(result.status, 1);
  const std::string time = TextOfTime(last.first);
  EXPECT_EQ(result.err, "ksicache: " + a_ + "@" + time + ": damaged: the part of " + time +
                            " is damaged: 1 moment left out\n");
  ExpectMoments(*OpenFile(b_), From(moments, 0, 19));
}

// A recording has no room that it does not need; one that is gone on with grows.
TEST_F(RecordingJoin, WhatIsMadeIsSmall) {
  const std::vector<Moment> moments = MakeMoments(1, 100);
  Record(a_, moments);
  Output({"join", b_, a_});
  RecordingFile::Room room;
  ASSERT_EQ(OpenFile(b_)->ReadRoom(room), kOk);
  EXPECT_EQ(room.replaced, 0u);
  EXPECT_EQ(room.free, 0u);
  {
    ksicache::RecordingStore store(b_, kUnbounded);
    ksicache::Recorder recorder(store);
    for (Moment moment : moments) {
      moment.facts.taken += 3600 * kSecond;
      recorder.Add(moment.host, moment.facts, moment.readings);
    }
  }
  EXPECT_EQ(OpenFile(b_)->Parts().back().End(), 200);
}

}  // namespace
}  // namespace ksi
