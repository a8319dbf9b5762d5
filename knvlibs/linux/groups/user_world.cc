// A user world is a process. docs/linux-host.md says where each figure comes from and why.
#include <algorithm>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/groups/smaps.h"
#include "knvlibs/linux/handlers.h"

namespace ksi {
namespace {

constexpr int64_t kUnlimited = -1;

// Fails with KSI_STATUS_NOT_FOUND if there is no such client.
Status FindClient(const LinuxHost& host, const Keys& keys, const GroupTree** tree,
                  const Group** group) {
  const Status status = GroupTree::Get(host, tree);
  if (status != kOk) return status;
  *group = (*tree)->FindClient(keys[0].number);
  return *group == nullptr ? KSI_STATUS_NOT_FOUND : kOk;
}

// A limit in KB as the record has it; one that is too large for the field limits nothing.
int32_t NarrowLimit(int64_t limit) {
  return limit > INT32_MAX ? static_cast<int32_t>(kUnlimited) : static_cast<int32_t>(limit);
}

}  // namespace

Status ReadUwTally(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const GroupTree* tree = nullptr;
  const Group* group = nullptr;
  Status status = FindClient(host, keys, &tree, &group);
  if (status != kOk) return status;
  if (group->kind != Group::Kind::kUserWorld) return KSI_STATUS_NOT_FOUND;

  const Process& process = tree->ProcessOf(*group);
  int64_t limit = kUnlimited;
  uint64_t saved = 0;
  WalkedMemory walked;
  status = ReadAddressSpaceLimit(host, process.pid, &limit);
  if (status == kOk) status = tree->ReadSharedSaved(host, *group, &saved);
  if (status == kOk) status = ReadWalkedMemory(host, process.pid, &walked);
  if (status != kOk) return status;

  KSI_UwTally record = {};
  record.max = kUnlimited;
  record.minLimit = kUnlimited;
  record.memSizeLimit = NarrowLimit(limit);
  record.memSize = process.addressSpace;
  record.touched = walked.referenced;
  record.mapped = process.Mapped();
  record.sharedSaved = saved;
  record.memBStore = SumOf(process.anonymous, process.shared);
  record.swapBStore = process.swapped;
  record.swappable = DifferenceOf(SumOf(walked.privateClean, walked.privateDirty), walked.locked);
  record.pinned = SumOf(walked.locked, process.hugePages);
  record.cow = kNoValue;
  record.pageable = SumOf(process.anonymous, process.shared);
  record.pageableUnacct = process.file;
  record.swapped = process.swapped;
  record.shm = process.shared;
  return Answer(buffer, record);
}

Status ReadCommonTally(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const GroupTree* tree = nullptr;
  const Group* group = nullptr;
  const Status status = FindClient(host, keys, &tree, &group);
  return status == kOk ? Answer(buffer, KSI_CommonTally{}) : status;
}

// Linux moves pages at once, when it moves them: no client has a type of remapping that waits.
Status ListRemapTypes(const LinuxHost& host, const Keys& keys, ParamList& /*instances*/) {
  const GroupTree* tree = nullptr;
  const Group* group = nullptr;
  return FindClient(host, keys, &tree, &group);
}

Status ReadRemapType(const LinuxHost& /*host*/, const Keys& /*keys*/, Buffer /*buffer*/) {
  return KSI_STATUS_NOT_FOUND;
}

}  // namespace ksi
