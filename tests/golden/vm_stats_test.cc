#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "tests/harness/golden.h"
#include "tests/harness/hosts.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/report.h"

namespace harness {
namespace {

constexpr Report kVmStats("vm-stats");

// clang-format off
constexpr char kKilobytes[] =
    "name,b,schedGrp,parSchedGroup,worldGrp,memSizeLimit,memSize,min,max,minLimit,shares,ovhdResv,ovhd,allocTgt,consumed,balloonTgt,ballooned,swapTgt,swapped,mapped,touched,zipped,vpmemRO,vpmemRW,vpmemUC,zipSaved,shared,zero,sharedSaved,useReliableMem,swapScope\n"
    "web,y,10,4,100,104447,105471,122879,123903,124927,1000,120831,121855,106495,37888,107519,108543,109567,119807,155647,110591,111615,112639,113663,114687,115711,116735,117759,118783,n,7\n"
    "a database in its 28 letters,n,20,18446744073709551615,-300,8590141439,8590142463,225279,226303,227327,-5,8590157823,8590158847,8590143487,37888,8590144511,8590145535,8590146559,8590156799,8590192639,8590147583,8590148607,8590149631,8590150655,8590151679,8590152703,8590153727,8590154751,8590155775,y,1099511627776\n"
    "Total,,,,,8590245886,8590247934,348158,,,,8590278654,8590280702,8590249982,75776,8590252030,8590254078,8590256126,8590276606,8590348286,8590258174,8590260222,8590262270,8590264318,8590266366,8590268414,8590270462,8590272510,8590274558,,\n";
constexpr char kMegabytes[] =
    "web,y,10,4,100,101,102,119,120,121,1000,117,118,103,37,104,105,106,116,151,107,108,109,110,111,112,113,114,115,n,7\n"
    "a database in its 28 letters,n,20,18446744073709551615,-300,8388809,8388810,219,220,221,-5,8388825,8388826,8388811,37,8388812,8388813,8388814,8388824,8388859,8388815,8388816,8388817,8388818,8388819,8388820,8388821,8388822,8388823,y,1099511627776\n"
    "Total,,,,,8388911,8388913,339,,,,8388943,8388945,8388915,74,8388917,8388919,8388921,8388941,8389011,8388923,8388925,8388927,8388929,8388931,8388933,8388935,8388937,8388939,,\n";
constexpr char kPages[] =
    "web,y,10,4,100,26111,26367,30719,30975,31231,1000,30207,30463,26623,9472,26879,27135,27391,29951,38911,27647,27903,28159,28415,28671,28927,29183,29439,29695,n,7\n"
    "a database in its 28 letters,n,20,18446744073709551615,-300,2147535359,2147535615,56319,56575,56831,-5,2147539455,2147539711,2147535871,9472,2147536127,2147536383,2147536639,2147539199,2147548159,2147536895,2147537151,2147537407,2147537663,2147537919,2147538175,2147538431,2147538687,2147538943,y,1099511627776\n"
    "Total,,,,,2147561471,2147561983,87039,,,,2147569663,2147570175,2147562495,18944,2147563007,2147563519,2147564031,2147569151,2147587071,2147564543,2147565055,2147565567,2147566079,2147566591,2147567103,2147567615,2147568127,2147568639,,\n";
// clang-format on

// Gives machine `id` amounts from Kb(first) on: 15 and `mapped` in its tally, one in its swapping,
// two in its memory statistics and three in its allocation. What no column shows stands out.
void PutRaw(Scenario& host, int id, int leader, uint64_t first, uint32_t shares, uint8_t balloon,
            uint8_t reliable, uint64_t swapScope) {
  host.Bytes("sched_memClients_tally_vmm", {leader},
             RawRecord(332)
                 .Amounts(first,
                          {28, 36, 68, 281, 273, 212, 44, 180, 100, 188, 124, 140, 148, 156, 196})
                 .Amounts(first + 50, {172})
                 .U8(236, reliable)
                 .U8(272, balloon)
                 .U64(228, swapScope))
      .Bytes("sched_memClients_swapInfo", {leader + 1}, RawRecord(220).Amounts(first + 15, {9}))
      .Bytes("sched_groups_stats_memoryStats", {id}, RawRecord(312).Amounts(first + 16, {20, 28}))
      // Reservation and limit are those of the VMM's group.
      .Bytes("sched_groups_memAllocationInKB", {id + 1},
             RawRecord(32).Amounts(first + 18, {0, 8}).Amounts(9001, {20}))
      .Bytes("sched_groups_memAllocationInKB", {id},
             RawRecord(32).Amounts(9002, {0, 8}).Amounts(first + 20, {20}).U32(16, shares));
}

Scenario RawMachines() {
  Scenario host = TwoMachines();
  PutRaw(host, 10, 100, 101, 1000, 0x80, 0, 7);
  PutRaw(host, 20, -300, 8388809, UINT32_MAX - 4, 0, 1, uint64_t{1} << 40);
  return host;
}

// The row of a machine in place of machine 10, then the Total row.
std::string Rows(const VirtualMachine& machine, const std::string& columns, const Args& args = {}) {
  Scenario host;
  AddVirtualMachine(host, 10, machine);
  Args all = {"-g", "10"};
  all.insert(all.end(), args.begin(), args.end());
  return kVmStats.Rows(host, columns, all);
}

TEST(VmStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/vm_stats.txt", RawMachines(), {"-r", "vm-stats", "-g", "4", "-v"});
}

TEST(VmStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kVmStats.Run(RawMachines(), {"-q"}).out, kKilobytes);
  EXPECT_EQ(kVmStats.Rows(RawMachines(), "", {"-u", "mb"}), kMegabytes);
  EXPECT_EQ(kVmStats.Rows(RawMachines(), "", {"-u", "pg"}), kPages);
}

TEST(VmStats, ReadsAMachineInOrder) {
  Scenario host;
  AddVirtualMachine(host, 20, {.leader = -300});
  EXPECT_EQ(
      kVmStats.Run(host, {"-g", "20", "-l", "1"}).Calls(),
      ReadsOfClient20() +
          // The allocation: the VMM's group, then the amounts of both.
          "Create(1,2) AddInt(20) GetInstanceListAlloc(sched_groups_members_groups,[20]) "
          "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[20]) "
          "GetInt64(sched_groups_members_groups,[20],0) "
          "Create(1,2) AddInt(21) Get(sched_groups_groupFlags,[21]) RemoveLast() Destroy() "
          "Destroy(sched_groups_members_groups,[20]) "
          "Create(1,2) AddInt(20) Get(sched_groups_memAllocationInKB,[20]) RemoveLast() "
          "Destroy() "
          "Create(1,2) AddInt(21) Get(sched_groups_memAllocationInKB,[21]) RemoveLast() "
          "Destroy() "
          "Create(1,2) AddInt(-300) Get(sched_memClients_tally_vmm,[-300]) RemoveLast() "
          "Destroy() "
          "Create(1,2) AddInt(-300) Get(worldGroups_vmmLeaderID,[-300]) RemoveLast() Destroy() "
          "Create(1,2) AddInt(-299) Get(sched_memClients_swapInfo,[-299]) RemoveLast() "
          "Destroy() "
          "Create(1,2) AddInt(20) Get(sched_groups_stats_memoryStats,[20]) RemoveLast() "
          "Destroy() "
          "Destroy(sched_groups_members_groups,[20])");
}

TEST(VmStats, ShowsOnlyMachines) {
  Scenario host;
  AddGroup(host, 4, {.flags = 0xffff & ~0x4, .children = {10, 5}});
  AddVirtualMachine(host, 10, {.name = "one", .flags = 0x4});
  AddGroup(host, 5, {.flags = 0, .children = {20}});
  AddVirtualMachine(host, 20, {.name = "two", .flags = 0x7fff});
  EXPECT_EQ(kVmStats.Rows(host, "name:schedGrp"), "one,10\ntwo,20\nTotal,\n");
}

TEST(VmStats, ShowsAMachineInsideAMachine) {
  Scenario host;
  AddVirtualMachine(host, 10, {.name = "outer"});
  AddVirtualMachine(host, 20, {.name = "inner"});
  host.List("sched_groups_members_groups", {10}, {11, 20});
  EXPECT_EQ(kVmStats.Rows(host, "name", {"-g", "10"}), "outer\ninner\nTotal\n");
}

TEST(VmStats, TotalsAreZeroWithoutMachines) {
  Scenario host;
  AddGroup(host, 4, {});
  const TallyRun run = kVmStats.Run(host, {"-s", "name:b:memSize:min:max:swapScope"});
  EXPECT_EQ(run.out,
            "\n VIRTUAL MACHINE STATS: Sat Nov 21 10:00:00 2026\n"
            " -----------------------------------------------\n"
            "   Start Group ID   : 4\n"
            "   No. of levels    : 12\n"
            "   Unit             : KB\n"
            "   Selected columns : name:b:memSize:min:max:swapScope\n\n"
            "------------------------------------------------------------\n"
            "           name b    memSize        min        max swapScope\n"
            "------------------------------------------------------------\n"
            "------------------------------------------------------------\n"
            "          Total            0          0                     \n"
            "------------------------------------------------------------\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(kVmStats.Rows(host, ""), "Total,,,,,0,0,0,,,,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,,\n");
}

TEST(VmStats, KeepsWhatIsNotAvailableInEveryUnit) {
  VirtualMachine machine;
  for (KSI_GroupAllocation* allocation : {&machine.allocation, &machine.vmmAllocation}) {
    *allocation = {.min = -1, .max = -1, .shares = -1, .minLimit = -1, .unused28 = {}};
  }
  std::memset(&machine.vmm, 0xff, sizeof machine.vmm);
  std::memset(&machine.swap, 0xff, sizeof machine.swap);
  std::memset(&machine.memory, 0xff, sizeof machine.memory);
  const std::string none = "18446744073709551615";
  std::string row = "vm,y,10,0,0," + none + "," + none + ",-1,-1,-1,-1,";
  std::string total = "Total,,,,," + none + "," + none + ",-1,,,,";
  for (int column = 12; column <= 29; ++column) {
    // All ones and all ones without twice that is 0, which is consumed.
    row += (column == 15 ? "0" : none) + ",";
    total += (column == 15 ? "0" : none) + ",";
  }
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Rows(machine, "", {"-u", unit}), row + "y," + none + "\n" + total + ",\n");
  }
}

