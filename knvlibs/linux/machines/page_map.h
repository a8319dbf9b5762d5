// /proc/PID/pagemap: which pages of a process are in memory or in swap. It is asked in pieces so
// short that the process, however large, is not held up.
#ifndef KNVLIBS_LINUX_MACHINES_PAGE_MAP_H_
#define KNVLIBS_LINUX_MACHINES_PAGE_MAP_H_

#include <cstdint>
#include <span>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

struct AddressRange {
  uint64_t start = 0;
  uint64_t end = 0;
};

// KB. The kernel's zero page is not resident: it takes no memory for the process.
struct PageCounts {
  Figure resident;
  Figure swapped;
  Figure huge;  // of the resident, in pages of 2 MB or more; only Linux 6.7 and later tell
};

// Counts the pages in these ranges. No figures where pagemap may not be read, where it does not
// tell which pages are zero pages (before Linux 6.7 without CAP_SYS_ADMIN), and when the time for
// walks is used up; each is told once. Fails with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status CountPages(const LinuxHost& host, int32_t pid,
                                std::span<const AddressRange> ranges, PageCounts& counts);

// Counts pages by the entries of a pagemap file, which come in the order of their addresses.
class EntryCounter {
 public:
  // `zeroFrame` is the frame of the zero page; `isHugeZero` tells of a frame at which a huge page
  // begins whether that is the huge zero page.
  EntryCounter(uint64_t pageSize, uint64_t zeroFrame, bool (*isHugeZero)(uint64_t frame))
      : pageSize_(pageSize), zeroFrame_(zeroFrame), isHugeZero_(isHugeZero) {}

  void Take(uint64_t address, uint64_t entry);

  uint64_t Resident() const { return resident_; }
  uint64_t Swapped() const { return swapped_; }

 private:
  bool IsZero(uint64_t address, uint64_t entry);

  uint64_t pageSize_;
  uint64_t zeroFrame_;
  bool (*isHugeZero_)(uint64_t frame);
  bool isInHugeZero_ = false;
  uint64_t resident_ = 0;
  uint64_t swapped_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_PAGE_MAP_H_
