// The double finds misuse of the library, and the harness tells of it.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/harness/tally.h"

namespace harness {
namespace {

using Problems = std::vector<std::string>;

TallyRun Misuse(const std::string& how) {
  Scenario scenario;
  scenario.Time(86400)
      .Value("sched_groups_groupFlags", {4}, uint32_t{4})
      .List("system_heaps", {},
            {"a name that is longer than most", 0x100000007, Item::Unreadable(77)});
  Program program;
  program.path = TALLY_MISUSE_PROGRAM;
  return TryTally(scenario, {how}, program);
}

TEST(Double, HasNothingAgainstGoodUse) {
  const TallyRun run = Misuse("none");
  EXPECT_EQ(run.problems, Problems{});
  EXPECT_EQ(run.Calls(), "Create(1,1) Destroy()");
}

TEST(Double, FindsLeakedLists) {
  EXPECT_EQ(Misuse("leak").problems, Problems{"leaked list: Create(1,1) [7]"});
  EXPECT_EQ(Misuse("leak-instances").problems, Problems{"leaked list: system_heaps,[]"});
}

TEST(Double, FindsUseOfDestroyedLists) {
  EXPECT_EQ(Misuse("twice").problems, Problems{"Destroy of a destroyed list: Create(1,1)"});
  EXPECT_EQ(Misuse("use-after-destroy").problems,
            Problems{"UsedCount of a destroyed list: GetInstanceListAlloc(system_heaps)"});
}

TEST(Double, OverwritesTheTextsOfDestroyedLists) {
  EXPECT_EQ(Misuse("text-after-destroy").out,
            "a name that is longer than most\n" + std::string(31, '\xdb') + "\n");
}

TEST(Double, FindsWrongArguments) {
  EXPECT_EQ(Misuse("version").problems[0], "Create(2,1): the version is not 1");
  EXPECT_EQ(Misuse("full").problems, Problems{"AddInt(8) to a full list: Create(1,1)"});
  EXPECT_EQ(Misuse("size").problems,
            Problems{"Get(sched_groups_groupFlags,[4]): a buffer of 8 bytes for a value of 4"});
  EXPECT_EQ(Misuse("node").problems, Problems{"Get of no node: 0"});
  EXPECT_EQ(Misuse("append").problems[0], "AddInt(1) to an instance list");
}

TEST(Double, FindsReadsThatTheScenarioDoesNotAnswer) {
  EXPECT_EQ(Misuse("unanswered").problems,
            Problems{"the scenario has no answer: sched_globalStats_numVMs,[]"});
}

TEST(Double, GivesEntriesByKind) {
  EXPECT_EQ(Misuse("kinds").out,
            "3 0xbad0084 0xbad0084 0x4d 0xbad0003 untouched -5 7 4294967303\n");
}

TEST(Double, FillsNoListBeyondItsRoom) { EXPECT_EQ(Misuse("room").out, "0xbad00b4\n"); }

TEST(Double, SetsTheClock) { EXPECT_EQ(Misuse("time").out, "86400\n"); }

TEST(Harness, FindsProcessesThatEndInDisorder) {
  const TallyRun run = Misuse("abort");
  ASSERT_EQ(run.problems.size(), 1U);
  EXPECT_TRUE(run.problems[0].starts_with("ended in disorder with status ")) << run.problems[0];
}

TEST(Harness, FindsDiagnosticsThatDidNotGoThroughWarning) {
  const TallyRun run = Misuse("stderr");
  EXPECT_EQ(run.err, "not a Warning\n");
  EXPECT_EQ(run.warnings, "");
}

}  // namespace
}  // namespace harness
