#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "tests/harness/golden.h"
#include "tests/harness/hosts.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/report.h"

namespace harness {
namespace {

constexpr Report kZipStats("zip-stats");

// clang-format off
constexpr char kKilobytes[] =
    "name,schedGrp,parSchedGroup,worldGrp,totalCache,maxCache,usedCache,zipped,unZipped,zipRejected,nrFreeHalf,nrFreeQuarter,avgZipTime,avgUnzipTime\n"
    "web,10,4,100,104447,105471,106495,107519,108543,109567,2049,2050,110591,111615\n"
    "a database in its 28 letters,20,18446744073709551615,-300,4398046717951,4398046718975,4398046719999,4398046721023,4398046722047,4398046723071,4294967295,4294967294,4398046724095,4398046725119\n"
    "Total,,,,4398046822398,4398046824446,4398046826494,4398046828542,4398046830590,4398046832638,4294969344,4294969344,2199023417343,2199023418367\n";
constexpr char kMegabytes[] =
    "web,10,4,100,101,102,103,104,105,106,2049,2050,110591,111615\n"
    "a database in its 28 letters,20,18446744073709551615,-300,4294967497,4294967498,4294967499,4294967500,4294967501,4294967502,4294967295,4294967294,4398046724095,4398046725119\n"
    "Total,,,,4294967599,4294967601,4294967603,4294967605,4294967607,4294967609,4294969344,4294969344,2199023417343,2199023418367\n";
constexpr char kPages[] =
    "web,10,4,100,26111,26367,26623,26879,27135,27391,2049,2050,110591,111615\n"
    "a database in its 28 letters,20,18446744073709551615,-300,1099511679487,1099511679743,1099511679999,1099511680255,1099511680511,1099511680767,4294967295,4294967294,4398046724095,4398046725119\n"
    "Total,,,,1099511705599,1099511706111,1099511706623,1099511707135,1099511707647,1099511708159,4294969344,4294969344,2199023417343,2199023418367\n";
// clang-format on

// A compression cache with amounts from Kb(first) on in the order of the columns.
RawRecord RawCache(uint64_t first, uint32_t halves, uint32_t quarters) {
  return RawRecord(136)
      .Amounts(first, {0, 16, 8, 32, 40, 56, 80, 104})
      .U32(24, halves)
      .U32(28, quarters);
}

Scenario RawMachines() {
  Scenario host = TwoMachines();
  host.Bytes("sched_memClients_memzipInfo", {100}, RawCache(101, 2049, 2050))
      .Bytes("sched_memClients_memzipInfo", {-300},
             RawCache(4294967497, UINT32_MAX, UINT32_MAX - 1));
  return host;
}

// The two machines with these caches.
Scenario Caches(const KSI_MemzipInfo& first, const KSI_MemzipInfo& second) {
  Scenario host = TwoMachines();
  host.Value("sched_memClients_memzipInfo", {100}, first)
      .Value("sched_memClients_memzipInfo", {-300}, second);
  return host;
}

std::string Rows(const Scenario& host, const std::string& columns, const Args& args = {}) {
  return kZipStats.Rows(host, columns, args);
}

TEST(ZipStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/zip_stats.txt", RawMachines(), {"-r", "zip-stats", "-g", "4", "-v"});
}

TEST(ZipStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kZipStats.Run(RawMachines(), {"-q"}).out, kKilobytes);
  EXPECT_EQ(Rows(RawMachines(), "", {"-u", "mb"}), kMegabytes);
  EXPECT_EQ(Rows(RawMachines(), "", {"-u", "pg"}), kPages);
}

TEST(ZipStats, ReadsAMachineInOrder) {
  Scenario host;
  AddVirtualMachine(host, 20, {.leader = -300});
  EXPECT_EQ(kZipStats.Run(host, {"-g", "20", "-l", "1"}).Calls(),
            ReadsOfClient20() +
                "Create(1,2) AddInt(-300) Get(sched_memClients_memzipInfo,[-300]) RemoveLast() "
                "Destroy() "
                "Destroy(sched_groups_members_groups,[20])");
}

TEST(ZipStats, ShowsTheMeanOfTheAveragesInTheTotal) {
  KSI_MemzipInfo first{};
  first.avgZipTime = 10;
  first.avgUnzipTime = 7;
  KSI_MemzipInfo second{};
  second.avgZipTime = 21;
  second.avgUnzipTime = 0;
  EXPECT_EQ(Rows(Caches(first, second), "avgZipTime:avgUnzipTime"), "10,7\n21,0\n15,3\n");
  // Times have no unit of memory.
  EXPECT_EQ(Rows(Caches(first, second), "avgZipTime:avgUnzipTime", {"-u", "mb"}),
            "10,7\n21,0\n15,3\n");
}

TEST(ZipStats, TakesTheMeanOfTheMachinesShown) {
  KSI_MemzipInfo first{};
  first.avgZipTime = 10;
  KSI_MemzipInfo second{};
  second.avgZipTime = 21;
  Scenario host = Caches(first, second);
  host.Fails("sched_memClients_memzipInfo", {100}, 0xbad0003);
  EXPECT_EQ(kZipStats.Run(host, {"-q", "-s", "avgZipTime"}).out, "avgZipTime\n21\n21\n");
  EXPECT_EQ(kZipStats.Rows(Caches(first, second), "avgZipTime", {"-g", "10"}), "10\n10\n");
}

TEST(ZipStats, SumsOfTimesWrapBeforeTheyAreDivided) {
  KSI_MemzipInfo info{};
  info.avgZipTime = kAllOnes;
  info.avgUnzipTime = uint64_t{1} << 63;
  EXPECT_EQ(Rows(Caches(info, info), "avgZipTime:avgUnzipTime"),
            "18446744073709551615,9223372036854775808\n18446744073709551615,9223372036854775808\n"
            "9223372036854775807,0\n");
}

TEST(ZipStats, KeepsWhatIsNotAvailableInEveryUnit) {
  KSI_MemzipInfo info;
  std::memset(&info, 0xff, sizeof info);
  const std::string none = "18446744073709551615";
  const std::string sizes = none + "," + none + "," + none + "," + none + "," + none + "," + none;
  Scenario host = Caches(info, {});
  host.List("sched_groups_members_groups", {4}, {10});
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Rows(host, "", {"-u", unit}),
              "web,10,4,100," + sizes + ",4294967295,4294967295," + none + "," + none + "\n" +
                  "Total,,,," + sizes + ",4294967295,4294967295," + none + "," + none + "\n");
  }
}

