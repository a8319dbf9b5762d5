// QMP: asking QEMU itself about its guest. Only questions are sent, nothing that changes anything.
//
// A recorded tree has, in the place of the socket, a file with the lines that the socket said.
#ifndef KNVLIBS_LINUX_MACHINES_QMP_H_
#define KNVLIBS_LINUX_MACHINES_QMP_H_

#include <cstdint>
#include <string>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/qemu_command_line.h"

namespace ksi {

// What a monitor tells of its guest. KB, all ones where it cannot be told.
struct GuestMemory {
  enum class Balloon : uint8_t { kNone, kActive, kUnknown };

  Balloon balloon = Balloon::kUnknown;
  uint64_t actual = kNoValue;     // what the balloon leaves to the guest
  uint64_t total = kNoValue;      // as the guest counts
  uint64_t available = kNoValue;  // without its having to swap
};

// Asks the monitor that the command line of process `pid` names. Never takes longer than a quarter
// of a second, and all that do not answer a second together; what is not answered is not told.
GuestMemory ReadGuestMemory(const LinuxHost& host, int32_t pid, const QemuCommandLine& line);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_QMP_H_
