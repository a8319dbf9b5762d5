// What a group is and what it uses: the nodes below sched/groups. tally-linux(7) says where
// each figure comes from and why.
#include <knvlibs/ksi_records.h>
#include "knvlibs/characters.h"
#include "knvlibs/linux/groups/cgroup.h"
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/groups/reader_of.h"
#include "knvlibs/linux/host/figure_file.h"
#include "knvlibs/linux/machines/guest.h"
#include "knvlibs/linux/memory/kernel_memory.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

Status FindGroup(const LinuxHost& host, const Keys& keys, const GroupTree*& tree,
                 const Group*& group) {
  const Status status = GroupTree::Get(host, tree);
  if (status != kOk) return status;
  group = tree->Find(keys[0].number);
  return group == nullptr ? KSI_STATUS_NOT_FOUND : kOk;
}

// A text that is cut before the first character that the field has no room for.
template <size_t size>
void CopyText(std::string_view text, char (&field)[size]) {
  CutAtCharacter(text, size).copy(field, size);
}

// The cgroup whose settings hold for a group, null if none do: its own, and for a virtual machine
// that of the unit made for it. Nothing is set for the root.
const Group* SettingsOf(const GroupTree& tree, const Group& group) {
  if (group.virtualMachine != Group::kNone) {
    const size_t own = tree.VirtualMachineOf(group).cgroup;
    return own == Group::kNone ? nullptr : &tree.At(own);
  }
  return group.kind == Group::Kind::kCgroup && group.id != kRootGroup ? &group : nullptr;
}

// What is reserved, and the limit: none for no limit.
Status ReadSettings(const LinuxHost& host, const GroupTree& tree, const Group& group,
                    Figure& reserved, Figure& limit) {
  reserved = 0;
  limit.reset();
  const Group* settings = SettingsOf(tree, group);
  if (settings == nullptr) return kOk;
  const Status status = tree.ReadReservation(host, *settings, reserved);
  return status == kOk ? tree.Cgroups().ReadLimit(host, settings->path, limit) : status;
}

// What is kept for a group, come what may or while there is other memory to take.
Status ReadProtection(const LinuxHost& host, const GroupTree& tree, const Group& group,
                      Figure& kept) {
  Figure low;
  kept = 0;
  const Group* settings = SettingsOf(tree, group);
  if (settings == nullptr) return kOk;
  Status status = tree.ReadReservation(host, *settings, kept);
  if (status == kOk) status = tree.Cgroups().ReadLow(host, settings->path, low);
  // None is all that it has.
  kept = kept && low ? Figure(std::max(*kept, *low)) : std::nullopt;
  return status;
}

// What is reserved for the cgroups below a group, in KB.
Status ReadReservedBelow(const LinuxHost& host, const GroupTree& tree, const Group& group,
                         Figure& reserved) {
  reserved = 0;
  for (const size_t index : group.children) {
    Figure part;
    const Status status = tree.ReadReservation(host, tree.At(index), part);
    if (status != kOk) return status;
    reserved = SumOf({reserved, part});
  }
  return kOk;
}

// What of a group's reservation holds against those around it. Without any on the way up there is
// nothing to work out; else only the kernel knows.
Status ReadEffectiveReservation(const LinuxHost& host, const GroupTree& tree, const Group& group,
                                Figure& effective) {
  effective = 0;
  for (const Group* at = &group; at->parent != Group::kNone; at = &tree.At(at->parent)) {
    Figure reserved;
    const Status status = tree.ReadReservation(host, *at, reserved);
    if (status != kOk) return status;
    if (reserved != 0u) effective.reset();
  }
  return kOk;
}

// The part of the time that waiting for memory has left to all who wait at once. Percent.
Figure LeftBy(const Pressure& pressure) {
  if (!pressure.full) return std::nullopt;
  return Less(100, (*pressure.full + 50) / 100);
}

// The cgroup that a process is in.
const Group& CgroupOf(const GroupTree& tree, const Group& group) {
  const Group* at = &group;
  while (at->kind != Group::Kind::kCgroup) at = &tree.At(at->parent);
  return *at;
}

// The part of the time that a group may run. Who waits is counted for the host and for cgroups: of
// a process that shares its cgroup, only that it did not wait is told, if nobody there did.
Status ReadThrottle(const LinuxHost& host, const GroupTree& tree, const Group& group,
                    Figure& percent) {
  const Pressure* ofHost = nullptr;
  Status status = host.Kept().pressure.Get(host, ofHost);
  percent.reset();
  if (status != kOk || !ofHost->some) return status;
  if (ofHost->IsNone()) percent = 100;
  if (group.id == kRootGroup) percent = LeftBy(*ofHost);
  const Group* own = SettingsOf(tree, group);
  const Group& measured = own == nullptr ? CgroupOf(tree, group) : *own;
  if (percent || measured.id == kRootGroup) return kOk;
  Pressure pressure;
  status = tree.ReadPressure(host, measured, pressure);
  if (own != nullptr) {
    percent = LeftBy(pressure);
  } else if (pressure.IsNone()) {
    percent = 100;
  }
  return status;
}