TEST(VmStats, AddsWhatIsNotAvailableLikeANumber) {
  Scenario host = TwoMachines();
  VirtualMachine machine{.name = "web", .parent = 4, .leader = 100};
  machine.vmm.memSize = kAllOnes;
  machine.vmmAllocation.min = -1;
  AddVirtualMachine(host, 10, machine);
  machine.name = "db";
  machine.leader = -300;
  machine.vmm.memSize = 4097;
  machine.vmmAllocation.min = 2049;
  AddVirtualMachine(host, 20, machine);
  EXPECT_EQ(kVmStats.Rows(host, "memSize:min"), "18446744073709551615,-1\n4097,2049\n4096,2048\n");
  EXPECT_EQ(kVmStats.Rows(host, "memSize:min", {"-u", "mb"}),
            "18446744073709551615,-1\n4,2\n4,2\n");
}

TEST(VmStats, ConvertsTotalsOnce) {
  Scenario host = TwoMachines();
  VirtualMachine machine{.leader = 100};
  machine.vmm.touched = 1023;
  machine.vmmAllocation.min = 3;
  AddVirtualMachine(host, 10, machine);
  machine.leader = -300;
  AddVirtualMachine(host, 20, machine);
  EXPECT_EQ(kVmStats.Rows(host, "touched", {"-u", "mb"}), "0\n0\n1\n");
  EXPECT_EQ(kVmStats.Rows(host, "min:touched", {"-u", "pg"}), "0,255\n0,255\n1,511\n");
}

