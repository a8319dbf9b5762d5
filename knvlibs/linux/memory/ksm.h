// /sys/kernel/mm/ksm: page sharing on the host as a whole.
#ifndef KNVLIBS_LINUX_MEMORY_KSM_H_
#define KNVLIBS_LINUX_MEMORY_KSM_H_

#include <cstdint>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// Pages, by the names of the files. A kernel without page sharing has shared nothing.
struct Ksm {
  bool isTold = true;         // else nothing of this is known: the kernel's files are hidden
  uint64_t pagesShared = 0;   // that stand for several
  uint64_t pagesSharing = 0;  // more that would be there without them
  Figure zeroPages = 0;       // of processes, in whose place the kernel's zero page is mapped
  bool hasScanned = false;

  bool IsSharing() const { return !isTold || pagesShared != 0 || zeroPages != 0u; }

  // What of so much merged memory of a process is saved: of pages that share one, one stays. None
  // if it is not told how many do.
  Figure SavedOf(Figure merged) const;
};

[[nodiscard]] Status ReadKsm(const LinuxHost& host, Ksm& ksm);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_KSM_H_