Status ReadRoot(const LinuxHost& host, const FigureFile& meminfo, KSI_GroupMemoryStats& record) {
  uint64_t total = 0;
  uint64_t free = 0;
  uint64_t kernel = 0;
  Status status = meminfo.Require("MemTotal", total);
  if (status == kOk) status = meminfo.Require("MemFree", free);
  if (status == kOk) status = ReadKernelMemory(host, kernel);
  if (status != kOk) return status;

  record.consumed = Less(total, free);
  record.memSize =
      record.consumed + Less(meminfo.FindOr("SwapTotal", 0), meminfo.FindOr("SwapFree", 0));
  record.consumedPeak = FieldOf(std::nullopt);
  record.memSizePeak = FieldOf(std::nullopt);
  record.ovhd = kernel;
  record.touched = FieldOf(meminfo.Find("Active"));
  return kOk;
}

Status ReadKernel(const LinuxHost& host, KSI_GroupMemoryStats& record) {
  uint64_t kernel = 0;
  const Status status = ReadKernelMemory(host, kernel);
  record.consumed = kernel;
  record.memSize = kernel;
  record.consumedPeak = FieldOf(std::nullopt);
  record.memSizePeak = FieldOf(std::nullopt);
  record.touched = FieldOf(std::nullopt);
  return status;
}

// Of the default size meminfo tells what is in use; of the others a free page counts as used.
uint64_t HugetlbInUse(const FigureFile& meminfo) {
  const uint64_t all = meminfo.FindOr("Hugetlb", 0);
  const uint64_t free = meminfo.FindOr("HugePages_Free", 0) * meminfo.FindOr("Hugepagesize", 0);
  return Less(all, free);
}

Status ReadCgroup(const LinuxHost& host, const GroupTree& tree, const Group& group,
                  const FigureFile& meminfo, KSI_GroupMemoryStats& record) {
  MemcgUsage usage;
  Figure hugetlb;
  Status status = tree.Cgroups().ReadUsage(host, group.path, usage);
  if (status == kOk) status = tree.ReadHugetlb(host, group, HugetlbInUse(meminfo), hugetlb);
  if (status != kOk) return status;
  usage.current = SumOf({usage.current, hugetlb});
  // The kernel keeps no peak of hugetlb.
  if (hugetlb != 0u) usage.peak = usage.peakWithSwap = std::nullopt;
  // Kernels that do not account for swap, and hosts that have none.
  if (usage.current && meminfo.FindOr("SwapTotal", 0) == 0) {
    usage.swap = 0;
    usage.peakWithSwap = usage.peak;
  }
  record.consumed = FieldOf(usage.current);
  record.consumedPeak = FieldOf(usage.peak);
  record.memSize = FieldOf(SumOf({usage.current, usage.swap}));
  record.memSizePeak = FieldOf(usage.peakWithSwap);
  record.ovhd = FieldOf(usage.kernel);
  record.touched = FieldOf(usage.active);
  return kOk;
}

// What the page tables of KVM take for a machine by its own cgroup.
Status ReadOwnTables(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                     Figure& tables) {
  tables.reset();
  const MemcgEvents* events = nullptr;
  const Status status = GetOwnEvents(host, tree, machine, events);
  if (status == kOk) tables = events->secPageTables;
  return status;
}

// Whether what the host has of such page tables is that of the machines. Since Linux 6.11 those of
// devices are among it.
Status ReadHostTables(const LinuxHost& host, const GroupTree& tree, const FigureFile& meminfo,
                      Figure& tables) {
  const FigureFile* vmstat = nullptr;
  tables.reset();
  if (!tree.HasAllMachines()) return kOk;
  const Status status = host.Kept().vmstat.Get(host, vmstat);
  if (status == kOk && vmstat->FindOr("nr_iommu_pages", 0) == 0) {
    tables = meminfo.Find("SecPageTables");
  }
  return status;
}

// The share of the one machine whose own cgroup does not tell: what is left of the host's. There
// is no telling how several divide it.
Status ReadRestOfTables(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                        const FigureFile& meminfo, Figure& rest) {
  Status status = ReadHostTables(host, tree, meminfo, rest);
  for (const VirtualMachine& other : tree.VirtualMachines()) {
    if (status != kOk || !rest) return status;
    if (&other == &machine || UsesKvm(host, tree, other) == false) continue;
    Figure part;
    status = ReadOwnTables(host, tree, other, part);
    rest = DifferenceOf(rest, part);
  }
  return status;
}