TEST(VmStats, KeepsTheAllocationIn32Bits) {
  const struct {
    int64_t amount;
    const char* unit;
    const char* min;
    const char* limit;  // max and minLimit
    const char* total;  // of min
  } amounts[] = {
      {5, "kb", "5", "5", "5"},
      {0x7fffffff, "kb", "2147483647", "2147483647", "2147483647"},
      {0x7fffffff, "mb", "2097151", "2097151", "2097151"},
      {0x80000000, "kb", "-2147483648", "-1", "-2147483648"},
      // The sign is widened to 64 bits, which lose their highest bits in the end.
      {0x80000000, "mb", "-2097152", "-1", "-2097152"},
      {-5, "kb", "-5", "-1", "-5"},
      {-5, "mb", "-1", "-1", "-1"},
      {-5, "pg", "-2", "-1", "-2"},
      {-1, "pg", "-1", "-1", "-1"},
      {0xffffffff, "mb", "-1", "-1", "-1"},
      {0x100000007, "kb", "7", "7", "7"},
      {INT64_MIN, "kb", "0", "0", "0"},
      {INT64_MAX, "mb", "-1", "-1", "-1"},
  };
  for (const auto& [amount, unit, min, limit, total] : amounts) {
    VirtualMachine machine;
    machine.vmmAllocation.min = amount;
    machine.vmmAllocation.max = amount;
    machine.allocation.minLimit = amount;
    EXPECT_EQ(Rows(machine, "min:max:minLimit", {"-u", unit}),
              std::string(min) + "," + limit + "," + limit + "\n" + total + ",,\n")
        << amount << unit;
  }
}

