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

constexpr Report kUwStats("uw-stats");

// clang-format off
constexpr char kKilobytes[] =
    "type,name,schedGrp,parSchedGroup,worldGrp,min,max,minLimit,shares,totalResv,pinnedResv,memSizeLimit,memSize,memBStore,swapBStore,mapped,touched,swappable,cow,pageable,pageableUnacct,pinned,prealloced,shm,allocTgt,consumed,swapTgt,swapped,useReliableMem,swapScope\n"
    "uw,hostd,10,4,100,104447,105471,106495,1000,107519,108543,2000000000,109567,110591,111615,112639,113663,114687,115711,116735,117759,118783,119807,120831,121855,15360,122879,123903,n,3\n"
    "(all),a helper of many letters,20,18446744073709551615,-300,8590141439,8590142463,8590143487,-5,8590144511,8590145535,-2,8590146559,8590147583,8590148607,8590149631,8590150655,8590151679,8590152703,8590153727,8590154751,8590155775,8590156799,8590157823,8590158847,15360,8590159871,8590160895,y,1099511627776\n"
    ",,,,,8590245886,,,,8590252030,8590254078,,8590256126,8590258174,8590260222,8590262270,8590264318,8590266366,8590268414,8590270462,8590272510,8590274558,8590276606,8590278654,8590280702,30720,8590282750,8590284798,,\n";
constexpr char kMegabytes[] =
    "uw,hostd,10,4,100,101,102,103,1000,104,105,1953125,106,107,108,109,110,111,112,113,114,115,116,117,118,15,119,120,n,3\n"
    "(all),a helper of many letters,20,18446744073709551615,-300,8388809,8388810,8388811,-5,8388812,8388813,18014398509481983,8388814,8388815,8388816,8388817,8388818,8388819,8388820,8388821,8388822,8388823,8388824,8388825,8388826,15,8388827,8388828,y,1099511627776\n"
    ",,,,,8388911,,,,8388917,8388919,,8388921,8388923,8388925,8388927,8388929,8388931,8388933,8388935,8388937,8388939,8388941,8388943,8388945,30,8388947,8388949,,\n";
constexpr char kPages[] =
    "uw,hostd,10,4,100,26111,26367,26623,1000,26879,27135,500000000,27391,27647,27903,28159,28415,28671,28927,29183,29439,29695,29951,30207,30463,3840,30719,30975,n,3\n"
    "(all),a helper of many letters,20,18446744073709551615,-300,2147535359,2147535615,2147535871,-5,2147536127,2147536383,4611686018427387903,2147536639,2147536895,2147537151,2147537407,2147537663,2147537919,2147538175,2147538431,2147538687,2147538943,2147539199,2147539455,2147539711,3840,2147539967,2147540223,y,1099511627776\n"
    ",,,,,2147561471,,,,2147563007,2147563519,,2147564031,2147564543,2147565055,2147565567,2147566079,2147566591,2147567103,2147567615,2147568127,2147568639,2147569151,2147569663,2147570175,7680,2147570687,2147571199,,\n";
// clang-format on

// A tally with 20 amounts from Kb(first) on in the order of the columns, and three more that only
// "consumed" is made of.
RawRecord RawTally(uint64_t first, uint32_t shares, uint32_t memSizeLimit, uint8_t reliable,
                   uint64_t swapScope) {
  return RawRecord(360)
      .Amounts(first, {0,   8,   16,  264, 272, 36,  280, 288, 172, 44,
                       296, 312, 320, 328, 304, 344, 352, 68,  212, 336})
      .Amounts(first + 50, {124})
      .Amounts(first + 21, {188, 196})
      .U32(24, shares)
      .U32(28, memSizeLimit)
      .U64(228, swapScope)
      .U8(236, reliable);
}

