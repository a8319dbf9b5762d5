// Every node that the test double exports: its name and the size of its value, 0 if it has
// instances only.
#ifndef TESTS_DOUBLE_NODES_H_
#define TESTS_DOUBLE_NODES_H_

#include <knvlibs/ksi_records.h>

#define TALLY_DOUBLE_NODES(NODE)                                                \
  NODE(sched_groups_groupName, sizeof(KSI_GroupName))                           \
  NODE(sched_groups_groupTag, sizeof(KSI_GroupTag))                             \
  NODE(sched_groups_parentGroupID, sizeof(int64_t))                             \
  NODE(sched_groups_groupFlags, sizeof(uint32_t))                               \
  NODE(sched_groups_groupLeaderID, sizeof(int32_t))                             \
  NODE(sched_groups_memAllocationInKB, sizeof(KSI_GroupAllocation))             \
  NODE(sched_groups_stats_capacity, sizeof(KSI_GroupCapacity))                  \
  NODE(sched_groups_stats_memoryStats, sizeof(KSI_GroupMemoryStats))            \
  NODE(sched_groups_members_groups, 0)                                          \
  NODE(sched_groups_members_memClients, 0)                                      \
  NODE(sched_memClients_tally_totalCommon, sizeof(KSI_CommonTally))             \
  NODE(sched_memClients_tally_vmm, sizeof(KSI_VmmTally))                        \
  NODE(sched_memClients_tally_uw, sizeof(KSI_UwTally))                          \
  NODE(sched_memClients_tally_guest, sizeof(KSI_GuestTally))                    \
  NODE(sched_memClients_swapInfo, sizeof(KSI_SwapInfo))                         \
  NODE(sched_memClients_memzipInfo, sizeof(KSI_MemzipInfo))                     \
  NODE(sched_memClients_remapTypes, sizeof(KSI_RemapType))                      \
  NODE(worldGroups_vmmLeaderID, sizeof(int32_t))                                \
  NODE(sched_globalStats_numVMs, sizeof(uint32_t))                              \
  NODE(sched_globalStats_memory_tally, sizeof(KSI_GlobalTally))                 \
  NODE(sched_globalStats_memory_stateTransitions, sizeof(KSI_StateTransitions)) \
  NODE(memory_comprehensive, sizeof(KSI_Comprehensive))                         \
  NODE(memory_memInfo, sizeof(KSI_MemInfo))                                     \
  NODE(memory_memNodes, sizeof(KSI_MemNode))                                    \
  NODE(memory_pshare_stats, sizeof(KSI_PshareStats))                            \
  NODE(memory_lpage_vmLPage, sizeof(KSI_VmLargePages))                          \
  NODE(memory_lpage_nodeList_psharePool, sizeof(KSI_LargePagePool))             \
  NODE(memory_lpage_nodeList_vmPools, sizeof(KSI_LargePagePool))                \
  NODE(system_buddy, 0)                                                         \
  NODE(system_buddy_comprehensive, sizeof(KSI_BuddyStats))                      \
  NODE(system_heaps, 0)                                                         \
  NODE(system_heaps_stats, sizeof(KSI_HeapStats))                               \
  NODE(memory_pmem_volumes, 0)                                                  \
  NODE(memory_pmem_volumes_info, sizeof(KSI_PmemVolume))                        \
  NODE(memory_pmem_volumes_regionStore_info, sizeof(KSI_PmemRegionStore))       \
  NODE(memory_pmem_volumes_regionStore_isClean, sizeof(uint8_t))                \
  NODE(memory_pmem_volumes_regionStore_regions, 0)                              \
  NODE(memory_pmem_volumes_regionStore_regions_info, sizeof(KSI_PmemRegion))

#endif  // TESTS_DOUBLE_NODES_H_
