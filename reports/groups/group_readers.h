// The readers of one group's and one memory client's data. Each returns the status of what failed,
// after its message.
#ifndef REPORTS_GROUPS_GROUP_READERS_H_
#define REPORTS_GROUPS_GROUP_READERS_H_

#include <cstddef>
#include <cstdint>

#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "framework/status.h"

namespace tally {

// Reads a record of a group. The status of the read itself is the caller's to word.
[[nodiscard]] Status TallyGroupKsiGet(uint64_t groupId, uint16_t node, void* buffer, size_t size);

// Reads a record of a memory client; ids are widened with their sign. The status of the read itself
// is the caller's to word.
[[nodiscard]] Status Tally_MemClientKsiGet(int32_t clientId, uint16_t node, void* buffer,
                                           size_t size);

// Read a record of a group or of a memory client; `complaint` words the status of the read.
template <class Record>
[[nodiscard]] Status ReadGroupRecord(const Complaint& complaint, uint64_t groupId, uint16_t node,
                                     Record& record) {
  return complaint.Of(TallyGroupKsiGet(groupId, node, &record, sizeof record));
}
template <class Record>
[[nodiscard]] Status ReadClientRecord(const Complaint& complaint, int32_t clientId, uint16_t node,
                                      Record& record) {
  return complaint.Of(Tally_MemClientKsiGet(clientId, node, &record, sizeof record));
}

[[nodiscard]] Status Tally_GroupGetName(uint64_t groupId, KSI_GroupName& name);
[[nodiscard]] Status Tally_GroupGetTag(uint64_t groupId, KSI_GroupTag& tag);
[[nodiscard]] Status Tally_GroupGetParentID(uint64_t groupId, int64_t& parentId);
[[nodiscard]] Status Tally_GroupGetFlags(uint64_t groupId, uint32_t& flags);
[[nodiscard]] Status Tally_GroupGetAlloc(uint64_t groupId, KSI_GroupAllocation& allocation);
[[nodiscard]] Status TallyGroupGetCapacity(uint64_t groupId, KSI_GroupCapacity& capacity);
[[nodiscard]] Status TallyGroupGetMemoryStats(uint64_t groupId, KSI_GroupMemoryStats& stats);

// The world group that leads a virtual machine's or user world's group; kBadParameter, without a
// message, for any other group.
[[nodiscard]] Status Tally_GroupGetGroupLeaderID(uint64_t groupId, int32_t& leader);

// A virtual machine's allocation in kilobytes: reservation and limit are those of its VMM.
struct VmmAlloc {
  int64_t min;
  int64_t max;
  int32_t shares;
  int64_t minLimit;
};

// Puts a virtual machine's allocation together from its group and the group's first child flagged
// "vmm"; kNotFound, without a message, when there is no such child.
[[nodiscard]] Status Tally_GroupGetVMMAlloc(uint64_t groupId, VmmAlloc& record);

[[nodiscard]] Status Tally_MemClientGetTotalCommonStats(int32_t clientId, KSI_CommonTally& stats);

// The leader of the VMM of a virtual machine's world group.
[[nodiscard]] Status Tally_GetVmmLeaderID(int32_t clientId, int32_t& vmmLeader);

// A list for a group's id that cannot be made; all readers share the message.
constexpr Complaint kGroupListNotMade = {Style::plain,
                                         "TallyGroupKsiGet: KSI_ParamListCreate() failure"};

// Lists a group's child groups.
[[nodiscard]] Status ListChildGroups(const ReaderTexts& texts, uint64_t groupId,
                                     ParamList& children);

}  // namespace tally

#endif  // REPORTS_GROUPS_GROUP_READERS_H_
