// lpool-stats.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/harness/golden.h"
#include "tests/harness/lines.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kMemInfo[] = "memory_memInfo";
constexpr char kNumVMs[] = "sched_globalStats_numVMs";
constexpr char kPsharePool[] = "memory_lpage_nodeList_psharePool";
constexpr char kVmPools[] = "memory_lpage_nodeList_vmPools";

constexpr char kTitle[] =
    "\n LPAGE POOL STATS: Sat Nov 21 10:00:00 2026\n"
    " -------------------------------------------\n";
constexpr char kUnitsNote[] =
    "Displayed stats are either in small 4K page (SPage) or large 2M page (LPage) units\n";

// Figures from `first` + 1 to `first` + 12 in the order of the columns. The bytes between them,
// which stand for no column, are set.
RawRecord Pool(uint32_t first) {
  return RawRecord(96)
      .U32(0, first + 1)     // nrLPages
      .U32(4, first + 2)     // nrFreeSPages
      .U64(8, first + 3)     // nrSPageAllocs
      .U64(16, first + 4)    // nrSPageFrees
      .U64(24, first + 5)    // nrReapAttempts
      .U64(32, first + 6)    // nrSPagesReaped
      .U64(40, first + 7)    // nrDefragAttempts
      .U64(56, first + 8)    // nrDefragCancelled
      .U64(64, first + 9)    // nrDefragReaped
      .U64(72, first + 10)   // nrLPagesDefragged
      .U64(80, first + 11)   // peakDefragAttempts
      .U64(88, first + 12);  // nrCachehit
}

// A host with so many memory nodes; they still need pools.
Scenario Nodes(uint32_t count) {
  return Scenario().Bytes(kMemInfo, {}, RawRecord(32).U32(20, count)).Value(kNumVMs, {}, 7U);
}

Scenario Host() {
  return Nodes(2)
      .Bytes(kPsharePool, {0}, Pool(1000))
      .List(kVmPools, {0}, {"vm-b", "vm-a"})
      .Bytes(kVmPools, {0, "vm-b"}, Pool(2000))
      .Bytes(kVmPools, {0, "vm-a"}, Pool(3000))
      .Bytes(kPsharePool, {1}, Pool(4000))
      .List(kVmPools, {1}, {"vm-b"})
      .Bytes(kVmPools, {1, "vm-b"}, Pool(5000));
}

// One memory node with a page sharing pool and one virtual machine's pool.
Scenario TwoPools(const RawRecord& psharePool, const RawRecord& vmPool) {
  return Nodes(1)
      .Bytes(kPsharePool, {0}, psharePool)
      .List(kVmPools, {0}, {"vm"})
      .Bytes(kVmPools, {0, "vm"}, vmPool);
}

TallyRun LPoolStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "lpool-stats"});
  return RunTally(scenario, args);
}

// The rows in CSV, with the Total row; name is among the columns anyway.
std::string Cells(const Scenario& scenario, const std::string& columns) {
  const TallyRun run = LPoolStats(scenario, {"-q", "-s", columns});
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
  return Rows(run.out);
}

// The report on the column nrCachehit.
constexpr char kHead[] =
    "   Selected columns : name:nrCachehit\n\n"
    "--------------------------------\n"
    "           name       nrCachehit\n"
    "--------------------------------\n";
constexpr char kPshare0[] = "       pshare-0             1012\n";
constexpr char kVmB0[] = "           vm-b             2012\n";
constexpr char kVmA0[] = "           vm-a             3012\n";
constexpr char kPshare1[] = "       pshare-1             4012\n";
constexpr char kVmB1[] = "           vm-b             5012\n";

std::string Total(const std::string& cell) {
  return Dashes(32) + "          Total" + std::string(17 - cell.size(), ' ') + cell + "\n" +
         Dashes(32) +
         "Description of report header labels:\n"
         "                name: Large page pool name\n"
         "          nrCachehit: Hit count in lpage victim cache\n" +
         kUnitsNote;
}

void ExpectReport(const Scenario& scenario, const std::string& rows, const std::string& warnings,
                  int status = 0) {
  const TallyRun run = LPoolStats(scenario, {"-v", "-s", "nrCachehit"});
  EXPECT_EQ(run.out, std::string(kTitle) + kHead + rows);
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, status);
}

