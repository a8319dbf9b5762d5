// Who grows steadily over a recording, and who does not.
#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstring>
#include <iostream>
#include <string>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "tests/ksicache/leak_host.h"
#include "tests/ksicache/recording_fixture.h"

namespace ksi {
namespace {

using nlohmann::json;

class DiffSince : public RecordingTest {
 protected:
  static constexpr size_t kMoments = 150;

  static std::vector<Moment> MomentsOf(LeakHost& host) {
    std::vector<Moment> moments;
    for (size_t i = 0; i < kMoments; ++i) {
      Moment& moment = moments.emplace_back();
      moment.host = Host();
      moment.facts.taken = kStart + static_cast<int64_t>(i) * host.Every() * kSecond;
      moment.readings = host.Next();
    }
    return moments;
  }

  json SteadyOf(const std::vector<Moment>& moments) const {
    Record(Path("r.rec"), moments);
    const std::string out = Output({"diff", "--since", "7d", Path("r.rec"), "--json"});
    const json value = json::parse(out, nullptr, false);
    EXPECT_FALSE(value.is_discarded()) << out;
    return value;
  }

  // So many more than `from`.
  static uint64_t Beyond(size_t i, size_t from) { return i > from ? i - from : 0; }

  // Has a user world have so much mapped, in KB.
  static void Set(MomentReading& reading, uint64_t kilobytes) {
    KSI_UwTally tally = {};
    std::memcpy(&tally, reading.answer.record.data(), sizeof tally);
    tally.mapped = kilobytes;
    std::memcpy(reading.answer.record.data(), &tally, sizeof tally);
  }

  // Adds to what a user world has mapped, in KB.
  static void Grow(MomentReading& reading, uint64_t kilobytes) {
    KSI_UwTally tally = {};
    std::memcpy(&tally, reading.answer.record.data(), sizeof tally);
    tally.mapped += kilobytes;
    std::memcpy(reading.answer.record.data(), &tally, sizeof tally);
  }

  static void Rename(MomentReading& reading, const std::string& name) {
    KSI_GroupName record = {};
    std::memcpy(record.text, name.data(), name.size());
    std::memcpy(reading.answer.record.data(), &record, sizeof record);
  }

