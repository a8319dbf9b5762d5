#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <utility>

#include "tests/harness/golden.h"
#include "tests/harness/hosts.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/report.h"

namespace harness {
namespace {

constexpr Report kGroupStats("group-stats");

constexpr uint32_t kBad = 0xbad0014;

// clang-format off
constexpr char kKilobytes[] =
    "gid,name,parGid,nChild,min,max,minLimit,shares,conResv,availResv,memSize,memSizePeak,iMin,eMin,eMinPeak,rMinPeak,bMin,bMax,bShares,fShares,ovhdResv,ovhd,allocTgt,consumed,consumedPeak,touched,bActive,sharedSaved,mps,throttlePct,flags,tag\n"
    "4,production,-9,2,104447,105471,106495,1000,107519,108543,109567,110591,111615,112639,113663,114687,115711,116735,117759,118783,119807,120831,121855,122879,123903,124927,125951,126975,127999,81,co,alpha\n"
    "5,a virtual machine of 30 letters,4,0,8590141439,8590142463,8590143487,-5,8590144511,8590145535,8590146559,8590147583,8590148607,8590149631,8590150655,8590151679,8590152703,8590153727,8590154751,8590155775,8590156799,8590157823,8590158847,8590159871,8590160895,8590161919,8590162943,8590163967,8590164991,82,vm:co,beta\n"
    "6,jobs,4,0,309247,310271,311295,2147483647,312319,313343,314367,315391,316415,317439,318463,319487,320511,321535,322559,323583,324607,325631,326655,327679,328703,329727,330751,331775,332799,83,(all),alpha\n"
    "Virtual tags report\n"
    "1,alpha,0,2,413694,-1,-1,0,419838,421886,423934,425982,428030,430078,432126,434174,436222,321535,0,0,444414,446462,448510,901116,452606,454654,456702,458750,-1,0,(none),alpha\n"
    "1,beta,0,0,8590141439,-1,-1,0,8590144511,8590145535,8590146559,8590147583,8590148607,8590149631,8590150655,8590151679,8590152703,8590153727,0,0,8590156799,8590157823,8590158847,17180319742,8590160895,8590161919,8590162943,8590163967,-1,0,(none),beta\n";
constexpr char kMegabytes[] =
    "4,production,-9,2,101,102,103,1000,104,105,106,107,108,109,110,111,112,113,117759,118783,116,117,118,119,120,121,122,123,124,81,co,alpha\n"
    "5,a virtual machine of 30 letters,4,0,8388809,8388810,8388811,-5,8388812,8388813,8388814,8388815,8388816,8388817,8388818,8388819,8388820,8388821,8590154751,8590155775,8388824,8388825,8388826,8388827,8388828,8388829,8388830,8388831,8388832,82,vm:co,beta\n"
    "6,jobs,4,0,301,302,303,2147483647,304,305,306,307,308,309,310,311,312,313,322559,323583,316,317,318,319,320,321,322,323,324,83,(all),alpha\n"
    "Virtual tags report\n"
    "1,alpha,0,2,403,-1,-1,0,409,411,413,415,417,419,421,423,425,313,0,0,433,435,437,879,441,443,445,447,-1,0,(none),alpha\n"
    "1,beta,0,0,8388809,-1,-1,0,8388812,8388813,8388814,8388815,8388816,8388817,8388818,8388819,8388820,8388821,0,0,8388824,8388825,8388826,16777655,8388828,8388829,8388830,8388831,-1,0,(none),beta\n";
constexpr char kPages[] =
    "4,production,-9,2,26111,26367,26623,1000,26879,27135,27391,27647,27903,28159,28415,28671,28927,29183,117759,118783,29951,30207,30463,30719,30975,31231,31487,31743,31999,81,co,alpha\n"
    "5,a virtual machine of 30 letters,4,0,2147535359,2147535615,2147535871,-5,2147536127,2147536383,2147536639,2147536895,2147537151,2147537407,2147537663,2147537919,2147538175,2147538431,8590154751,8590155775,2147539199,2147539455,2147539711,2147539967,2147540223,2147540479,2147540735,2147540991,2147541247,82,vm:co,beta\n"
    "6,jobs,4,0,77311,77567,77823,2147483647,78079,78335,78591,78847,79103,79359,79615,79871,80127,80383,322559,323583,81151,81407,81663,81919,82175,82431,82687,82943,83199,83,(all),alpha\n"
    "Virtual tags report\n"
    "1,alpha,0,2,103423,-1,-1,0,104959,105471,105983,106495,107007,107519,108031,108543,109055,80383,0,0,111103,111615,112127,225279,113151,113663,114175,114687,-1,0,(none),alpha\n"
    "1,beta,0,0,2147535359,-1,-1,0,2147536127,2147536383,2147536639,2147536895,2147537151,2147537407,2147537663,2147537919,2147538175,2147538431,0,0,2147539199,2147539455,2147539711,4295079935,2147540223,2147540479,2147540735,2147540991,-1,0,(none),beta\n";
// clang-format on

// The rows of these columns, of which gid is always the first.
std::string Rows(const Scenario& scenario, const std::string& columns, const Args& args = {}) {
  return kGroupStats.Rows(scenario, columns, args);
}

// Group 4 as the only one.
Scenario One(const Group& group) {
  Scenario scenario;
  AddGroup(scenario, 4, group);
  return scenario;
}

std::string Row(const Group& group, const std::string& columns, const Args& args = {}) {
  return Rows(One(group), columns, args);
}

// A group whose amounts, in the order of the columns, are Kb(first), Kb(first + 1) and so on.
void AddRawGroup(Scenario& scenario, int64_t id, uint64_t first, uint32_t shares,
                 const Group& group) {
  AddGroup(scenario, id, group);
  scenario
      .Bytes("sched_groups_memAllocationInKB", {id},
             RawRecord(32).Amounts(first, {0, 8, 20}).U32(16, shares))
      .Bytes("sched_groups_stats_capacity", {id}, RawRecord(24).Amounts(first + 3, {8, 16}))
      .Bytes("sched_groups_stats_memoryStats", {id},
             RawRecord(312)
                 .Amounts(first + 5, {4, 292, 188, 196, 260, 244, 156, 164, 172, 180, 20, 28, 212,
                                      108, 276, 140, 204, 60, 236})
                 .U8(308, static_cast<uint8_t>(77 + id)));
}

// Group 4 and below it 5, whose amounts need 64 bits, and 6, which shares the tag of 4.
Scenario RawGroups() {
  Scenario scenario;
  AddRawGroup(
      scenario, 4, 101, 1000,
      {.name = "production", .tag = "alpha", .parent = -9, .flags = 0x800, .children = {5, 6}});
  AddRawGroup(
      scenario, 5, 8388809, UINT32_MAX - 4,
      {.name = "a virtual machine of 30 letters", .tag = "beta", .parent = 4, .flags = 0x804});
  AddRawGroup(scenario, 6, 301, INT32_MAX,
              {.name = "jobs", .tag = "alpha", .parent = 4, .flags = 0x7fff});
  return scenario;
}

TEST(GroupStats, PrintsATableWithTagsAndDescriptions) {
  ExpectTallyGolden("golden/group_stats.txt", RawGroups(),
                    {"-r", "group-stats", "-g", "4", "-t", "-v"});
}

TEST(GroupStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kGroupStats.Run(RawGroups(), {"-t", "-q"}).out, kKilobytes);
  EXPECT_EQ(Rows(RawGroups(), "", {"-t", "-u", "mb"}), kMegabytes);
  EXPECT_EQ(Rows(RawGroups(), "", {"-t", "-u", "pg"}), kPages);
}

TEST(GroupStats, ReadsAGroupInOrder) {
  EXPECT_EQ(kGroupStats.Run(One({})).Calls(),
            "CheckSig() "
            "Create(1,2) AddInt(4) GetInstanceListAlloc(sched_groups_members_groups,[4]) "
            "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[4]) "
            "Create(1,2) AddInt(4) Get(sched_groups_groupFlags,[4]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(4) Get(sched_groups_groupName,[4]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(4) Get(sched_groups_groupTag,[4]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(4) Get(sched_groups_parentGroupID,[4]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(4) Get(sched_groups_memAllocationInKB,[4]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(4) Get(sched_groups_stats_capacity,[4]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(4) Get(sched_groups_stats_memoryStats,[4]) RemoveLast() Destroy() "
            "Destroy(sched_groups_members_groups,[4])");
}

TEST(GroupStats, CountsTheChildrenThatTheKernelLists) {
  EXPECT_EQ(Row({.children = {Item::Unreadable(kBad), 7, 8}}, "nChild", {"-l", "1"}), "4,3\n");
  EXPECT_EQ(Row({}, "nChild"), "4,0\n");
}

TEST(GroupStats, TakesVeryLargeLimitsForNone) {
  const struct {
    int64_t limit;
    const char* unit;
    const char* shown;
  } limits[] = {{0xFFFFFFFFF0, "kb", "1099511627760"},
                {0xFFFFFFFFF0, "mb", "1073741823"},
                {0xFFFFFFFFF0, "pg", "274877906940"},
                {0xFFFFFFFFF1, "kb", "-1"},
                {0xFFFFFFFFF1, "mb", "-1"},
                {INT64_MAX, "pg", "-1"},
                {-1, "kb", "-1"},
                {-1, "mb", "-1"},
                {-1, "pg", "-1"},
                // Below zero is not above the largest limit.
                {-5, "kb", "-5"},
                {-5, "mb", "18014398509481983"},
                {-5, "pg", "4611686018427387902"},
                {INT64_MIN, "kb", "-9223372036854775808"},
                {0, "kb", "0"},
                {1023, "mb", "0"}};
  for (const auto& [limit, unit, shown] : limits) {
    const KSI_GroupAllocation allocation = {
        .min = 0, .max = limit, .shares = 1, .minLimit = limit, .unused28 = {}};
    EXPECT_EQ(Row({.allocation = allocation}, "max:minLimit", {"-u", unit}),
              "4," + std::string(shown) + "," + shown + "\n")
        << limit << unit;
  }
}

TEST(GroupStats, KeepsWhatIsNotAvailableInEveryUnit) {
  Group group{.allocation = {.min = -1, .max = -1, .shares = -1, .minLimit = -1, .unused28 = {}}};
  std::memset(&group.capacity, 0xff, sizeof group.capacity);
  std::memset(&group.memory, 0xff, sizeof group.memory);
  std::string row = "4,group,0,0,-1,-1,-1,-1";
  for (int column = 9; column <= 28; ++column) row += ",18446744073709551615";
  row += ",-1,255,co,tag\n";
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Row(group, "", {"-u", unit}), row);
  }
}

