// Captures of a scripted host, through its own library, and what the reports make of them.
#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <vector>

#include <knvlibs/ksi_status.h>
#include "tests/harness/hosts.h"
#include "tests/harness/report.h"
#include "tests/harness/tally.h"
#include "tests/ksicache/ksicache_fixture.h"

namespace harness {
namespace {

const std::vector<Args> kReports = {
    {"group-stats", "-t"},
    {"vm-stats"},
    {"uw-stats"},
    {"pshare-stats"},
    {"pshareHint-stats"},
    {"swap-stats"},
    {"buddy-stats"},
    {"comp-stats"},
    {"lpool-stats"},
    {"heap-stats", "-v"},
    {"guest-stats", "-u", "kb"},
    {"zip-stats"},
    {"lpage-stats"},
    {"asyncremap-stats"},
    {"pmem-stats"},
    {"pmem-stats", "-l", "2"},
};

void AddClients(Scenario& host) {
  AddGroup(host, 0, {.name = "host", .children = {4, 30}});
  AddUserWorld(host, 30, {.name = "shell \x1b[2J", .leader = 400});
  host.List("sched_memClients_remapTypes", {100}, {"numa", "a type of more than 28 letters"})
      .List("sched_memClients_remapTypes", {400}, {"numa"})
      .Value("sched_memClients_remapTypes", {100, "numa"}, NumberedRemapType(1000))
      .Value("sched_memClients_remapTypes", {100, "a type of more than 28 letters"},
             NumberedRemapType(2000))
      .Value("sched_memClients_remapTypes", {400, "numa"}, NumberedRemapType(3000));
}

void AddMemory(Scenario& host) {
  AddHostMemory(host, {});
  KSI_MemInfo memory{};
  memory.numNodes = 2;
  KSI_MemNode node{};
  KSI_BuddyStats buddy{};
  buddy.buffers[0].free = 11;
  host.Value("memory_pshare_stats", {}, NumberedPshareStats(1000))
      .List("system_buddy", {}, {"heap", "memmap-03-hi", "memmap-03-lo"})
      .Value("memory_memNodes", {3}, node)
      .Value("system_buddy_comprehensive", {"memmap-03-lo"}, buddy)
      .Value("system_buddy_comprehensive", {"memmap-03-hi"}, buddy)
      .List("system_heaps", {}, {"main", "net"})
      .Value("system_heaps_stats", {"main"}, NumberedHeapStats("main", 100))
      .Value("system_heaps_stats", {"net"}, NumberedHeapStats("net", 20000))
      .Value("memory_memInfo", {}, memory)
      .Value("sched_globalStats_numVMs", {}, uint32_t{2});
  for (const int pool : {0, 1}) {
    host.Value("memory_lpage_nodeList_psharePool", {pool}, NumberedLargePagePool(1))
        .List("memory_lpage_nodeList_vmPools", {pool}, {"vm.a"})
        .Value("memory_lpage_nodeList_vmPools", {pool, "vm.a"}, NumberedLargePagePool(10));
  }
}

void AddPersistentMemory(Scenario& host) {
  KSI_PmemRegionStore store{};
  store.alloc2MBlocks = 7;
  KSI_PmemRegion region{};
  region.reserved = 9;
  host.List("memory_pmem_volumes", {}, {"a", "b"});
  for (const char* volume : {"a", "b"}) {
    host.Value("memory_pmem_volumes_info", {volume}, KSI_PmemVolume{})
        .Value("memory_pmem_volumes_regionStore_info", {volume}, store)
        .Value("memory_pmem_volumes_regionStore_isClean", {volume}, uint8_t{1})
        .List("memory_pmem_volumes_regionStore_regions", {volume}, {"r"})
        .Value("memory_pmem_volumes_regionStore_regions_info", {volume, "r"}, region);
  }
}

// A host that has something for every report.
Scenario WholeHost() {
  Scenario host = TwoMachines();
  host.OthersFail(KSI_STATUS_NOT_FOUND);
  AddClients(host);
  AddMemory(host);
  AddPersistentMemory(host);
  return host;
}

// The title block tells the time of the run.
std::string WithoutTime(const std::string& output) {
  static const std::regex time("STATS: [A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9]{2} [0-9:]{8} [0-9]{4}\n");
  return std::regex_replace(output, time, "STATS: (the time)\n");
}

Program Ksicache() {
  Program program;
  program.path = KSICACHE_PROGRAM;
  return program;
}

class Replay : public testing::Test {
 protected:
  TallyRun Capture(const Scenario& host) const {
    return TryTally(host, {"capture", "--force", File()}, Ksicache());
  }

