// /proc/PID/ksm_stat: how much of a process's memory the kernel shares with that of others.
#ifndef KNVLIBS_LINUX_GROUPS_PROCESS_KSM_H_
#define KNVLIBS_LINUX_GROUPS_PROCESS_KSM_H_

#include <cstdint>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// KB.
struct ProcessKsm {
  Figure merged = 0;     // in pages that stand for several, which count as resident
  Figure zeroPages = 0;  // in place of which the kernel's zero page is mapped, which does not
  // What is not there for their sake. Zero pages that the kernel does not count (before 6.6) are
  // neither resident nor in this.
  Figure saved = 0;
};

// Where nothing is shared on the whole host this reads no file of the process; else it fails with
// KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status ReadProcessKsm(const LinuxHost& host, int32_t pid, ProcessKsm& ksm);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_PROCESS_KSM_H_
