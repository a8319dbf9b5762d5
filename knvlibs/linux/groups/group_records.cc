// What a group is and what it uses: the nodes below sched/groups. docs/linux-host.md says where
// each figure comes from and why.
#include <algorithm>
#include <cstring>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/cgroup.h"
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/handlers.h"
#include "knvlibs/linux/host/figures.h"
#include "knvlibs/linux/host/recent.h"

namespace ksi {
namespace {

constexpr int64_t kUnlimited = -1;

// Lets `read` answer for the group that the keys name.
template <class Reader>
Status OfGroup(const LinuxHost& host, const Keys& keys, Reader&& read) {
  const GroupTree* tree = nullptr;
  const Status status = GroupTree::Get(host, &tree);
  if (status != kOk) return status;
  const Group* group = tree->Find(keys[0].number);
  return group == nullptr ? KSI_STATUS_NOT_FOUND : read(*tree, *group);
}

// A text that is cut where the field ends.
template <size_t size>
void CopyText(std::string_view text, char (&field)[size]) {
  text.copy(field, size);
}

int64_t SignedLimit(uint64_t limit) {
  return limit == kNoLimit ? kUnlimited : static_cast<int64_t>(limit);
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

Status ReadSettings(const LinuxHost& host, const GroupTree& tree, const Group& group,
                    uint64_t* reserved, uint64_t* limit) {
  *reserved = 0;
  *limit = kNoLimit;
  const Group* settings = SettingsOf(tree, group);
  if (settings == nullptr) return kOk;
  const Status status = tree.ReadReservation(host, *settings, reserved);
  return status == kOk ? tree.Cgroups().ReadLimit(host, settings->path, limit) : status;
}

// What is reserved for the cgroups below a group, in KB.
Status ReadReservedBelow(const LinuxHost& host, const GroupTree& tree, const Group& group,
                         uint64_t* reserved) {
  *reserved = 0;
  for (const size_t index : group.children) {
    const Group& child = tree.At(index);
    uint64_t part = 0;
    const Status status = tree.ReadReservation(host, child, &part);
    if (status != kOk) return status;
    *reserved = SumOf(*reserved, part);
  }
  return kOk;
}

// What of a group's reservation holds against those around it. Without any on the way up there is
// nothing to work out; else only the kernel knows.
Status ReadEffectiveReservation(const LinuxHost& host, const GroupTree& tree, const Group& group,
                                uint64_t* effective) {
  *effective = 0;
  for (const Group* at = &group; at->parent != Group::kNone; at = &tree.At(at->parent)) {
    uint64_t reserved = 0;
    const Status status = tree.ReadReservation(host, *at, &reserved);
    if (status != kOk) return status;
    if (reserved != 0) *effective = kNoValue;
  }
  return kOk;
}

// /proc/meminfo, for the rows of one report.
struct Meminfo {
  Figures figures;

  static Status Read(const LinuxHost& host, Meminfo* meminfo) {
    return meminfo->figures.ReadMeminfo(host);
  }
};

Status GetMeminfo(const LinuxHost& host, const Figures** figures) {
  const Meminfo* meminfo = nullptr;
  const Status status = host.Keep<Recent<Meminfo>>().Get(host, Meminfo::Read, &meminfo);
  if (status == kOk) *figures = &meminfo->figures;
  return status;
}

Status ReadRoot(const Figures& meminfo, KSI_GroupMemoryStats* record) {
  uint64_t total = 0;
  uint64_t free = 0;
  uint64_t kernel = 0;
  Status status = meminfo.Require("MemTotal", &total);
  if (status == kOk) status = meminfo.Require("MemFree", &free);
  if (status == kOk) status = ReadKernelHeap(meminfo, &kernel);
  if (status != kOk) return status;

  record->consumed = DifferenceOf(total, free);
  record->memSize = record->consumed +
                    DifferenceOf(meminfo.FindOr("SwapTotal", 0), meminfo.FindOr("SwapFree", 0));
  record->consumedPeak = kNoValue;
  record->memSizePeak = kNoValue;
  record->ovhd = kernel;
  record->touched = meminfo.FindOr("Active", kNoValue);
  return kOk;
}

Status ReadKernel(const Figures& meminfo, KSI_GroupMemoryStats* record) {
  uint64_t kernel = 0;
  const Status status = ReadKernelHeap(meminfo, &kernel);
  record->consumed = kernel;
  record->memSize = kernel;
  record->consumedPeak = kNoValue;
  record->memSizePeak = kNoValue;
  record->touched = kNoValue;
  return status;
}

Status ReadCgroup(const LinuxHost& host, const GroupTree& tree, const Group& group,
                  const Figures& meminfo, KSI_GroupMemoryStats* record) {
  CgroupMemory memory;
  const Status status = tree.Cgroups().ReadMemory(host, group.path, &memory);
  if (status != kOk) return status;
  // Kernels that do not account for swap, and hosts that have none.
  if (memory.current != kNoValue && meminfo.FindOr("SwapTotal", 0) == 0) {
    memory.swapped = 0;
    memory.peakWithSwap = memory.peak;
  }
  record->consumed = memory.current;
  record->consumedPeak = memory.peak;
  record->memSize = SumOf(memory.current, memory.swapped);
  record->memSizePeak = memory.peakWithSwap;
  record->ovhd = memory.kernel;
  record->touched = memory.active;
  return kOk;
}

void FillProcess(const GroupTree& tree, const Group& group, KSI_GroupMemoryStats* record) {
  const Process& process = tree.ProcessOf(group);
  record->consumed = process.Mapped();
  // The kernel keeps no peak of the huge pages.
  record->consumedPeak = process.hugePages == 0 ? process.peakResident : kNoValue;
  record->memSize = process.addressSpace;
  record->memSizePeak = process.peakAddressSpace;
  record->ovhd = process.pageTables;
  // Only a walk of all its page tables tells.
  record->touched = kNoValue;
  if (group.virtualMachine == Group::kNone) return;
  const QemuCommandLine& line = tree.VirtualMachineOf(group).commandLine;
  record->memSize = line.memory;
  record->memSizePeak = line.memory == line.maxMemory ? line.memory : kNoValue;
}

Status AnswerAllocation(const LinuxHost& host, const GroupTree& tree, const Group& group,
                        Buffer buffer) {
  uint64_t reserved = 0;
  uint64_t limit = 0;
  const Status status = ReadSettings(host, tree, group, &reserved, &limit);
  if (status != kOk) return status;
  KSI_GroupAllocation record = {};
  record.min = static_cast<int64_t>(reserved);
  record.max = SignedLimit(limit);
  record.minLimit = kUnlimited;
  return Answer(buffer, record);
}

Status AnswerCapacity(const LinuxHost& host, const GroupTree& tree, const Group& group,
                      Buffer buffer) {
  uint64_t own = 0;
  uint64_t limit = 0;
  uint64_t below = 0;
  Status status = ReadSettings(host, tree, group, &own, &limit);
  if (status == kOk) status = ReadReservedBelow(host, tree, group, &below);
  // What there is to reserve at the top is the whole host, if there are reservations.
  if (status == kOk && group.id == kRootGroup && tree.Cgroups().HasReservations()) {
    const Figures* meminfo = nullptr;
    status = GetMeminfo(host, &meminfo);
    if (status == kOk) status = meminfo->Require("MemTotal", &own);
  }
  if (status != kOk) return status;
  KSI_GroupCapacity record = {};
  record.conResv = below;
  record.availResv = DifferenceOf(own, below);
  return Answer(buffer, record);
}

Status ReadUse(const LinuxHost& host, const GroupTree& tree, const Group& group,
               KSI_GroupMemoryStats* record) {
  if (group.IsProcess()) {
    FillProcess(tree, group, record);
    return kOk;
  }
  const Figures* meminfo = nullptr;
  const Status status = GetMeminfo(host, &meminfo);
  if (status != kOk) return status;
  if (group.kind == Group::Kind::kKernel) return ReadKernel(*meminfo, record);
  return group.id == kRootGroup ? ReadRoot(*meminfo, record)
                                : ReadCgroup(host, tree, group, *meminfo, record);
}

Status AnswerMemoryStats(const LinuxHost& host, const GroupTree& tree, const Group& group,
                         Buffer buffer) {
  KSI_GroupMemoryStats record = {};
  uint64_t reserved = 0;
  uint64_t limit = 0;
  uint64_t effective = 0;
  uint64_t saved = 0;
  Status status = ReadUse(host, tree, group, &record);
  if (status == kOk) status = ReadSettings(host, tree, group, &reserved, &limit);
  if (status == kOk) status = ReadEffectiveReservation(host, tree, group, &effective);
  if (status == kOk) status = tree.ReadSharedSaved(host, group, &saved);
  if (status != kOk) return status;

  record.bMin = reserved;
  record.bMax = limit;
  record.eMin = effective;
  record.eMinPeak = effective;
  record.sharedSaved = saved;
  // Nothing holds a group's threads back for the sake of memory.
  record.throttlePct = 100;
  return Answer(buffer, record);
}

}  // namespace

Status ReadGroupName(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree&, const Group& group) {
    KSI_GroupName record = {};
    CopyText(group.name, record.text);
    return Answer(buffer, record);
  });
}

