// The memory of a guest as QEMU has it mapped.
#ifndef KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
#define KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_

#include <cstdint>

#include "knvlibs/linux/groups/smaps.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/qemu_command_line.h"
#include "knvlibs/status.h"

namespace ksi {

struct GuestMapping {
  uint64_t size = kNoValue;  // KB
  WalkedMemory memory;
};

// All ones if it cannot be found among the mappings of process `pid`, or they may not be read.
Status ReadGuestMapping(const LinuxHost& host, int32_t pid, const QemuCommandLine& line,
                        GuestMapping* guest);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