TEST(GroupStats, ConvertsTheNeighboursOfNoValue) {
  Group group;
  group.allocation.min = -2;
  group.memory.bMax = UINT64_MAX - 1;
  group.memory.mps = -2;
  EXPECT_EQ(Row(group, "min:bMax:mps"), "4,-2,18446744073709551614,-2\n");
  EXPECT_EQ(Row(group, "min:bMax:mps", {"-u", "mb"}),
            "4,18014398509481983,18014398509481983,18014398509481983\n");
  EXPECT_EQ(Row(group, "min:bMax:mps", {"-u", "pg"}),
            "4,4611686018427387903,4611686018427387903,4611686018427387903\n");
}

TEST(GroupStats, DropsFractions) {
  Group group;
  group.memory.consumed = 1023;
  group.memory.touched = 7;
  EXPECT_EQ(Row(group, "consumed:touched", {"-u", "mb"}), "4,0,0\n");
  EXPECT_EQ(Row(group, "consumed:touched", {"-u", "pg"}), "4,255,1\n");
}

TEST(GroupStats, ShowsSignedIdsAndShares) {
  Group group{.parent = INT64_MIN};
  group.allocation.shares = INT32_MIN;
  EXPECT_EQ(Row(group, "parGid:shares"), "4,-9223372036854775808,-2147483648\n");
}

