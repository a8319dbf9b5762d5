#include "knvlibs/linux/groups/groups.h"

#include <algorithm>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

// "machine-qemu\x2d1\x2dweb.scope"
std::string WithoutEscapes(std::string_view name) {
  std::string plain;
  while (!name.empty()) {
    uint64_t code = 0;
    if (name.starts_with("\\x") && name.size() >= 4 && ParseHex(name.substr(2, 2), code)) {
      plain.push_back(static_cast<char>(code));
      name.remove_prefix(4);
    } else {
      plain.push_back(name.front());
      name.remove_prefix(1);
    }
  }
  return Printable(plain);
}

std::string_view LastPart(std::string_view path) { return path.substr(path.rfind('/') + 1); }

// Whether a cgroup of this name below one of that name holds a container.
bool IsContainer(std::string_view parent, std::string_view name) {
  // The monitor of a container is not in it.
  if (name.find("-conmon-") != std::string_view::npos) return false;
  constexpr std::string_view kScopes[] = {"docker-", "libpod-", "cri-containerd-", "crio-",
                                          "lxc.payload"};
  if (std::ranges::any_of(kScopes, [&](std::string_view s) { return name.starts_with(s); })) {
    return true;
  }
  constexpr std::string_view kParents[] = {"machine.slice", "qemu.slice", "docker", "lxc"};
  if (std::ranges::find(kParents, parent) != std::end(kParents)) return true;
  // Container engines that do not go through systemd name the cgroup by the container's id.
  constexpr size_t kIdLength = 64;
  return name.size() == kIdLength &&
         name.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

uint32_t CgroupFlags(const Group& parent, std::string_view name) {
  uint32_t flags = 0;
  if (parent.id == kRootGroup) flags |= KSI_GROUP_PREDEFINED;
  const bool isSystem = parent.id == kRootGroup ? name == "system.slice" || name == "init.scope"
                                                : (parent.flags & KSI_GROUP_SYSTEM_WORLD) != 0;
  flags |= isSystem ? KSI_GROUP_SYSTEM_WORLD : KSI_GROUP_USER_CREATED;
  if (UnitType(name) == "scope") flags |= KSI_GROUP_NON_PERSISTENT;
  if (IsContainer(LastPart(parent.path), name)) {
    flags |= KSI_GROUP_CONTAINER;
  } else if ((parent.flags & (KSI_GROUP_CONTAINER | KSI_GROUP_SUB_CONTAINER)) != 0) {
    flags |= KSI_GROUP_SUB_CONTAINER;
  }
  return flags;
}

}  // namespace

std::string_view UnitType(std::string_view cgroupName) {
  for (const std::string_view type : {"slice", "scope", "service"}) {
    if (cgroupName.ends_with(type) && cgroupName.size() > type.size() &&
        cgroupName[cgroupName.size() - type.size() - 1] == '.') {
      return type;
    }
  }
  return {};
}

Status GroupTree::Get(const LinuxHost& host, const GroupTree*& tree) {
  return host.Kept().groups.Get(host, tree);
}

Status GroupTree::Read(const LinuxHost& host, GroupTree& tree) {
  tree.AddTop();
  tree.AddCgroups(host);
  const Status status = tree.AddProcesses(host);
  if (status != kOk) return status;
  tree.FindOwnCgroups();
  tree.LookAtSwap(host);
  tree.hugetlb_ = tree.ProcessHugetlbOf(tree.groups_[0]);
  for (Group& group : tree.groups_) {
    if (group.children.empty()) group.flags |= KSI_GROUP_LEAF;
  }
  tree.reserved_.resize(tree.groups_.size());
  tree.limits_.resize(tree.groups_.size());
  tree.pressures_.resize(tree.groups_.size());
  tree.ksm_.resize(tree.processes_.size());
  tree.cgroupOfPid_.clear();
  tree.byPath_.clear();
  return kOk;
}

size_t GroupTree::Add(size_t parent, Group group) {
  const size_t index = groups_.size();
  group.parent = parent;
  byId_.emplace(group.id, index);
  if (parent != Group::kNone) groups_[parent].children.push_back(index);
  groups_.push_back(std::move(group));
  return index;
}

void GroupTree::AddTop() {
  Group root;
  root.id = kRootGroup;
  root.flags = KSI_GROUP_PREDEFINED;
  root.name = "/";
  Add(Group::kNone, std::move(root));

  Group kernel;
  kernel.id = kKernelGroup;
  kernel.kind = Group::Kind::kKernel;
  kernel.flags = KSI_GROUP_PREDEFINED | KSI_GROUP_SYSTEM_WORLD | KSI_GROUP_KERNEL_MEMORY;
  kernel.name = "kernel";
  Add(0, std::move(kernel));
}