Scenario RawUserWorlds() {
  Scenario host = TwoUserWorlds();
  host.Bytes("sched_memClients_tally_uw", {100}, RawTally(101, 1000, 2000000000, 0, 3))
      .Bytes("sched_memClients_tally_uw", {-300},
             RawTally(8388809, UINT32_MAX - 4, UINT32_MAX - 1, 0x80, uint64_t{1} << 40))
      .Value("sched_groups_groupFlags", {20}, uint32_t{0xc});
  return host;
}

// The row of a user world as group 10, then the Total row.
std::string Rows(const UserWorld& world, const std::string& columns, const Args& args = {}) {
  Scenario host;
  AddUserWorld(host, 10, world);
  Args all = {"-g", "10"};
  all.insert(all.end(), args.begin(), args.end());
  return kUwStats.Rows(host, columns, all);
}

TEST(UwStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/uw_stats.txt", RawUserWorlds(), {"-r", "uw-stats", "-g", "4", "-v"});
}

TEST(UwStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kUwStats.Run(RawUserWorlds(), {"-q"}).out, kKilobytes);
  EXPECT_EQ(kUwStats.Rows(RawUserWorlds(), "", {"-u", "mb"}), kMegabytes);
  EXPECT_EQ(kUwStats.Rows(RawUserWorlds(), "", {"-u", "pg"}), kPages);
}

TEST(UwStats, ReadsAUserWorldInOrder) {
  Scenario host;
  AddUserWorld(host, 20, {.leader = -300});
  EXPECT_EQ(kUwStats.Run(host, {"-g", "20"}).Calls(),
            ReadsOfClient20() +
                "Create(1,2) AddInt(-300) Get(sched_memClients_tally_uw,[-300]) RemoveLast() "
                "Destroy() "
                "Destroy(sched_groups_members_groups,[20])");
}

// Groups below 4: 40 a machine, 6 a user world, 7 both, 8 neither with 9, a user world, below it.
Scenario Mixed() {
  Scenario host;
  AddGroup(host, 4, {.flags = 0xffff & ~0x8, .children = {40, 6, 7, 8}});
  AddVirtualMachine(host, 40, {.leader = 500});
  AddUserWorld(host, 6, {.name = "alone", .flags = 0x8, .leader = 600});
  AddUserWorld(host, 7, {.name = "both", .flags = 0x7fff, .leader = 700});
  AddGroup(host, 8, {.flags = 0, .children = {9}});
  AddUserWorld(host, 9, {.name = "below", .flags = 0xa, .leader = 900});
  return host;
}

std::string Names(const Args& filters) { return kUwStats.Rows(Mixed(), "type:name", filters); }

TEST(UwStats, ShowsUserWorldsAndTheirTypes) {
  EXPECT_EQ(Names({}), "uw,alone\n(all),both\nuw,below\n,\n");
}

TEST(UwStats, ShowsTypesThatPassTheFilters) {
  EXPECT_EQ(Names({"-i", "vm"}), "(all),both\n,\n");
  EXPECT_EQ(Names({"-e", "vm"}), "uw,alone\nuw,below\n,\n");
  EXPECT_EQ(Names({"-i", "uw"}), "uw,alone\n(all),both\nuw,below\n,\n");
  EXPECT_EQ(Names({"--iFilter", "VM:UW"}), "uw,alone\n(all),both\nuw,below\n,\n");
  EXPECT_EQ(Names({"-e", "uw"}), ",\n");
  EXPECT_EQ(Names({"--eFilter=uw:vm"}), ",\n");
  EXPECT_EQ(Names({"-i", ""}), ",\n");
  EXPECT_EQ(Names({"-i", "::"}), ",\n");
  EXPECT_EQ(Names({"-e", ""}), "uw,alone\n(all),both\nuw,below\n,\n");
}