TEST(GroupStats, NamesTheFlags) {
  const char* const names[] = {"pre", "lf", "vm", "uw", "sys", "tw",  "pr", "sd",
                               "np",  "ke", "ug", "co", "sc",  "vmm", "usr"};
  uint32_t flag = 1;
  for (const char* name : names) {
    EXPECT_EQ(Row({.flags = flag}, "flags"), std::string("4,") + name + "\n");
    flag <<= 1;
  }
  EXPECT_EQ(Row({.flags = 0x8000}, "flags"), "4,(none)\n");
  EXPECT_EQ(Row({.flags = 0x4001}, "flags"), "4,pre:usr\n");
  EXPECT_EQ(Row({.flags = 0x7ffe}, "flags"), "4,lf:vm:uw:sys:tw:pr:sd:np:ke:ug:co:sc:vmm:usr\n");
  EXPECT_EQ(Row({.flags = UINT32_MAX}, "flags"), "4,(all)\n");
}

TEST(GroupStats, ShowsTextsThatFillTheirFields) {
  const std::string name(64, 'n');
  const std::string tag(8, 't');
  EXPECT_EQ(Row({.name = name + "cut", .tag = tag + "cut"}, "name:tag"),
            "4," + name + "," + tag + "\n");
  EXPECT_EQ(Row({.name = "", .tag = ""}, "name:tag"), "4,,\n");
  // What is after the first NUL is not shown.
  std::string bytes = name;
  bytes[3] = '\0';
  EXPECT_EQ(Rows(One({}).Bytes("sched_groups_groupName", {4}, bytes), "name"), "4,nnn\n");
}

