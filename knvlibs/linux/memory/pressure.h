// /proc/pressure/memory, and memory.pressure of a cgroup: for which part of the time processes have
// waited for memory.
#ifndef KNVLIBS_LINUX_MEMORY_PRESSURE_H_
#define KNVLIBS_LINUX_MEMORY_PRESSURE_H_

#include <string>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// Of the last ten seconds, in hundredths of a percent; none where the kernel does not tell.
struct Pressure {
  Figure some;  // one at least has waited
  Figure full;  // all that had something to do have

  // Whether nobody has waited for as much as one percent, in whole ones.
  bool IsNone() const { return some && *some < 50; }
};

// Of the host.
[[nodiscard]] Status ReadPressure(const LinuxHost& host, Pressure& pressure);

// Of whose file it is. A kernel that does not measure it has no file, or one that cannot be read.
[[nodiscard]] Status ReadPressureFile(const LinuxHost& host, const std::string& file,
                                      Pressure& pressure);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_PRESSURE_H_
