// A virtual machine is a QEMU process. tally-linux(7) says where each figure comes from and
// why.
#include <algorithm>
#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/cgroup.h"
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/groups/process_ksm.h"
#include "knvlibs/linux/groups/reader_of.h"
#include "knvlibs/linux/machines/guest.h"
#include "knvlibs/linux/memory/ksm.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

constexpr uint64_t kLargePageKB = 2048;

// The virtual machine that the keys name.
Status FindMachine(const LinuxHost& host, const Keys& keys, const GroupTree*& tree,
                   const VirtualMachine*& machine) {
  const Status status = GroupTree::Get(host, tree);
  if (status != kOk) return status;
  machine = tree->FindVirtualMachine(keys[0].number);
  return machine == nullptr ? KSI_STATUS_NOT_FOUND : kOk;
}

// What the kernel tells of a machine's use of memory, by its process and by its own cgroup.
struct MachineUse {
  const GuestMapping* mapping = nullptr;
  ProcessKsm ksm;
  const MemcgEvents* events = nullptr;
  const Ksm* sharing = nullptr;  // on the host
  Figure hugetlb;
};

Status ReadUse(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
               MachineUse& use) {
  Status status = GetMapping(host, tree, machine, use.mapping);
  if (status == kOk) status = tree.ReadKsm(host, tree.At(machine.group), use.ksm);
  if (status == kOk) status = host.Kept().ksm.Get(host, use.sharing);
  use.hugetlb = tree.ProcessOf(tree.At(machine.group)).hugetlb;
  return status == kOk ? GetOwnEvents(host, tree, machine, use.events) : status;
}

// What of the guest's memory is in use. Only of a small process the pages tell; else its own cgroup
// does, of what is in memory. Of huge pages of hugetlb neither does.
Figure TouchedOf(const MachineUse& use) {
  if (use.hugetlb != 0u) return std::nullopt;
  if (use.mapping->referenced) return use.mapping->referenced;
  return LesserOf(use.events->active, use.mapping->resident);
}

// What of the guest is in memory and what of it sharing saves. Readers take the latter off the
// former for what is consumed, so both are told or neither.
void FillSharing(const MachineUse& use, KSI_VmmTally& record) {
  const Figure resident = use.mapping->resident;
  const Figure zero = use.ksm.zeroPages;
  // Who merges the memory of a guest merges little else; where that is not so, smaps tells. Pages
  // of hugetlb are never merged.
  const Figure mayBe = DifferenceOf(resident, use.hugetlb);
  const Figure merged = use.mapping->merged ? use.mapping->merged : LesserOf(use.ksm.merged, mayBe);
  // The kernel's zero page backs guest memory too, but does not count as resident.
  const Figure mapped = SumOf({resident, zero.value_or(0)});
  const Figure saved = SumOf({use.sharing->SavedOf(merged), zero.value_or(0)});
  record.shared = FieldOf(SumOf({merged, zero}));
  record.zero = FieldOf(zero);
  record.mapped = FieldOf(saved ? mapped : std::nullopt);
  record.sharedSaved = mapped ? saved.value_or(0) : 0;
}

void FillBalloon(const GuestMemory& guest, Figure memory, KSI_VmmTally& record) {
  const Figure ballooned = DifferenceOf(memory, guest.actual);
  switch (guest.balloon) {
    case GuestMemory::Balloon::kNone:
      break;
    case GuestMemory::Balloon::kActive:
      // The device is there without a driver, too; what it was given only a driver can have taken.
      record.balloonActive = guest.hasDriver || ballooned.value_or(0) != 0 ? 1 : 0;
      record.ballooned = FieldOf(ballooned);
      record.balloonTgt = FieldOf(std::nullopt);
      break;
    case GuestMemory::Balloon::kUnknown:
      // A flag has no third state: it is set where a driver is known to be there.
      record.ballooned = FieldOf(std::nullopt);
      record.balloonTgt = FieldOf(std::nullopt);
      break;
  }
}

