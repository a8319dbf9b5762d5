// The tree of groups: the cgroups, and below each the processes that are in it.
//
//   /                                  the root cgroup
//   ├─ kernel                          all kernel threads
//   ├─ system.slice                    a cgroup
//   │  └─ cron.service
//   │     └─ cron                      a user world: a process
//   └─ machine.slice
//      └─ machine-qemu-1-web.scope
//         └─ web                       a virtual machine: a QEMU process
//            └─ vmm                    its monitor
#ifndef KNVLIBS_LINUX_GROUPS_GROUPS_H_
#define KNVLIBS_LINUX_GROUPS_GROUPS_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "knvlibs/linux/groups/cgroup.h"
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/groups/process_ksm.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/guest_mapping.h"
#include "knvlibs/linux/machines/kvm.h"
#include "knvlibs/linux/machines/qemu_command_line.h"
#include "knvlibs/linux/machines/qmp.h"
#include "knvlibs/linux/memory/pressure.h"
#include "knvlibs/status.h"

namespace ksi {

// The ids of groups that are no cgroups: the process id, with a bit that no id of a cgroup has. The
// kernel's group is that of process 0.
constexpr int64_t kProcessGroup = int64_t{1} << 40;
constexpr int64_t kVmmGroup = int64_t{1} << 41;
constexpr int64_t kRootGroup = 0;
constexpr int64_t kKernelGroup = kProcessGroup;

struct Group {
  enum class Kind : uint8_t { kCgroup, kKernel, kUserWorld, kVirtualMachine, kVmm };
  static constexpr size_t kNone = ~size_t{0};

  int64_t id = 0;
  Kind kind = Kind::kCgroup;
  size_t parent = kNone;  // an index into the tree's groups, as are the children
  std::vector<size_t> children;
  uint32_t flags = 0;
  std::string name;
  std::string path;        // of a cgroup
  size_t process = kNone;  // of a user world, a virtual machine and its monitor
  size_t virtualMachine = kNone;

  bool IsProcess() const { return process != kNone; }
};

struct VirtualMachine {
  int32_t pid = 0;
  size_t group = Group::kNone;
  // The cgroup that was made for this virtual machine alone, if there is one.
  size_t cgroup = Group::kNone;
  // The swap of that cgroup when the reading began.
  Figure swapAtFirst;
  // Of another monitor nothing is known but that it is one.
  bool isQemu = true;
  QemuCommandLine commandLine;

  // What takes long to find out, once it was asked.
  mutable std::optional<QemuMappings> mappings;  // until they have been measured
  mutable std::optional<GuestMapping> mapping;
  mutable Process measured;  // the process beside `mapping`: what it has beside its guest's memory
  mutable std::optional<GuestMemory> guest;
  mutable std::optional<MemcgEvents> events;  // of its own cgroup
  mutable std::optional<std::optional<bool>> usesKvm;
};

// The swap of a machine by its own cgroup, in KB; no figures without one.
struct MachineSwap {
  Figure current;
  Figure limit;  // the lowest of the cgroup and of those around it
  Figure left;   // below the nearest limit
};

class GroupTree {
 public:
  // Scans /proc and the cgroups once.
  [[nodiscard]] static Status Read(const LinuxHost& host, GroupTree& tree);

  // The tree of this reading.
  [[nodiscard]] static Status Get(const LinuxHost& host, const GroupTree*& tree);

  // Null if there is no such group, process or virtual machine.
  const Group* Find(int64_t id) const;
  const Group* FindClient(int64_t pid) const;
  const VirtualMachine* FindVirtualMachine(int64_t pid) const;

  const Group& At(size_t index) const { return groups_[index]; }
  const Process& ProcessOf(const Group& group) const { return processes_[group.process]; }
  const VirtualMachine& VirtualMachineOf(const Group& group) const {
    return virtualMachines_[group.virtualMachine];
  }
  const std::vector<Process>& Processes() const { return processes_; }
  const std::vector<VirtualMachine>& VirtualMachines() const { return virtualMachines_; }
  const CgroupHierarchy& Cgroups() const { return cgroups_; }

  // Whether no virtual machine that uses KVM can have been missed.
  bool HasAllMachines() const { return kvm_.IsWhole(); }

  [[nodiscard]] Status ReadSwap(const LinuxHost& host, const VirtualMachine& machine,
                                MachineSwap& swap) const;

  // What is reserved for a group itself, in KB.
  [[nodiscard]] Status ReadReservation(const LinuxHost& host, const Group& group,
                                       Figure& reserved) const;

  // The smallest limit on the way up from a group, in KB; none if there is none.
  [[nodiscard]] Status ReadEffectiveLimit(const LinuxHost& host, const Group& group,
                                          Figure& limit) const;

  // For which part of the time the processes of a cgroup have waited for memory.
  [[nodiscard]] Status ReadPressure(const LinuxHost& host, const Group& group,
                                    Pressure& pressure) const;

  // What huge pages of hugetlb are used in a cgroup beside what its `current` counts; `inUse` is
  // what all of the host have. None where that cannot be told.
  [[nodiscard]] Status ReadHugetlb(const LinuxHost& host, const Group& group, uint64_t inUse,
                                   Figure& hugetlb) const;

  // What page sharing does for a group that is a process. Fails with KSI_STATUS_NOT_FOUND if it has
  // ended.
  [[nodiscard]] Status ReadKsm(const LinuxHost& host, const Group& group, ProcessKsm& ksm) const;

  // What page sharing saves of the memory of a group's processes, in KB.
  [[nodiscard]] Status ReadSharedSaved(const LinuxHost& host, const Group& group,
                                       Figure& saved) const;

 private:
  void AddTop();
  void AddCgroups(const LinuxHost& host);
  void AddChildren(const LinuxHost& host, size_t self, std::vector<size_t>& added);
  [[nodiscard]] Status AddProcesses(const LinuxHost& host);
  void AddProcess(const LinuxHost& host, Process process);
  [[nodiscard]] bool FindMachine(const LinuxHost& host, const Process& process,
                                 VirtualMachine& machine);
  size_t Add(size_t parent, Group group);
  size_t CgroupOf(const LinuxHost& host, int32_t pid) const;
  void AddVirtualMachine(size_t parent, size_t process, VirtualMachine machine);
  void FindOwnCgroups();
  void LookAtSwap(const LinuxHost& host);
  size_t UnitOf(size_t group) const;
  size_t CountUserWorlds(size_t group) const;
  Figure ProcessHugetlbOf(const Group& group) const;
  [[nodiscard]] Status TightenLimit(const LinuxHost& host, const Group& cgroup,
                                    Figure& limit) const;

  CgroupHierarchy cgroups_;
  KvmSearch kvm_;
  std::vector<Group> groups_;  // the first is the root
  std::vector<Process> processes_;
  std::vector<VirtualMachine> virtualMachines_;
  std::unordered_map<int64_t, size_t> byId_;
  Figure hugetlb_;  // of all processes
  // What has been asked for, of each group and of each process.
  mutable std::vector<std::optional<Figure>> reserved_;
  mutable std::vector<std::optional<Figure>> limits_;  // effective ones
  mutable std::vector<std::optional<Pressure>> pressures_;
  mutable std::vector<std::optional<ProcessKsm>> ksm_;

  // Only while the tree grows.
  std::unordered_map<int32_t, size_t> cgroupOfPid_;
  std::unordered_map<std::string, size_t> byPath_;
};

// The kind of systemd unit that a cgroup stands for ("slice", "scope", "service"), else "".
std::string_view UnitType(std::string_view cgroupName);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_GROUPS_H_
