// The time that may be spent on walks of the page tables of processes, which for large ones is
// seconds.
#ifndef KNVLIBS_LINUX_HOST_WALK_TIME_H_
#define KNVLIBS_LINUX_HOST_WALK_TIME_H_

#include <chrono>

#include "knvlibs/linux/host/host.h"

namespace ksi {

// What all walks of a reading may take, in time of a processor.
constexpr std::chrono::seconds kWalkTime{1};

// A process up to this size may be walked at once: that takes some milliseconds.
constexpr uint64_t kShortWalkKB = uint64_t{256} << 10;
// So much of page tables holds that size in pages of 4 KB. What a process has only read is in them
// alone: it is walked, but counts as neither in memory nor swapped.
constexpr uint64_t kShortWalkTablesKB = kShortWalkKB / 512;

// Whether there is time left for a walk; that there is none is told once in a reading.
bool MayWalk(const LinuxHost& host);

// A walk, from its making to its end.
class Walk {
 public:
  explicit Walk(const LinuxHost& host);
  Walk(const Walk&) = delete;
  Walk& operator=(const Walk&) = delete;
  ~Walk();

 private:
  const LinuxHost& host_;
  std::chrono::nanoseconds began_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_WALK_TIME_H_