// Breadth first, so that what is above a group has been added before it.
void GroupTree::AddCgroups(const LinuxHost& host) {
  cgroups_ = CgroupHierarchy::Find(host);
  if (!cgroups_.Exists()) return;
  std::vector<size_t> toList{0};
  for (size_t i = 0; i < toList.size(); ++i) {
    AddChildren(host, toList[i], toList);
    std::vector<int32_t> pids;
    // What cannot be listed here, each process tells of itself.
    if (cgroups_.ReadProcesses(host, groups_[toList[i]].path, pids) != kOk) continue;
    for (const int32_t pid : pids) cgroupOfPid_.emplace(pid, toList[i]);
  }
}

// Adds the cgroups below one, also to `added`.
void GroupTree::AddChildren(const LinuxHost& host, size_t self, std::vector<size_t>& added) {
  const std::string path = groups_[self].path;
  int64_t id = groups_[self].id;
  std::vector<CgroupHierarchy::Child> children;
  const Status status = cgroups_.List(host, path, id, children);
  if (status == KSI_STATUS_PERMISSION_DENIED && host.First("cgroup denied")) {
    Warning("cgroup %s: not permitted: what is below such cgroups is left out\n",
            path.empty() ? "/" : Printable(path).c_str());
  }
  // A cgroup that has gone since stays as one without children.
  if (status != kOk) return;
  if (self != 0 && id != groups_[self].id) {
    // The id of a recorded tree, which anybody may have written.
    if (id <= kRootGroup || id >= kProcessGroup || byId_.contains(id)) {
      if (host.First("cgroup.id")) {
        Warning("cgroup %s: its recorded id is another's or none: what is below it is left out\n",
                Printable(path).c_str());
      }
      return;
    }
    byId_.erase(groups_[self].id);
    byId_.emplace(id, self);
    groups_[self].id = id;
  }
  for (const CgroupHierarchy::Child& child : children) {
    Group group;
    group.id = static_cast<int64_t>(child.inode);
    group.path = path + '/' + child.name;
    group.flags = CgroupFlags(groups_[self], child.name);
    group.name = WithoutEscapes(child.name);
    const std::string childPath = group.path;
    added.push_back(Add(self, std::move(group)));
    byPath_.emplace(childPath, added.back());
  }
}

size_t GroupTree::CgroupOf(const LinuxHost& host, int32_t pid) const {
  const auto listed = cgroupOfPid_.find(pid);
  if (listed != cgroupOfPid_.end()) return listed->second;
  if (!cgroups_.Exists()) return 0;
  std::string path;
  if (ReadCgroupPath(host, pid, cgroups_.Controller(), path) != kOk) return 0;
  const auto found = byPath_.find(path);
  return found == byPath_.end() ? 0 : found->second;
}

Status GroupTree::AddProcesses(const LinuxHost& host) {
  std::vector<int32_t> pids;
  Status status = ListProcesses(host, pids);
  if (status != kOk) return status;

  kvm_ = KvmSearch(host);
  processes_.reserve(pids.size());
  for (const int32_t pid : pids) {
    Process process;
    status = ReadProcess(host, pid, process);
    if (status == KSI_STATUS_PERMISSION_DENIED && host.First("status denied")) {
      Warning("/proc/PID/status: not permitted for some processes: they are left out\n");
    }
    if (status == kOk && !process.isKernelThread && !process.isZombie) {
      AddProcess(host, std::move(process));
    }
  }
  return kOk;
}

namespace {

// QEMU is never a single thread; most others are and need not be asked.
bool RunsQemu(const LinuxHost& host, const Process& process, std::vector<std::string>& words) {
  if (process.threads < 2) return false;
  const Status status = ReadCommandLine(host, process.pid, words);
  if (status == KSI_STATUS_PERMISSION_DENIED && host.First("cmdline denied")) {
    Warning(
        "/proc/PID/cmdline: not permitted for some processes: virtual machines may be shown as "
        "user worlds\n");
  }
  return status == kOk && IsQemu(words);
}

}  // namespace

// Whether a process runs a virtual machine.
bool GroupTree::FindMachine(const LinuxHost& host, const Process& process,
                            VirtualMachine& machine) {
  machine.pid = process.pid;
  std::vector<std::string> words;
  machine.isQemu = RunsQemu(host, process, words);
  if (machine.isQemu) machine.commandLine = ParseQemuCommandLine(words);
  return machine.isQemu || kvm_.IsMachine(host, process);
}

