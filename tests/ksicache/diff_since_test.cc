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

}  // namespace
}  // namespace ksi
