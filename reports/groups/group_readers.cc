#include "reports/groups/group_readers.h"

#include <knvlibs/ksi_nodes.h>
#include "framework/return_status.h"

namespace tally {
namespace {

// All that make a list for a group's id share this message.
constexpr char kGroupListCreateFailure[] = "TallyGroupKsiGet: KSI_ParamListCreate() failure\n";

// The list of every reader here: it carries one id.
KeyList IdList(uint64_t id) { return {.capacity = 2, .first = id, .removeKeys = true}; }

// Reads a group's record and words a failure with the reader's name.
template <class Record>
Status GetGroupRecord(const char* reader, uint64_t groupId, uint16_t node, Record& record) {
  const Status status = TallyGroupKsiGet(groupId, node, &record, sizeof record);
  if (status != kSuccess) Warning("%s() failure, error code: %u\n", reader, status);
  return status;
}

// The same for a memory client, whose readers give the status as its message.
template <class Record>
Status GetClientRecord(const char* reader, int32_t clientId, uint16_t node, Record& record) {
  const Status status = Tally_MemClientKsiGet(clientId, node, &record, sizeof record);
  if (status != kSuccess) {
    Warning("%s() failure: %s\n", reader, KNV_ReturnStatusToString(status));
  }
  return status;
}

// The group's first child flagged "vmm". Children that cannot be read are passed over.
Status FindVmmChild(uint64_t groupId, int64_t& vmmChild) {
  ParamList children;
  if (Status status =
          ListChildGroups("Tally_GroupGetVMMAlloc", "GetInstanceListAlloc", groupId, children)) {
    return status;
  }
  const uint32_t count = KSI_ParamListUsedCount(children.get());
  for (uint32_t i = 0; i < count; ++i) {
    int64_t child = 0;
    uint32_t flags = 0;
    if (KSI_ParamListGetInt64(children.get(), i, &child) != kSuccess) continue;
    if (Tally_GroupGetFlags(static_cast<uint64_t>(child), flags) != kSuccess) continue;
    if ((flags & KSI_GROUP_VMM_SUB_CONTAINER) == 0) continue;
    vmmChild = child;
    return child == -1 ? kNotFound : kSuccess;
  }
  return kNotFound;
}

}  // namespace

Status ListChildGroups(const char* caller, const char* listCall, uint64_t groupId,
                       ParamList& children) {
  return KeyedList(KSI_NODE_sched_groups_members_groups, IdList(groupId), children,
                   [&](ReadStep step, Status status) {
                     const char* const message = KNV_ReturnStatusToString(status);
                     if (step == ReadStep::create) {
                       Warning(kGroupListCreateFailure);
                     } else if (step == ReadStep::read) {
                       Warning("%s: %s failure: %s\n", caller, listCall, message);
                     } else {
                       Warning("%s: KSI_ParamListAddInt() failure: %s\n", caller, message);
                     }
                   });
}

Status TallyGroupKsiGet(uint64_t groupId, uint16_t node, void* buffer, size_t size) {
  return KeyedRead(
      IdList(groupId), [&](KSI_ParamList* list) { return KSI_Get(node, list, buffer, size); },
      [](ReadStep step, Status status) {
        if (step == ReadStep::create) Warning(kGroupListCreateFailure);
        if (step == ReadStep::addFirstKey) {
          Warning("TallyGroupKsiGet: KSI_ParamListAddInt() faiure, error code: %u\n", status);
        }
      });
}

Status Tally_MemClientKsiGet(int32_t clientId, uint16_t node, void* buffer, size_t size) {
  const auto widened = static_cast<uint64_t>(int64_t{clientId});
  return KeyedRead(
      IdList(widened), [&](KSI_ParamList* list) { return KSI_Get(node, list, buffer, size); },
      [](ReadStep step, Status status) {
        if (step == ReadStep::create) {
          Warning("Tally_MemClientKsiGet: KSI_ParamListCreate() failure\n");
        }
        if (step == ReadStep::addFirstKey) {
          Warning("Tally_MemClientKsiGet: KSI_ParamListAddInt() failure: %s\n",
                  KNV_ReturnStatusToString(status));
        }
      });
}

Status Tally_GroupGetName(uint64_t groupId, KSI_GroupName& name) {
  return GetGroupRecord("Tally_GroupGetName", groupId, KSI_NODE_sched_groups_groupName, name);
}

Status Tally_GroupGetTag(uint64_t groupId, KSI_GroupTag& tag) {
  return GetGroupRecord("Tally_GroupGetTag", groupId, KSI_NODE_sched_groups_groupTag, tag);
}

Status Tally_GroupGetParentID(uint64_t groupId, int64_t& parentId) {
  return GetGroupRecord("Tally_GroupGetParentID", groupId, KSI_NODE_sched_groups_parentGroupID,
                        parentId);
}

Status Tally_GroupGetFlags(uint64_t groupId, uint32_t& flags) {
  return GetGroupRecord("Tally_GroupGetFlags", groupId, KSI_NODE_sched_groups_groupFlags, flags);
}

Status Tally_GroupGetGroupLeaderID(uint64_t groupId, int32_t& leader) {
  leader = 0;
  uint32_t flags = 0;
  if (Status status = Tally_GroupGetFlags(groupId, flags)) return status;
  if ((flags & (KSI_GROUP_VM | KSI_GROUP_USER_WORLD)) == 0) return kBadParameter;
  return GetGroupRecord("Tally_GroupGetGroupLeaderID", groupId, KSI_NODE_sched_groups_groupLeaderID,
                        leader);
}

Status Tally_GroupGetAlloc(uint64_t groupId, KSI_GroupAllocation& allocation) {
  return GetGroupRecord("Tally_GroupGetAlloc", groupId, KSI_NODE_sched_groups_memAllocationInKB,
                        allocation);
}

Status TallyGroupGetCapacity(uint64_t groupId, KSI_GroupCapacity& capacity) {
  return GetGroupRecord("TallyGroupGetCapacity", groupId, KSI_NODE_sched_groups_stats_capacity,
                        capacity);
}

Status TallyGroupGetMemoryStats(uint64_t groupId, KSI_GroupMemoryStats& stats) {
  return GetGroupRecord("TallyGroupGetMemoryStats", groupId,
                        KSI_NODE_sched_groups_stats_memoryStats, stats);
}

Status Tally_GroupGetVMMAlloc(uint64_t groupId, VmmAlloc& record) {
  int64_t vmmChild = -1;
  if (Status status = FindVmmChild(groupId, vmmChild)) return status;

  KSI_GroupAllocation ofGroup;
  if (Status status = Tally_GroupGetAlloc(groupId, ofGroup)) {
    Warning("Tally_GroupGetVMMAlloc: VM GroupGetAlloc failure, error code: %u\n", status);
    return status;
  }
  KSI_GroupAllocation ofVmm;
  if (Status status = Tally_GroupGetAlloc(static_cast<uint64_t>(vmmChild), ofVmm)) {
    Warning("Tally_GroupGetVMMAlloc: GroupGetAlloc failure, error code: %u\n", status);
    return status;
  }
  record = {
      .min = ofVmm.min, .max = ofVmm.max, .shares = ofGroup.shares, .minLimit = ofGroup.minLimit};
  return kSuccess;
}

Status Tally_MemClientGetTotalCommonStats(int32_t clientId, KSI_CommonTally& stats) {
  return GetClientRecord("Tally_MemClientGetTotalCommonStats", clientId,
                         KSI_NODE_sched_memClients_tally_totalCommon, stats);
}

Status Tally_GetVmmLeaderID(int32_t clientId, int32_t& vmmLeader) {
  return GetClientRecord("Tally_GetVmmLeaderID", clientId, KSI_NODE_worldGroups_vmmLeaderID,
                         vmmLeader);
}

}  // namespace tally