TEST(GroupStats, RealignsAfterALongName) {
  const TallyRun run =
      kGroupStats.Run(One({.name = "a name that needs some 33 letters", .parent = 12}),
                      {"-s", "name:parGid:nChild:tag"});
  EXPECT_EQ(
      run.out.substr(run.out.find("gid:name:")),
      "gid:name:parGid:nChild:tag\n\n"
      "------------------------------------------------------------------------------------\n"
      "     gid                         name   parGid   nChild                          tag\n"
      "------------------------------------------------------------------------------------\n"
      "       4 a name that needs some 33 letters  12        0                          tag\n"
      "------------------------------------------------------------------------------------\n");
}

TEST(GroupStats, AlwaysShowsTheId) {
  EXPECT_EQ(kGroupStats.Run(One({}), {"-s", "name:consumed"}).out,
            "\n GROUP STATS: Sat Nov 21 10:00:00 2026\n"
            " -------------------------------------\n"
            "   Start Group ID   : 4\n"
            "   No. of levels    : 12\n"
            "   Unit             : KB\n"
            "   Inclusion filter : (all)\n"
            "   Exclusion filter : (none)\n"
            "   Selected columns : gid:name:consumed\n\n"
            "------------------------------------------------\n"
            "     gid                         name   consumed\n"
            "------------------------------------------------\n"
            "       4                        group     104096\n"
            "------------------------------------------------\n");
  EXPECT_EQ(Row({}, "bogus"), "4\n");
  EXPECT_EQ(kGroupStats.Run(One({}), {"-q", "-s", ""}).out, "gid\n4\n");
  EXPECT_EQ(Row({}, "NAME:GID"), "4,group\n");
}

