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

constexpr Report kSwapStats("swap-stats");

// clang-format off
constexpr char kKilobytes[] =
    "name,schedGrp,parSchedGroup,worldGrp,isSwapping,CurSwapper,cacheUsage,swapoutReady,swapTgt,swapped,swapRead,swapIn,swapOut,discarded,COWSwapper,vmmSwapOn,knvSwapOn,llswapped,llswapUsed,totalReg,freeReg,cptTgt,cptRead,cptWritten,totalMig,freeMig,gblSwapRead,gblSwapIn,gblSwapOut\n"
    "web,10,4,100,y,vmm,102399,121855,104447,105471,106495,107519,108543,109567,110591,41,42,135167,136191,111615,112639,113663,114687,115711,116735,117759,118783,119807,120831\n"
    "a database in its 28 letters,20,18446744073709551615,-300,n,knv,4294967295,8590158847,8590141439,8590142463,8590143487,8590144511,8590145535,8590146559,8590147583,4294967280,4294967281,8590172159,8590173183,8590148607,8590149631,8590150655,8590151679,8590152703,8590153727,8590154751,8590155775,8590156799,8590157823\n"
    "Total,,,,,,,,8590245886,8590247934,8590249982,8590252030,8590254078,8590256126,8590258174,4294967321,4294967323,8590307326,8590309374,8590260222,8590262270,8590264318,8590266366,8590268414,8590270462,8590272510,8590274558,8590276606,8590278654\n";
constexpr char kMegabytes[] =
    "web,10,4,100,y,vmm,99,121855,101,102,103,104,105,106,107,41,42,131,132,108,109,110,111,112,113,114,115,116,117\n"
    "a database in its 28 letters,20,18446744073709551615,-300,n,knv,4194303,8590158847,8388809,8388810,8388811,8388812,8388813,8388814,8388815,4294967280,4294967281,8388839,8388840,8388816,8388817,8388818,8388819,8388820,8388821,8388822,8388823,8388824,8388825\n"
    "Total,,,,,,,,8388911,8388913,8388915,8388917,8388919,8388921,8388923,4294967321,4294967323,8388971,8388973,8388925,8388927,8388929,8388931,8388933,8388935,8388937,8388939,8388941,8388943\n";
constexpr char kPages[] =
    "web,10,4,100,y,vmm,25599,121855,26111,26367,26623,26879,27135,27391,27647,41,42,33791,34047,27903,28159,28415,28671,28927,29183,29439,29695,29951,30207\n"
    "a database in its 28 letters,20,18446744073709551615,-300,n,knv,1073741823,8590158847,2147535359,2147535615,2147535871,2147536127,2147536383,2147536639,2147536895,4294967280,4294967281,2147543039,2147543295,2147537151,2147537407,2147537663,2147537919,2147538175,2147538431,2147538687,2147538943,2147539199,2147539455\n"
    "Total,,,,,,,,2147561471,2147561983,2147562495,2147563007,2147563519,2147564031,2147564543,4294967321,4294967323,2147576831,2147577343,2147565055,2147565567,2147566079,2147566591,2147567103,2147567615,2147568127,2147568639,2147569151,2147569663\n";
// clang-format on

// A swapping with 18 amounts from Kb(first) on: 17 in the order of the columns and the ready time.
RawRecord RawSwapping(uint64_t first, uint8_t isSwapping, uint32_t swapper, uint32_t cacheUsage,
                      uint32_t vmmSwapOn, uint32_t knvSwapOn) {
  return RawRecord(220)
      .U8(0, isSwapping)
      .Amounts(first,
               {1, 9, 17, 25, 33, 89, 81, 137, 145, 153, 161, 169, 177, 185, 57, 65, 73, 209})
      .U32(97, vmmSwapOn)
      .U32(101, knvSwapOn)
      .U32(105, swapper)
      .U32(193, cacheUsage);
}

Scenario RawMachines() {
  Scenario host = TwoMachines();
  host.Bytes("sched_memClients_swapInfo", {101},
             RawSwapping(101, 0x80, 0, static_cast<uint32_t>(Kb(99)), 41, 42))
      .Bytes("sched_memClients_tally_vmm", {100}, RawRecord(332).Amounts(131, {132, 164}))
      .Bytes("sched_memClients_swapInfo", {-299},
             RawSwapping(8388809, 0, 0x01000000, UINT32_MAX, 0xfffffff0, 0xfffffff1))
      .Bytes("sched_memClients_tally_vmm", {-300}, RawRecord(332).Amounts(8388839, {132, 164}));
  return host;
}

// The row of a machine as group 10, then the Total row.
std::string Rows(const VirtualMachine& machine, const std::string& columns, const Args& args = {}) {
  Scenario host;
  AddVirtualMachine(host, 10, machine);
  Args all = {"-g", "10"};
  all.insert(all.end(), args.begin(), args.end());
  return kSwapStats.Rows(host, columns, all);
}

TEST(SwapStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/swap_stats.txt", RawMachines(), {"-r", "swap-stats", "-g", "4", "-v"});
}

TEST(SwapStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kSwapStats.Run(RawMachines(), {"-q"}).out, kKilobytes);
  EXPECT_EQ(kSwapStats.Rows(RawMachines(), "", {"-u", "mb"}), kMegabytes);
  EXPECT_EQ(kSwapStats.Rows(RawMachines(), "", {"-u", "pg"}), kPages);
}

