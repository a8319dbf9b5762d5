#include "reports/groups/group_walk.h"

#include "framework/loss.h"
#include "framework/param_list.h"
#include "reports/groups/group_readers.h"

namespace tally {
namespace {

constexpr ReaderTexts kChildTexts = {
    .create = kGroupListNotMade,
    .firstKey = {Style::message, "TallyTraverseGroups: KSI_ParamListAddInt() failure"},
    .read = {Style::message, "TallyTraverseGroups: KSI_GetInstanceListAlloc failure"},
};

}  // namespace

Status TallyTraverseGroups(uint64_t startGroupId, uint32_t levels, uint8_t mode,
                           GroupVisitor visitor, void* context) {
  ParamList children;
  if (Status status = ListChildGroups(kChildTexts, startGroupId, children)) return status;
  const uint32_t childCount = KSI_ParamListUsedCount(children.get());
  const Status visited = visitor(startGroupId, childCount, mode, context);
  if (visited != kSuccess || levels == 1) return visited;

  Status listed = kSuccess;
  for (uint32_t i = 0; i < childCount; ++i) {
    int64_t child = 0;
    listed = NoteLoss(KSI_ParamListGetInt64(children.get(), i, &child));
    if (listed != kSuccess) continue;
    // What failed below ends nothing else.
    NoteLoss(TallyTraverseGroups(static_cast<uint64_t>(child), levels - 1, mode, visitor, context));
  }
  return listed;
}

}  // namespace tally
