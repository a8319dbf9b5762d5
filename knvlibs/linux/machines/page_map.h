// /proc/PID/pagemap: which pages of a process are in memory or in swap. It is asked in pieces so
// short that the process, however large, is not held up.
#ifndef KNVLIBS_LINUX_MACHINES_PAGE_MAP_H_
#define KNVLIBS_LINUX_MACHINES_PAGE_MAP_H_

#include <cstdint>
#include <functional>
#include <span>
#include <utility>

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
  Figure huge;  // of the resident, in pages of 2 MB or more
};

// Counts the pages in these ranges. No figures where pagemap may not be read, where it does not
// tell which pages are zero pages (before Linux 6.7 without CAP_SYS_ADMIN), and when the time for
// walks is used up; each is told once. Fails with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status CountPages(const LinuxHost& host, int32_t pid,
                                std::span<const AddressRange> ranges, PageCounts& counts);

// Counts pages by the entries of a pagemap file, which come in the order of their addresses.
class EntryCounter {
 public:
  // The flags of a frame as /proc/kpageflags has them; none if they cannot be read.
  using FlagsOf = std::function<Figure(uint64_t frame)>;

  // `zeroFrame` is the frame of the zero page. `flagsOf` is asked where a huge page may begin.
  EntryCounter(uint64_t pageSize, uint64_t zeroFrame, FlagsOf flagsOf)
      : pageSize_(pageSize), zeroFrame_(zeroFrame), flagsOf_(std::move(flagsOf)) {}

  void Take(uint64_t address, uint64_t entry);

  // Pages.
  uint64_t Resident() const { return resident_; }
  uint64_t Swapped() const { return swapped_; }
  Figure Huge() const { return huge_; }  // of the resident; none if the flags were not told

 private:
  enum class Within : uint8_t { kSmall, kHuge, kHugeZero };

  Within FindBeginning(uint64_t entry);
  void TakePresent(uint64_t entry);

  uint64_t pageSize_;
  uint64_t zeroFrame_;
  FlagsOf flagsOf_;
  Within within_ = Within::kSmall;
  uint64_t next_ = 0;  // the frame that comes next in the huge page
  uint64_t resident_ = 0;
  uint64_t swapped_ = 0;
  Figure huge_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_PAGE_MAP_H_