Status ReadKvmTables(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                     const FigureFile& meminfo, Figure& tables) {
  tables = 0;
  if (meminfo.FindOr("SecPageTables", 0) == 0) return kOk;
  const Status status = ReadOwnTables(host, tree, machine, tables);
  if (status != kOk || tables) return status;
  const std::optional<bool> usesKvm = UsesKvm(host, tree, machine);
  if (usesKvm == true) return ReadRestOfTables(host, tree, machine, meminfo, tables);
  if (usesKvm == false) tables = 0;
  return kOk;
}

// What a virtual machine takes beside the memory of its guest: the rest of QEMU, page tables, and
// those of KVM.
Status ReadOverhead(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                    const GuestMapping& mapping, const FigureFile& meminfo, Figure& overhead) {
  Figure tables;
  overhead.reset();
  if (!mapping.resident) return kOk;
  const Status status = ReadKvmTables(host, tree, machine, meminfo, tables);
  const Process& process = machine.measured;
  overhead = SumOf({DifferenceOf(process.Mapped(), mapping.resident), process.vmPte, tables});
  return status;
}

void FillProcess(const Process& process, KSI_GroupMemoryStats& record) {
  record.consumed = FieldOf(process.Mapped());
  // The kernel keeps no peak of hugetlb.
  record.consumedPeak = FieldOf(process.hugetlb == 0u ? process.vmHwm : std::nullopt);
  record.memSize = FieldOf(process.vmSize);
  record.memSizePeak = FieldOf(process.vmPeak);
  record.ovhd = FieldOf(process.vmPte);
  // Only a walk of all its page tables tells.
  record.touched = FieldOf(std::nullopt);
}

