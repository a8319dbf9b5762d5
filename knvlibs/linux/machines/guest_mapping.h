// The memory of a guest as QEMU has it mapped.
#ifndef KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
#define KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_

#include <cstdint>

#include "knvlibs/linux/groups/smaps.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/qemu_command_line.h"
#include "knvlibs/status.h"

namespace ksi {

// No figures if it cannot be found among the mappings of the process, or they may not be read.
struct GuestMapping {
  Figure size;  // KB
  Smaps smaps;
  // QEMU has made its machine: there is memory that it keeps from its children.
  bool isMade = false;
};
[[nodiscard]] Status ReadGuestMapping(const LinuxHost& host, int32_t pid,
                                      const QemuCommandLine& line, GuestMapping& guest);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