TEST(ZipStats, AddsWhatIsNotAvailableLikeANumber) {
  KSI_MemzipInfo first{};
  first.maxCache = kAllOnes;
  KSI_MemzipInfo second{};
  second.maxCache = 4096;
  EXPECT_EQ(Rows(Caches(first, second), "maxCache"), "18446744073709551615\n4096\n4095\n");
  EXPECT_EQ(Rows(Caches(first, second), "maxCache", {"-u", "mb"}), "18446744073709551615\n4\n3\n");
}

TEST(ZipStats, ConvertsTotalsOnce) {
  KSI_MemzipInfo info{};
  info.usedCache = 6;
  info.zipped = 1023;
  EXPECT_EQ(Rows(Caches(info, info), "usedCache:zipped", {"-u", "pg"}), "1,255\n1,255\n3,511\n");
  EXPECT_EQ(Rows(Caches(info, info), "usedCache:zipped", {"-u", "mb"}), "0,0\n0,0\n0,1\n");
}

TEST(ZipStats, AddsCountsIn64Bits) {
  KSI_MemzipInfo info{};
  info.nrFreeHalf = UINT32_MAX;
  info.nrFreeQuarter = 0x80000000;
  EXPECT_EQ(Rows(Caches(info, info), "nrFreeHalf:nrFreeQuarter", {"-u", "mb"}),
            "4294967295,2147483648\n4294967295,2147483648\n8589934590,4294967296\n");
}

TEST(ZipStats, TotalsAreZeroWithoutMachines) {
  Scenario host;
  AddUserWorld(host, 4, {});
  const TallyRun run = kZipStats.Run(host, {"-s", "name:maxCache:avgZipTime"});
  EXPECT_EQ(run.out,
            "\n VIRTUAL MACHINE COMPRESSION STATS: Sat Nov 21 10:00:00 2026\n"
            " -------------------------------------------------------------\n"
            "   Start Group ID   : 4\n"
            "   No. of levels    : 12\n"
            "   Unit             : KB\n"
            "   Selected columns : name:maxCache:avgZipTime\n\n"
            "------------------------------------------\n"
            "                name   maxCache avgZipTime\n"
            "------------------------------------------\n"
            "------------------------------------------\n"
            "               Total          0          0\n"
            "------------------------------------------\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(Rows(host, ""), "Total,,,,0,0,0,0,0,0,0,0,0,0\n");
}

TEST(ZipStatsFailure, HidesTheMachine) {
  ExpectFailuresHideGroup10(kZipStats, TwoMachines(),
                            {{"sched_memClients_memzipInfo",
                              {100},
                              "TallyZipGetZipStats() failure, error code: 195887107\n"}});
}

}  // namespace
}  // namespace harness