Status ReadVmmTally(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                    KSI_VmmTally& record) {
  MachineUse use;
  const Status status = ReadUse(host, tree, machine, use);
  if (status != kOk) return status;

  const MachineMemory& memory = use.mapping->memory;
  const Figure limit = machine.commandLine.maxMemory;
  record.memSize = FieldOf(memory.Size());
  record.memSizeLimit = FieldOf(limit ? limit : memory.Size());
  record.touched = FieldOf(TouchedOf(use));
  FillSharing(use, record);
  record.zipped = FieldOf(use.events->zswapped);
  record.zipSaved = FieldOf(DifferenceOf(use.events->zswapped, use.events->zswapPool));
  FillBalloon(GetGuest(host, tree, machine), memory.BalloonSize(), record);
  return kOk;
}

Status ReadGuestTally(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                      KSI_GuestTally& record) {
  const GuestMemory& guest = GetGuest(host, tree, machine);
  record.memTotal = FieldOf(guest.total);
  record.lpageTotal = FieldOf<uint32_t>(std::nullopt);
  record.memNeeded = FieldOf(DifferenceOf(guest.total, guest.available));
  return kOk;
}

// What is swapped and not compressed instead. What is compressed in memory has its place in swap,
// too, until it is written there.
Figure SwappedOf(const MachineUse& use) {
  if (use.mapping->swapped == 0u) return 0;
  return DifferenceOf(use.mapping->swapped, use.events->zswapped);
}

// The swap that the machine may have, and what of it is free: the host's, or what its own cgroup is
// limited to.
Status FillSwapSpace(const LinuxHost& host, const MachineSwap& swap, KSI_SwapInfo& record) {
  const FigureFile* meminfo = nullptr;
  const Status status = host.Kept().meminfo.Get(host, meminfo);
  if (status != kOk) return status;
  const uint64_t total = meminfo->FindOr("SwapTotal", 0);
  const uint64_t free = meminfo->FindOr("SwapFree", 0);
  record.totalReg = std::min(swap.limit.value_or(total), total);
  record.freeReg = std::min(swap.left.value_or(free), free);
  return kOk;
}

// Whether more of the machine is swapped than when the reading began: by its own cgroup, else by
// its process.
Status FillSwapping(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                    const MachineSwap& swap, KSI_SwapInfo& record) {
  if (machine.swapAtFirst && swap.current) {
    record.isSwapping = *swap.current > *machine.swapAtFirst ? 1 : 0;
    return kOk;
  }
  Process now;
  const Status status = ReadProcess(host, machine.pid, now);
  const Figure first = tree.ProcessOf(tree.At(machine.group)).vmSwap;
  record.isSwapping = first && now.vmSwap && *now.vmSwap > *first ? 1 : 0;
  return status;
}

Status ReadSwapInfo(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                    KSI_SwapInfo& record) {
  MachineUse use;
  Status status = ReadUse(host, tree, machine, use);
  if (status != kOk) return status;
  MachineSwap swap;
  status = tree.ReadSwap(host, machine, swap);
  if (status == kOk) status = FillSwapSpace(host, swap, record);
  if (status == kOk) status = FillSwapping(host, tree, machine, swap, record);
  if (status != kOk) return status;

  record.swapped = FieldOf(SwappedOf(use));
  record.swapRead = FieldOf(use.events->swapcached);
  record.swapIn = FieldOf(use.events->swpin);
  record.swapOut = FieldOf(use.events->swpout);
  // Linux swaps all to the same places.
  record.gblSwapRead = record.swapRead;
  record.gblSwapIn = record.swapIn;
  record.gblSwapOut = record.swapOut;
  record.COWSwapper = FieldOf(use.ksm.merged == 0u ? Figure(0) : std::nullopt);
  // It is always the kernel that swaps.
  record.curSwapper = 1;
  return kOk;
}