// Group 4 with children of several kinds, and one without flags above a virtual machine.
Scenario Flagged() {
  Scenario scenario;
  AddGroup(scenario, 4, {.flags = 0x800, .children = {5, 6, 7, 8}});
  AddGroup(scenario, 5, {.flags = 0x804});
  AddGroup(scenario, 6, {.flags = 0x8});
  AddGroup(scenario, 7, {.flags = 0xc});
  AddGroup(scenario, 8, {.flags = 0, .children = {9}});
  AddGroup(scenario, 9, {.flags = 0x4});
  return scenario;
}

// The ids of the rows as "4 5".
std::string Ids(const Args& filters) {
  std::string ids = Rows(Flagged(), "gid", filters);
  for (char& c : ids) {
    if (c == '\n') c = ' ';
  }
  return ids;
}

TEST(GroupStats, ShowsGroupsThatPassTheFilters) {
  EXPECT_EQ(Ids({}), "4 5 6 7 9 ");
  EXPECT_EQ(Ids({"-i", "vm"}), "5 7 9 ");
  EXPECT_EQ(Ids({"-i", "VM:uw"}), "5 6 7 9 ");
  EXPECT_EQ(Ids({"--iFilter", "::vm:vm:"}), "5 7 9 ");
  EXPECT_EQ(Ids({"-e", "vm"}), "4 6 ");
  EXPECT_EQ(Ids({"--eFilter=co"}), "6 7 9 ");
  EXPECT_EQ(Ids({"-i", "vm", "-e", "uw:co"}), "9 ");
  EXPECT_EQ(Ids({"-i", "vm", "-e", "vm"}), "");
  EXPECT_EQ(Ids({"-i", "tw"}), "");
  EXPECT_EQ(Ids({"-i", "tw", "-i", "uw"}), "6 7 ");
}

TEST(GroupStats, ShowsNoneForAnEmptyInclusionFilter) {
  for (const char* none : {"", ":", ":::"}) EXPECT_EQ(Ids({"-i", none}), "") << none;
  const TallyRun run = kGroupStats.Run(Flagged(), {"-i", "", "-s", "gid"});
  EXPECT_EQ(run.out.substr(run.out.find("   Inclusion")),
            "   Inclusion filter : (none)\n"
            "   Exclusion filter : (none)\n"
            "   Selected columns : gid\n\n"
            "--------\n     gid\n--------\n--------\n");
  EXPECT_EQ(run.status, 0);
}

TEST(GroupStats, ExcludesNoneForAnEmptyExclusionFilter) {
  EXPECT_EQ(Ids({"-e", ""}), "4 5 6 7 9 ");
  EXPECT_EQ(Ids({"-e", "::"}), "4 5 6 7 9 ");
}

TEST(GroupStats, TakesAFlagWithoutANameForAFlag) {
  EXPECT_EQ(Row({.flags = 0x80000000}, "flags", {"-e", "vm"}), "4,(none)\n");
}

TEST(GroupStats, ShowsTheFiltersInTheTitle) {
  const std::string every = "pre:lf:vm:uw:sys:tw:pr:sd:np:ke:ug:co:sc:vmm:usr";
  const std::pair<Args, std::string> filters[] = {
      {{"-i", "usr:VM:pre"}, "pre:vm:usr\n   Exclusion filter : (none)\n"},
      {{"-e", "uw"}, "(all)\n   Exclusion filter : uw\n"},
      {{"-i", every, "-e", every}, "(all)\n   Exclusion filter : (all)\n"},
  };
  for (const auto& [args, shown] : filters) {
    const TallyRun run = kGroupStats.Run(Flagged(), args);
    EXPECT_NE(run.out.find("\n   Inclusion filter : " + shown), std::string::npos) << run.out;
  }
}