TEST(LPoolStats, PrintsPoolsNodeByNode) {
  ExpectTallyGolden("golden/lpool_stats.txt", Host(), {"-r", "lpool-stats", "-v"});
}

TEST(LPoolStats, ReadsTheKernelInOrder) {
  EXPECT_EQ(LPoolStats(Host()).Calls(),
            "CheckSig() Get(memory_memInfo) Get(sched_globalStats_numVMs) "
            "Create(1,1) AddInt(0) Get(memory_lpage_nodeList_psharePool,[0]) Destroy() "
            "Create(1,2) AddInt(0) "
            "GetInstanceListAllocHint(memory_lpage_nodeList_vmPools,[0],7) Destroy() "
            "UsedCount(memory_lpage_nodeList_vmPools,[0]) "
            "GetString(memory_lpage_nodeList_vmPools,[0],0) "
            "Create(1,2) AddInt(0) AddString('vm-b') "
            "Get(memory_lpage_nodeList_vmPools,[0,'vm-b']) Destroy() "
            "GetString(memory_lpage_nodeList_vmPools,[0],1) "
            "Create(1,2) AddInt(0) AddString('vm-a') "
            "Get(memory_lpage_nodeList_vmPools,[0,'vm-a']) Destroy() "
            "Destroy(memory_lpage_nodeList_vmPools,[0]) "
            "Create(1,1) AddInt(1) Get(memory_lpage_nodeList_psharePool,[1]) Destroy() "
            "Create(1,2) AddInt(1) "
            "GetInstanceListAllocHint(memory_lpage_nodeList_vmPools,[1],7) Destroy() "
            "UsedCount(memory_lpage_nodeList_vmPools,[1]) "
            "GetString(memory_lpage_nodeList_vmPools,[1],0) "
            "Create(1,2) AddInt(1) AddString('vm-b') "
            "Get(memory_lpage_nodeList_vmPools,[1,'vm-b']) Destroy() "
            "Destroy(memory_lpage_nodeList_vmPools,[1])");
}

TEST(LPoolStats, PrintsNodesWithoutVirtualMachines) {
  const Scenario host = Nodes(2)
                            .Bytes(kPsharePool, {0}, Pool(0))
                            .List(kVmPools, {0}, {})
                            .Bytes(kPsharePool, {1}, Pool(100))
                            .List(kVmPools, {1}, {});
  EXPECT_EQ(Cells(host, "nodeID:nrLPages"), "pshare-0,0,1\npshare-1,1,101\nTotal,,102\n");
}

TEST(LPoolStats, NumbersTheNodes) {
  Scenario host = Nodes(12);
  std::string rows;
  for (int node = 0; node < 12; ++node) {
    host.Bytes(kPsharePool, {node}, Pool(0)).List(kVmPools, {node}, {});
    rows += "pshare-" + std::to_string(node) + "," + std::to_string(node) + "\n";
  }
  EXPECT_EQ(Cells(host, "nodeID"), rows + "Total,\n");
}

TEST(LPoolStats, PrintsAnEmptyReportWithoutNodes) {
  ExpectReport(Nodes(0), Total("0"), "");
  EXPECT_EQ(LPoolStats(Nodes(0)).Calls(),
            "CheckSig() Get(memory_memInfo) Get(sched_globalStats_numVMs)");
  EXPECT_EQ(LPoolStats(Nodes(0), {"-q"}).out,
            "name,nodeID,nrLPages,nrFreeSPages,nrSPageAllocs,nrSPageFrees,nrReapAttempts,"
            "nrSPagesReaped,nrDefragAttempts,nrDefragCancelled,nrDefragReaped,nrLPagesDefragged,"
            "peakDefragAttempts,nrCachehit\n"
            "Total,,0,0,0,0,0,0,0,0,0,0,0,0\n");
}

// The number of virtual machines is a hint and no more.
TEST(LPoolStats, DoesNotCountOnTheNumberOfVirtualMachines) {
  for (const uint32_t hint : {0U, 1U, UINT32_MAX}) {
    Scenario host = Host();
    host.Value(kNumVMs, {}, hint);
    EXPECT_EQ(Cells(host, "nrCachehit"), Cells(Host(), "nrCachehit"));
    EXPECT_NE(LPoolStats(host).Calls().find(
                  "GetInstanceListAllocHint(memory_lpage_nodeList_vmPools,[0]," +
                  std::to_string(hint) + ")"),
              std::string::npos);
  }
}