Status ReadMemzipInfo(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                      KSI_MemzipInfo& record) {
  const MemcgEvents* events = nullptr;
  const Status status = GetOwnEvents(host, tree, machine, events);
  if (status != kOk) return status;

  record.totalCache = FieldOf(events->zswapMax);
  record.maxCache = FieldOf(events->zswapMax);
  record.usedCache = FieldOf(events->zswapPool);
  record.zipped = FieldOf(events->zswpout);
  record.unZipped = FieldOf(events->zswpin);
  // The kernel counts what it refused for the host alone, and takes no times.
  const auto untoldUnless = [](bool isZero) { return FieldOf(isZero ? Figure(0) : std::nullopt); };
  record.zipRejected = untoldUnless(events->zswapMax == 0u && events->zswpout == 0u);
  record.avgZipTime = untoldUnless(events->zswpout == 0u);
  record.avgUnzipTime = untoldUnless(events->zswpin == 0u);
  return kOk;
}

// Where the kernel has no transparent huge pages it has made none and met no trouble making them.
Status ReadTransparent(const LinuxHost& host, Figure& swapThreshold) {
  return host.ReadNumberIfAny("/sys/kernel/mm/transparent_hugepage/khugepaged/max_ptes_swap",
                              swapThreshold);
}

Status ReadVmLargePages(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                        KSI_VmLargePages& record) {
  const GuestMapping* mapping = nullptr;
  const MemcgEvents* events = nullptr;
  Figure threshold;
  Status status = GetMapping(host, tree, machine, mapping);
  if (status == kOk) status = GetOwnEvents(host, tree, machine, events);
  if (status == kOk) status = ReadTransparent(host, threshold);
  if (status != kOk) return status;

  const Figure untold = threshold ? std::nullopt : Figure(0);
  record.nrBackings = FieldOf<uint32_t>(QuotientOf(mapping->huge, kLargePageKB));
  record.maxSwapThreshold = FieldOf<uint32_t>(threshold.value_or(0));
  record.nrAllocSuccess = FieldOf(threshold ? events->thpAlloc : Figure(0));
  record.nrFailPinned = FieldOf(untold);
  record.nrFailSwapped = FieldOf(untold);
  record.nrFailPinnedLate = FieldOf(untold);
  record.nrFailNoMem = FieldOf(untold);
  record.nrLocked = FieldOf<uint32_t>(untold);
  record.nrBroken = FieldOf(untold);
  return kOk;
}

Status ReadVmmLeaderID(const LinuxHost& /*host*/, const GroupTree& /*tree*/,
                       const VirtualMachine& machine, int32_t& pid) {
  // QEMU is one process: its monitor is led by the same.
  pid = machine.pid;
  return kOk;
}

Status ReadNumVMs(const LinuxHost& host, const Keys& /*keys*/, uint32_t& count) {
  const GroupTree* tree = nullptr;
  const Status status = GroupTree::Get(host, tree);
  if (status == kOk) count = static_cast<uint32_t>(tree->VirtualMachines().size());
  return status;
}

template <auto read>
constexpr auto OfMachine = ReaderOf<FindMachine, read>::Read;

constexpr Reader kReaders[] = {
    ValueOf<node::sched_memClients_tally_vmm, OfMachine<ReadVmmTally>>(),
    ValueOf<node::sched_memClients_tally_guest, OfMachine<ReadGuestTally>>(),
    ValueOf<node::sched_memClients_swapInfo, OfMachine<ReadSwapInfo>>(),
    ValueOf<node::sched_memClients_memzipInfo, OfMachine<ReadMemzipInfo>>(),
    ValueOf<node::memory_lpage_vmLPage, OfMachine<ReadVmLargePages>>(),
    ValueOf<node::worldGroups_vmmLeaderID, OfMachine<ReadVmmLeaderID>>(),
    ValueOf<node::sched_globalStats_numVMs, ReadNumVMs>(),
};

}  // namespace

constinit const ReaderTable kVirtualMachineReaders = kReaders;

}  // namespace ksi
