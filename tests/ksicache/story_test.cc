// The recordings of the example host: what they tell agrees with itself at each moment.
#include <cstdint>
#include <string>
#include <vector>

#include <nlohmann/json.hpp>
#include "tests/ksicache/export_fixture.h"

namespace ksi {
namespace {

using Json = nlohmann::json;

class StoryTest : public ExportTest, public testing::WithParamInterface<std::string> {
 protected:
  static inline const std::vector<std::string> kStates = {"High", "Clear", "Soft", "Hard", "Low"};

  // The rows of a report on all moments.
  std::vector<Json> Rows(const std::string& report) const {
    std::vector<Json> rows;
    for (const std::string& line :
         Lines(Output({"export", report, "--format=json", file_ + "@.."}))) {
      rows.push_back(Json::parse(line));
    }
    return rows;
  }

  static int64_t Sum(const Json& row, const std::vector<std::string>& names) {
    int64_t sum = 0;
    for (const std::string& name : names) sum += row[name].get<int64_t>();
    return sum;
  }

  const std::string file_ = TALLY_EXAMPLES "/" + GetParam() + ".rec";
};

// By how much of the least there should be is free.
size_t StateOf(int64_t free, int64_t least) {
  if (free >= least) return 0;
  if (free * 100 >= least * 64) return 1;
  if (free * 100 >= least * 32) return 2;
  return free * 100 >= least * 16 ? 3 : 4;
}

TEST_P(StoryTest, MemoryAddsUpAndItsStateFollowsFromIt) {
  const std::vector<Json> rows = Rows("comp-stats");
  ASSERT_GE(rows.size(), 5u);
  const std::vector<std::string> parts = {"free", "otherConsumed", "dataAndHeap"};
  size_t state = 0;
  std::vector<int64_t> times;
  for (const Json& row : rows) {
    SCOPED_TRACE(row["time"].get<std::string>());
    EXPECT_EQ(Sum(row, parts), Sum(rows[0], parts));
    const size_t wanted = StateOf(row["free"], row["minFree"]);
    EXPECT_EQ(row["memState"], kStates[wanted]);
    const std::vector<int64_t> before = times;
    times.clear();
    for (const char* name : {"numHigh", "numClear", "numSoft", "numHard", "numLow"}) {
      times.push_back(row[name]);
    }
    // It goes through all that lie between, and then it is there.
    if (before.empty()) continue;
    for (size_t each = 0; each < kStates.size(); ++each) {
      const bool isEntered =
          each != state && ((state < each && each <= wanted) || (wanted <= each && each < state));
      EXPECT_EQ(times[each] - before[each], isEntered ? 1 : 0) << kStates[each];
    }
    state = wanted;
  }
}

TEST_P(StoryTest, GroupsHaveWhatIsInThem) {
  int64_t last = 0;
  std::string time;
  for (const Json& row : Rows("group-stats")) {
    if (row["time"] != time) last = 0;
    time = row["time"];
    if (row["name"] == "host") last = row["consumed"].get<int64_t>();
    // What host has beside these does not change.
    for (const char* name : {"services", "machines"}) {
      if (row["name"] == name) last -= row["consumed"].get<int64_t>();
    }
    if (row["name"] != "gateway") continue;
    EXPECT_EQ(last, 130342820 - 1223884 - 115640228) << time;
  }
  EXPECT_NE(time, "");
}

INSTANTIATE_TEST_SUITE_P(Examples, StoryTest, testing::Values("incident", "afternoon"),
                         [](const auto& name) { return name.param; });

TEST_F(ExportTest, TheAfternoonHasAnIncidentWorthFinding) {
  const std::string file = TALLY_EXAMPLES "/afternoon.rec";
  const auto at = [&file](const std::string& time, const std::string& report,
                          const std::string& name, const std::string& column) {
    for (const std::string& line :
         Lines(Output({"export", report, "--format=json", file + "@" + time}))) {
      const Json row = Json::parse(line);
      if (name.empty() || row["name"] == name) return row[column];
    }
    return Json();
  };
  // A heap that leaks.
  EXPECT_EQ(at("13:00Z", "heap-stats", "netPktHeap", "pctFreeOfMax"), 88);
  EXPECT_EQ(at("17:00Z", "heap-stats", "netPktHeap", "pctFreeOfMax"), 8);
  // Sharing that is lost.
  EXPECT_GT(at("14:00Z", "vm-stats", "web-03", "sharedSaved"), 2'000'000);
  EXPECT_EQ(at("14:02Z", "vm-stats", "web-03", "sharedSaved"), 0);
  // A machine that balloons another one out.
  EXPECT_EQ(at("14:58Z", "vm-stats", "mail", "ballooned"), 2264924);
  EXPECT_GT(at("15:10Z", "vm-stats", "mail", "ballooned"), 5'000'000);
  EXPECT_EQ(at("15:00Z", "comp-stats", "", "memState"), "Soft");
}

}  // namespace
}  // namespace ksi