// A virtual machine and its monitor, which is the same process. One that has ended since is shown
// as it was.
Status ReadMachine(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                   const FigureFile& meminfo, KSI_GroupMemoryStats& record) {
  const QemuCommandLine& line = machine.commandLine;
  GuestMapping ended;
  ended.memory = line.memory;
  if (line.MayChange()) ended.memory.modules.reset();
  const GuestMapping* mapping = &ended;
  Figure overhead;
  Status status = GetMapping(host, tree, machine, mapping);
  if (status == kOk) status = ReadOverhead(host, tree, machine, *mapping, meminfo, overhead);
  const Figure size = mapping->memory.Size();
  record.memSize = FieldOf(size);
  // What may be more is no peak.
  record.memSizePeak = FieldOf(!line.maxMemory || size == line.maxMemory ? size : std::nullopt);
  record.ovhd = FieldOf(overhead);
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

Status ReadUse(const LinuxHost& host, const GroupTree& tree, const Group& group,
               KSI_GroupMemoryStats& record) {
  if (group.IsProcess()) FillProcess(tree.ProcessOf(group), record);
  if (group.kind == Group::Kind::kUserWorld) return kOk;

  const FigureFile* meminfo = nullptr;
  const Status status = host.Kept().meminfo.Get(host, meminfo);
  if (status != kOk) return status;
  if (group.IsProcess()) {
    return ReadMachine(host, tree, tree.VirtualMachineOf(group), *meminfo, record);
  }
  if (group.kind == Group::Kind::kKernel) return ReadKernel(host, record);
  return group.id == kRootGroup ? ReadRoot(host, *meminfo, record)
                                : ReadCgroup(host, tree, group, *meminfo, record);
}

Status ReadGroupMemoryStats(const LinuxHost& host, const GroupTree& tree, const Group& group,
                            KSI_GroupMemoryStats& record) {
  Figure reserved = 0;
  Figure limit;
  Figure effective;
  Figure throttle;
  Figure saved;
  Status status = ReadUse(host, tree, group, record);
  if (status == kOk) status = ReadProtection(host, tree, group, reserved);
  if (status == kOk) status = tree.ReadEffectiveLimit(host, group, limit);
  if (status == kOk) status = ReadEffectiveReservation(host, tree, group, effective);
  if (status == kOk) status = ReadThrottle(host, tree, group, throttle);
  if (status != kOk) return status;
  status = tree.ReadSharedSaved(host, group, saved);
  if (status == KSI_STATUS_NOT_FOUND) saved.reset();  // a process that has ended since
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;

  record.bMin = FieldOf(reserved);
  record.bMax = FieldOf(limit);
  record.eMin = FieldOf(effective);
  record.eMinPeak = FieldOf(effective);
  record.sharedSaved = FieldOf(saved);
  record.throttlePct = FieldOf<uint8_t>(throttle);
  return kOk;
}

Status ReadGroupAllocation(const LinuxHost& host, const GroupTree& tree, const Group& group,
                           KSI_GroupAllocation& record) {
  Figure reserved;
  Figure limit;
  Status status = ReadSettings(host, tree, group, reserved, limit);
  if (status != kOk) return status;
  record.min = FieldOf<int64_t>(reserved);
  // All ones is no limit here.
  record.max = FieldOf<int64_t>(limit);
  record.minLimit = KSI_NO_LIMIT;
  return kOk;
}

Status ReadGroupCapacity(const LinuxHost& host, const GroupTree& tree, const Group& group,
                         KSI_GroupCapacity& record) {
  Figure own;
  Figure limit;
  Figure below;
  Status status = ReadSettings(host, tree, group, own, limit);
  if (status == kOk) status = ReadReservedBelow(host, tree, group, below);
  // What there is to reserve at the top is the whole host, if there are reservations.
  if (status == kOk && group.id == kRootGroup && tree.Cgroups().HasReservations()) {
    const FigureFile* meminfo = nullptr;
    status = host.Kept().meminfo.Get(host, meminfo);
    if (status == kOk) status = meminfo->Require("MemTotal", own.emplace());
  }
  if (status != kOk) return status;
  record.conResv = FieldOf(below);
  record.availResv = FieldOf(DifferenceOf(own, below));
  return kOk;
}

Status ReadGroupName(const LinuxHost& /*host*/, const GroupTree& /*tree*/, const Group& group,
                     KSI_GroupName& record) {
  CopyText(group.name, record.text);
  return kOk;
}

Status ReadGroupTag(const LinuxHost& /*host*/, const GroupTree& /*tree*/, const Group& group,
                    KSI_GroupTag& record) {
  CopyText(UnitType(group.path), record.text);
  return kOk;
}

Status ReadParentGroupID(const LinuxHost& /*host*/, const GroupTree& tree, const Group& group,
                         int64_t& id) {
  // The root is its own parent: there is no other.
  id = group.parent == Group::kNone ? group.id : tree.At(group.parent).id;
  return kOk;
}

Status ReadGroupFlags(const LinuxHost& /*host*/, const GroupTree& /*tree*/, const Group& group,
                      uint32_t& flags) {
  flags = group.flags;
  return kOk;
}

Status ReadGroupLeaderID(const LinuxHost& /*host*/, const GroupTree& tree, const Group& group,
                         int32_t& pid) {
  if (!group.IsProcess()) return KSI_STATUS_NOT_FOUND;
  pid = tree.ProcessOf(group).pid;
  return kOk;
}

Status ListChildGroups(const LinuxHost& /*host*/, const GroupTree& tree, const Group& group,
                       ParamList& instances) {
  Status status = kOk;
  instances.Reserve(group.children.size());
  for (const size_t child : group.children) {
    if (status == kOk) status = instances.AddNumber(static_cast<uint64_t>(tree.At(child).id));
  }
  return status;
}

Status ListGroupClients(const LinuxHost& /*host*/, const GroupTree& tree, const Group& group,
                        ParamList& instances) {
  // The monitor is no client beside its virtual machine.
  if (!group.IsProcess() || group.kind == Group::Kind::kVmm) return kOk;
  return instances.AddNumber(static_cast<uint64_t>(tree.ProcessOf(group).pid));
}

template <auto read>
constexpr auto OfGroup = ReaderOf<FindGroup, read>::Read;

constexpr Reader kReaders[] = {
    ValueOf<node::sched_groups_groupName, OfGroup<ReadGroupName>>(),
    ValueOf<node::sched_groups_groupTag, OfGroup<ReadGroupTag>>(),
    ValueOf<node::sched_groups_parentGroupID, OfGroup<ReadParentGroupID>>(),
    ValueOf<node::sched_groups_groupFlags, OfGroup<ReadGroupFlags>>(),
    ValueOf<node::sched_groups_groupLeaderID, OfGroup<ReadGroupLeaderID>>(),
    ValueOf<node::sched_groups_memAllocationInKB, OfGroup<ReadGroupAllocation>>(),
    ValueOf<node::sched_groups_stats_capacity, OfGroup<ReadGroupCapacity>>(),
    ValueOf<node::sched_groups_stats_memoryStats, OfGroup<ReadGroupMemoryStats>>(),
    ListOf<node::sched_groups_members_groups>(OfGroup<ListChildGroups>),
    ListOf<node::sched_groups_members_memClients>(OfGroup<ListGroupClients>),
};

}  // namespace

constinit const ReaderTable kGroupReaders = kReaders;

}  // namespace ksi
