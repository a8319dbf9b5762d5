// The walk over the groups, and the options of the reports that walk.
#include <gtest/gtest.h>

#include <initializer_list>
#include <string>

#include "tests/harness/hosts.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr uint32_t kBad = 0xbad0014;
constexpr char kGroupFlags[] = "sched_groups_groupFlags";
constexpr char kChildren[] = "sched_groups_members_groups";

// Group 0 with 1, 2 and 3 below it; 11 and 12 below 1, 31 below 3.
Scenario Tree() {
  Scenario tree;
  AddGroup(tree, 0, {.children = {1, 2, 3}});
  AddGroup(tree, 1, {.children = {11, 12}});
  AddGroup(tree, 2, {});
  AddGroup(tree, 3, {.children = {31}});
  for (const int id : {11, 12, 31}) AddGroup(tree, id, {});
  return tree;
}

// Group 0, which has one child, and so on: `count` groups, each id one more than its parent's.
Scenario Chain(int count) {
  Scenario chain;
  for (int id = 0; id < count; ++id) {
    AddGroup(chain, id, {.children = id + 1 < count ? Items{id + 1} : Items{}});
  }
  return chain;
}

// The rows of group-stats as "0 1 11": the ids in the order of the walk.
std::string Visited(const TallyRun& run) {
  std::string ids = run.out.substr(run.out.find('\n') + 1);
  for (char& c : ids) {
    if (c == '\n') c = ' ';
  }
  if (!ids.empty()) ids.pop_back();
  return ids;
}

TallyRun Walk(const Scenario& scenario, const Args& args = {}) {
  Args all = {"-r", "group-stats", "-q", "-s", "gid"};
  all.insert(all.end(), args.begin(), args.end());
  return RunTally(scenario, all);
}

TEST(GroupWalk, VisitsAGroupBeforeItsChildrenInTheKernelsOrder) {
  const TallyRun run = Walk(Tree());
  EXPECT_EQ(Visited(run), "0 1 11 12 2 3 31");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(Visited(Walk(Tree().List(kChildren, {0}, {3, 1, 2}))), "0 3 31 1 11 12 2");
}

TEST(GroupWalk, StartsAtTheGivenGroup) {
  EXPECT_EQ(Visited(Walk(Tree(), {"-g", "1"})), "1 11 12");
  EXPECT_EQ(Visited(Walk(Tree(), {"--gid", "3"})), "3 31");
  EXPECT_EQ(Visited(Walk(Tree(), {"--gid=2"})), "2");
}

TEST(GroupWalk, GoesDownTheGivenLevels) {
  EXPECT_EQ(Visited(Walk(Tree(), {"-l", "1"})), "0");
  EXPECT_EQ(Visited(Walk(Tree(), {"--level", "2"})), "0 1 2 3");
  EXPECT_EQ(Visited(Walk(Tree(), {"-l3"})), "0 1 11 12 2 3 31");
  EXPECT_EQ(Visited(Walk(Tree(), {"-g", "3", "-l", "1"})), "3");
}

TEST(GroupWalk, GoesDownTwelveLevelsAtMost) {
  const std::string twelve = "0 1 2 3 4 5 6 7 8 9 10 11";
  EXPECT_EQ(Visited(Walk(Chain(14))), twelve);
  EXPECT_EQ(Visited(Walk(Chain(14), {"-l", "12"})), twelve);
  EXPECT_EQ(Visited(Walk(Chain(14), {"-l", "13"})), twelve);
  EXPECT_EQ(Visited(Walk(Chain(14), {"-l", "11"})), twelve.substr(0, twelve.rfind(' ')));
}

TEST(GroupWalk, EndsInACircle) {
  Scenario circle;
  AddGroup(circle, 0, {.children = {0}});
  EXPECT_EQ(Visited(Walk(circle, {"-l", "3"})), "0 0 0");
}

