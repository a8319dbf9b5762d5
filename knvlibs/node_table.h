// The rows of the node catalogue, for whoever lists all nodes: NODE(name, value, list).
//
// value: VALUE(record, keys...) or NO_VALUE; list: LIST(entries, keys...) or NO_LIST. A record is
// the name of a struct of ksi_records.h without its KSI_, or of a plain number's fields.
#ifndef KNVLIBS_NODE_TABLE_H_
#define KNVLIBS_NODE_TABLE_H_

#include <cstdint>

// clang-format off
#define KSI_NODE_TABLE(NODE)                                                                       \
  NODE(sched_groups_groupName,               VALUE(GroupName, kGroup),          NO_LIST)           \
  NODE(sched_groups_groupTag,                VALUE(GroupTag, kGroup),           NO_LIST)           \
  NODE(sched_groups_parentGroupID,           VALUE(ParentGroupID, kGroup),      NO_LIST)           \
  NODE(sched_groups_groupFlags,              VALUE(GroupFlags, kGroup),         NO_LIST)           \
  NODE(sched_groups_groupLeaderID,           VALUE(GroupLeaderID, kGroup),      NO_LIST)           \
  NODE(sched_groups_memAllocationInKB,       VALUE(GroupAllocation, kGroup),    NO_LIST)           \
  NODE(sched_groups_stats_capacity,          VALUE(GroupCapacity, kGroup),      NO_LIST)           \
  NODE(sched_groups_stats_memoryStats,       VALUE(GroupMemoryStats, kGroup),   NO_LIST)           \
  NODE(sched_groups_members_groups,          NO_VALUE,                  LIST(kGroup, kGroup))      \
  NODE(sched_groups_members_memClients,      NO_VALUE,                  LIST(kClient, kGroup))     \
  NODE(sched_memClients_tally_totalCommon,   VALUE(CommonTally, kClient),       NO_LIST)           \
  NODE(sched_memClients_tally_vmm,           VALUE(VmmTally, kClient),          NO_LIST)           \
  NODE(sched_memClients_tally_uw,            VALUE(UwTally, kClient),           NO_LIST)           \
  NODE(sched_memClients_tally_guest,         VALUE(GuestTally, kClient),        NO_LIST)           \
  NODE(sched_memClients_swapInfo,            VALUE(SwapInfo, kClient),          NO_LIST)           \
  NODE(sched_memClients_memzipInfo,          VALUE(MemzipInfo, kClient),        NO_LIST)           \
  NODE(sched_memClients_remapTypes,          VALUE(RemapType, kClient, kRemapType),                \
                                                                        LIST(kRemapType, kClient)) \
  NODE(worldGroups_vmmLeaderID,              VALUE(VmmLeaderID, kClient),       NO_LIST)           \
  NODE(sched_globalStats_numVMs,             VALUE(NumVMs),                     NO_LIST)           \
  NODE(sched_globalStats_memory_tally,       VALUE(GlobalTally),                NO_LIST)           \
  NODE(sched_globalStats_memory_stateTransitions, VALUE(StateTransitions, kState), NO_LIST)        \
  NODE(memory_comprehensive,                 VALUE(Comprehensive),              NO_LIST)           \
  NODE(memory_memInfo,                       VALUE(MemInfo),                    NO_LIST)           \
  NODE(memory_memNodes,                      VALUE(MemNode, kMemNode),          NO_LIST)           \
  NODE(memory_pshare_stats,                  VALUE(PshareStats),                NO_LIST)           \
  NODE(system_buddy,                         NO_VALUE,                          LIST(kBuddy))      \
  NODE(system_buddy_comprehensive,           VALUE(BuddyStats, kBuddy),         NO_LIST)           \
  NODE(system_heaps,                         NO_VALUE,                          LIST(kHeap))       \
  NODE(system_heaps_stats,                   VALUE(HeapStats, kHeap),           NO_LIST)           \
  NODE(memory_lpage_vmLPage,                 VALUE(VmLargePages, kClient),      NO_LIST)           \
  NODE(memory_lpage_nodeList_psharePool,     VALUE(LargePagePool, kMemNode),    NO_LIST)           \
  NODE(memory_lpage_nodeList_vmPools,        VALUE(LargePagePool, kMemNode, kPool),                \
                                                                        LIST(kPool, kMemNode))     \
  NODE(memory_pmem_volumes,                  NO_VALUE,                          LIST(kVolume))     \
  NODE(memory_pmem_volumes_info,             VALUE(PmemVolume, kVolume),        NO_LIST)           \
  NODE(memory_pmem_volumes_regionStore_info, VALUE(PmemRegionStore, kVolume),   NO_LIST)           \
  NODE(memory_pmem_volumes_regionStore_isClean, VALUE(IsClean, kVolume),        NO_LIST)           \
  NODE(memory_pmem_volumes_regionStore_regions, NO_VALUE,               LIST(kRegion, kVolume))    \
  NODE(memory_pmem_volumes_regionStore_regions_info, VALUE(PmemRegion, kVolume, kRegion), NO_LIST)
// clang-format on

namespace ksi::node {

// The identifiers of the nodes, as constants.
enum Id : uint16_t {
  kInvalid,
#define KSI_NODE_ID(name, value, list) name,
  KSI_NODE_TABLE(KSI_NODE_ID)
#undef KSI_NODE_ID
};

}  // namespace ksi::node

#endif  // KNVLIBS_NODE_TABLE_H_