void GroupTree::AddProcess(const LinuxHost& host, Process process) {
  const int32_t pid = process.pid;
  const size_t index = processes_.size();
  const size_t cgroup = CgroupOf(host, pid);
  processes_.push_back(std::move(process));
  VirtualMachine machine;
  if (FindMachine(host, processes_[index], machine)) {
    AddVirtualMachine(cgroup, index, std::move(machine));
    return;
  }
  Group group;
  group.id = kProcessGroup | pid;
  group.kind = Group::Kind::kUserWorld;
  group.flags = KSI_GROUP_USER_WORLD;
  group.name = processes_[index].name;
  group.process = index;
  Add(cgroup, std::move(group));
}

void GroupTree::AddVirtualMachine(size_t parent, size_t process, VirtualMachine machine) {
  const int32_t pid = machine.pid;
  const std::string& name = machine.commandLine.name;
  Group group;
  group.id = kProcessGroup | pid;
  group.kind = Group::Kind::kVirtualMachine;
  group.flags = KSI_GROUP_VM;
  group.name = name.empty() ? processes_[process].name : Printable(name);
  group.process = process;
  group.virtualMachine = virtualMachines_.size();
  const size_t self = Add(parent, std::move(group));

  Group monitor;
  monitor.id = kVmmGroup | pid;
  monitor.kind = Group::Kind::kVmm;
  monitor.flags = KSI_GROUP_VMM_SUB_CONTAINER;
  monitor.name = "vmm";
  monitor.process = process;
  monitor.virtualMachine = virtualMachines_.size();
  Add(self, std::move(monitor));
  machine.group = self;
  virtualMachines_.push_back(std::move(machine));
}

// The nearest scope or service that holds a group.
size_t GroupTree::UnitOf(size_t group) const {
  for (size_t at = groups_[group].parent; at != Group::kNone; at = groups_[at].parent) {
    const std::string_view type = UnitType(groups_[at].path);
    if (type == "scope" || type == "service") return at;
  }
  return Group::kNone;
}

size_t GroupTree::CountUserWorlds(size_t group) const {
  if (groups_[group].kind == Group::Kind::kUserWorld) return 1;
  size_t count = 0;
  for (const size_t child : groups_[group].children) count += CountUserWorlds(child);
  return count;
}

void GroupTree::FindOwnCgroups() {
  std::unordered_map<size_t, size_t> machines;  // in each unit
  for (VirtualMachine& machine : virtualMachines_) {
    machine.cgroup = UnitOf(machine.group);
    ++machines[machine.cgroup];
  }
  for (VirtualMachine& machine : virtualMachines_) {
    const size_t unit = machine.cgroup;
    // The session of a user who started QEMU was not made for it; a container was, helpers and all.
    const bool isOwn =
        unit != Group::kNone && machines[unit] == 1 &&
        ((groups_[unit].flags & KSI_GROUP_CONTAINER) != 0 || CountUserWorlds(unit) == 0);
    if (!isOwn) machine.cgroup = Group::kNone;
  }
}

// What a machine's swap is compared with, should somebody ask whether it is being swapped.
void GroupTree::LookAtSwap(const LinuxHost& host) {
  for (VirtualMachine& machine : virtualMachines_) {
    if (machine.cgroup == Group::kNone) continue;
    MemcgSwap swap;
    const Status status = cgroups_.ReadSwap(host, At(machine.cgroup).path, swap);
    if (status == kOk) machine.swapAtFirst = swap.current;
  }
}

Status GroupTree::ReadSwap(const LinuxHost& host, const VirtualMachine& machine,
                           MachineSwap& swap) const {
  swap = MachineSwap();
  Status status = kOk;
  for (size_t at = machine.cgroup; status == kOk && at != Group::kNone; at = At(at).parent) {
    MemcgSwap each;
    status = cgroups_.ReadSwap(host, At(at).path, each);
    if (at == machine.cgroup) swap.current = each.current;
    if (!each.left) continue;
    swap.limit = std::min(swap.limit.value_or(*each.max), *each.max);
    swap.left = std::min(swap.left.value_or(*each.left), *each.left);
  }
  return status;
}

const Group* GroupTree::Find(int64_t id) const {
  const auto found = byId_.find(id);
  return found == byId_.end() ? nullptr : &groups_[found->second];
}

const Group* GroupTree::FindClient(int64_t pid) const {
  return pid <= 0 || pid > INT32_MAX ? nullptr : Find(kProcessGroup | pid);
}

const VirtualMachine* GroupTree::FindVirtualMachine(int64_t pid) const {
  const Group* group = FindClient(pid);
  return group == nullptr || group->virtualMachine == Group::kNone ? nullptr
                                                                   : &VirtualMachineOf(*group);
}