TEST(GroupStats, RefusesUnknownFlags) {
  const std::pair<Args, std::string> filters[] = {
      {{"-i", "vm:bogus"}, "Invalid flag (bogus) in filter\n"},
      {{"-e", "bogus:worse"}, "Invalid flag (bogus) in filter\n"},
      {{"-e", "x", "-i", "y"}, "Invalid flag (y) in filter\n"},
      {{"-i", "vm:uw", "-e", "vm "}, "Invalid flag (vm ) in filter\n"},
      {{"-i", "v"}, "Invalid flag (v) in filter\n"},
      {{"-i", "all"}, "Invalid flag (all) in filter\n"},
      // The unit is looked at first.
      {{"-i", "x", "-e", "y", "-u", "z"}, "Invalid unit specified. Choose from {mb, kb, pg}\n"},
  };
  for (const auto& [args, warning] : filters) {
    const TallyRun run = kGroupStats.Run(Flagged(), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, warning);
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(), "CheckSig()");
  }
}

TEST(GroupTags, AddUpKilobytes) {
  Scenario scenario;
  Group group{.tag = "same", .children = {5}};
  group.memory.consumed = 100;
  group.memory.touched = 1023;
  AddGroup(scenario, 4, group);
  group.children = {};
  group.memory.consumed = 50;
  group.memory.touched = 1;
  AddGroup(scenario, 5, group);
  EXPECT_EQ(Rows(scenario, "consumed:touched", {"-t"}),
            "4,100,1023\n5,50,1\nVirtual tags report\n1,300,1024\n");
  EXPECT_EQ(Rows(scenario, "consumed:touched", {"--tags", "-u", "mb"}),
            "4,0,0\n5,0,0\nVirtual tags report\n1,0,1\n");
  EXPECT_EQ(Rows(scenario, "consumed:touched", {"-t", "-u", "pg"}),
            "4,25,255\n5,12,0\nVirtual tags report\n1,75,256\n");
}

TEST(GroupTags, StandInTheOrderOfTheWalk) {
  Scenario scenario;
  AddGroup(scenario, 4, {.tag = "b", .children = {5, 6, 7}});
  AddGroup(scenario, 5, {.tag = ""});
  AddGroup(scenario, 6, {.tag = "B"});
  AddGroup(scenario, 7, {.tag = ""});
  EXPECT_EQ(Rows(scenario, "name:min:tag", {"-t"}),
            "4,group,1024,b\n5,group,1024,\n6,group,1024,B\n7,group,1024,\n"
            "Virtual tags report\n"
            "1,b,1024,b\n1,,2048,\n1,B,1024,B\n");
}

TEST(GroupTags, CountOnlyGroupsWithARow) {
  Scenario scenario = Flagged();
  scenario.Value("sched_groups_groupTag", {5}, TextRecord<KSI_GroupTag>("five"));
  EXPECT_EQ(Rows(scenario, "nChild:tag", {"-t", "-e", "co"}),
            "6,0,tag\n7,0,tag\n9,0,tag\nVirtual tags report\n1,0,tag\n");
}

TEST(GroupTags, AreNotShownWithoutTheOption) { EXPECT_EQ(Row({}, "tag"), "4,tag\n"); }

TEST(GroupTags, AreABareHeadingWhenThereIsNoRow) {
  EXPECT_EQ(Row({.flags = 0}, "tag", {"-t"}), "Virtual tags report\n");
  const TallyRun run = kGroupStats.Run(One({}).Fails("sched_groups_groupFlags", {4}, kBad),
                                       {"-t", "-s", "gid", "-v"});
  EXPECT_EQ(run.out.substr(run.out.find("--------\n     gid")),
            "--------\n     gid\n--------\n--------\nVirtual tags report\n--------\n"
            "Description of report header labels:\n"
            "                 gid: Group ID\n");
  EXPECT_EQ(run.status, 1);
}