TEST(UwStats, ShowsTheFiltersInTheTitle) {
  const std::pair<Args, std::string> filters[] = {
      {{}, "(all)\n   Exclusion filter : (none)\n"},
      {{"-i", "vm"}, "vm\n   Exclusion filter : (none)\n"},
      {{"-i", "vm:uw", "-e", "uw"}, "(all)\n   Exclusion filter : uw\n"},
      {{"-i", "", "-e", "vm:uw"}, "(none)\n   Exclusion filter : (all)\n"},
  };
  for (const auto& [args, shown] : filters) {
    const TallyRun run = kUwStats.Run(Mixed(), args);
    EXPECT_NE(run.out.find("\n   Unit             : KB\n   Inclusion filter : " + shown +
                           "   Selected columns : (all)\n\n"),
              std::string::npos)
        << run.out;
  }
}

TEST(UwStats, RefusesUnknownTypes) {
  const std::pair<Args, std::string> filters[] = {
      {{"-i", "uw:sys"}, "Invalid flag (sys) in filter\n"},
      {{"-e", "pre"}, "Invalid flag (pre) in filter\n"},
      {{"-e", "x", "-i", "y"}, "Invalid flag (y) in filter\n"},
      {{"-i", "x", "-u", "z"}, "Invalid unit specified. Choose from {mb, kb, pg}\n"},
  };
  for (const auto& [args, warning] : filters) {
    const TallyRun run = kUwStats.Run(Mixed(), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, warning);
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(), "CheckSig()");
  }
}

TEST(UwStats, TakesVeryLargeLimitsForNone) {
  const struct {
    int64_t limit;
    const char* unit;
    const char* shown;
  } limits[] = {{0x3FFFFFFEF, "kb", "17179869167"},
                {0x3FFFFFFEF, "mb", "16777215"},
                {0x3FFFFFFEF, "pg", "4294967291"},
                {0x3FFFFFFF0, "kb", "-1"},
                {0x3FFFFFFF0, "mb", "-1"},
                {0x3FFFFFFF0, "pg", "-1"},
                {INT64_MAX, "kb", "-1"},
                {-1, "mb", "-1"},
                // Below zero is very large without a sign.
                {-5, "kb", "-1"},
                {INT64_MIN, "kb", "-1"},
                {0, "kb", "0"}};
  for (const auto& [limit, unit, shown] : limits) {
    UserWorld world;
    world.uw.max = limit;
    world.uw.minLimit = limit;
    EXPECT_EQ(Rows(world, "max:minLimit", {"-u", unit}), std::string(shown) + "," + shown + "\n,\n")
        << limit << unit;
  }
}

TEST(UwStats, HasNoLargestMemSizeLimit) {
  const struct {
    int32_t limit;
    const char* unit;
    const char* shown;
  } limits[] = {{INT32_MAX, "kb", "2147483647"},
                {INT32_MAX, "mb", "2097151"},
                {-1, "kb", "-1"},
                {-1, "mb", "-1"},
                {-1, "pg", "-1"},
                {INT32_MIN, "kb", "-2147483648"},
                // 0xffffffff80000000 by 4.
                {INT32_MIN, "pg", "4611686017890516992"}};
  for (const auto& [limit, unit, shown] : limits) {
    UserWorld world;
    world.uw.memSizeLimit = limit;
    EXPECT_EQ(Rows(world, "memSizeLimit", {"-u", unit}), std::string(shown) + "\n\n")
        << limit << unit;
  }
}

TEST(UwStats, KeepsWhatIsNotAvailableInEveryUnit) {
  UserWorld world;
  std::memset(&world.uw, 0xff, sizeof world.uw);
  const std::string none = ",18446744073709551615";
  std::string row = "uw,world,10,0,0,-1,-1,-1,-1" + none + none + ",-1";
  std::string total = ",,,,,-1,,,," + none.substr(1) + none + ",";
  for (int column = 13; column <= 28; ++column) {
    row += column == 26 ? ",0" : none;  // consumed
    total += column == 26 ? ",0" : none;
  }
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Rows(world, "", {"-u", unit}), row + ",y" + none + "\n" + total + ",,\n");
  }
}