TEST(GroupWalk, DoesNotLookAtTheChildrenOfTheLastLevel) {
  Scenario tree = Tree();
  tree.List(kChildren, {0}, {Item::Unreadable(kBad), 99});
  const TallyRun run = Walk(tree, {"-l", "1"});
  EXPECT_EQ(Visited(run), "0");
  EXPECT_EQ(run.status, 0);
}

// A walk over groups without flags: of each only the flags are read.
TEST(GroupWalk, MakesTheseCalls) {
  Scenario tree;
  AddGroup(tree, 4, {.flags = 0, .children = {5, 6}});
  AddGroup(tree, 5, {.flags = 0});
  AddGroup(tree, 6, {.flags = 0});
  EXPECT_EQ(Walk(tree, {"-g", "4"}).Calls(),
            "CheckSig() "
            "Create(1,2) AddInt(4) GetInstanceListAlloc(sched_groups_members_groups,[4]) "
            "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[4]) "
            "Create(1,2) AddInt(4) Get(sched_groups_groupFlags,[4]) RemoveLast() Destroy() "
            "GetInt64(sched_groups_members_groups,[4],0) "
            "Create(1,2) AddInt(5) GetInstanceListAlloc(sched_groups_members_groups,[5]) "
            "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[5]) "
            "Create(1,2) AddInt(5) Get(sched_groups_groupFlags,[5]) RemoveLast() Destroy() "
            "Destroy(sched_groups_members_groups,[5]) "
            "GetInt64(sched_groups_members_groups,[4],1) "
            "Create(1,2) AddInt(6) GetInstanceListAlloc(sched_groups_members_groups,[6]) "
            "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[6]) "
            "Create(1,2) AddInt(6) Get(sched_groups_groupFlags,[6]) RemoveLast() Destroy() "
            "Destroy(sched_groups_members_groups,[6]) "
            "Destroy(sched_groups_members_groups,[4])");
}

TEST(GroupWalk, TakesTheStartGroupAs64BitsWithASign) {
  const struct {
    const char* argument;
    int64_t id;
    const char* shown;
  } ids[] = {{"4294967296", 4294967296, "4294967296"},
             {"-1", -1, "18446744073709551615"},
             {"-4294967297", -4294967297, "18446744069414584319"},
             {"99999999999999999999", INT64_MAX, "9223372036854775807"},
             {"-99999999999999999999", INT64_MIN, "9223372036854775808"},
             {" 7x", 7, "7"},
             {"0x10", 0, "0"},
             {"abc", 0, "0"},
             {"", 0, "0"}};
  for (const auto& [argument, id, shown] : ids) {
    Scenario scenario;
    AddGroup(scenario, id, {});
    const TallyRun run = Walk(scenario, {"-g", argument});
    EXPECT_EQ(Visited(run), shown) << argument;
    EXPECT_EQ(run.status, 0) << argument;
    const std::string table =
        RunTally(scenario, {"-r", "group-stats", "-s", "gid", "-g", argument}).out;
    EXPECT_NE(table.find("\n   Start Group ID   : " + std::string(shown) + "\n"), std::string::npos)
        << table;
  }
}

TEST(GroupWalk, ReadsChildrenWithNegativeIds) {
  Scenario scenario;
  AddGroup(scenario, 0, {.children = {-2, INT64_MIN}});
  AddGroup(scenario, -2, {});
  AddGroup(scenario, INT64_MIN, {});
  EXPECT_EQ(Visited(Walk(scenario)), "0 18446744073709551614 9223372036854775808");
}

// Runs `scenario` and expects these rows, diagnostics and status.
void ExpectWalk(const Scenario& scenario, const std::string& visited, const std::string& warnings,
                int status, const Args& args = {}) {
  const TallyRun run = Walk(scenario, args);
  EXPECT_EQ(Visited(run), visited);
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, status);
}