TEST(VmStats, AddsReservationsIn32Bits) {
  Scenario host = TwoMachines();
  VirtualMachine machine{.leader = 100};
  machine.vmmAllocation.min = 0x7fffffff;
  AddVirtualMachine(host, 10, machine);
  machine.leader = -300;
  machine.vmmAllocation.min = 0x7ffffffe;
  AddVirtualMachine(host, 20, machine);
  EXPECT_EQ(kVmStats.Rows(host, "min"), "2147483647\n2147483646\n-3\n");
  // -3 KB, widened, are 0x3ffffffffffffffe pages, of which 32 bits are kept.
  EXPECT_EQ(kVmStats.Rows(host, "min", {"-u", "pg"}), "536870911\n536870911\n-1\n");
}

TEST(VmStats, ConsumedWraps) {
  VirtualMachine machine;
  machine.vmm.vpmemUC = 1;
  machine.vmm.mapped = 2;
  machine.vmm.vpmemRW = 4;
  machine.vmm.sharedSaved = 8;
  EXPECT_EQ(Rows(machine, "consumed"), "18446744073709551607\n18446744073709551607\n");
  EXPECT_EQ(Rows(machine, "consumed", {"-u", "mb"}), "18014398509481983\n18014398509481983\n");
  machine.vmm.mapped = 10;  // one less than nothing is no value
  EXPECT_EQ(Rows(machine, "consumed", {"-u", "mb"}),
            "18446744073709551615\n18446744073709551615\n");
  machine.vmm.mapped = 10 + kAllOnes;  // 9, wrapped
  machine.vmm.vpmemUC = kAllOnes;
  EXPECT_EQ(Rows(machine, "consumed"), "18446744073709551612\n18446744073709551612\n");
}