// A tag of eight letters is kept with seven: it is not found again, and the row of seven takes
// what bears just these.
TEST(GroupTags, LoseTheirEighthLetter) {
  Scenario scenario;
  AddGroup(scenario, 4, {.tag = "ABCDEFGH", .children = {5, 6}});
  AddGroup(scenario, 5, {.tag = "ABCDEFGH"});
  AddGroup(scenario, 6, {.tag = "ABCDEFG"});
  EXPECT_EQ(Rows(scenario, "name:min:tag", {"-t"}),
            "4,group,1024,ABCDEFGH\n5,group,1024,ABCDEFGH\n6,group,1024,ABCDEFG\n"
            "Virtual tags report\n"
            "1,ABCDEFGH,2048,ABCDEFG\n1,ABCDEFGH,1024,ABCDEFG\n");
}

TEST(GroupTags, SumsWrap) {
  Group group{.tag = "t", .children = {5}};
  group.allocation.min = INT64_MAX;
  group.memory.consumed = UINT64_MAX;
  group.memory.memSize = UINT64_MAX;
  group.memory.touched = uint64_t{1} << 63;
  group.memory.bMax = UINT64_MAX;
  Scenario scenario;
  AddGroup(scenario, 4, group);
  group.children = {};
  group.allocation.min = 2;
  group.memory.consumed = 3;
  group.memory.memSize = 0;
  group.memory.bMax = 8;
  AddGroup(scenario, 5, group);
  // A sum of all ones is no value, too.
  const std::string columns = "min:memSize:bMax:consumed:touched";
  const std::string kb = Rows(scenario, columns, {"-t"});
  EXPECT_EQ(kb.substr(kb.find("Virtual")),
            "Virtual tags report\n1,-9223372036854775807,18446744073709551615,8,4,0\n");
  const std::string pg = Rows(scenario, columns, {"-t", "-u", "pg"});
  EXPECT_EQ(pg.substr(pg.find("Virtual")),
            "Virtual tags report\n1,2305843009213693952,18446744073709551615,2,1,0\n");
}

// Group 0 with the tag "t0" and `count` children with "t1" and so on.
Scenario ManyTags(int count) {
  Scenario scenario;
  Items children;
  for (int id = 1; id <= count; ++id) {
    children.emplace_back(id);
    AddGroup(scenario, id, {.tag = "t" + std::to_string(id)});
  }
  AddGroup(scenario, 0, {.tag = "t0", .children = children});
  return scenario;
}

TEST(GroupTags, AreUpTo512) {
  const TallyRun run = kGroupStats.Run(ManyTags(511), {"-g", "0", "-t", "-q", "-s", "tag"});
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
  std::string expected = "gid,tag\n";
  std::string tags = "Virtual tags report\n";
  for (int id = 0; id <= 511; ++id) {
    expected += std::to_string(id) + ",t" + std::to_string(id) + "\n";
    tags += "1,t" + std::to_string(id) + "\n";
  }
  EXPECT_EQ(run.out, expected + tags);
}

TEST(GroupTags, BeyondPassOverTheGroupAndItsSubtree) {
  // 512 is the 513th tag; 600 is below it. 513 and 601 bear known ones.
  Scenario scenario = ManyTags(513);
  AddGroup(scenario, 512, {.tag = "t512", .children = {600}});
  AddGroup(scenario, 513, {.tag = "t1", .children = {601}});
  AddGroup(scenario, 601, {.tag = "t511"});
  const TallyRun run = kGroupStats.Run(scenario, {"-g", "0", "-t", "-q", "-s", "min"});
  EXPECT_EQ(run.err, "Maximum number of VTag exceeded\n");
  EXPECT_EQ(run.status, 0);
  std::string expected = "gid,min\n";
  std::string tags = "Virtual tags report\n";
  for (int id = 0; id <= 511; ++id) {
    expected += std::to_string(id) + ",1024\n";
    tags += id == 1 || id == 511 ? "1,2048\n" : "1,1024\n";
  }
  EXPECT_EQ(run.out, expected + "513,1024\n601,1024\n" + tags);
  EXPECT_EQ(run.Calls().find("[600]"), std::string::npos);
  // Without the tags there is no limit.
  AddGroup(scenario, 600, {});
  EXPECT_NE(
      kGroupStats.Run(scenario, {"-g", "0", "-q", "-s", "gid"}).out.find("\n512\n600\n513\n601\n"),
      std::string::npos);
}

