// A virtual machine's guest: what it has of memory and what is there of it, found out when it is
// first asked for.
#ifndef KNVLIBS_LINUX_MACHINES_GUEST_H_
#define KNVLIBS_LINUX_MACHINES_GUEST_H_

#include <optional>

#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/guest_mapping.h"
#include "knvlibs/linux/machines/qmp.h"
#include "knvlibs/status.h"

namespace ksi {

// What its monitor tells.
const GuestMemory& GetGuest(const LinuxHost& host, const GroupTree& tree,
                            const VirtualMachine& machine);

// Whether it runs with KVM, by its descriptors, else by its command line; none if neither tells.
std::optional<bool> UsesKvm(const LinuxHost& host, const GroupTree& tree,
                            const VirtualMachine& machine);

// Its memory as QEMU has it mapped. Fails with KSI_STATUS_NOT_FOUND if it has ended.
[[nodiscard]] Status GetMapping(const LinuxHost& host, const GroupTree& tree,
                                const VirtualMachine& machine, const GuestMapping*& mapping);

// What happened to the cgroup that was made for it, and what is compressed of it; little is told if
// there is no such cgroup. Fails with KSI_STATUS_NOT_FOUND if that is gone.
[[nodiscard]] Status GetOwnEvents(const LinuxHost& host, const GroupTree& tree,
                                  const VirtualMachine& machine, const MemcgEvents*& events);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_GUEST_H_
