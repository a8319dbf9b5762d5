// Recordings of hosts whose clock was set: every moment is found, and none is mixed with others.
#include <algorithm>
#include <cstdint>
#include <string>
#include <vector>

#include <knvlibs/ksi_status.h>
#include "knvlibs/open_cache.h"
#include "knvlibs/times.h"
#include "tests/ksicache/recording_fixture.h"
#include "tools/ksicache/opened_file.h"

namespace ksi {
namespace {

class RecordingClock : public RecordingTest {
 protected:
  // Moments each 5 s: `count` of them from each of the starts, seconds from kStart, one after the
  // other.
  void RecordFrom(const std::vector<int64_t>& starts, size_t count) {
    moments_ = MakeMoments(1, starts.size() * count);
    for (size_t i = 0; i < moments_.size(); ++i) {
      moments_[i].facts.taken = TimeAt(starts[i / count] + 5 * static_cast<int64_t>(i % count));
    }
    Record(file_, moments_);
  }

  // Ten moments each from kStart and from another second on, as the clock on the wall went, of
  // which the last may be of another boot.
  void RecordSteps(int64_t second, bool isBooted) {
    RecordFrom({0, second}, 10);
    for (size_t i = 0; i < moments_.size(); ++i) {
      const bool isOther = isBooted && i >= 10;
      moments_[i].host.boot = isOther ? "b" : "a";
      moments_[i].facts.uptime = static_cast<int64_t>(isOther ? 5 * i - 30 : 500 + 5 * i) * kSecond;
    }
    Record(file_, moments_);
  }

  // How many moments a span has, and the time of the first one.
  std::string MomentsOf(const std::string& span) const {
    const std::string list = Output({"moments", file_ + "@" + span});
    const size_t at = list.find('\n') + 1;
    return std::to_string(std::ranges::count(list, '\n') - 1) + " " + list.substr(at + 11, 8);
  }