TEST(GroupWalkFailure, OfAChildListPassesOverThatGroup) {
  ExpectWalk(Tree().Fails(kChildren, {1}, kBad), "0 2 3 31",
             "TallyTraverseGroups: KSI_GetInstanceListAlloc failure: Out of memory\n", 0);
  ExpectWalk(Tree().Fails(kChildren, {11}, 0xbad0003), "0 1 12 2 3 31",
             "TallyTraverseGroups: KSI_GetInstanceListAlloc failure: Not found\n", 0);
  ExpectWalk(Tree().Fails(kChildren, {3}, 0xbad0003), "0 1 11 12 2",
             "TallyTraverseGroups: KSI_GetInstanceListAlloc failure: Not found\n", 0);
}

TEST(GroupWalkFailure, OfTheStartGroupsChildListEndsTheReport) {
  const TallyRun run =
      RunTally(Tree().Fails(kChildren, {0}, 0xbad0003), {"-r", "group-stats", "-s", "gid", "-v"});
  EXPECT_EQ(run.out,
            "\n GROUP STATS: Sat Nov 21 10:00:00 2026\n"
            " -------------------------------------\n"
            "   Start Group ID   : 0\n"
            "   No. of levels    : 12\n"
            "   Unit             : KB\n"
            "   Inclusion filter : (all)\n"
            "   Exclusion filter : (none)\n"
            "   Selected columns : gid\n\n"
            "--------\n"
            "     gid\n"
            "--------\n"
            "--------\n"
            "Description of report header labels:\n"
            "                 gid: Group ID\n");
  EXPECT_EQ(run.err, "TallyTraverseGroups: KSI_GetInstanceListAlloc failure: Not found\n");
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(run.Calls(),
            "CheckSig() Create(1,2) AddInt(0) "
            "GetInstanceListAlloc(sched_groups_members_groups,[0])=0xbad0003 RemoveLast() "
            "Destroy()");
}

TEST(GroupWalkFailure, OfTheKeyListBearsTheReadersName) {
  // The walk makes the first and, for the first child, the ninth list: group 0 takes one for its
  // children and seven for its data.
  ExpectWalk(Tree().FailCall("Create", 1, kBad), "",
             "TallyGroupKsiGet: KSI_ParamListCreate() failure\n", 1);
  ExpectWalk(Tree().FailCall("Create", 9, kBad), "0 2 3 31",
             "TallyGroupKsiGet: KSI_ParamListCreate() failure\n", 0);
}

TEST(GroupWalkFailure, OfTheKey) {
  ExpectWalk(Tree().FailCall("AddInt", 1, 0xbad00b4), "",
             "TallyTraverseGroups: KSI_ParamListAddInt() failure: Too many elements for list\n", 1);
  ExpectWalk(Tree().FailCall("AddInt", 9, 0xbad00b4), "0 2 3 31",
             "TallyTraverseGroups: KSI_ParamListAddInt() failure: Too many elements for list\n", 0);
  EXPECT_EQ(Walk(Tree().FailCall("AddInt", 1, kBad)).Calls(),
            "CheckSig() Create(1,2) AddInt(0)=0xbad0014 Destroy()");
}

TEST(GroupWalkFailure, OfAChildsIdPassesOverThatChild) {
  ExpectWalk(Tree().List(kChildren, {0}, {1, Item::Unreadable(kBad), 3}), "0 1 11 12 3 31", "", 0);
  ExpectWalk(Tree().List(kChildren, {0}, {Item::Unreadable(kBad), 3}), "0 3 31", "", 0);
}

TEST(GroupWalkFailure, OfTheLastChildsIdIsTheWalksStatus) {
  ExpectWalk(Tree().List(kChildren, {0}, {1, 2, Item::Unreadable(kBad)}), "0 1 11 12 2", "", 1);
  // Only below the start group.
  ExpectWalk(Tree().List(kChildren, {3}, {Item::Unreadable(kBad)}), "0 1 11 12 2 3", "", 0);
}

TEST(GroupWalkFailure, OfAnIdThatIsAText) {
  ExpectWalk(Tree().List(kChildren, {0}, {"1", 2}), "0 2", "", 0);
}

