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

constexpr Report kLPageStats("lpage-stats");

// clang-format off
constexpr char kAnyUnit[] =
    "name,schedGrp,parSchedGroup,worldGrp,nrBackings,nrAllocSuccess,nrLocked,nrBroken,maxSwapThreshold,nrFailPinned,nrFailSwapped,nrFailPinnedLate,nrFailNoMem\n"
    "web,10,4,100,2049,104447,2050,105471,2051,106495,107519,108543,109567\n"
    "a database in its 28 letters,20,18446744073709551615,4294966996,4294967280,4398046717951,4294967281,4398046718975,4294967282,4398046719999,4398046721023,4398046722047,4398046723071\n"
    "Total,,,,2033,4398046822398,4294969331,4398046824446,4294969333,4398046826494,4398046828542,4398046830590,4398046832638\n";
// clang-format on

// Large pages with 64-bit counts from Kb(first) on in the order of the columns, and three 32-bit
// ones from `first32` on.
RawRecord RawPages(uint64_t first, uint32_t first32) {
  return RawRecord(84)
      .Amounts(first, {8, 76, 16, 24, 32, 56})
      .U32(0, first32)
      .U32(72, first32 + 1)
      .U32(4, first32 + 2);
}

Scenario RawMachines() {
  Scenario host = TwoMachines();
  host.Bytes("memory_lpage_vmLPage", {101}, RawPages(101, 2049))
      .Bytes("memory_lpage_vmLPage", {-299}, RawPages(4294967497, 0xfffffff0));
  return host;
}

// The two machines with these large pages.
Scenario Pages(const KSI_VmLargePages& first, const KSI_VmLargePages& second) {
  Scenario host = TwoMachines();
  host.Value("memory_lpage_vmLPage", {101}, first).Value("memory_lpage_vmLPage", {-299}, second);
  return host;
}

TEST(LPageStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/lpage_stats.txt", RawMachines(),
                    {"-r", "lpage-stats", "-g", "4", "-v"});
}

TEST(LPageStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kLPageStats.Run(RawMachines(), {"-q"}).out, kAnyUnit);
}

TEST(LPageStats, ShowsTheUnitInTheTitleOnly) {
  const std::string kilobytes = kLPageStats.Run(RawMachines()).out;
  const std::pair<const char*, std::string> units[] = {{"mb", "MB"}, {"pg", "Page (4K)"}};
  for (const auto& [word, title] : units) {
    EXPECT_EQ(kLPageStats.Run(RawMachines(), {"-q", "-u", word}).out, kAnyUnit);
    std::string expected = kilobytes;
    expected.replace(expected.find(": KB\n"), 5, ": " + title + "\n");
    EXPECT_EQ(kLPageStats.Run(RawMachines(), {"-u", word}).out, expected);
  }
}

TEST(LPageStats, ReadsAMachineInOrder) {
  Scenario host;
  AddVirtualMachine(host, 20, {.leader = -300});
  EXPECT_EQ(
      kLPageStats.Run(host, {"-g", "20", "-l", "1"}).Calls(),
      ReadsOfClient20() +
          "Create(1,2) AddInt(-300) Get(worldGroups_vmmLeaderID,[-300]) RemoveLast() Destroy() "
          "Create(1,2) AddInt(-299) Get(memory_lpage_vmLPage,[-299]) RemoveLast() Destroy() "
          "Destroy(sched_groups_members_groups,[20])");
}

TEST(LPageStats, AddsUpTheMachines) {
  KSI_VmLargePages first{};
  first.nrBackings = 3;
  KSI_VmLargePages second{};
  second.nrBackings = 4;
  EXPECT_EQ(
      kLPageStats.Rows(Pages(first, second), "name:schedGrp:parSchedGroup:worldGrp:nrBackings"),
      "web,10,4,100,3\n"
      "a database in its 28 letters,20,18446744073709551615,4294966996,4\n"
      "Total,,,,7\n");
}

TEST(LPageStats, AddsBackingsIn32Bits) {
  KSI_VmLargePages pages{};
  pages.nrBackings = 0x80000001;
  pages.nrLocked = 0x80000001;
  pages.maxSwapThreshold = UINT32_MAX;
  pages.nrBroken = uint64_t{1} << 63;
  pages.nrFailNoMem = kAllOnes;
  EXPECT_EQ(kLPageStats.Rows(Pages(pages, pages),
                             "nrBackings:nrLocked:nrBroken:maxSwapThreshold:nrFailNoMem"),
            "2147483649,2147483649,9223372036854775808,4294967295,18446744073709551615\n"
            "2147483649,2147483649,9223372036854775808,4294967295,18446744073709551615\n"
            "2,4294967298,0,8589934590,18446744073709551614\n");
}

TEST(LPageStats, KnowsNoFigureThatIsNotAvailable) {
  KSI_VmLargePages pages;
  std::memset(&pages, 0xff, sizeof pages);
  const std::string ones = "18446744073709551615";
  const std::string others = ",4294967295," + ones + "," + ones + "," + ones + "," + ones + "\n";
  Scenario host = Pages(pages, {});
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(kLPageStats.Rows(host, "", {"-u", unit}),
              "web,10,4,100,4294967295," + ones + ",4294967295," + ones + others +
                  "a database in its 28 letters,20,18446744073709551615,4294966996,"
                  "0,0,0,0,0,0,0,0,0\n"
                  "Total,,,,4294967295," +
                  ones + ",4294967295," + ones + others);
  }
}

TEST(LPageStats, LeavesOutAMachineWithoutAVmm) {
  Scenario host = TwoMachines();
  host.Fails("worldGroups_vmmLeaderID", {100}, 0xbad0095);
  const TallyRun run = kLPageStats.Run(host, {"-q", "-s", "name"});
  EXPECT_EQ(run.out, "name\na database in its 28 letters\nTotal\n");
  EXPECT_EQ(run.err, "Tally_GetVmmLeaderID() failure: Invalid vmm\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.Calls().find("[11]"), std::string::npos);
}

TEST(LPageStats, TotalsAreZeroWithoutMachines) {
  Scenario host;
  AddGroup(host, 4, {});
  const TallyRun run = kLPageStats.Run(host, {"-s", "name:worldGrp:nrBackings"});
  EXPECT_EQ(run.out,
            "\n VIRTUAL MACHINE LARGE PAGE STATS: Sat Nov 21 10:00:00 2026\n"
            " ----------------------------------------------------------\n"
            "   Start Group ID   : 4\n"
            "   No. of levels    : 12\n"
            "   Unit             : KB\n"
            "   Selected columns : name:worldGrp:nrBackings\n\n"
            "------------------------------------------\n"
            "                name   worldGrp nrBackings\n"
            "------------------------------------------\n"
            "------------------------------------------\n"
            "               Total                     0\n"
            "------------------------------------------\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(kLPageStats.Rows(host, ""), "Total,,,,0,0,0,0,0,0,0,0,0\n");
}

TEST(LPageStatsFailure, HidesTheMachine) {
  ExpectFailuresHideGroup10(
      kLPageStats, TwoMachines(),
      {{"worldGroups_vmmLeaderID", {100}, "Tally_GetVmmLeaderID() failure: Not found\n"},
       {"memory_lpage_vmLPage",
        {101},
        "TallyLPageGetLPageStats() failure, error code: 195887107\n"}});
}

}  // namespace
}  // namespace harness