  // A clock ticks somewhere in its second.
  static int64_t TimeAt(int64_t second) { return kStart + second * kSecond + 250'000; }

  // The number of the moment that `when` means, or the status for which there is none.
  int64_t NumberAt(const std::string& when) const {
    OpenedCache opened;
    std::string why;
    const Status status = OpenCache(file_ + "@" + when, &opened, &why);
    return status == kOk ? opened.number : status;
  }
  int64_t NumberAt(int64_t second) const { return NumberAt(TextOfTime(kStart + second * kSecond)); }

  const std::string file_ = Path("r.ksi");
  std::vector<Moment> moments_;
};

// An hour from 10:00 on, then the clock is set back to 10:30, where it stays for some minutes.
TEST_F(RecordingClock, MomentsBeforeItWasSetBackAreFound) {
  RecordFrom({0, 1800}, 720);
  // What was once is found, before and after the step.
  EXPECT_EQ(NumberAt(0), 0);
  EXPECT_EQ(NumberAt(1799), 359);
  // What was twice is the later one, though half of it lies before the step.
  EXPECT_EQ(NumberAt(1800), 720);
  EXPECT_EQ(NumberAt(1804), 720);
  EXPECT_EQ(NumberAt(3599), 1079);
  EXPECT_EQ(NumberAt(5395), 1439);
  EXPECT_EQ(NumberAt(9999), 1439);
  EXPECT_EQ(NumberAt("last"), 1439);
  EXPECT_EQ(NumberAt("first"), 0);
  EXPECT_EQ(NumberAt("-30m"), 1079);
  EXPECT_EQ(NumberAt(-1), KSI_STATUS_NOT_FOUND);
}

TEST_F(RecordingClock, MomentsOfAClockThatWasWrongAreFound) {
  // For four samples it was a day ahead.
  RecordFrom({0, 86400, 20, 40}, 4);
  EXPECT_EQ(NumberAt(15), 3);
  EXPECT_EQ(NumberAt(20), 8);
  EXPECT_EQ(NumberAt(86399), 15);
  EXPECT_EQ(NumberAt(86400), 4);
  EXPECT_EQ(NumberAt(86411), 6);
  EXPECT_EQ(NumberAt(86500), 7);
  EXPECT_EQ(NumberAt("last"), 15);
  EXPECT_EQ(NumberAt("-5s"), 14);
  ExpectFailure({"dump", file_ + "@2026-11-20T10:00Z"},
                file_ +
                    "@2026-11-20T10:00Z: there is no moment so early: moments are of "
                    "2026-11-21T10:00:00Z to 2026-11-22T10:00:15Z");
}

TEST_F(RecordingClock, SoLongBeforeIsByTheClockThatNobodySets) {
  // Put forward by a day, or set back by half an hour.
  for (const int64_t second : {50, 86400, -1800}) {
    SCOPED_TRACE(second);
    RecordSteps(second, false);
    EXPECT_EQ(NumberAt("-0s"), 19);
    EXPECT_EQ(NumberAt("-5s"), 18);
    EXPECT_EQ(NumberAt("-7s"), 17);
    EXPECT_EQ(NumberAt("-45s"), 10);
    EXPECT_EQ(NumberAt("-50s"), 9);
    EXPECT_EQ(NumberAt("-60s"), 7);
    EXPECT_EQ(NumberAt("-95s"), 0);
    EXPECT_EQ(NumberAt("-96s"), KSI_STATUS_NOT_FOUND);
  }
  // A host that was down for some time; by a clock that was behind then for none.
  RecordSteps(145, true);
  EXPECT_EQ(NumberAt("-45s"), 10);
  EXPECT_EQ(NumberAt("-60s"), 9);
  EXPECT_EQ(NumberAt("-145s"), 9);
  EXPECT_EQ(NumberAt("-146s"), 8);
  RecordSteps(-1800, true);
  EXPECT_EQ(NumberAt("-45s"), 10);
  EXPECT_EQ(NumberAt("-46s"), 8);
  EXPECT_EQ(NumberAt("-60s"), 6);
  EXPECT_EQ(NumberAt("-91s"), KSI_STATUS_NOT_FOUND);
}

// A clock that nobody sets does not tick with that on the wall, and none ticks evenly.
TEST_F(RecordingClock, SoLongBeforeIsInWholeSeconds) {
  RecordSteps(86400, false);
  for (size_t i = 0; i < moments_.size(); ++i) {
    const int64_t late = i % 3 == 1 ? 1700 : 0;
    moments_[i].facts.taken += late;
    moments_[i].facts.uptime += 777'777 + late;
  }
  Record(file_, moments_);
  for (int64_t i = 0; i < 20; ++i) {
    EXPECT_EQ(NumberAt("-" + std::to_string(5 * i) + "s"), 19 - i);
  }
}

// A span that begins so long before the last moment has what was recorded since, wherever the clock
// was set, and begins where a moment is that is asked for so.
TEST_F(RecordingClock, SpansThatGoBackAreThoseThatPassed) {
  for (const int64_t second : {50, 86400, -1800}) {
    SCOPED_TRACE(second);
    RecordSteps(second, false);
    EXPECT_EQ(MomentsOf("-45s.."), "10 " + TextOfTime(TimeAt(second)).substr(11, 8));
    EXPECT_EQ(MomentsOf("-47s.."), "10 " + TextOfTime(TimeAt(second)).substr(11, 8));
    EXPECT_EQ(MomentsOf("-50s.."), "11 10:00:45");
    EXPECT_EQ(MomentsOf("-60s..-55s"), "2 10:00:35");
    EXPECT_EQ(MomentsOf("..-90s"), "2 10:00:00");
    EXPECT_EQ(MomentsOf("-1d.."), "20 10:00:00");
    EXPECT_EQ(MomentsOf("-0s.."), "1 " + TextOfTime(TimeAt(second + 45)).substr(11, 8));
    const std::string none = Run({"moments", file_ + "@..-1h"}).err;
    EXPECT_NE(none.find("there is no moment in that time"), std::string::npos) << none;
  }
  // A host that was down for 100 s, or by its clock for none.
  RecordSteps(145, true);
  EXPECT_EQ(MomentsOf("-45s.."), "10 10:02:25");
  EXPECT_EQ(MomentsOf("-144s.."), "10 10:02:25");
  EXPECT_EQ(MomentsOf("-145s.."), "11 10:00:45");
  EXPECT_EQ(MomentsOf("-150s..-60s"), "2 10:00:40");
  RecordSteps(-1800, true);
  EXPECT_EQ(MomentsOf("-46s.."), "11 10:00:45");
}

// What is exported of such a span is what is listed.
TEST_F(RecordingClock, SpansThatGoBackAreExported) {
  Output({"load", TALLY_EXAMPLE_JSON, Path("h.ksi")});
  const Moment moment = ksicache::MomentOf(ksicache::OpenedFile(Path("h.ksi")).File());
  for (const int64_t second : {50, 86400, -1800}) {
    SCOPED_TRACE(second);
    RecordSteps(second, false);
    for (Moment& each : moments_) each.readings = moment.readings;
    Record(file_, moments_);
    const auto rows = [this](const std::string& span) {
      const std::string out = Output({"export", "comp-stats", "-s", "free", file_ + "@" + span});
      return std::ranges::count(out, '\n') - 1;
    };
    EXPECT_EQ(rows("-45s.."), 10);
    EXPECT_EQ(rows("-60s.."), 13);
    EXPECT_EQ(rows("-60s..-55s"), 2);
    EXPECT_EQ(rows(".."), 20);
  }
}

// From 11:06:40 on, and then from 10:00.
TEST_F(RecordingClock, ATimeOfDayThatIsLaterThanTheLastMomentIsFound) {
  RecordFrom({4000, 0}, 10);
  EXPECT_EQ(NumberAt("11:07Z"), 4);
  EXPECT_EQ(NumberAt("10:00:20Z"), 14);
  EXPECT_EQ(NumberAt("12:00Z"), KSI_STATUS_NOT_FOUND);
}

TEST_F(RecordingClock, SpansHaveAllOfTheirTimesInTheOrderOfTheRecording) {
  RecordFrom({0, 10, -100}, 4);
  // Of a host that has rows.
  Output({"load", TALLY_EXAMPLE_JSON, Path("h.ksi")});
  const Moment moment = ksicache::MomentOf(ksicache::OpenedFile(Path("h.ksi")).File());
  for (Moment& each : moments_) each = {Host(), each.facts, moment.readings};
  Record(file_, moments_);
  const auto times = [this](const std::string& span) {
    const std::string out = Output({"export", "comp-stats", file_ + "@" + span});
    std::string found;
    for (size_t at = 0; (at = out.find("\nh,2026-11-21T", at)) != std::string::npos; ++at) {
      found += out.substr(at + 14, 8) + " ";
    }
    return found;
  };
  const std::string all =
      "10:00:00 10:00:05 10:00:10 10:00:15 10:00:10 10:00:15 10:00:20 10:00:25 "
      "09:58:20 09:58:25 09:58:30 09:58:35 ";
  EXPECT_EQ(times(".."), all);
  EXPECT_EQ(times("first..last"), all);
  EXPECT_EQ(times("2026-11-21T10:00:10Z..2026-11-21T10:00:15Z"),
            "10:00:10 10:00:15 10:00:10 10:00:15 ");
  EXPECT_EQ(times("..2026-11-21T10:00:00Z"), "10:00:00 09:58:20 09:58:25 09:58:30 09:58:35 ");
  EXPECT_EQ(times("-5s.."), "09:58:30 09:58:35 ");
  EXPECT_EQ(times("-6s..-1s"), "09:58:30 ");
  EXPECT_EQ(times("last.."), "09:58:35 ");
  EXPECT_EQ(times("..first"), "10:00:00 ");
}

// Clocks go back between parts, never within one.
TEST_F(RecordingClock, APartThatGoesBackIsDamaged) {
  ChunkWriter writer(Host());
  const std::vector<Moment> moments = MakeMoments(1, 3);
  for (const int64_t second : {0, 60, 30}) {
    MomentFacts facts;
    facts.taken = TimeAt(second);
    writer.Add(facts, moments[0].readings);
  }
  MakeEmpty(file_);
  ksicache::RecordingStore(file_, kUnbounded)
      .Add({0, 3, 0, 0, TimeAt(0), TimeAt(30), 0, 0}, writer.PartFrom(0));
  ExpectFailure({"dump", file_ + "@2026-11-21T10:00:20Z"},
                file_ +
                    "@2026-11-21T10:00:20Z: damaged: the part of 2026-11-21T10:00:00Z goes back in "
                    "time");
}

}  // namespace
}  // namespace ksi