TEST(LPoolStats, ShowsAllOnes) {
  const RawRecord pool =
      RawRecord(96).U32({0, 4}, UINT32_MAX).U64({8, 16, 24, 32, 40, 56, 64, 72, 80, 88}, kAllOnes);
  std::string wide;
  for (int i = 0; i < 10; ++i) wide += ",18446744073709551615";
  const std::string cells = "4294967295,4294967295" + wide + "\n";
  const Scenario host = Nodes(1).Bytes(kPsharePool, {0}, pool).List(kVmPools, {0}, {});
  EXPECT_EQ(Rows(LPoolStats(host, {"-q"}).out), "pshare-0,0," + cells + "Total,," + cells);
}

TEST(LPoolStats, AddsUpInTheWidthsOfTheFields) {
  RawRecord one = Pool(0);
  RawRecord other = Pool(0);
  one.U32(0, UINT32_MAX).U32(4, 3000000000).U64(8, kAllOnes).U64(16, UINT32_MAX).U64(88, kAllOnes);
  other.U32(0, 2).U32(4, 3000000000).U64(8, 3).U64(16, UINT32_MAX).U64(88, kAllOnes);
  EXPECT_EQ(
      Cells(TwoPools(one, other), "nrLPages:nrFreeSPages:nrSPageAllocs:nrSPageFrees:nrCachehit"),
      "pshare-0,4294967295,3000000000,18446744073709551615,4294967295,18446744073709551615\n"
      "vm,2,3000000000,3,4294967295,18446744073709551615\n"
      "Total,1,1705032704,2,8589934590,18446744073709551614\n");
}

TEST(LPoolStats, AddsUpThePeaks) {
  EXPECT_EQ(Cells(TwoPools(Pool(0).U64(80, 70), Pool(0).U64(80, 50)), "peakDefragAttempts"),
            "pshare-0,70\nvm,50\nTotal,120\n");
}

TEST(LPoolStats, PrintsCsv) {
  for (const char* option : {"-q", "--csvMode"}) {
    EXPECT_EQ(LPoolStats(Host(), {option}).out,
              "name,nodeID,nrLPages,nrFreeSPages,nrSPageAllocs,nrSPageFrees,nrReapAttempts,"
              "nrSPagesReaped,nrDefragAttempts,nrDefragCancelled,nrDefragReaped,nrLPagesDefragged,"
              "peakDefragAttempts,nrCachehit\n"
              "pshare-0,0,1001,1002,1003,1004,1005,1006,1007,1008,1009,1010,1011,1012\n"
              "vm-b,0,2001,2002,2003,2004,2005,2006,2007,2008,2009,2010,2011,2012\n"
              "vm-a,0,3001,3002,3003,3004,3005,3006,3007,3008,3009,3010,3011,3012\n"
              "pshare-1,1,4001,4002,4003,4004,4005,4006,4007,4008,4009,4010,4011,4012\n"
              "vm-b,1,5001,5002,5003,5004,5005,5006,5007,5008,5009,5010,5011,5012\n"
              "Total,,15005,15010,15015,15020,15025,15030,15035,15040,15045,15050,15055,15060\n");
  }
}

TEST(LPoolStats, AlwaysShowsTheName) {
  const std::string rows =
      std::string(kPshare0) + kVmB0 + kVmA0 + kPshare1 + kVmB1 + Total("15060");
  for (const char* option : {"-s", "--cSelect"}) {
    EXPECT_EQ(LPoolStats(Host(), {option, "NRCACHEHIT", "-v"}).out,
              std::string(kTitle) + kHead + rows);
  }
  EXPECT_EQ(LPoolStats(Nodes(0), {"-s", "bogus"}).out,
            std::string(kTitle) +
                "   Selected columns : name\n\n"
                "---------------\n           name\n---------------\n"
                "---------------\n          Total\n---------------\n");
}

TEST(LPoolStats, AddsANoteToTheDescriptions) {
  for (const char* option : {"-v", "--verbose"}) {
    EXPECT_EQ(LPoolStats(Host(), {option, "-q", "-s", "nodeID"}).out,
              "name,nodeID\npshare-0,0\nvm-b,0\nvm-a,0\npshare-1,1\nvm-b,1\nTotal,\n"
              "Description of report header labels:\n"
              "                name: Large page pool name\n"
              "              nodeID: Home memory node the pool\n" +
                  std::string(kUnitsNote));
  }
}

