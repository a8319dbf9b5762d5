// The fault sweeps of the host reports.
#include <gtest/gtest.h>

#include "tests/harness/fault_sweep.h"
#include "tests/harness/hosts.h"

namespace harness {
namespace {

TEST(FaultSweep, PshareStats) {
  Scenario host;
  host.Value("memory_pshare_stats", {}, NumberedPshareStats(1000));
  ExpectFaultSweep({.golden = "fault/pshare_stats.txt",
                    .scenario = host,
                    .args = {"-r", "pshare-stats", "-s", "cow:totRemove", "-v"}});
}

TEST(FaultSweep, PshareHintStats) {
  Scenario host;
  host.Value("memory_pshare_stats", {}, NumberedPshareStats(1000));
  ExpectFaultSweep({.golden = "fault/pshare_hint_stats.txt",
                    .scenario = host,
                    .args = {"-r", "pshareHint-stats", "-s", "type:active", "-v"}});
}

TEST(FaultSweep, BuddyStats) {
  KSI_MemNode node{};
  KSI_BuddyStats low{};
  KSI_BuddyStats high{};
  low.buffers[0].free = 11;
  high.buffers[0].free = 200;
  Scenario host;
  host.List("system_buddy", {}, {"heap", "memmap-03-hi", "memmap-03-lo"})
      .Value("memory_memNodes", {3}, node)
      .Value("system_buddy_comprehensive", {"memmap-03-lo"}, low)
      .Value("system_buddy_comprehensive", {"memmap-03-hi"}, high);
  ExpectFaultSweep({.golden = "fault/buddy_stats.txt",
                    .scenario = host,
                    .args = {"-r", "buddy-stats", "-s", "name:4KBfree", "-v"}});
}

TEST(FaultSweep, LPoolStats) {
  KSI_MemInfo memory{};
  memory.numNodes = 2;
  Scenario host;
  host.Value("memory_memInfo", {}, memory).Value("sched_globalStats_numVMs", {}, uint32_t{2});
  for (const int node : {0, 1}) {
    host.Value("memory_lpage_nodeList_psharePool", {node}, NumberedLargePagePool(node == 0 ? 1 : 2))
        .List("memory_lpage_nodeList_vmPools", {node}, {"vm.a", "vm.b"});
    host.Value("memory_lpage_nodeList_vmPools", {node, "vm.a"},
               NumberedLargePagePool(node == 0 ? 10 : 20))
        .Value("memory_lpage_nodeList_vmPools", {node, "vm.b"},
               NumberedLargePagePool(node == 0 ? 100 : 200));
  }
  // The list of a node's pools is kept when one of its names cannot be fetched.
  ExpectFaultSweep({.golden = "fault/lpool_stats.txt",
                    .scenario = host,
                    .args = {"-r", "lpool-stats", "-s", "nrLPages", "-v"},
                    .allowedProblems = {"leaked list: memory_lpage_nodeList_vmPools,"}});
}

TEST(FaultSweep, HeapStats) {
  Scenario host;
  host.List("system_heaps", {}, {"main", "net"})
      .Value("system_heaps_stats", {"main"}, NumberedHeapStats("main", 100))
      .Value("system_heaps_stats", {"net"}, NumberedHeapStats("net", 20000));
  ExpectFaultSweep({.golden = "fault/heap_stats.txt",
                    .scenario = host,
                    .args = {"-r", "heap-stats", "-s", "size", "-v"}});
}

// Two volumes with two regions each.
Scenario PersistentMemory() {
  Scenario host;
  host.List("memory_pmem_volumes", {}, {"a", "b"});
  uint64_t blocks = 0;
  for (const char* volume : {"a", "b"}) {
    KSI_PmemRegionStore store{};
    store.alloc2MBlocks = ++blocks;
    host.Value("memory_pmem_volumes_info", {volume}, KSI_PmemVolume{})
        .Value("memory_pmem_volumes_regionStore_info", {volume}, store)
        .Value("memory_pmem_volumes_regionStore_isClean", {volume}, uint8_t{1})
        .List("memory_pmem_volumes_regionStore_regions", {volume}, {"r", "s"});
    for (const char* name : {"r", "s"}) {
      KSI_PmemRegion region{};
      region.reserved = ++blocks;
      host.Value("memory_pmem_volumes_regionStore_regions_info", {volume, name}, region);
    }
  }
  return host;
}

TEST(FaultSweep, PmemStatsOfVolumes) {
  ExpectFaultSweep({.golden = "fault/pmem_stats_volumes.txt",
                    .scenario = PersistentMemory(),
                    .args = {"-r", "pmem-stats", "-s", "uuid:alloc2MBlocks", "-v"}});
}

TEST(FaultSweep, PmemStatsOfRegions) {
  ExpectFaultSweep(
      {.golden = "fault/pmem_stats_regions.txt",
       .scenario = PersistentMemory(),
       .args = {"-r", "pmem-stats", "-l", "2", "-s", "uuid:regionUuid:reserved", "-v"}});
}

}  // namespace
}  // namespace harness
