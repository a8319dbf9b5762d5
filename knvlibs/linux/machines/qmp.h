// QMP: asking QEMU itself about its guest.
//
// A recorded tree has, in the place of the socket, a file with the lines that the socket said.
#ifndef KNVLIBS_LINUX_MACHINES_QMP_H_
#define KNVLIBS_LINUX_MACHINES_QMP_H_

#include <chrono>
#include <cstdint>
#include <optional>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/machine_memory.h"
#include "knvlibs/linux/machines/qemu_command_line.h"

namespace ksi {

// What one monitor may take, and all monitors of a reading together.
constexpr std::chrono::milliseconds kMonitorPatience{250};
constexpr std::chrono::seconds kMonitorTime{1};

// How often a reading looks whether a monitor that somebody holds is left again, for all of them
// together, and how long it waits before: whoever asked it last may be about to go.
constexpr int kHeldLooks = 10;
constexpr std::chrono::milliseconds kHeldWait{10};

// What a monitor tells of its guest. KB.
struct GuestMemory {
  enum class Balloon : uint8_t { kNone, kActive, kUnknown };

  Balloon balloon = Balloon::kUnknown;
  bool hasDriver = false;  // the guest's driver has sent something
  Figure actual;           // what the balloon leaves to the guest
  // As the guest counts, if it has done so lately.
  Figure total;
  Figure available;  // without its having to swap
  // What the machine has, and the address of the block that is its base.
  Figure base;
  Figure baseAddress;
  std::optional<std::vector<MemoryModule>> modules;
};

// What is known without asking: whether there is a balloon at all.
GuestMemory UnaskedGuest(const QemuCommandLine& line);

// Asks the monitor that the command line of process `pid` names, if it is that process that listens
// there. What is not answered in time is not told.
GuestMemory ReadGuestMemory(const LinuxHost& host, int32_t pid, const QemuCommandLine& line);

// What is older is not current, however seldom a guest is asked. Seconds.
constexpr uint64_t kMostStatisticsAge = 300;

// Whether figures that a guest sent at `sent` are those of `now` (seconds of the same clock): not
// older than two of the intervals, in seconds, at which it is asked for them.
bool AreCurrent(Figure sent, Figure now, Figure interval);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_QMP_H_