TEST(UwStats, TotalsAreConvertedOnceAndWrap) {
  Scenario host = TwoUserWorlds();
  UserWorld world{.leader = 100};
  world.uw.min = INT64_MAX;
  world.uw.touched = 1023;
  world.uw.shm = kAllOnes;
  AddUserWorld(host, 10, world);
  world.leader = -300;
  world.uw.min = 3;
  world.uw.touched = 1;
  world.uw.shm = 3;
  AddUserWorld(host, 20, world);
  EXPECT_EQ(kUwStats.Rows(host, "min:touched:shm"),
            "9223372036854775807,1023,18446744073709551615\n3,1,3\n-9223372036854775806,1024,2\n");
  EXPECT_EQ(kUwStats.Rows(host, "min:touched:shm", {"-u", "mb"}),
            "9007199254740991,0,18446744073709551615\n0,0,0\n9007199254740992,1,0\n");
}

TEST(UwStats, ConsumedWraps) {
  UserWorld world;
  world.uw.mapped = 2;
  world.uw.vpmemUC = 1;
  world.uw.vpmemRW = 4;
  world.uw.sharedSaved = 8;
  EXPECT_EQ(Rows(world, "consumed", {"-u", "pg"}), "4611686018427387901\n4611686018427387901\n");
}

TEST(UwStats, TotalsAreZeroWithoutUserWorlds) {
  Scenario host;
  AddVirtualMachine(host, 4, {});
  const TallyRun run = kUwStats.Run(host, {"-s", "type:name:min:max:memSize:swapScope"});
  EXPECT_EQ(
      run.out,
      "\n USER-WORLD STATS: Sat Nov 21 10:00:00 2026\n"
      " ------------------------------------------\n"
      "   Start Group ID   : 4\n"
      "   No. of levels    : 12\n"
      "   Unit             : KB\n"
      "   Inclusion filter : (all)\n"
      "   Exclusion filter : (none)\n"
      "   Selected columns : type:name:min:max:memSize:swapScope\n\n"
      "------------------------------------------------------------------------------------\n"
      "                type                 name        min        max    memSize swapScope\n"
      "------------------------------------------------------------------------------------\n"
      "------------------------------------------------------------------------------------\n"
      "                                                   0                     0          \n"
      "------------------------------------------------------------------------------------\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(kUwStats.Rows(host, ""), ",,,,,0,,,,0,0,,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,,\n");
}

TEST(UwStats, ShowsANameThatFillsItsField) {
  const std::string name(64, 'n');
  EXPECT_EQ(Rows({.name = name + "cut"}, "name"), name + "\n\n");
}

TEST(UwStatsFailure, HidesTheUserWorld) {
  ExpectFailuresHideGroup10(kUwStats, TwoUserWorlds(),
                            {{"sched_memClients_tally_uw",
                              {100},
                              "TallyUWGetUWStats() failure, error code: 195887107\n"}});
}

TEST(UwStatsFailure, OfTheTallysListAndKey) {
  // Six lists are made for the group.
  Scenario host;
  AddUserWorld(host, 10, {.leader = 100});
  Scenario list = host;
  EXPECT_EQ(kUwStats.Run(list.FailCall("Create", 7, 0xbad0014), {"-g", "10"}).err,
            "Tally_MemClientKsiGet: KSI_ParamListCreate() failure\n"
            "TallyUWGetUWStats() failure, error code: 195887105\n");
  EXPECT_EQ(kUwStats.Run(host.FailCall("AddInt", 7, 0xbad00b4), {"-g", "10"}).err,
            "Tally_MemClientKsiGet: KSI_ParamListAddInt() failure: Too many elements for list\n"
            "TallyUWGetUWStats() failure, error code: 195887284\n");
}

}  // namespace
}  // namespace harness
