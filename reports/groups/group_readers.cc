#include "reports/groups/group_readers.h"

#include <knvlibs/ksi_nodes.h>

namespace tally {
namespace {

// The list of every reader here: it carries one id.
template <class Id>
KeyList IdList(Id id) {
  return {.capacity = 2, .first = id, .removeKeys = true};
}

// sic: C10
constexpr ReaderTexts kGroupTexts = {
    .create = kGroupListNotMade,
    .firstKey = {Style::code, "TallyGroupKsiGet: KSI_ParamListAddInt() faiure"},
};

constexpr ReaderTexts kClientTexts = {
    .create = {Style::plain, "Tally_MemClientKsiGet: KSI_ParamListCreate() failure"},
    .firstKey = {Style::message, "Tally_MemClientKsiGet: KSI_ParamListAddInt() failure"},
};

// sic: C10
constexpr ReaderTexts kVmmChildTexts = {
    .create = kGroupListNotMade,
    .firstKey = {Style::message, "Tally_GroupGetVMMAlloc: KSI_ParamListAddInt() failure"},
    .read = {Style::message, "Tally_GroupGetVMMAlloc: GetInstanceListAlloc failure"},
};

// The group's first child flagged "vmm". Children that cannot be read are passed over.
Status FindVmmChild(uint64_t groupId, int64_t& vmmChild) {
  ParamList children;
  if (Status status = ListChildGroups(kVmmChildTexts, groupId, children)) return status;
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

Status ListChildGroups(const ReaderTexts& texts, uint64_t groupId, ParamList& children) {
  return ListInstances(KSI_NODE_sched_groups_members_groups, IdList(groupId), texts, children);
}

Status TallyGroupKsiGet(uint64_t groupId, uint16_t node, void* buffer, size_t size) {
  return ReadRecord(node, IdList(groupId), kGroupTexts, buffer, size);
}

Status Tally_MemClientKsiGet(int32_t clientId, uint16_t node, void* buffer, size_t size) {
  return ReadRecord(node, IdList(clientId), kClientTexts, buffer, size);
}

Status Tally_GroupGetName(uint64_t groupId, KSI_GroupName& name) {
  return ReadGroupRecord({Style::code, "Tally_GroupGetName() failure"}, groupId,
                         KSI_NODE_sched_groups_groupName, name);
}

Status Tally_GroupGetTag(uint64_t groupId, KSI_GroupTag& tag) {
  return ReadGroupRecord({Style::code, "Tally_GroupGetTag() failure"}, groupId,
                         KSI_NODE_sched_groups_groupTag, tag);
}

Status Tally_GroupGetParentID(uint64_t groupId, int64_t& parentId) {
  return ReadGroupRecord({Style::code, "Tally_GroupGetParentID() failure"}, groupId,
                         KSI_NODE_sched_groups_parentGroupID, parentId);
}

Status Tally_GroupGetFlags(uint64_t groupId, uint32_t& flags) {
  return ReadGroupRecord({Style::code, "Tally_GroupGetFlags() failure"}, groupId,
                         KSI_NODE_sched_groups_groupFlags, flags);
}

Status Tally_GroupGetGroupLeaderID(uint64_t groupId, int32_t& leader) {
  leader = 0;
  uint32_t flags = 0;
  if (Status status = Tally_GroupGetFlags(groupId, flags)) return status;
  if ((flags & (KSI_GROUP_VM | KSI_GROUP_USER_WORLD)) == 0) return kBadParameter;
  return ReadGroupRecord({Style::code, "Tally_GroupGetGroupLeaderID() failure"}, groupId,
                         KSI_NODE_sched_groups_groupLeaderID, leader);
}

Status Tally_GroupGetAlloc(uint64_t groupId, KSI_GroupAllocation& allocation) {
  return ReadGroupRecord({Style::code, "Tally_GroupGetAlloc() failure"}, groupId,
                         KSI_NODE_sched_groups_memAllocationInKB, allocation);
}

Status TallyGroupGetCapacity(uint64_t groupId, KSI_GroupCapacity& capacity) {
  return ReadGroupRecord({Style::code, "TallyGroupGetCapacity() failure"}, groupId,
                         KSI_NODE_sched_groups_stats_capacity, capacity);
}

Status TallyGroupGetMemoryStats(uint64_t groupId, KSI_GroupMemoryStats& stats) {
  return ReadGroupRecord({Style::code, "TallyGroupGetMemoryStats() failure"}, groupId,
                         KSI_NODE_sched_groups_stats_memoryStats, stats);
}

Status Tally_GroupGetVMMAlloc(uint64_t groupId, VmmAlloc& record) {
  int64_t vmmChild = -1;
  if (Status status = FindVmmChild(groupId, vmmChild)) return status;

  constexpr Complaint kOfGroup = {Style::code, "Tally_GroupGetVMMAlloc: VM GroupGetAlloc failure"};
  constexpr Complaint kOfVmm = {Style::code, "Tally_GroupGetVMMAlloc: GroupGetAlloc failure"};
  KSI_GroupAllocation ofGroup;
  if (Status status = kOfGroup.Of(Tally_GroupGetAlloc(groupId, ofGroup))) return status;
  KSI_GroupAllocation ofVmm;
  if (Status status = kOfVmm.Of(Tally_GroupGetAlloc(static_cast<uint64_t>(vmmChild), ofVmm))) {
    return status;
  }
  record = {
      .min = ofVmm.min, .max = ofVmm.max, .shares = ofGroup.shares, .minLimit = ofGroup.minLimit};
  return kSuccess;
}

Status Tally_MemClientGetTotalCommonStats(int32_t clientId, KSI_CommonTally& stats) {
  return ReadClientRecord({Style::message, "Tally_MemClientGetTotalCommonStats() failure"},
                          clientId, KSI_NODE_sched_memClients_tally_totalCommon, stats);
}

Status Tally_GetVmmLeaderID(int32_t clientId, int32_t& vmmLeader) {
  return ReadClientRecord({Style::message, "Tally_GetVmmLeaderID() failure"}, clientId,
                          KSI_NODE_worldGroups_vmmLeaderID, vmmLeader);
}

}  // namespace tally