TEST(VmStats, ShowsSwitchesAndCodesAsTheyAre) {
  VirtualMachine machine;
  machine.vmm.balloonActive = 0;
  machine.vmm.useReliableMem = 0xff;
  machine.vmm.swapScope = kAllOnes - 1;
  machine.allocation.shares = INT32_MIN;
  EXPECT_EQ(Rows(machine, "b:shares:useReliableMem:swapScope", {"-u", "mb"}),
            "n,-2147483648,y,18446744073709551614\n,,,\n");
  machine.vmm.balloonActive = 1;
  machine.vmm.useReliableMem = 0;
  EXPECT_EQ(Rows(machine, "b:useReliableMem"), "y,n\n,\n");
}

TEST(VmStats, LabelsTheTotalInTheNameOnly) {
  EXPECT_EQ(Rows({.name = "x"}, "name:b"), "x,y\nTotal,\n");
  EXPECT_EQ(Rows({.name = "x"}, "schedGrp:memSize"), "10,301024\n,301024\n");
}

TEST(VmStats, ShowsANameThatFillsItsField) {
  const std::string name(64, 'n');
  EXPECT_EQ(Rows({.name = name + "cut"}, "name:b"), name + ",y\nTotal,\n");
}

TEST(VmStats, TakesTheFirstVmmChild) {
  // Children whose id or flags cannot be read are passed over; 12 is another VMM.
  Scenario host;
  AddVirtualMachine(host, 10, {});
  AddGroup(host, 12, {.flags = 0x2000});
  AddGroup(host, 13, {.flags = 0x4fff & ~0x2000 & ~0x4});
  AddGroup(host, 14, {});
  host.List("sched_groups_members_groups", {10}, {Item::Unreadable(1), "text", 14, 13, 11, 12})
      .Fails("sched_groups_groupFlags", {14}, 0xbad0003);
  const TallyRun run = kVmStats.Run(host, {"-g", "10", "-q", "-s", "min:max", "-l", "1"});
  EXPECT_EQ(run.out, "min,max\n512,8192\n512,\n");
  EXPECT_EQ(run.err, "Tally_GroupGetFlags() failure, error code: 195887107\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.Calls().find("groupFlags,[12]"), std::string::npos);
}

TEST(VmStatsFailure, HidesTheMachine) {
  ExpectFailuresHideGroup10(
      kVmStats, TwoMachines(),
      {{"sched_groups_memAllocationInKB",
        {10},
        "Tally_GroupGetAlloc() failure, error code: 195887107\n"
        "Tally_GroupGetVMMAlloc: VM GroupGetAlloc failure, error code: 195887107\n"},
       {"sched_groups_memAllocationInKB",
        {11},
        "Tally_GroupGetAlloc() failure, error code: 195887107\n"
        "Tally_GroupGetVMMAlloc: GroupGetAlloc failure, error code: 195887107\n"},
       {"sched_memClients_tally_vmm",
        {100},
        "TallyVMGetVMMStats() failure, error code: 195887107\n"},
       {"worldGroups_vmmLeaderID", {100}, "Tally_GetVmmLeaderID() failure: Not found\n"},
       {"sched_memClients_swapInfo",
        {101},
        "TallyVMGetSwapStats() failure, error code: 195887107\n"},
       {"sched_groups_stats_memoryStats",
        {10},
        "TallyGroupGetMemoryStats() failure, error code: 195887107\n"}});
}

// Runs machine 10 alone with a failing call and expects no row, and these diagnostics.
void ExpectNoRow(Scenario host, const std::string& warnings, const std::string& lastCalls) {
  const TallyRun run = kVmStats.Run(host, {"-g", "10", "-q", "-s", "name:memSize"});
  EXPECT_EQ(run.out, "name,memSize\nTotal,0\n");
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, 1);
  EXPECT_TRUE(run.Calls().ends_with(lastCalls)) << run.Calls();
}

Scenario OneMachine() {
  Scenario host;
  AddVirtualMachine(host, 10, {.leader = 100});
  return host;
}

