#include "knvlibs/linux/handlers.h"

#include "knvlibs/node_table.h"

namespace ksi {

Handlers HandlersOf(uint16_t node) {
  switch (node) {
    case node::sched_groups_groupName:
      return {.value = ReadGroupName};
    case node::sched_groups_groupTag:
      return {.value = ReadGroupTag};
    case node::sched_groups_parentGroupID:
      return {.value = ReadParentGroupID};
    case node::sched_groups_groupFlags:
      return {.value = ReadGroupFlags};
    case node::sched_groups_groupLeaderID:
      return {.value = ReadGroupLeaderID};
    case node::sched_groups_memAllocationInKB:
      return {.value = ReadGroupAllocation};
    case node::sched_groups_stats_capacity:
      return {.value = ReadGroupCapacity};
    case node::sched_groups_stats_memoryStats:
      return {.value = ReadGroupMemoryStats};
    case node::sched_groups_members_groups:
      return {.list = ListChildGroups};
    case node::sched_groups_members_memClients:
      return {.list = ListGroupClients};
    case node::sched_memClients_tally_totalCommon:
      return {.value = ReadCommonTally};
    case node::sched_memClients_tally_vmm:
      return {.value = ReadVmmTally};
    case node::sched_memClients_tally_uw:
      return {.value = ReadUwTally};
    case node::sched_memClients_tally_guest:
      return {.value = ReadGuestTally};
    case node::sched_memClients_swapInfo:
      return {.value = ReadSwapInfo};
    case node::sched_memClients_memzipInfo:
      return {.value = ReadMemzipInfo};
    case node::sched_memClients_remapTypes:
      return {.value = ReadRemapType, .list = ListRemapTypes};
    case node::worldGroups_vmmLeaderID:
      return {.value = ReadVmmLeaderID};
    case node::sched_globalStats_numVMs:
      return {.value = ReadNumVMs};
    case node::memory_lpage_vmLPage:
      return {.value = ReadVmLargePages};
    case node::memory_comprehensive:
      return {.value = ReadComprehensive};
    case node::sched_globalStats_memory_tally:
      return {.value = ReadGlobalTally};
    case node::sched_globalStats_memory_stateTransitions:
      return {.value = ReadStateTransitions};
    case node::memory_memInfo:
      return {.value = ReadMemInfo};
    case node::memory_memNodes:
      return {.value = ReadMemNode};
    case node::memory_pshare_stats:
      return {.value = ReadPshareStats};
    case node::memory_lpage_nodeList_psharePool:
      return {.value = ReadPsharePool};
    case node::memory_lpage_nodeList_vmPools:
      return {.value = ReadPool, .list = ListPools};
    case node::system_buddy:
      return {.list = ListBuddies};
    case node::system_buddy_comprehensive:
      return {.value = ReadBuddy};
    case node::system_heaps:
      return {.list = ListHeaps};
    case node::system_heaps_stats:
      return {.value = ReadHeapStats};
    case node::memory_pmem_volumes:
      return {.list = ListVolumes};
    case node::memory_pmem_volumes_info:
      return {.value = ReadVolume};
    case node::memory_pmem_volumes_regionStore_info:
      return {.value = ReadRegionStore};
    case node::memory_pmem_volumes_regionStore_isClean:
      return {.value = ReadIsClean};
    case node::memory_pmem_volumes_regionStore_regions:
      return {.list = ListRegions};
    case node::memory_pmem_volumes_regionStore_regions_info:
      return {.value = ReadRegion};
    default:
      return {};
  }
}

}  // namespace ksi