TEST(LPoolStats, ShowsLongNamesWhole) {
  const std::string longName(200, 'v');
  const Scenario host = Nodes(1)
                            .Bytes(kPsharePool, {0}, Pool(0))
                            .List(kVmPools, {0}, {longName, "", "vm,2"})
                            .Bytes(kVmPools, {0, longName}, Pool(10))
                            .Bytes(kVmPools, {0, ""}, Pool(20))
                            .Bytes(kVmPools, {0, "vm,2"}, Pool(30));
  EXPECT_EQ(Cells(host, "nrLPages"), "pshare-0,1\n" + longName + ",11\n,21\nvm,2,31\nTotal,64\n");
}

TEST(LPoolStats, RealignsAfterAWideName) {
  const Scenario host = Nodes(1)
                            .Bytes(kPsharePool, {0}, Pool(0))
                            .List(kVmPools, {0}, {"a-pool-of-a-virtual-machine"})
                            .Bytes(kVmPools, {0, "a-pool-of-a-virtual-machine"}, Pool(9));
  const TallyRun run = LPoolStats(host, {"-s", "nodeID:nrLPages:nrCachehit"});
  EXPECT_TRUE(
      run.out.ends_with("\n"
                        "           name  nodeID         nrLPages       nrCachehit\n"
                        "---------------------------------------------------------\n"
                        "       pshare-0       0                1               12\n"
                        "a-pool-of-a-virtual-machine 0         10               21\n"
                        "---------------------------------------------------------\n"
                        "          Total                       11               33\n"
                        "---------------------------------------------------------\n"))
      << run.out;
}