Status ReadGroupTag(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree&, const Group& group) {
    KSI_GroupTag record = {};
    CopyText(UnitType(group.path), record.text);
    return Answer(buffer, record);
  });
}

Status ReadParentGroupID(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    // The root is its own parent: there is no other.
    return Answer(buffer, group.parent == Group::kNone ? group.id : tree.At(group.parent).id);
  });
}

Status ReadGroupFlags(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys,
                 [&](const GroupTree&, const Group& group) { return Answer(buffer, group.flags); });
}

Status ReadGroupLeaderID(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    return group.IsProcess() ? Answer(buffer, tree.ProcessOf(group).pid) : KSI_STATUS_NOT_FOUND;
  });
}

Status ReadGroupAllocation(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    return AnswerAllocation(host, tree, group, buffer);
  });
}

Status ReadGroupCapacity(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    return AnswerCapacity(host, tree, group, buffer);
  });
}

Status ReadGroupMemoryStats(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    return AnswerMemoryStats(host, tree, group, buffer);
  });
}

Status ListChildGroups(const LinuxHost& host, const Keys& keys, ParamList& instances) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    instances.Reserve(group.children.size());
    Status status = kOk;
    for (const size_t child : group.children) {
      if (status == kOk) status = instances.AddNumber(static_cast<uint64_t>(tree.At(child).id));
    }
    return status;
  });
}

Status ListGroupClients(const LinuxHost& host, const Keys& keys, ParamList& instances) {
  return OfGroup(host, keys, [&](const GroupTree& tree, const Group& group) {
    // The monitor is no client beside its virtual machine.
    if (!group.IsProcess() || group.kind == Group::Kind::kVmm) return kOk;
    return instances.AddNumber(static_cast<uint64_t>(tree.ProcessOf(group).pid));
  });
}

}  // namespace ksi
