// A user world is a process. tally-linux(7) says where each figure comes from and why.
#include <algorithm>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/groups/reader_of.h"
#include "knvlibs/linux/reader_tables.h"

namespace ksi {
namespace {

// Fails with KSI_STATUS_NOT_FOUND if there is no such client.
Status FindClient(const LinuxHost& host, const Keys& keys, const GroupTree*& tree,
                  const Group*& group) {
  const Status status = GroupTree::Get(host, tree);
  if (status != kOk) return status;
  group = tree->FindClient(keys[0].number);
  return group == nullptr ? KSI_STATUS_NOT_FOUND : kOk;
}

// What a process has in memory and what of it sharing saves. Readers take the latter off the former
// for what is consumed, so both are told or neither.
void FillMapped(const Process& process, const ProcessKsm& ksm, KSI_UwTally& record) {
  // The kernel's zero page backs memory too, but does not count as resident.
  const Figure mapped = SumOf({process.Mapped(), ksm.zeroPages.value_or(0)});
  const bool isTold = mapped && ksm.saved;
  record.mapped = FieldOf(isTold ? mapped : std::nullopt);
  record.sharedSaved = isTold ? std::min(*ksm.saved, *mapped) : 0;
}

// A mapping can be locked or pinned before all of it is in memory. Where more is held than there is
// in memory, only a walk tells how much of that is held.
Figure PinnedOf(const Process& process) {
  const Figure held = SumOf({process.vmLck, process.vmPin, process.hugetlb});
  const Figure mapped = process.Mapped();
  return held && mapped && *held <= *mapped ? held : std::nullopt;
}

// Walks nothing: what the scan has held of the process is enough, though it may have ended since.
Status ReadUwTally(const LinuxHost& host, const GroupTree& tree, const Group& group,
                   KSI_UwTally& record) {
  if (group.kind != Group::Kind::kUserWorld) return KSI_STATUS_NOT_FOUND;

  const Process& process = tree.ProcessOf(group);
  Figure limit;
  ProcessKsm ksm;
  Status status = ReadAddressSpaceLimit(host, process.pid, limit);
  if (status == kOk || status == KSI_STATUS_NOT_FOUND) status = tree.ReadKsm(host, group, ksm);
  if (status == KSI_STATUS_NOT_FOUND) ksm.saved.reset();
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;

  const Figure onlySwapTakes = SumOf({process.rssAnon, process.rssShmem});
  FillMapped(process, ksm, record);
  record.max = KSI_NO_LIMIT;
  record.minLimit = KSI_NO_LIMIT;
  // All ones is no limit here; one that is too large for the field limits nothing.
  record.memSizeLimit = FieldOf<int32_t>(limit);
  record.memSize = FieldOf(process.vmSize);
  record.touched = FieldOf(std::nullopt);
  record.memBStore = FieldOf(onlySwapTakes);
  record.swapBStore = FieldOf(process.vmSwap);
  record.swappable = FieldOf(std::nullopt);
  record.pinned = FieldOf(PinnedOf(process));
  record.cow = FieldOf(std::nullopt);
  record.pageable = FieldOf(onlySwapTakes);
  record.pageableUnacct = FieldOf(process.rssFile);
  record.swapped = FieldOf(process.vmSwap);
  record.shm = FieldOf(process.rssShmem);
  return kOk;
}

Status ReadCommonTally(const LinuxHost& /*host*/, const GroupTree& /*tree*/, const Group& /*group*/,
                       KSI_CommonTally& /*record*/) {
  return kOk;
}

// Linux moves pages at once, when it moves them: no client has a type of remapping that waits.
Status ListRemapTypes(const LinuxHost& /*host*/, const GroupTree& /*tree*/, const Group& /*group*/,
                      ParamList& /*instances*/) {
  return kOk;
}

Status ReadRemapType(const LinuxHost& /*host*/, const Keys& /*keys*/, KSI_RemapType& /*record*/) {
  return KSI_STATUS_NOT_FOUND;
}

template <auto read>
constexpr auto OfClient = ReaderOf<FindClient, read>::Read;

constexpr Reader kReaders[] = {
    ValueOf<node::sched_memClients_tally_totalCommon, OfClient<ReadCommonTally>>(),
    ValueOf<node::sched_memClients_tally_uw, OfClient<ReadUwTally>>(),
    ListOf<node::sched_memClients_remapTypes>(OfClient<ListRemapTypes>),
    ValueOf<node::sched_memClients_remapTypes, ReadRemapType>(),
};

}  // namespace

constinit const ReaderTable kUserWorldReaders = kReaders;

}  // namespace ksi
