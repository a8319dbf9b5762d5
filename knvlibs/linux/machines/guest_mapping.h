// The memory of a guest as QEMU has it mapped.
#ifndef KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
#define KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_

#include <cstdint>

#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/qemu_command_line.h"
#include "knvlibs/status.h"

namespace ksi {

// KB. No figures if it cannot be found among the mappings of the process, or they may not be read.
struct GuestMapping {
  Figure size;
  Figure resident;    // hugetlb too, but not the kernel's zero page
  Figure referenced;  // only small processes tell
  Figure swapped;
  Figure huge;    // of the resident, in pages of 2 MB or more
  Figure merged;  // of the resident, by page sharing
  // QEMU has made its machine: its memory is there.
  bool isMade = false;
};

// A small process is walked for it; of a large one the mappings are looked at, and its pages are
// counted piece by piece. Fails with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status ReadGuestMapping(const LinuxHost& host, const Process& process,
                                      const QemuCommandLine& line, GuestMapping& guest);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
