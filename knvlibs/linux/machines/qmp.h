// QMP: asking QEMU itself about its guest. Only questions are sent, nothing that changes anything.
//
// A recorded tree has, in the place of the socket, a file with the lines that the socket said.
#ifndef KNVLIBS_LINUX_MACHINES_QMP_H_
#define KNVLIBS_LINUX_MACHINES_QMP_H_

#include <chrono>
#include <cstdint>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/qemu_command_line.h"

namespace ksi {

// What one monitor may take, and all monitors of a reading together.
constexpr std::chrono::milliseconds kMonitorPatience{250};
constexpr std::chrono::seconds kMonitorTime{1};

// What a monitor tells of its guest. KB.
struct GuestMemory {
  enum class Balloon : uint8_t { kNone, kActive, kUnknown };

  Balloon balloon = Balloon::kUnknown;
  Figure actual;     // what the balloon leaves to the guest
  Figure total;      // as the guest counts
  Figure available;  // without its having to swap
};

// What is known without asking: whether there is a balloon at all.
GuestMemory UnaskedGuest(const QemuCommandLine& line);

// Asks the monitor that the command line of process `pid` names, if it is that process that listens
// there. What is not answered in time is not told.
GuestMemory ReadGuestMemory(const LinuxHost& host, int32_t pid, const QemuCommandLine& line);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_QMP_H_