Status GroupTree::ReadReservation(const LinuxHost& host, const Group& group,
                                  Figure& reserved) const {
  reserved = 0;
  if (group.kind != Group::Kind::kCgroup || group.id == kRootGroup) return kOk;
  std::optional<Figure>& known = reserved_[static_cast<size_t>(&group - groups_.data())];
  if (!known) {
    const Status status = cgroups_.ReadReservation(host, group.path, reserved);
    if (status != kOk) return status;
    known = reserved;
  }
  reserved = *known;
  return kOk;
}

namespace {

// The smaller of two limits, of which none is no limit.
Figure StricterOf(Figure one, Figure other) {
  if (!one || !other) return one ? one : other;
  return LesserOf(one, other);
}

}  // namespace

// Makes the limit above a cgroup what holds in it.
Status GroupTree::TightenLimit(const LinuxHost& host, const Group& cgroup, Figure& limit) const {
  std::optional<Figure> told;
  Status status = cgroups_.ReadHierarchicalLimit(host, cgroup.path, told);
  if (status != kOk) return status;
  if (told) {
    limit = *told;
    return kOk;
  }
  Figure own;
  Figure high;
  status = cgroups_.ReadLimit(host, cgroup.path, own);
  if (status == kOk) status = cgroups_.ReadHigh(host, cgroup.path, high);
  limit = StricterOf(limit, StricterOf(own, high));
  return status;
}

Status GroupTree::ReadEffectiveLimit(const LinuxHost& host, const Group& group,
                                     Figure& limit) const {
  limit.reset();
  if (group.parent == Group::kNone) return kOk;  // nothing is set for the root
  std::optional<Figure>& known = limits_[static_cast<size_t>(&group - groups_.data())];
  if (!known) {
    Status status = ReadEffectiveLimit(host, At(group.parent), limit);
    if (status == kOk && group.kind == Group::Kind::kCgroup) {
      status = TightenLimit(host, group, limit);
    }
    if (status != kOk) return status;
    known = limit;
  }
  limit = *known;
  return kOk;
}

Status GroupTree::ReadPressure(const LinuxHost& host, const Group& group,
                               Pressure& pressure) const {
  std::optional<Pressure>& known = pressures_[static_cast<size_t>(&group - groups_.data())];
  if (!known) {
    const Status status = cgroups_.ReadPressure(host, group.path, pressure);
    if (status != kOk) return status;
    known = pressure;
  }
  pressure = *known;
  return kOk;
}

Figure GroupTree::ProcessHugetlbOf(const Group& group) const {
  if (group.IsProcess()) return group.kind == Group::Kind::kVmm ? 0 : ProcessOf(group).hugetlb;
  Figure sum = 0;
  for (const size_t child : group.children) sum = SumOf({sum, ProcessHugetlbOf(groups_[child])});
  return sum;
}

Status GroupTree::ReadHugetlb(const LinuxHost& host, const Group& group, uint64_t inUse,
                              Figure& hugetlb) const {
  hugetlb = 0;
  if (inUse == 0) return kOk;
  const Status status = cgroups_.ReadHugetlb(host, group.path, hugetlb);
  if (status != kOk || hugetlb) return status;
  // Without the controller the processes tell, unless some have pages in common. Who has none
  // shares none.
  const Figure own = ProcessHugetlbOf(group);
  if (own == 0u || (hugetlb_ && *hugetlb_ <= inUse)) hugetlb = own;
  return kOk;
}

Status GroupTree::ReadKsm(const LinuxHost& host, const Group& group, ProcessKsm& ksm) const {
  std::optional<ProcessKsm>& known = ksm_[group.process];
  if (!known) {
    const Status status = ReadProcessKsm(host, ProcessOf(group).pid, ksm);
    if (status != kOk) return status;
    known = ksm;
  }
  ksm = *known;
  return kOk;
}

Status GroupTree::ReadSharedSaved(const LinuxHost& host, const Group& group, Figure& saved) const {
  saved = 0;
  if (group.IsProcess()) {
    ProcessKsm ksm;
    const Status status = ReadKsm(host, group, ksm);
    saved = ksm.saved;
    return status;
  }
  for (const size_t child : group.children) {
    Figure part;
    const Status status = ReadSharedSaved(host, groups_[child], part);
    if (status == KSI_STATUS_NOT_FOUND) continue;  // it has ended since
    if (status != kOk) return status;
    saved = SumOf({saved, part});
  }
  return kOk;
}

}  // namespace ksi
