/* The nodes of the kernel information tree: one table, from which the objects below and all that
 * the library knows of its nodes derive. The name spells the path with '_' for '/'; the value of an
 * object is the library's own and no program assumes one.
 */
#ifndef KNVLIBS_KSI_NODES_H_
#define KNVLIBS_KSI_NODES_H_

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* What the keys of a node, and the entries of its instance list, name:
 * INSTANCE(identifier, kind, name). Of the kind kNumber they are integers, else strings. */
/* clang-format off */
#define KSI_INSTANCES(INSTANCE)              \
  INSTANCE(kGroup, kNumber, "group")         \
  INSTANCE(kClient, kNumber, "client")       \
  INSTANCE(kMemNode, kNumber, "memory node") \
  INSTANCE(kRemapType, kText, "remap type")  \
  INSTANCE(kState, kText, "state")           \
  INSTANCE(kBuddy, kText, "buddy")           \
  INSTANCE(kHeap, kText, "heap")             \
  INSTANCE(kPool, kText, "pool")             \
  INSTANCE(kVolume, kText, "volume")         \
  INSTANCE(kRegion, kText, "region")

/* NODE(name, record, keys, entries, list keys, meaning): the value is KSI_<record> (ksi_records.h),
 * selected by the keys; the instance list names the entries, selected by its own keys. A node
 * without a value has the record None, one without a list the entries kNone. */
#define KSI_NODES(NODE)                                                                            \
  /* Scheduler groups, by group id. */                                                             \
  NODE(sched_groups_groupName, GroupName, (kGroup), kNone, (), "A group's name")                   \
  NODE(sched_groups_groupTag, GroupTag, (kGroup), kNone, (), "A group's tag")                      \
  NODE(sched_groups_parentGroupID, ParentGroupID, (kGroup), kNone, (), "The group above a group")  \
  NODE(sched_groups_groupFlags, GroupFlags, (kGroup), kNone, (), "What a group is")                \
  NODE(sched_groups_groupLeaderID, GroupLeaderID, (kGroup), kNone, (),                             \
       "The world that leads a group")                                                             \
  NODE(sched_groups_memAllocationInKB, GroupAllocation, (kGroup), kNone, (),                       \
       "How a group's memory is configured")                                                       \
  NODE(sched_groups_stats_capacity, GroupCapacity, (kGroup), kNone, (),                            \
       "What is reserved of a group's memory")                                                     \
  NODE(sched_groups_stats_memoryStats, GroupMemoryStats, (kGroup), kNone, (), "A group's memory")  \
  NODE(sched_groups_members_groups, None, (), kGroup, (kGroup), "The groups below a group")        \
  NODE(sched_groups_members_memClients, None, (), kClient, (kGroup), "A group's memory clients")   \
  /* Memory clients, by client id. */                                                              \
  NODE(sched_memClients_tally_totalCommon, CommonTally, (kClient), kNone, (),                      \
       "What the tallies of all clients have in common")                                           \
  NODE(sched_memClients_tally_vmm, VmmTally, (kClient), kNone, (), "A virtual machine's memory")   \
  NODE(sched_memClients_tally_uw, UwTally, (kClient), kNone, (), "A user world's memory")          \
  NODE(sched_memClients_tally_guest, GuestTally, (kClient), kNone, (),                             \
       "What a virtual machine's guest says of itself")                                            \
  NODE(sched_memClients_swapInfo, SwapInfo, (kClient), kNone, (),                                  \
       "How the host swaps a virtual machine")                                                     \
  NODE(sched_memClients_memzipInfo, MemzipInfo, (kClient), kNone, (),                              \
       "A virtual machine's compression cache")                                                    \
  NODE(sched_memClients_remapTypes, RemapType, (kClient, kRemapType), kRemapType, (kClient),       \
       "A client's remapped pages, by type")                                                       \
  NODE(worldGroups_vmmLeaderID, VmmLeaderID, (kClient), kNone, (),                                 \
       "The VMM leader of a client's world group")                                                 \
  /* The host. */                                                                                  \
  NODE(sched_globalStats_numVMs, NumVMs, (), kNone, (), "How many virtual machines there are")     \
  NODE(sched_globalStats_memory_tally, GlobalTally, (), kNone, (),                                 \
       "What the memory scheduler manages")                                                        \
  NODE(sched_globalStats_memory_stateTransitions, StateTransitions, (kState), kNone, (),           \
       "How often the host left a memory state")                                                   \
  NODE(memory_comprehensive, Comprehensive, (), kNone, (), "How the host's memory is divided")     \
  NODE(memory_memInfo, MemInfo, (), kNone, (), "The host's memory hardware")                       \
  NODE(memory_memNodes, MemNode, (kMemNode), kNone, (), "Where a memory node is")                  \
  NODE(memory_pshare_stats, PshareStats, (), kNone, (), "Page sharing on the host")                \
  NODE(system_buddy, None, (), kBuddy, (), "The buddy allocators")                                 \
  NODE(system_buddy_comprehensive, BuddyStats, (kBuddy), kNone, (),                                \
       "The buffers of a buddy allocator")                                                         \
  NODE(system_heaps, None, (), kHeap, (), "The kernel's heaps")                                    \
  NODE(system_heaps_stats, HeapStats, (kHeap), kNone, (), "A heap")                                \
  /* Large pages; a virtual machine's by the client id of its VMM leader. */                       \
  NODE(memory_lpage_vmLPage, VmLargePages, (kClient), kNone, (),                                   \
       "The large pages behind a virtual machine")                                                 \
  NODE(memory_lpage_nodeList_psharePool, LargePagePool, (kMemNode), kNone, (),                     \
       "A memory node's pool for page sharing")                                                    \
  NODE(memory_lpage_nodeList_vmPools, LargePagePool, (kMemNode, kPool), kPool, (kMemNode),         \
       "A memory node's other pools of large pages")                                               \
  /* Persistent memory. */                                                                         \
  NODE(memory_pmem_volumes, None, (), kVolume, (), "The volumes of persistent memory")             \
  NODE(memory_pmem_volumes_info, PmemVolume, (kVolume), kNone, (), "A volume")                     \
  NODE(memory_pmem_volumes_regionStore_info, PmemRegionStore, (kVolume), kNone, (),                \
       "A volume's store of regions")                                                              \
  NODE(memory_pmem_volumes_regionStore_isClean, IsClean, (kVolume), kNone, (),                     \
       "Whether the store was closed in order")                                                    \
  NODE(memory_pmem_volumes_regionStore_regions, None, (), kRegion, (kVolume),                      \
       "The regions in the store")                                                                 \
  NODE(memory_pmem_volumes_regionStore_regions_info, PmemRegion, (kVolume, kRegion), kNone, (),    \
       "A region")
/* clang-format on */

#define KSI_NODE(name, record, keys, entries, listKeys, meaning) \
  extern const uint16_t KSI_NODE_##name;
KSI_NODES(KSI_NODE)
#undef KSI_NODE

#ifdef __cplusplus
}
#endif

#endif /* KNVLIBS_KSI_NODES_H_ */