TEST(SwapStats, ReadsAMachineInOrder) {
  Scenario host;
  AddVirtualMachine(host, 20, {.leader = -300});
  EXPECT_EQ(
      kSwapStats.Run(host, {"-g", "20", "-l", "1"}).Calls(),
      ReadsOfClient20() +
          "Create(1,2) AddInt(-300) Get(worldGroups_vmmLeaderID,[-300]) RemoveLast() Destroy() "
          "Create(1,2) AddInt(-299) Get(sched_memClients_swapInfo,[-299]) RemoveLast() "
          "Destroy() "
          "Create(1,2) AddInt(-300) Get(sched_memClients_tally_vmm,[-300]) RemoveLast() "
          "Destroy() "
          "Destroy(sched_groups_members_groups,[20])");
}

TEST(SwapStats, ShowsMachinesWithoutAVmmGroup) {
  Scenario host = TwoMachines();
  host.List("sched_groups_members_groups", {10}, {});
  EXPECT_EQ(kSwapStats.Rows(host, "name"), "web\na database in its 28 letters\nTotal\n");
}

TEST(SwapStats, NamesTheSwapper) {
  const std::pair<uint32_t, const char*> swappers[] = {
      {0, "vmm"}, {1, "knv"}, {2, "knv"}, {0x80000000, "knv"}, {UINT32_MAX, "knv"}};
  for (const auto& [code, name] : swappers) {
    VirtualMachine machine;
    machine.swap.curSwapper = code;
    EXPECT_EQ(Rows(machine, "CurSwapper"), std::string(name) + "\n\n");
  }
}

TEST(SwapStats, ConvertsACacheUsageOf32BitOnes) {
  VirtualMachine machine;
  machine.swap.cacheUsage = UINT32_MAX;
  EXPECT_EQ(Rows(machine, "cacheUsage"), "4294967295\n\n");
  EXPECT_EQ(Rows(machine, "cacheUsage", {"-u", "mb"}), "4194303\n\n");
  EXPECT_EQ(Rows(machine, "cacheUsage", {"-u", "pg"}), "1073741823\n\n");
}

TEST(SwapStats, ShowsCountsAndTimesAsTheyAre) {
  VirtualMachine machine;
  machine.swap.vmmSwapOn = UINT32_MAX;
  machine.swap.knvSwapOn = 2049;
  machine.swap.swapoutReady = kAllOnes - 1;
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Rows(machine, "swapoutReady:vmmSwapOn:knvSwapOn", {"-u", unit}),
              "18446744073709551614,4294967295,2049\n,4294967295,2049\n");
  }
}

TEST(SwapStats, KeepsWhatIsNotAvailableInEveryUnit) {
  VirtualMachine machine;
  std::memset(&machine.vmm, 0xff, sizeof machine.vmm);
  std::memset(&machine.swap, 0xff, sizeof machine.swap);
  machine.swap.cacheUsage = 0;
  const std::string none = ",18446744073709551615";
  std::string row = "vm,10,0,0,y,knv,0" + none;
  std::string total = "Total,,,,,,,";
  for (int column = 9; column <= 29; ++column) {
    const bool count = column == 16 || column == 17;
    row += count ? ",4294967295" : none;
    total += count ? ",4294967295" : none;
  }
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Rows(machine, "", {"-u", unit}), row + "\n" + total + "\n");
  }
}

TEST(SwapStats, TotalsAreConvertedOnceAndWrap) {
  Scenario host = TwoMachines();
  VirtualMachine machine{.leader = 100};
  machine.swap.swapped = kAllOnes;
  machine.swap.swapIn = 1023;
  machine.vmm.llswapped = uint64_t{1} << 63;
  AddVirtualMachine(host, 10, machine);
  machine.leader = -300;
  machine.swap.swapped = 4097;
  AddVirtualMachine(host, 20, machine);
  EXPECT_EQ(kSwapStats.Rows(host, "swapped:swapIn:llswapped", {"-u", "mb"}),
            "18446744073709551615,0,9007199254740992\n4,0,9007199254740992\n4,1,0\n");
}

TEST(SwapStats, WidensColumnsToTheirNames) {
  const TallyRun run =
      kSwapStats.Run(TwoMachines(), {"-s",
                                     "isSwapping:CurSwapper:parSchedGroup:swapoutReady:"
                                     "gblSwapRead:name"});
  EXPECT_EQ(run.out,
            "\n VIRTUAL MACHINE SWAP STATS: Sat Nov 21 10:00:00 2026\n"
            " ----------------------------------------------------\n"
            "   Start Group ID   : 4\n"
            "   No. of levels    : 12\n"
            "   Unit             : KB\n"
            "   Selected columns : "
            "name:parSchedGroup:isSwapping:CurSwapper:swapoutReady:gblSwapRead\n\n"
            "---------------------------------------------------------------------------------\n"
            "                name parSchedGroup isSwapping CurSwapper swapoutReady gblSwapRead\n"
            "---------------------------------------------------------------------------------\n"
            "                 web             4          y        vmm       620480      605120\n"
            "a database in its 28 letters 18446744073709551615 y     vmm    620480      605120\n"
            "---------------------------------------------------------------------------------\n"
            "               Total                                                      1210240\n"
            "---------------------------------------------------------------------------------\n");
}

TEST(SwapStats, TotalsAreZeroWithoutMachines) {
  Scenario host;
  AddUserWorld(host, 4, {});
  EXPECT_EQ(kSwapStats.Rows(host, ""), "Total,,,,,,,,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0,0\n");
}

TEST(SwapStatsFailure, HidesTheMachine) {
  ExpectFailuresHideGroup10(
      kSwapStats, TwoMachines(),
      {{"worldGroups_vmmLeaderID", {100}, "Tally_GetVmmLeaderID() failure: Not found\n"},
       {"sched_memClients_swapInfo",
        {101},
        "TallySwapGetSwapStats() failure, error code: 195887107\n"},
       {"sched_memClients_tally_vmm",
        {100},
        "TallyVMGetVMMStats() failure, error code: 195887107\n"}});
}

}  // namespace
}  // namespace harness
