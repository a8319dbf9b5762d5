// Who grows steadily over a recording, and who does not.
#include <nlohmann/json.hpp>

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

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
  for (uint32_t seed = 1000; seed < 1000 + kHosts; ++seed) {
    LeakHost host(seed, kMoments);
    const json steady = SteadyOf(MomentsOf(host));
    if (steady["things"].empty() && steady["groups"].empty()) continue;
    ++alarms;
    std::cout << "seed " << seed << ": " << steady["things"] << steady["groups"] << "\n";
  }
  std::cout << alarms << " alarms of " << kHosts << " quiet hosts\n";
  EXPECT_LE(alarms, 1U);
}

// The screen, with when what is full.
TEST_F(DiffSince, Screen) {
  LeakHost host(2, kMoments);
  host.Leak(LeakHost::Kind::heap);
  Record(Path("r.rec"), MomentsOf(host));
  const std::string out = Output({"diff", "--since", "7d", Path("r.rec"), "--top", "1"});
  EXPECT_EQ(out, R"(h, 2026-11-21T10:00:00Z to 2026-11-23T09:40:48Z: 1d 23h
150 of 150 moments read

KB                                          now      growth    an hour   full in
free                                  178999464           -          -
in use                                 89435992           -          -
  kernel                                6698168           -          -
  caches                               10659072           -          -
  others                               72078752           -          -

who grows steadily                          now      growth    an hour   full in
heap heap0                               110844        9836        225  367d 20h
)");
}

// The afternoon's leak begins after some minutes, and the heap is full before the end.
TEST_F(DiffSince, FindsARamp) {
  const std::string out =
      Output({"diff", "--since", "4h", TALLY_EXAMPLES "/afternoon.rec", "-u", "mb"});
  EXPECT_NE(
      out.find(
          "\nheap netPktHeap                             465         407        131    21m 4s\n"),
      std::string::npos)
      << out;
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
