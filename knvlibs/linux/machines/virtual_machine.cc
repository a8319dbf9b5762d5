// A virtual machine is a QEMU process. tally-linux(7) says where each figure comes from and
// why.
#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/cgroup.h"
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/groups/process_ksm.h"
#include "knvlibs/linux/groups/reader_of.h"
#include "knvlibs/linux/reader_tables.h"

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

Status GetMapping(const LinuxHost& host, const VirtualMachine& machine,
                  const GuestMapping*& mapping) {
  if (!machine.mapping) {
    GuestMapping read;
    const Status status = ReadGuestMapping(host, machine.pid, machine.commandLine, read);
    if (status != kOk) return status;
    machine.mapping = read;
  }
  mapping = &*machine.mapping;
  return kOk;
}

// Whether a client may come without being the one that QEMU waits for to make its machine.
bool MayBeAsked(const LinuxHost& host, const VirtualMachine& machine) {
  const GuestMapping* mapping = nullptr;
  return !machine.commandLine.waitsForClient ||
         (GetMapping(host, machine, mapping) == kOk && mapping->isMade);
}

const GuestMemory& GetGuest(const LinuxHost& host, const VirtualMachine& machine) {
  if (!machine.guest) {
    machine.guest = MayBeAsked(host, machine)
                        ? ReadGuestMemory(host, machine.pid, machine.commandLine)
                        : UnaskedGuest(machine.commandLine);
  }
  return *machine.guest;
}

// What happened to the cgroup that was made for the machine; nothing is told if there is none.
Status ReadOwnEvents(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                     MemcgEvents& events) {
  events = MemcgEvents();
  if (machine.cgroup == Group::kNone) return kOk;
  return tree.Cgroups().ReadEvents(host, tree.At(machine.cgroup).path, events);
}

// What the kernel tells of a machine's use of memory, by its process and by its own cgroup.
struct MachineUse {
  const GuestMapping* mapping = nullptr;
  ProcessKsm ksm;
  MemcgEvents events;
};

Status ReadUse(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
               MachineUse& use) {
  Status status = GetMapping(host, machine, use.mapping);
  if (status == kOk) status = ReadProcessKsm(host, machine.pid, use.ksm);
  return status == kOk ? ReadOwnEvents(host, tree, machine, use.events) : status;
}

// Without a compressed cache for swap on the host nothing of any machine is compressed.
void SettleCompression(const LinuxHost& host, MemcgEvents& events) {
  std::string enabled;
  const Status status = host.Read("/sys/module/zswap/parameters/enabled", enabled);
  const bool isOff = status == KSI_STATUS_NOT_FOUND || enabled.starts_with('N');
  if (!isOff || events.zswapPool) return;
  events.zswapPool = 0;
  events.zswapped = 0;
  events.zswpin = 0;
  events.zswpout = 0;
  events.zswapMax = 0;
}

void FillBalloon(const GuestMemory& guest, Figure memory, KSI_VmmTally& record) {
  switch (guest.balloon) {
    case GuestMemory::Balloon::kNone:
      break;
    case GuestMemory::Balloon::kActive:
      record.balloonActive = 1;
      record.ballooned = FieldOf(DifferenceOf(memory, guest.actual));
      record.balloonTgt = FieldOf(std::nullopt);
      break;
    case GuestMemory::Balloon::kUnknown:
      record.balloonActive = FieldOf<uint8_t>(std::nullopt);
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
  SettleCompression(host, use.events);

  const QemuCommandLine& line = machine.commandLine;
  const Figure memory = line.memory ? line.memory : use.mapping->size;
  record.memSize = FieldOf(memory);
  record.memSizeLimit = FieldOf(line.maxMemory ? line.maxMemory : memory);
  record.touched = FieldOf(use.mapping->smaps.referenced);
  // The kernel's zero page backs guest memory too, but does not count as resident.
  record.mapped =
      FieldOf(SumOf({use.mapping->smaps.rss, use.mapping->smaps.hugetlb, use.ksm.zeroPages}));
  record.shared = FieldOf(use.ksm.Saved());
  record.zero = FieldOf(use.ksm.zeroPages);
  record.sharedSaved = FieldOf(use.ksm.Saved());
  record.zipped = FieldOf(use.events.zswapped);
  record.zipSaved = FieldOf(DifferenceOf(use.events.zswapped, use.events.zswapPool));
  FillBalloon(GetGuest(host, machine), memory, record);
  return kOk;
}

Status ReadGuestTally(const LinuxHost& host, const GroupTree& /*tree*/,
                      const VirtualMachine& machine, KSI_GuestTally& record) {
  const GuestMemory& guest = GetGuest(host, machine);
  record.memTotal = FieldOf(guest.total);
  record.lpageTotal = FieldOf<uint32_t>(std::nullopt);
  record.memNeeded = FieldOf(DifferenceOf(guest.total, guest.available));
  return kOk;
}

Status ReadSwapInfo(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                    KSI_SwapInfo& record) {
  MachineUse use;
  const Status status = ReadUse(host, tree, machine, use);
  if (status != kOk) return status;

  record.swapped = FieldOf(use.mapping->smaps.swap);
  record.swapRead = FieldOf(use.events.swapcached);
  record.swapIn = FieldOf(use.events.swpin);
  record.swapOut = FieldOf(use.events.swpout);
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
  MemcgEvents events;
  Status status = ReadOwnEvents(host, tree, machine, events);
  if (status != kOk) return status;
  SettleCompression(host, events);

  record.totalCache = FieldOf(events.zswapMax);
  record.maxCache = FieldOf(events.zswapMax);
  record.usedCache = FieldOf(events.zswapPool);
  record.zipped = FieldOf(events.zswpout);
  record.unZipped = FieldOf(events.zswpin);
  // The kernel counts what it refused for the host alone, and takes no times.
  const auto untoldUnless = [](bool isZero) { return FieldOf(isZero ? Figure(0) : std::nullopt); };
  record.zipRejected = untoldUnless(events.zswapMax == 0u && events.zswpout == 0u);
  record.avgZipTime = untoldUnless(events.zswpout == 0u);
  record.avgUnzipTime = untoldUnless(events.zswpin == 0u);
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
  MemcgEvents events;
  Figure threshold;
  Status status = GetMapping(host, machine, mapping);
  if (status == kOk) status = ReadOwnEvents(host, tree, machine, events);
  if (status == kOk) status = ReadTransparent(host, threshold);
  if (status != kOk) return status;

  const Smaps& smaps = mapping->smaps;
  const Figure backed = SumOf({smaps.anonHugePages, smaps.shmemPmdMapped, smaps.hugetlb});
  const Figure untold = threshold ? std::nullopt : Figure(0);
  record.nrBackings = FieldOf<uint32_t>(QuotientOf(backed, kLargePageKB));
  record.maxSwapThreshold = FieldOf<uint32_t>(threshold.value_or(0));
  record.nrAllocSuccess = FieldOf(threshold ? events.thpAlloc : Figure(0));
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