TEST(GroupWalkFailure, OfAVisitHidesTheSubtree) {
  const std::string failure = "Tally_GroupGetFlags() failure, error code: 195887124\n";
  ExpectWalk(Tree().Fails(kGroupFlags, {1}, kBad), "0 2 3 31", failure, 0);
  ExpectWalk(Tree().Fails(kGroupFlags, {0}, kBad), "", failure, 1);
  ExpectWalk(Tree().Fails(kGroupFlags, {0}, kBad), "3 31", "", 0, {"-g", "3"});
}

TEST(GroupWalkFailure, OfAReadersListAndKey) {
  ExpectWalk(Tree().FailCall("Create", 2, kBad), "",
             "TallyGroupKsiGet: KSI_ParamListCreate() failure\n"
             "Tally_GroupGetFlags() failure, error code: 195887105\n",
             1);
  ExpectWalk(Tree().FailCall("AddInt", 2, 0xbad00b4), "",
             "TallyGroupKsiGet: KSI_ParamListAddInt() faiure, error code: 195887284\n"
             "Tally_GroupGetFlags() failure, error code: 195887284\n",
             1);
}

// What is the same in every report that walks; the parameter is its name.
class Walkers : public testing::TestWithParam<const char*> {
 protected:
  TallyRun Run(const Scenario& scenario, Args args) {
    args.insert(args.begin(), {"-r", GetParam()});
    return RunTally(scenario, args);
  }

  // Expects the report to end with this diagnostic before it reads anything.
  void ExpectRefused(const Args& args, const std::string& warnings) {
    const TallyRun run = Run(Scenario(), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, warnings);
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(), "CheckSig()");
  }
};

class LevelWalkers : public Walkers {};

TEST_P(LevelWalkers, RefuseNoLevels) {
  for (const std::string argument : {"0", "-0", "abc", "", "x1", "4294967296", "-4294967296",
                                     "8589934592", "-99999999999999999999"}) {
    ExpectRefused({"-l", argument}, "Invalid level " + argument + ", must be > 0\n");
  }
  ExpectRefused({"--level=0"}, "Invalid level 0, must be > 0\n");
}

TEST_P(LevelWalkers, RefuseNoLevelsBeforeAllElse) {
  ExpectRefused({"-u", "bogus", "-i", "bogus", "-l", "0", "-l", "5"},
                "Invalid level 0, must be > 0\n");
  ExpectRefused({"-l", "77", "-l", "0"},
                "Specified level 77 too high, reseting to 12\nInvalid level 0, must be > 0\n");
}

TEST_P(LevelWalkers, TakeTwelveForMore) {
  for (const std::string argument : {"13", "-1", "4294967295", "4294967309", "2147483648",
                                     "99999999999999999999", "-13", "-4294967284x"}) {
    const bool twelve = argument == "-4294967284x";  // 12 in 32 bits
    const TallyRun run = Run(Chain(14), {"-l", argument});
    EXPECT_EQ(run.err, twelve ? "" : "Specified level " + argument + " too high, reseting to 12\n");
    EXPECT_NE(run.out.find("\n   No. of levels    : 12\n"), std::string::npos) << argument;
    EXPECT_NE(run.Calls().find("GetInstanceListAlloc(sched_groups_members_groups,[11])"),
              std::string::npos);
    EXPECT_EQ(run.Calls().find("[12]"), std::string::npos);
    EXPECT_EQ(run.status, 0);
  }
}

TEST_P(LevelWalkers, TakeTheGivenLevels) {
  for (const std::string argument : {"1", "12", "+3", " 4", "5x", "6.9", "4294967297"}) {
    const std::string shown = std::to_string(std::stoll(argument) % 4294967296);
    const TallyRun run = Run(Chain(1), {"-l", argument});
    EXPECT_EQ(run.err, "");
    EXPECT_NE(run.out.find("\n   No. of levels    : " + shown + "\n"), std::string::npos)
        << run.out;
    EXPECT_EQ(run.status, 0);
  }
}

