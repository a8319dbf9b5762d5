/* The nodes of the kernel information tree. The name spells the path with '_' for '/'; the value
 * is the library's own and no program assumes one. Each line names the keys in brackets and the
 * record of the value (ksi_records.h), or the entries of the instance list. */
#ifndef KNVLIBS_KSI_NODES_H_
#define KNVLIBS_KSI_NODES_H_

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Scheduler groups, by group id. */
extern const uint16_t KSI_NODE_sched_groups_groupName;          /* [group] KSI_GroupName */
extern const uint16_t KSI_NODE_sched_groups_groupTag;           /* [group] KSI_GroupTag */
extern const uint16_t KSI_NODE_sched_groups_parentGroupID;      /* [group] int64_t */
extern const uint16_t KSI_NODE_sched_groups_groupFlags;         /* [group] uint32_t */
extern const uint16_t KSI_NODE_sched_groups_groupLeaderID;      /* [group] int32_t */
extern const uint16_t KSI_NODE_sched_groups_memAllocationInKB;  /* [group] KSI_GroupAllocation */
extern const uint16_t KSI_NODE_sched_groups_stats_capacity;     /* [group] KSI_GroupCapacity */
extern const uint16_t KSI_NODE_sched_groups_stats_memoryStats;  /* [group] KSI_GroupMemoryStats */
extern const uint16_t KSI_NODE_sched_groups_members_groups;     /* [group] list of group ids */
extern const uint16_t KSI_NODE_sched_groups_members_memClients; /* [group] list of client ids */

/* Memory clients, by client id. */
extern const uint16_t KSI_NODE_sched_memClients_tally_totalCommon; /* [client] KSI_CommonTally */
extern const uint16_t KSI_NODE_sched_memClients_tally_vmm;         /* [client] KSI_VmmTally */
extern const uint16_t KSI_NODE_sched_memClients_tally_uw;          /* [client] KSI_UwTally */
extern const uint16_t KSI_NODE_sched_memClients_tally_guest;       /* [client] KSI_GuestTally */
extern const uint16_t KSI_NODE_sched_memClients_swapInfo;          /* [client] KSI_SwapInfo */
extern const uint16_t KSI_NODE_sched_memClients_memzipInfo;        /* [client] KSI_MemzipInfo */
extern const uint16_t KSI_NODE_sched_memClients_remapTypes;        /* [client] list of type names;
                                                                      [client, type] KSI_RemapType */
extern const uint16_t KSI_NODE_worldGroups_vmmLeaderID;            /* [client] int32_t */

/* The host. */
extern const uint16_t KSI_NODE_sched_globalStats_numVMs;                  /* uint32_t */
extern const uint16_t KSI_NODE_sched_globalStats_memory_tally;            /* KSI_GlobalTally */
extern const uint16_t KSI_NODE_sched_globalStats_memory_stateTransitions; /* [state name]
                                                                           KSI_StateTransitions */
extern const uint16_t KSI_NODE_memory_comprehensive;                      /* KSI_Comprehensive */
extern const uint16_t KSI_NODE_memory_memInfo;                            /* KSI_MemInfo */
extern const uint16_t KSI_NODE_memory_memNodes;            /* [memory node] KSI_MemNode */
extern const uint16_t KSI_NODE_memory_pshare_stats;        /* KSI_PshareStats */
extern const uint16_t KSI_NODE_system_buddy;               /* list of buddy names */
extern const uint16_t KSI_NODE_system_buddy_comprehensive; /* [buddy name] KSI_BuddyStats */
extern const uint16_t KSI_NODE_system_heaps;               /* list of heap names */
extern const uint16_t KSI_NODE_system_heaps_stats;         /* [heap name] KSI_HeapStats */

/* Large pages; the value of a pool is KSI_LargePagePool. */
extern const uint16_t KSI_NODE_memory_lpage_vmLPage;             /* [VMM leader] KSI_VmLargePages */
extern const uint16_t KSI_NODE_memory_lpage_nodeList_psharePool; /* [memory node] */
/* [memory node] list of names; [memory node, name] a pool */
extern const uint16_t KSI_NODE_memory_lpage_nodeList_vmPools;

/* Persistent memory. */
/* list of volume names */
extern const uint16_t KSI_NODE_memory_pmem_volumes;
/* [volume] KSI_PmemVolume */
extern const uint16_t KSI_NODE_memory_pmem_volumes_info;
/* [volume] KSI_PmemRegionStore */
extern const uint16_t KSI_NODE_memory_pmem_volumes_regionStore_info;
/* [volume] uint8_t: not 0 if the store is clean */
extern const uint16_t KSI_NODE_memory_pmem_volumes_regionStore_isClean;
/* [volume] list of region names */
extern const uint16_t KSI_NODE_memory_pmem_volumes_regionStore_regions;
/* [volume, region] KSI_PmemRegion */
extern const uint16_t KSI_NODE_memory_pmem_volumes_regionStore_regions_info;

#ifdef __cplusplus
}
#endif

#endif /* KNVLIBS_KSI_NODES_H_ */
