// A virtual machine is a QEMU process. docs/linux-host.md says where each figure comes from and
// why.
#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/cgroup.h"
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/groups/process_ksm.h"
#include "knvlibs/linux/handlers.h"

namespace ksi {
namespace {

// Lets `read` answer for the virtual machine that the keys name.
template <class Reader>
Status OfMachine(const LinuxHost& host, const Keys& keys, Reader&& read) {
  const GroupTree* tree = nullptr;
  const Status status = GroupTree::Get(host, &tree);
  if (status != kOk) return status;
  const VirtualMachine* machine = tree->FindVirtualMachine(keys[0].number);
  return machine == nullptr ? KSI_STATUS_NOT_FOUND : read(*tree, *machine);
}

Status GetMapping(const LinuxHost& host, const VirtualMachine& machine,
                  const GuestMapping** mapping) {
  if (!machine.mapping) {
    GuestMapping read;
    const Status status = ReadGuestMapping(host, machine.pid, machine.commandLine, &read);
    if (status != kOk) return status;
    machine.mapping = read;
  }
  *mapping = &*machine.mapping;
  return kOk;
}

const GuestMemory& GetGuest(const LinuxHost& host, const VirtualMachine& machine) {
  if (!machine.guest) machine.guest = ReadGuestMemory(host, machine.pid, machine.commandLine);
  return *machine.guest;
}

// What happened to the cgroup that was made for the machine; all ones if there is none.
Status ReadOwnEvents(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                     CgroupEvents* events) {
  *events = CgroupEvents();
  if (machine.cgroup == Group::kNone) return kOk;
  return tree.Cgroups().ReadEvents(host, tree.At(machine.cgroup).path, events);
}

// Without a compressed cache for swap on the host nothing of any machine is compressed.
void SettleCompression(const LinuxHost& host, CgroupEvents* events) {
  std::string enabled;
  const Status status = host.Read("/sys/module/zswap/parameters/enabled", &enabled);
  const bool isOff = status == KSI_STATUS_NOT_FOUND || enabled.starts_with('N');
  if (!isOff || events->zswapPool != kNoValue) return;
  events->zswapPool = 0;
  events->zswapped = 0;
  events->zswapIn = 0;
  events->zswapOut = 0;
  events->zswapLimit = 0;
}

uint64_t MemoryOf(const VirtualMachine& machine, const GuestMapping& mapping) {
  return machine.commandLine.memory == kNoValue ? mapping.size : machine.commandLine.memory;
}

Status AnswerVmmTally(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                      Buffer buffer) {
  const GuestMapping* mapping = nullptr;
  ProcessKsm ksm;
  CgroupEvents events;
  Status status = GetMapping(host, machine, &mapping);
  if (status == kOk) status = ReadProcessKsm(host, machine.pid, &ksm);
  if (status == kOk) status = ReadOwnEvents(host, tree, machine, &events);
  if (status != kOk) return status;
  SettleCompression(host, &events);
  const GuestMemory& guest = GetGuest(host, machine);

  KSI_VmmTally record = {};
  record.memSize = MemoryOf(machine, *mapping);
  record.memSizeLimit = machine.commandLine.maxMemory == kNoValue ? uint64_t{record.memSize}
                                                                  : machine.commandLine.maxMemory;
  record.touched = mapping->memory.referenced;
  // The kernel's zero page backs guest memory too, but does not count as resident.
  record.mapped = SumOf(SumOf(mapping->memory.resident, mapping->memory.poolHuge), ksm.zeroPages);
  record.shared = ksm.Saved();
  record.zero = ksm.zeroPages;
  record.sharedSaved = ksm.Saved();
  record.zipped = events.zswapped;
  record.zipSaved = DifferenceOf(events.zswapped, events.zswapPool);
  switch (guest.balloon) {
    case GuestMemory::Balloon::kNone:
      break;
    case GuestMemory::Balloon::kActive:
      record.balloonActive = 1;
      record.ballooned = DifferenceOf(record.memSize, guest.actual);
      record.balloonTgt = kNoValue;
      break;
    case GuestMemory::Balloon::kUnknown:
      record.balloonActive = FigureOf<uint8_t>(kNoValue);
      record.ballooned = kNoValue;
      record.balloonTgt = kNoValue;
      break;
  }
  return Answer(buffer, record);
}

Status AnswerSwapInfo(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                      Buffer buffer) {
  const GuestMapping* mapping = nullptr;
  ProcessKsm ksm;
  CgroupEvents events;
  Status status = GetMapping(host, machine, &mapping);
  if (status == kOk) status = ReadProcessKsm(host, machine.pid, &ksm);
  if (status == kOk) status = ReadOwnEvents(host, tree, machine, &events);
  if (status != kOk) return status;

  KSI_SwapInfo record = {};
  record.swapped = mapping->memory.swapped;
  record.swapRead = events.swapCached;
  record.swapIn = events.swappedIn;
  record.swapOut = events.swappedOut;
  // Linux swaps all to the same places.
  record.gblSwapRead = record.swapRead;
  record.gblSwapIn = record.swapIn;
  record.gblSwapOut = record.swapOut;
  record.COWSwapper = ksm.merged == 0 ? 0 : kNoValue;
  // It is always the kernel that swaps.
  record.curSwapper = 1;
  return Answer(buffer, record);
}

Status AnswerMemzipInfo(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                        Buffer buffer) {
  CgroupEvents events;
  const Status status = ReadOwnEvents(host, tree, machine, &events);
  if (status != kOk) return status;
  SettleCompression(host, &events);

  KSI_MemzipInfo record = {};
  record.totalCache = events.zswapLimit;
  record.maxCache = events.zswapLimit;
  record.usedCache = events.zswapPool;
  record.zipped = events.zswapOut;
  record.unZipped = events.zswapIn;
  // The kernel counts what it refused for the host alone, and takes no times.
  const bool wasUsed = events.zswapOut != 0;
  record.zipRejected = events.zswapLimit == 0 && !wasUsed ? 0 : kNoValue;
  record.avgZipTime = wasUsed ? kNoValue : 0;
  record.avgUnzipTime = events.zswapIn == 0 ? 0 : kNoValue;
  return Answer(buffer, record);
}

Status AnswerVmLargePages(const LinuxHost& host, const GroupTree& tree,
                          const VirtualMachine& machine, Buffer buffer) {
  constexpr uint64_t kLargePageKB = 2048;
  const GuestMapping* mapping = nullptr;
  CgroupEvents events;
  uint64_t threshold = 0;
  Status status = GetMapping(host, machine, &mapping);
  if (status == kOk) status = ReadOwnEvents(host, tree, machine, &events);
  if (status == kOk) {
    status =
        host.ReadNumber("/sys/kernel/mm/transparent_hugepage/khugepaged/max_ptes_swap", &threshold);
  }
  // A kernel without transparent huge pages has made none and met no trouble making them.
  const bool hasTransparent = status != KSI_STATUS_NOT_FOUND;
  if (status != kOk && hasTransparent) return status;
  if (!hasTransparent && mapping == nullptr) return status;

  const WalkedMemory& memory = mapping->memory;
  const uint64_t backed = SumOf(SumOf(memory.anonymousHuge, memory.sharedHuge), memory.poolHuge);
  const uint64_t untold = hasTransparent ? kNoValue : 0;
  KSI_VmLargePages record = {};
  record.nrBackings = FigureOf<uint32_t>(backed == kNoValue ? backed : backed / kLargePageKB);
  record.maxSwapThreshold = FigureOf<uint32_t>(threshold);
  record.nrAllocSuccess = hasTransparent ? events.hugePagesMade : 0;
  record.nrFailPinned = untold;
  record.nrFailSwapped = untold;
  record.nrFailPinnedLate = untold;
  record.nrFailNoMem = untold;
  record.nrLocked = FigureOf<uint32_t>(untold);
  record.nrBroken = untold;
  return Answer(buffer, record);
}

}  // namespace

Status ReadVmmTally(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfMachine(host, keys, [&](const GroupTree& tree, const VirtualMachine& machine) {
    return AnswerVmmTally(host, tree, machine, buffer);
  });
}

Status ReadGuestTally(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfMachine(host, keys, [&](const GroupTree&, const VirtualMachine& machine) {
    const GuestMemory& guest = GetGuest(host, machine);
    KSI_GuestTally record = {};
    record.memTotal = guest.total;
    record.lpageTotal = FigureOf<uint32_t>(kNoValue);
    record.memNeeded = DifferenceOf(guest.total, guest.available);
    return Answer(buffer, record);
  });
}

Status ReadSwapInfo(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfMachine(host, keys, [&](const GroupTree& tree, const VirtualMachine& machine) {
    return AnswerSwapInfo(host, tree, machine, buffer);
  });
}

Status ReadMemzipInfo(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfMachine(host, keys, [&](const GroupTree& tree, const VirtualMachine& machine) {
    return AnswerMemzipInfo(host, tree, machine, buffer);
  });
}

Status ReadVmLargePages(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfMachine(host, keys, [&](const GroupTree& tree, const VirtualMachine& machine) {
    return AnswerVmLargePages(host, tree, machine, buffer);
  });
}

Status ReadVmmLeaderID(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  // QEMU is one process: its monitor is led by the same.
  return OfMachine(host, keys, [&](const GroupTree&, const VirtualMachine& machine) {
    return Answer(buffer, machine.pid);
  });
}

Status ReadNumVMs(const LinuxHost& host, const Keys& /*keys*/, Buffer buffer) {
  const GroupTree* tree = nullptr;
  const Status status = GroupTree::Get(host, &tree);
  if (status != kOk) return status;
  return Answer(buffer, static_cast<uint32_t>(tree->VirtualMachines().size()));
}

}  // namespace ksi