TEST_P(LevelWalkers, TakeTheLastOfAnOption) {
  const TallyRun run = Run(Chain(3), {"-l", "3", "-l", "13", "-l", "1", "-g", "5", "-g", "1"});
  EXPECT_EQ(run.err, "Specified level 13 too high, reseting to 12\n");
  EXPECT_NE(run.out.find("\n   Start Group ID   : 1\n   No. of levels    : 1\n"),
            std::string::npos);
}

TEST_P(Walkers, RefuseOtherUnits) {
  for (const char* unit : {"b", "B", "gb", "", "mbx", "k"}) {
    ExpectRefused({"-u", unit}, "Invalid unit specified. Choose from {mb, kb, pg}\n");
    ExpectRefused({"-q", "-v", "--unit", unit},
                  "Invalid unit specified. Choose from {mb, kb, pg}\n");
  }
}

TEST_P(Walkers, NameTheUnit) {
  const std::pair<Args, std::string> units[] = {{{}, "KB"},
                                                {{"-u", "kb"}, "KB"},
                                                {{"-u", "MB"}, "MB"},
                                                {{"-u", "pG"}, "Page (4K)"},
                                                {{"-u", "b", "-u", "mb"}, "MB"}};
  for (const auto& [args, title] : units) {
    EXPECT_NE(Run(Chain(1), args).out.find("\n   Unit             : " + title + "\n"),
              std::string::npos);
  }
}

TEST_P(Walkers, PassOverUnknownOptions) {
  const TallyRun plain = Run(Tree(), {"-v"});
  const TallyRun run = Run(Tree(), {"-x", "-v", "--bogus", "--tagged=3", "word", "-u"});
  EXPECT_EQ(run.out, plain.out);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST_P(Walkers, KnowTheBeginningsOfLongOptions) {
  EXPECT_EQ(Run(Tree(), {"--u=mb", "--verb", "--cSel", "x", "--gi", "2"}).out,
            Run(Tree(), {"-u", "mb", "-v", "-s", "x", "-g", "2"}).out);
  EXPECT_EQ(Run(Tree(), {"--csv"}).out, Run(Tree(), {"-q"}).out);
}

TEST_P(Walkers, EndWithTheStartGroupsStatus) {
  EXPECT_EQ(Run(Tree().Fails(kChildren, {0}, kBad), {}).status, 1);
  EXPECT_EQ(Run(Tree().Fails(kChildren, {1}, kBad), {}).status, 0);
  EXPECT_EQ(Run(Tree().Fails(kGroupFlags, {0}, kBad), {}).status, 1);
  EXPECT_EQ(Run(Tree().Fails(kGroupFlags, {1}, kBad), {}).status, 0);
  EXPECT_EQ(Run(Tree().List(kChildren, {0}, {1, Item::Unreadable(kBad)}), {}).status, 1);
}

// Whatever the report: the list of children before the flags, and both for each group.
TEST_P(Walkers, ReadTheChildrenThenTheFlags) {
  Scenario scenario;
  AddGroup(scenario, 6, {.flags = 0});
  EXPECT_EQ(Run(scenario, {"-g", "6"}).Calls(),
            "CheckSig() "
            "Create(1,2) AddInt(6) GetInstanceListAlloc(sched_groups_members_groups,[6]) "
            "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[6]) "
            "Create(1,2) AddInt(6) Get(sched_groups_groupFlags,[6]) RemoveLast() Destroy() "
            "Destroy(sched_groups_members_groups,[6])");
}

std::string Name(const testing::TestParamInfo<const char*>& info) {
  const std::string report = info.param;
  return report.substr(0, report.find('-'));
}

INSTANTIATE_TEST_SUITE_P(Reports, LevelWalkers,
                         testing::Values("group-stats", "vm-stats", "uw-stats", "swap-stats",
                                         "guest-stats", "zip-stats", "lpage-stats"),
                         Name);
INSTANTIATE_TEST_SUITE_P(Reports, Walkers,
                         testing::Values("group-stats", "vm-stats", "uw-stats", "swap-stats",
                                         "guest-stats", "zip-stats", "lpage-stats",
                                         "asyncremap-stats"),
                         Name);

}  // namespace
}  // namespace harness