  // Expects every report to say of the capture what it says of the host. Gives how many read
  // `node`.
  size_t ExpectSameReports(const Scenario& host, const std::string& node) const {
    size_t readers = 0;
    for (const Args& report : kReports) {
      Args args = {"-r"};
      args.insert(args.end(), report.begin(), report.end());
      const TallyRun live = RunTally(host, args);
      if (live.Calls().find("(" + node) == std::string::npos) continue;
      ++readers;
      args.insert(args.begin(), {"-c", File()});
      const Result replayed = RunProgram(BuiltTally(args));
      EXPECT_EQ(WithoutTime(replayed.out), WithoutTime(live.out)) << report[0];
      EXPECT_EQ(replayed.err, live.err) << report[0];
      EXPECT_EQ(replayed.status, live.status) << report[0];
    }
    return readers;
  }

  std::string File() const { return directory_.Path("host.ksi"); }

 private:
  ksi::TestDirectory directory_;
};

TEST_F(Replay, ReportsSayTheSameOfACapture) {
  const Scenario host = WholeHost();
  const TallyRun capture = Capture(host);
  EXPECT_EQ(capture.problems, std::vector<std::string>());
  EXPECT_EQ(capture.status, 0);
  EXPECT_EQ(capture.err, "");
  EXPECT_NE(capture.out.find("absent "), capture.out.npos) << capture.out;
  EXPECT_EQ(ExpectSameReports(host, ""), kReports.size());
}

struct ReadToFail {
  const char* node;
  Items keys;
};

TEST_F(Replay, ReportsSayTheSameOfFailures) {
  const ReadToFail reads[] = {
      {"sched_groups_groupName", {10}},
      {"sched_groups_groupTag", {4}},
      {"sched_groups_parentGroupID", {10}},
      {"sched_groups_groupFlags", {10}},
      {"sched_groups_groupLeaderID", {20}},
      {"sched_groups_memAllocationInKB", {11}},
      {"sched_groups_stats_capacity", {4}},
      {"sched_groups_stats_memoryStats", {10}},
      {"sched_groups_members_groups", {10}},
      {"sched_groups_members_memClients", {30}},
      {"sched_memClients_tally_vmm", {100}},
      {"sched_memClients_tally_uw", {400}},
      {"sched_memClients_tally_guest", {100}},
      {"sched_memClients_swapInfo", {101}},
      {"sched_memClients_memzipInfo", {100}},
      {"sched_memClients_remapTypes", {400}},
      {"sched_memClients_remapTypes", {400, "numa"}},
      {"worldGroups_vmmLeaderID", {100}},
      {"sched_globalStats_numVMs", {}},
      {"sched_globalStats_memory_tally", {}},
      {"sched_globalStats_memory_stateTransitions", {"soft"}},
      {"memory_comprehensive", {}},
      {"memory_memInfo", {}},
      {"memory_memNodes", {3}},
      {"memory_pshare_stats", {}},
      {"system_buddy", {}},
      {"system_buddy_comprehensive", {"memmap-03-lo"}},
      {"system_heaps", {}},
      {"system_heaps_stats", {"net"}},
      {"memory_lpage_vmLPage", {101}},
      {"memory_lpage_nodeList_psharePool", {1}},
      {"memory_lpage_nodeList_vmPools", {1}},
      {"memory_lpage_nodeList_vmPools", {1, "vm.a"}},
      {"memory_pmem_volumes", {}},
      {"memory_pmem_volumes_info", {"b"}},
      {"memory_pmem_volumes_regionStore_info", {"b"}},
      {"memory_pmem_volumes_regionStore_isClean", {"b"}},
      {"memory_pmem_volumes_regionStore_regions", {"b"}},
      {"memory_pmem_volumes_regionStore_regions_info", {"b", "r"}},
  };
  for (const auto& [node, keys] : reads) {
    SCOPED_TRACE(node);
    Scenario host = WholeHost();
    host.Fails(node, keys, KSI_STATUS_NO_MEMORY);
    const TallyRun capture = Capture(host);
    EXPECT_EQ(capture.problems, std::vector<std::string>());
    EXPECT_EQ(capture.status, 1);
    EXPECT_NE(capture.out.find("\nfailed     1: "), capture.out.npos) << capture.out;
    EXPECT_NE(capture.out.find(" (0xbad0014 Out of memory)\n"), capture.out.npos) << capture.out;
    EXPECT_GT(ExpectSameReports(host, node), 0u);
  }
}

TEST_F(Replay, OtherDefinitionsAreSeenAgain) {
  Scenario host = WholeHost();
  host.Signature(KSI_STATUS_CHECKSUM_MISMATCH, "Jan  2 2025 03:04:05", "Nov 21 2026 10:00:00");
  EXPECT_EQ(Capture(host).status, 0);
  Program info = Ksicache();
  info.args = {"ksicache", "info", File()};
  const std::string out = RunProgram(info).out;
  EXPECT_NE(out.find("\nbuilt      Jan  2 2025 03:04:05\n"
                     "signature  00000000000000000000000000000000, not "),
            out.npos)
      << out;
  const Result replayed = RunProgram(BuiltTally({"-c", File(), "-r", "comp-stats"}));
  EXPECT_EQ(replayed.status, 1);
  EXPECT_NE(replayed.err.find("Jan  2 2025 03:04:05"), replayed.err.npos) << replayed.err;
}

TEST_F(Replay, FailedReadsAreToldApart) {
  Scenario host = WholeHost();
  host.Fails("sched_groups_groupTag", {4}, KSI_STATUS_PERMISSION_DENIED)
      .Fails("sched_groups_groupTag", {10}, KSI_STATUS_NO_HANDLER);
  const TallyRun refused = Capture(host);
  EXPECT_EQ(refused.status, 0);
  EXPECT_NE(
      refused.out.find("\nrefused    1: sched/groups/groupTag [4] (0xbad005a Permission denied)\n"),
      refused.out.npos)
      << refused.out;
  EXPECT_EQ(refused.out.find("failed"), refused.out.npos);
  for (const int group : {20, 11, 12, 30}) {
    host.Fails("sched_groups_groupTag", {group}, KSI_STATUS_IO_ERROR);
  }
  const TallyRun failed = Capture(host);
  EXPECT_EQ(failed.status, 1);
  EXPECT_NE(failed.out.find("\nfailed     4: sched/groups/groupTag ["), failed.out.npos)
      << failed.out;
  EXPECT_NE(failed.out.find(" (0xbad000a I/O error) and 1 more\n"), failed.out.npos) << failed.out;
}

TEST_F(Replay, AListThatCannotBeReadToItsEndFails) {
  Scenario host = WholeHost();
  host.List("system_heaps", {}, {"main", Item::Unreadable(KSI_STATUS_READ_ERROR)});
  const TallyRun capture = Capture(host);
  EXPECT_EQ(capture.problems, std::vector<std::string>());
  EXPECT_EQ(capture.status, 1);
  EXPECT_NE(capture.out.find("\nfailed     1: system/heaps (0xbad000b Read error)\n"),
            capture.out.npos)
      << capture.out;
  host.List("system_heaps", {}, {std::string(4097, 'x')});
  EXPECT_NE(Capture(host).out.find("\nfailed     1: system/heaps (0xbad0122 "), std::string::npos);
}

TEST_F(Replay, AHostOfWhichNothingCanBeReadLeavesNoFile) {
  Scenario host;
  host.OthersFail(KSI_STATUS_PERMISSION_DENIED);
  const TallyRun capture = Capture(host);
  EXPECT_EQ(capture.status, 1);
  EXPECT_EQ(capture.out, "");
  EXPECT_TRUE(capture.err.starts_with("ksicache: nothing of the host can be read; failed reads "))
      << capture.err;
  EXPECT_EQ(access(File().c_str(), F_OK), -1);
}

TEST_F(Replay, StandardOutputHasTheFileAloneAndStandardErrorTheRest) {
  const TallyRun run = TryTally(WholeHost(), {"capture", "-"}, Ksicache());
  EXPECT_EQ(run.status, 0);
  EXPECT_TRUE(run.err.starts_with("ksicache: standard output: ")) << run.err;
  ksi::WriteContent(File(), run.out);
  ExpectSameReports(WholeHost(), "system_heaps");
}

TEST_F(Replay, ALibraryThatOpensNoHostsSaysSo) {
  const TallyRun run = TryTally(WholeHost(), {"capture", "--root", "/", File()}, Ksicache());
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(
      run.err,
      "ksicache: this libknvlibs.so reads no host but its own: --root takes the one of tally\n");
  EXPECT_EQ(access(File().c_str(), F_OK), -1);
}

}  // namespace
}  // namespace harness
