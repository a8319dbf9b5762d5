#include "knvlibs/linux/machines/guest.h"

#include <string>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/wall_clock.h"
#include "knvlibs/linux/machines/libvirt.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

Status GetMappings(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                   const QemuMappings*& mappings) {
  if (!machine.mappings) {
    QemuMappings read;
    const Status status = ReadQemuMappings(host, tree.ProcessOf(tree.At(machine.group)), read);
    if (status != kOk) return status;
    machine.mappings = std::move(read);
  }
  mappings = &*machine.mappings;
  return kOk;
}

// Whether a client may come without being the one that QEMU waits for to make its machine.
bool MayBeAsked(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine) {
  const QemuMappings* mappings = nullptr;
  return !machine.commandLine.waitsForClient ||
         (GetMappings(host, tree, machine, mappings) == kOk &&
          IsMade(*mappings, machine.commandLine.memory));
}

// A machine of libvirt; null if it is none.
const LibvirtDomain* FindDomain(const LinuxHost& host, const GroupTree& tree,
                                const VirtualMachine& machine) {
  if (machine.commandLine.uuid.empty()) return nullptr;
  std::optional<LibvirtDomains>& domains = host.Kept().libvirt;
  if (!domains) domains = ReadLibvirt(host, tree);
  const auto found = domains->find(machine.pid);
  return found == domains->end() ? nullptr : &found->second;
}

// A machine of libvirt whose monitor nobody else can ask.
void TellUnknown(const LinuxHost& host, const QemuCommandLine& line) {
  if (!host.IsThisMachine() || !line.isOfLibvirt || !line.monitor.empty()) return;
  if (!host.First("libvirt")) return;
  Warning(
      "libvirt: it does not run, or not know all machines that it started: their balloons and "
      "guests have no value\n");
}

// What libvirt tells, else its monitor; both only of a machine that is made.
GuestMemory AskFor(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine) {
  if (!machine.isQemu) return {};
  GuestMemory guest = UnaskedGuest(machine.commandLine);
  const LibvirtDomain* domain = FindDomain(host, tree, machine);
  if (domain != nullptr) {
    TakeDomain(*domain, WallClock(host), guest);
    return guest;
  }
  TellUnknown(host, machine.commandLine);
  return MayBeAsked(host, tree, machine) ? ReadGuestMemory(host, machine.pid, machine.commandLine)
                                         : guest;
}

// What the machine starts with, and what has become of it by its monitor.
MachineMemory MemoryOf(const QemuCommandLine& line, const GuestMemory& guest) {
  MachineMemory memory = line.memory;
  if (!memory.base && guest.base) {
    memory.base = guest.base;
    memory.blocks = {{guest.base, {}}};
  }
  if (memory.blocks.size() == 1) memory.blocks.front().address = guest.baseAddress;
  if (guest.modules) memory.modules = guest.modules;
  return memory;
}

Status ReadMapping(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                   GuestMapping& guest) {
  if (!machine.isQemu) {
    guest.memory.modules.reset();
    return kOk;
  }
  const QemuCommandLine& line = machine.commandLine;
  const GuestMemory told = line.TellsMemory() ? GuestMemory() : GetGuest(host, tree, machine);
  const bool isSure = !line.MayChange() || told.modules;
  const QemuMappings* mappings = nullptr;
  const Status status = GetMappings(host, tree, machine, mappings);
  if (status != kOk) return status;
  return MeasureGuest(host, machine.pid, *mappings, MemoryOf(line, told), isSure, guest);
}

// What is not told of a machine is 0 where nothing of any is compressed: without a compressed cache
// for swap on the host nothing ever was, and with an empty one nothing is.
Status SettleCompression(const LinuxHost& host, MemcgEvents& events) {
  if (events.zswapPool) return kOk;
  std::string enabled;
  const FigureFile* meminfo = nullptr;
  const Status found = host.Read("/sys/module/zswap/parameters/enabled", enabled);
  const Status status = host.Kept().meminfo.Get(host, meminfo);
  const bool isOff = found == KSI_STATUS_NOT_FOUND || enabled.starts_with('N');
  const bool isEmpty = status == kOk && meminfo->Find("Zswapped") == 0u;
  if (isOff || isEmpty) events.zswapPool = events.zswapped = 0;
  if (isOff) events.zswpin = events.zswpout = events.zswapMax = 0;
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

Status ReadOwnEvents(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                     MemcgEvents& events) {
  Status status = kOk;
  if (machine.cgroup != Group::kNone) {
    status = tree.Cgroups().ReadEvents(host, tree.At(machine.cgroup).path, events);
  }
  return status == kOk ? SettleCompression(host, events) : status;
}

}  // namespace

const GuestMemory& GetGuest(const LinuxHost& host, const GroupTree& tree,
                            const VirtualMachine& machine) {
  if (!machine.guest) machine.guest = AskFor(host, tree, machine);
  return *machine.guest;
}

std::optional<bool> UsesKvm(const LinuxHost& host, const GroupTree& tree,
                            const VirtualMachine& machine) {
  if (!machine.usesKvm) {
    const std::optional<bool> holds =
        machine.isQemu ? HoldsMachine(host, tree.ProcessOf(tree.At(machine.group))) : true;
    machine.usesKvm = holds ? holds : machine.commandLine.usesKvm;
  }
  return *machine.usesKvm;
}

Status GetMapping(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                  const GuestMapping*& mapping) {
  if (!machine.mapping) {
    GuestMapping read;
    Status status = ReadMapping(host, tree, machine, read);
    machine.mappings.reset();
    if (status == kOk) status = ReadProcess(host, machine.pid, machine.measured);
    if (status != kOk) return status;
    machine.mapping = std::move(read);
  }
  mapping = &*machine.mapping;
  return kOk;
}

Status GetOwnEvents(const LinuxHost& host, const GroupTree& tree, const VirtualMachine& machine,
                    const MemcgEvents*& events) {
  if (!machine.events) {
    MemcgEvents read;
    const Status status = ReadOwnEvents(host, tree, machine, read);
    if (status != kOk) return status;
    machine.events = read;
  }
  events = &*machine.events;
  return kOk;
}

}  // namespace ksi