TEST(VmStatsFailure, OfTheLeadersFlagsIsReportedOnce) {
  // The visitor reads flags, name and parent before.
  ExpectNoRow(OneMachine().FailCall("Get", 4, 0xbad0003),
              "Tally_GroupGetFlags() failure, error code: 195887107\n",
              "Get(sched_groups_groupFlags,[10])=0xbad0003 RemoveLast() Destroy() "
              "Destroy(sched_groups_members_groups,[10])");
}

TEST(VmStatsFailure, ToFindAVmmIsSilent) {
  const std::string lastCalls =
      "Destroy(sched_groups_members_groups,[10]) Destroy(sched_groups_members_groups,[10])";
  ExpectNoRow(OneMachine().List("sched_groups_members_groups", {10}, {}), "", lastCalls);
  ExpectNoRow(OneMachine().Value("sched_groups_groupFlags", {11}, uint32_t{0xdffb}), "", lastCalls);
  // A VMM's group without an id.
  Scenario without = OneMachine();
  AddGroup(without, -1, {.flags = 0x2000});
  ExpectNoRow(without.List("sched_groups_members_groups", {10}, {-1, 11}), "", lastCalls);
}

TEST(VmStatsFailure, OfTheVmmsFlags) {
  ExpectNoRow(OneMachine().Fails("sched_groups_groupFlags", {11}, 0xbad0014),
              "Tally_GroupGetFlags() failure, error code: 195887124\n",
              "Destroy(sched_groups_members_groups,[10])");
}

TEST(VmStatsFailure, OfTheVmmsListAndKey) {
  // The list is the second of its kind and the seventh with keys.
  ExpectNoRow(OneMachine().FailCall("GetInstanceListAlloc", 2, 0xbad0003),
              "Tally_GroupGetVMMAlloc: GetInstanceListAlloc failure: Not found\n",
              "Create(1,2) AddInt(10) "
              "GetInstanceListAlloc(sched_groups_members_groups,[10])=0xbad0003 RemoveLast() "
              "Destroy() Destroy(sched_groups_members_groups,[10])");
  ExpectNoRow(OneMachine().FailCall("Create", 7, 0xbad0014),
              "TallyGroupKsiGet: KSI_ParamListCreate() failure\n",
              "Create(1,2)=NULL Destroy(sched_groups_members_groups,[10])");
  ExpectNoRow(OneMachine().FailCall("AddInt", 7, 0xbad00b4),
              "Tally_GroupGetVMMAlloc: KSI_ParamListAddInt() failure: Too many elements for list\n",
              "AddInt(10)=0xbad00b4 Destroy() Destroy(sched_groups_members_groups,[10])");
}

TEST(VmStatsFailure, OfAClientsListAndKey) {
  // Ten lists are made for the group and its allocation.
  ExpectNoRow(OneMachine().FailCall("Create", 11, 0xbad0014),
              "Tally_MemClientKsiGet: KSI_ParamListCreate() failure\n"
              "TallyVMGetVMMStats() failure, error code: 195887105\n",
              "Create(1,2)=NULL Destroy(sched_groups_members_groups,[10])");
  ExpectNoRow(OneMachine().FailCall("AddInt", 11, 0xbad00b4),
              "Tally_MemClientKsiGet: KSI_ParamListAddInt() failure: Too many elements for list\n"
              "TallyVMGetVMMStats() failure, error code: 195887284\n",
              "AddInt(100)=0xbad00b4 Destroy() Destroy(sched_groups_members_groups,[10])");
  ExpectNoRow(OneMachine().FailCall("Create", 12, 0xbad0014),
              "Tally_MemClientKsiGet: KSI_ParamListCreate() failure\n"
              "Tally_GetVmmLeaderID() failure: Failure\n",
              "Create(1,2)=NULL Destroy(sched_groups_members_groups,[10])");
}

}  // namespace
}  // namespace harness