TEST(GroupTags, BeyondAreReportedForEachGroup) {
  const TallyRun run = kGroupStats.Run(ManyTags(600), {"-g", "0", "-t", "-q", "-s", "gid"});
  EXPECT_EQ(run.status, 0);
  std::string warnings;
  for (int id = 512; id <= 600; ++id) warnings += "Maximum number of VTag exceeded\n";
  EXPECT_EQ(run.err, warnings);
}

// Group 4 with 5 and 6; 51 below 5.
Scenario Family() {
  Scenario scenario;
  AddGroup(scenario, 4, {.children = {5, 6}});
  AddGroup(scenario, 5, {.children = {51}});
  AddGroup(scenario, 51, {});
  AddGroup(scenario, 6, {});
  return scenario;
}

TEST(GroupStatsFailure, OfAReadHidesTheGroupAndItsSubtree) {
  const struct {
    const char* node;
    const char* reader;
  } reads[] = {{"sched_groups_groupFlags", "Tally_GroupGetFlags"},
               {"sched_groups_groupName", "Tally_GroupGetName"},
               {"sched_groups_groupTag", "Tally_GroupGetTag"},
               {"sched_groups_parentGroupID", "Tally_GroupGetParentID"},
               {"sched_groups_memAllocationInKB", "Tally_GroupGetAlloc"},
               {"sched_groups_stats_capacity", "TallyGroupGetCapacity"},
               {"sched_groups_stats_memoryStats", "TallyGroupGetMemoryStats"}};
  for (const auto& [node, reader] : reads) {
    const std::string warning = std::string(reader) + "() failure, error code: 195887107\n";
    const TallyRun below =
        kGroupStats.Run(Family().Fails(node, {5}, 0xbad0003), {"-q", "-s", "nChild", "-t"});
    EXPECT_EQ(below.out, "gid,nChild\n4,2\n6,0\nVirtual tags report\n1,2\n");
    EXPECT_EQ(below.err, warning);
    EXPECT_EQ(below.status, 0);
    EXPECT_EQ(below.Calls().find("[51]"), std::string::npos);

    const TallyRun start =
        kGroupStats.Run(Family().Fails(node, {4}, 0xbad0003), {"-q", "-s", "nChild"});
    EXPECT_EQ(start.out, "gid,nChild\n");
    EXPECT_EQ(start.err, warning);
    EXPECT_EQ(start.status, 1);
  }
}

TEST(GroupStatsFailure, OfAReadIsTheLastReadOfTheGroup) {
  const TallyRun run = kGroupStats.Run(One({}).Fails("sched_groups_parentGroupID", {4}, kBad));
  EXPECT_TRUE(
      run.Calls().ends_with("Get(sched_groups_parentGroupID,[4])=0xbad0014 RemoveLast() Destroy() "
                            "Destroy(sched_groups_members_groups,[4])"))
      << run.Calls();
}

TEST(GroupStatsFailure, OfTheCapacitysListAndKey) {
  // The children's list, flags, name, tag, parent and allocation take the first six.
  const TallyRun list = kGroupStats.Run(One({}).FailCall("Create", 7, kBad), {"-q"});
  EXPECT_EQ(list.err,
            "TallyGroupKsiGet: KSI_ParamListCreate() failure\n"
            "TallyGroupGetCapacity() failure, error code: 195887105\n");
  EXPECT_EQ(list.status, 1);
  const TallyRun key = kGroupStats.Run(One({}).FailCall("AddInt", 7, 0xbad00b4), {"-q"});
  EXPECT_EQ(key.err,
            "TallyGroupKsiGet: KSI_ParamListAddInt() faiure, error code: 195887284\n"
            "TallyGroupGetCapacity() failure, error code: 195887284\n");
  EXPECT_EQ(key.status, 1);
}

}  // namespace
}  // namespace harness
