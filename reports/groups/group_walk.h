// The walk over the tree of scheduler groups.
#ifndef REPORTS_GROUPS_GROUP_WALK_H_
#define REPORTS_GROUPS_GROUP_WALK_H_

#include <cstdint>

#include "framework/status.h"

namespace tally {

// Called for each group with the number of its child groups, the walk's mode and its context.
// Success lets the walk go on into the children; a failure passes over them.
using GroupVisitor = Status (*)(uint64_t groupId, uint32_t childCount, int mode, void* context);

// Visits `startGroupId` and what is below it, each group before its children and these in the
// kernel's order, `levels` levels deep with the start group as the first. A failure below the start
// group is reported and passes over that subtree only; the walk returns that of the start group.
// REQUIRES: levels > 0.
[[nodiscard]] Status TallyTraverseGroups(uint64_t startGroupId, uint32_t levels, uint8_t mode,
                                         GroupVisitor visitor, void* context);

}  // namespace tally

#endif  // REPORTS_GROUPS_GROUP_WALK_H_