  static bool IsAmongFirst(const json& things, const LeakHost& host, size_t first) {
    return std::any_of(
        things.begin(), things.begin() + static_cast<int>(std::min(first, things.size())),
        [&](const json& thing) {
          return thing["what"] == host.GuiltyWhat() && thing["name"] == host.GuiltyName();
        });
  }
};

// Of 50 leaks of all kinds the guilty one is among the first three in 95 of 100.
TEST_F(DiffSince, FindsLeaks) {
  constexpr uint32_t kLeaks = 50;
  uint32_t found = 0;
  for (uint32_t seed = 0; seed < kLeaks; ++seed) {
    LeakHost host(seed, kMoments);
    host.Leak(static_cast<LeakHost::Kind>(seed % LeakHost::kKinds));
    const json steady = SteadyOf(MomentsOf(host));
    const bool isFound = IsAmongFirst(steady["things"], host, 3);
    found += isFound ? 1 : 0;
    if (!isFound) {
      std::cout << "not found: " << host.GuiltyWhat() << " " << host.GuiltyName() << " of seed "
                << seed << "\n";
    }
  }
  std::cout << found << " of " << kLeaks << " leaks found\n";
  EXPECT_GE(found * 100, kLeaks * 95);
}

// Of 50 hosts where all goes up and down, or by steps, or by chance, one at most is told of.
TEST_F(DiffSince, IsQuietWhereNothingLeaks) {
  constexpr uint32_t kHosts = 50;
  uint32_t alarms = 0;
  uint32_t late = 0;
  for (uint32_t seed = 1000; seed < 1000 + kHosts; ++seed) {
    LeakHost host(seed, kMoments);
    const json steady = SteadyOf(MomentsOf(host));
    late += steady["late"].empty() ? 0 : 1;
    if (steady["things"].empty() && steady["groups"].empty()) continue;
    ++alarms;
    std::cout << "seed " << seed << ": " << steady["things"] << steady["groups"] << "\n";
  }
  std::cout << alarms << " alarms of " << kHosts << " quiet hosts\n";
  EXPECT_LE(alarms, 1U);
  std::cout << late << " with some that grew late or in steps\n";
  EXPECT_LE(late, 5U);
}

// The screen, with when what is full.
TEST_F(DiffSince, Screen) {
  LeakHost host(2, kMoments);
  host.Leak(LeakHost::Kind::heap);
  Record(Path("r.rec"), MomentsOf(host));
  const std::string out = Output({"diff", "--since", "7d", Path("r.rec"), "--top", "1"});
  EXPECT_EQ(out, R"(h, 2026-11-21T10:00:00Z to 2026-11-23T09:40:48Z: 1d 23h
150 of 150 moments read; the recording begins there

KB                                          now      growth    an hour   full in
free                                  178999464           -          -
in use                                 89435992           -          -
  kernel                                6698168           -          -
  caches                               10659072           -          -
  others                               72078752           -          -

who grows steadily                          now      growth    an hour   full in
heap heap0                               110844        9836        225     1y 2d
)");
}

// The afternoon's leak begins after some minutes, and has stopped before the end: it will not be
// full at any time.
TEST_F(DiffSince, FindsARamp) {
  const std::string out =
      Output({"diff", "--since", "4h", TALLY_EXAMPLES "/afternoon.rec", "-u", "mb"});
  EXPECT_TRUE(out.ends_with(R"(
who grows steadily                          now      growth    an hour   full in
heap netPktHeap                             465         407        131
    it began at 2026-11-21T13:20:00Z and stopped at 2026-11-21T16:24:00Z
)")) << out;
}

// The clock is set back by an hour, which changes neither who is found nor how fast it grows.
TEST_F(DiffSince, AClockSetBack) {
  LeakHost host(2, kMoments);
  host.Leak(LeakHost::Kind::heap);
  std::vector<Moment> moments = MomentsOf(host);
  for (Moment& moment : moments) moment.facts.uptime = moment.facts.taken - kStart + kSecond;
  const json before = SteadyOf(moments);
  for (size_t i = 100; i < moments.size(); ++i) moments[i].facts.taken -= 3600 * kSecond;
  const json after = SteadyOf(moments);
  EXPECT_EQ(after["moments"], kMoments);
  ASSERT_EQ(after["things"].size(), before["things"].size());
  for (size_t i = 0; i < after["things"].size(); ++i) {
    EXPECT_EQ(after["things"][i]["perHour"], before["things"][i]["perHour"]);
  }
  // All of them lie in the hour that came twice.
  for (size_t i = 0; i < moments.size(); ++i) {
    moments[i].facts.taken = kStart + static_cast<int64_t>(i % 75) * 5 * kSecond;
    moments[i].facts.uptime = static_cast<int64_t>(i + 1) * 5 * kSecond;
  }
  EXPECT_EQ(SteadyOf(moments)["moments"], kMoments);
  EXPECT_TRUE(Output({"diff", Path("r.rec")})
                  .starts_with("h, 2026-11-21T10:00:00Z to 2026-11-21T10:06:10Z: 12m 25s\n"));
  EXPECT_TRUE(
      Output({"diff", Path("r.rec") + "@10:06:10", Path("r.rec")}).find("later one first") ==
      std::string::npos);
}

// Which moment is the later one, the recording knows, whatever its clock says.
TEST_F(DiffSince, TheOrderIsThatOfTheRecording) {
  LeakHost host(2, kMoments);
  std::vector<Moment> moments = MomentsOf(host);
  moments.resize(3);
  moments[2].facts.taken = kStart - 3600 * kSecond;
  moments[2].host.boot = "2";
  Record(Path("r.rec"), moments);
  const std::string first = Path("r.rec") + "@first";
  const std::string last = Path("r.rec") + "@last";
  EXPECT_TRUE(Output({"diff", first, last})
                  .starts_with("h, 2026-11-21T10:00:00Z to 2026-11-21T09:00:00Z, the clock was set "
                               "back\n"));
  EXPECT_TRUE(
      Output({"diff", last, first})
          .starts_with("h, 2026-11-21T09:00:00Z to 2026-11-21T10:00:00Z, the later one first\n"));
  EXPECT_EQ(json::parse(Output({"diff", first, last, "--json"}))["seconds"], nullptr);
  EXPECT_EQ(Run({"diff", first, last, "--fail-above", "9t"}).status, 0);
  ExpectFailure({"diff", last, first, "--fail-above", "9t"},
                "--fail-above takes the earlier moment first");
}

// The rows of one report, by a column of it.
TEST_F(DiffSince, OfAReport) {
  LeakHost host(2, kMoments);
  host.Leak(LeakHost::Kind::heap);
  Record(Path("r.rec"), MomentsOf(host));
  const std::vector<std::string> used = {"diff", "--since",    "7d",   Path("r.rec"),
                                         "-r",   "heap-stats", "--by", "used"};
  EXPECT_EQ(Output(used), R"(h, 2026-11-21T10:00:00Z to 2026-11-23T09:40:48Z: 1d 23h
150 of 150 moments read; the recording begins there
heap-stats, Bytes, by used

who grows steadily                          now      growth    an hour   full in
heap0                                 113504256    10072064     230400
)");
  std::vector<std::string> args = used;
  args.insert(args.end(), {"--json", "-u", "kb", "--fail-above", "9m"});
  const harness::Result result = Run(args);
  EXPECT_EQ(result.status, 3);
  const json steady = json::parse(result.out);
  EXPECT_EQ(steady["report"], "heap-stats");
  EXPECT_EQ(steady["by"], "used");
  EXPECT_EQ(steady["unit"], "KB");
  ASSERT_EQ(steady["things"].size(), 1U);
  EXPECT_EQ(steady["things"][0]["name"], "heap0");
  EXPECT_EQ(steady["things"][0]["growth"], 9836);
  args.back() = "10m";
  EXPECT_EQ(Run(args).status, 0);
  // What is no memory has no unit, and is none that could be too much.
  ExpectFailure({"diff", "--since", "7d", Path("r.rec"), "-r", "lpool-stats", "--by", "nrLPages",
                 "--fail-above", "1"},
                "--fail-above takes memory, and nrLPages is none: --by names another column", 2);
  EXPECT_NE(
      Output({"diff", "--since", "7d", Path("r.rec"), "-r", "lpool-stats", "--by", "nrLPages"})
          .find("moments read; the recording begins there\nlpool-stats, by nrLPages\n\n"
                "nobody grows steadily\n"),
      std::string::npos);
}

// One that begins in the last third, and one that climbs four steps, are told apart from those that
// grow all the time.
TEST_F(DiffSince, WhoGrewLateOrInSteps) {
  LeakHost host(1000, kMoments);
  std::vector<Moment> moments = MomentsOf(host);
  const size_t late = moments.size() * 3 / 4;
  for (size_t i = 0; i < moments.size(); ++i) {
    for (MomentReading& reading : moments[i].readings) {
      const std::string& path = RecordedNodes()[reading.question.node].path;
      if (path != "sched/memClients/tally/uw") continue;
      const OwnKey& key = reading.question.keys[0];
      if (key == OwnKey(int64_t{1003}))
        Set(reading, 500'000 + i % 2 * 400 + Beyond(i, late) * 20'000);
      if (key == OwnKey(int64_t{1004})) Set(reading, 500'000 + i % 2 * 400 + i / 34 * 90'000);
    }
  }
  const json steady = SteadyOf(moments);
  ASSERT_EQ(steady["late"].size(), 2U) << steady;
  EXPECT_EQ(steady["late"][0]["name"], "process3");
  EXPECT_EQ(steady["late"][1]["name"], "process4");
  EXPECT_EQ(steady["late"][1]["steps"], 4);
  EXPECT_EQ(Run({"diff", "--since", "7d", Path("r.rec"), "--fail-above", "1m"}).status, 0);
  EXPECT_TRUE(Output({"diff", "--since", "7d", Path("r.rec")}).ends_with(R"(
nobody grows steadily

who grew late, or in steps                  now      growth    an hour   full in
user world process3                     1240400      709800      62500
    it began at 2026-11-22T21:31:12Z
user world process4                      860400      360200       7683
    it grew in 4 steps, the last one at 2026-11-23T06:09:36Z
)"));
}

// A name may be anything.
TEST_F(DiffSince, ANameOfBlanks) {
  LeakHost host(1000, kMoments);
  std::vector<Moment> moments = MomentsOf(host);
  for (size_t i = 0; i < moments.size(); ++i) {
    for (MomentReading& reading : moments[i].readings) {
      const std::string& path = RecordedNodes()[reading.question.node].path;
      if (reading.question.keys[0] != OwnKey(int64_t{1003})) continue;
      if (path == "sched/memClients/tally/uw") Set(reading, 500'000 + i * 1000);
      if (path == "sched/groups/groupName") Rename(reading, "  ");
    }
  }
  const json steady = SteadyOf(moments);
  ASSERT_EQ(steady["things"].size(), 1U) << steady;
  EXPECT_EQ(steady["things"][0]["name"], "  ");
}

// A process for each few moments, and one that changes its name while it grows.
TEST_F(DiffSince, ProcessesThatAreManyOrRenamed) {
  LeakHost host(2, kMoments);
  std::vector<Moment> moments = MomentsOf(host);
  for (size_t i = 0; i < moments.size(); ++i) {
    for (MomentReading& reading : moments[i].readings) {
      const std::string& path = RecordedNodes()[reading.question.node].path;
      const OwnKey& key = reading.question.keys[0];
      const bool isWorld = path == "sched/memClients/tally/uw";
      if (isWorld && key == OwnKey(int64_t{1003})) Grow(reading, i * 20000);
      if (path == "sched/groups/groupName" && key == OwnKey(int64_t{1003})) {
        Rename(reading, "conns " + std::to_string(i));
      }
      // Each of four leaks while it is its turn.
      for (int64_t turn = 0; turn < 4; ++turn) {
        if (key != OwnKey(1004 + turn)) continue;
        const size_t begin = static_cast<size_t>(turn) * moments.size() / 4;
        if (isWorld && i > begin) Grow(reading, std::min(i - begin, moments.size() / 4) * 20000);
        if (path == "sched/groups/groupName") Rename(reading, "worker");
      }
    }
  }
  const json steady = SteadyOf(moments);
  ASSERT_EQ(steady["things"].size(), 2U) << steady;
  EXPECT_EQ(steady["things"][0]["name"], "worker");
  EXPECT_FALSE(steady["things"][0].contains("group"));
  EXPECT_EQ(steady["things"][1]["name"], "conns 149");
}

// A heap that cannot be read at the last moment has grown nevertheless, and is told.
TEST_F(DiffSince, WithoutTheLastFigure) {
  LeakHost host(2, kMoments);
  host.Leak(LeakHost::Kind::heap);
  std::vector<Moment> moments = MomentsOf(host);
  for (MomentReading& reading : moments.back().readings) {
    const std::string& path = RecordedNodes()[reading.question.node].path;
    if (path != "system/heaps/stats" || reading.question.keys[0] != OwnKey("heap0")) continue;
    reading.answer = {};
    reading.answer.status = 0xbad0002;
  }
  Record(Path("r.rec"), moments);
  const harness::Result result =
      Run({"diff", "--since", "7d", Path("r.rec"), "--json", "--fail-above", "5m"});
  EXPECT_EQ(result.status, 3);
  EXPECT_EQ(json::parse(result.out)["things"][0]["name"], "heap0");
  EXPECT_EQ(Run({"diff", "--since", "7d", Path("r.rec"), "--fail-above", "5g"}).status, 1);
}

// What was before the host was started anew is left out, and names are matched across it.
TEST_F(DiffSince, AfterAReboot) {
  LeakHost host(2, kMoments);
  std::vector<Moment> moments = MomentsOf(host);
  for (size_t i = 0; i < moments.size(); ++i) moments[i].host.boot = i < 100 ? "1" : "2";
  const json steady = SteadyOf(moments);
  EXPECT_EQ(steady["sinceBoot"], true);
  EXPECT_EQ(steady["moments"], 50);
  const json diff = json::parse(Output({"diff", Path("r.rec"), "-r", "uw-stats", "--json"}));
  EXPECT_EQ(diff["rebooted"], true);
  EXPECT_EQ(diff["changed"], 8);
  for (const json& row : diff["rows"]) EXPECT_EQ(row["state"], "changed") << row;
  EXPECT_TRUE(
      Output({"diff", Path("r.rec")})
          .find("Another boot or host: groups and processes are matched by their names.\n") !=
      std::string::npos);
}

}  // namespace
}  // namespace ksi