TEST(LPoolStats, PassesOverUnknownOptions) {
  const TallyRun run =
      LPoolStats(Nodes(0), {"-u", "bogus", "--unit", "mb", "-l", "0", "-x", "-q", "-s", "bogus"});
  EXPECT_EQ(run.out, "name\nTotal\n");
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(LPoolStatsFailure, OfTheMemoryInformation) {
  const Scenario host = Host().Fails(kMemInfo, {}, 0xbad0017);
  ExpectReport(host, "", "TallyTraversLPools: KSI_Get hardwareInfo failure\n", 1);
  EXPECT_EQ(LPoolStats(host).Calls(), "CheckSig() Get(memory_memInfo)=0xbad0017");
}

TEST(LPoolStatsFailure, OfTheNumberOfVirtualMachines) {
  for (const Scenario& host : {Host(), Nodes(0)}) {
    Scenario failing = host;
    failing.Fails(kNumVMs, {}, 0xbad0017);
    ExpectReport(failing, "", "TallyTraversLPools: KSI_Get numVMs failure\n", 1);
    EXPECT_EQ(LPoolStats(failing).Calls(),
              "CheckSig() Get(memory_memInfo) Get(sched_globalStats_numVMs)=0xbad0017");
  }
}

// The second node loses its page sharing pool and keeps its virtual machine's.
TEST(LPoolStatsFailure, OfAPageSharingPool) {
  const std::string rows = std::string(kPshare0) + kVmB0 + kVmA0 + kVmB1 + Total("11048");
  ExpectReport(Host().FailCall("Create", 5, 0xbad0014), rows,
               "TallyGetPSharePoolStats: KSI_ParamListCreate() failure\n");
  ExpectReport(Host().FailCall("AddInt", 5, 0xbad00b4), rows,
               "TallyGetPSharePoolStats: KSI_ParamListAddInt() failure, error code: 195887284\n");
  const Scenario host = Host().Fails(kPsharePool, {1}, 0xbad0003);
  ExpectReport(host, rows, "TallyGetVmPoolStats() failure, error code: 195887107\n");
  EXPECT_NE(LPoolStats(host).Calls().find("Get(memory_lpage_nodeList_psharePool,[1])=0xbad0003 "
                                          "Destroy() Create(1,2) AddInt(1) "
                                          "GetInstanceListAllocHint("),
            std::string::npos);
}

TEST(LPoolStatsFailure, OfAVirtualMachinesPool) {
  const std::string rows = std::string(kPshare0) + kVmA0 + kPshare1 + kVmB1 + Total("13048");
  ExpectReport(Host().FailCall("Create", 3, 0xbad0014), rows,
               "TallyGetVmPoolStats: KSI_ParamListCreate() failure\n");
  ExpectReport(Host().FailCall("AddInt", 3, 0xbad00b4), rows,
               "TallyGetVmPoolStats: KSI_ParamListAddInt() failure, error code: 195887284\n");
  ExpectReport(Host().FailCall("AddString", 1, 0xbad00b4), rows,
               "TallyGetVmPoolStats: KSI_ParamListAddString() failure, error code: 195887284\n");
  const Scenario host = Host().Fails(kVmPools, {0, "vm-b"}, 0xbad0003);
  ExpectReport(host, rows, "TallyGetVmPoolStats() failure, error code: 195887107\n");
  EXPECT_NE(LPoolStats(host).Calls().find("[0,'vm-b'])=0xbad0003 Destroy() "
                                          "GetString(memory_lpage_nodeList_vmPools,[0],1) "),
            std::string::npos);
}

TEST(LPoolStatsFailure, OfEveryPool) {
  Scenario host = Host();
  host.Fails(kPsharePool, {0}, 0xbad0003).Fails(kPsharePool, {1}, 0xbad0003);
  host.Fails(kVmPools, {0, "vm-b"}, 0xbad0003).Fails(kVmPools, {0, "vm-a"}, 4294967295);
  host.Fails(kVmPools, {1, "vm-b"}, 0xbad0017);
  ExpectReport(host, Total("0"),
               "TallyGetVmPoolStats() failure, error code: 195887107\n"
               "TallyGetVmPoolStats() failure, error code: 195887107\n"
               "TallyGetVmPoolStats() failure, error code: 4294967295\n"
               "TallyGetVmPoolStats() failure, error code: 195887107\n"
               "TallyGetVmPoolStats() failure, error code: 195887127\n");
}

// What was printed stays; neither totals nor descriptions follow.
TEST(LPoolStatsFailure, OfAListOfNames) {
  const std::string firstNode = std::string(kPshare0) + kVmB0 + kVmA0 + kPshare1;
  ExpectReport(Host().FailCall("Create", 6, 0xbad0014), firstNode,
               "TallyTraverseLPools: KSI_ParamListCreate() failure\n", 1);
  ExpectReport(Host().FailCall("AddInt", 6, 0xbad00b4), firstNode,
               "TallyTraverseLPools: KSI_ParamListAddInt() failure, error code: 195887284\n", 1);
  ExpectReport(Host().Fails(kVmPools, {1}, 0xbad0003), firstNode,
               "TallyTraverseLPools: KSI_GetInstanceListAllocHint() failure\n", 1);
  ExpectReport(Host().Fails(kVmPools, {0}, 0xbad0003), kPshare0,
               "TallyTraverseLPools: KSI_GetInstanceListAllocHint() failure\n", 1);
  EXPECT_TRUE(LPoolStats(Host().FailCall("AddInt", 2, 0xbad00b4))
                  .Calls()
                  .ends_with("Create(1,2) AddInt(0)=0xbad00b4 Destroy()"));
  EXPECT_TRUE(LPoolStats(Host().Fails(kVmPools, {0}, 0xbad0003))
                  .Calls()
                  .ends_with("GetInstanceListAllocHint(memory_lpage_nodeList_vmPools,[0],7)"
                             "=0xbad0003 Destroy()"));
}

// The list of names is not destroyed then.
TEST(LPoolStatsFailure, OfAName) {
  for (const Item& bad : {Item::Unreadable(0xbad0003), Item(5)}) {
    Scenario host = Host();
    host.List(kVmPools, {0}, {"vm-b", bad, "vm-a"});
    const TallyRun run = TryTally(host, {"-r", "lpool-stats", "-v", "-s", "nrCachehit"});
    EXPECT_EQ(run.out, std::string(kTitle) + kHead + kPshare0 + kVmB0);
    EXPECT_EQ(run.err, "TallyTraverseLPools: KSI_ParamListGetString() failure\n");
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.problems,
              std::vector<std::string>{"leaked list: memory_lpage_nodeList_vmPools,[0]"});
    EXPECT_TRUE(run.calls.back().starts_with("GetString(memory_lpage_nodeList_vmPools,[0],1)="));
  }
}

}  // namespace
}  // namespace harness
