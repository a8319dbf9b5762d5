// The time of day of a host.
#ifndef KNVLIBS_LINUX_HOST_WALL_CLOCK_H_
#define KNVLIBS_LINUX_HOST_WALL_CLOCK_H_

#include "knvlibs/linux/host/host.h"

namespace ksi {

// Seconds since 1970: of this machine now, of a recorded tree when it was recorded, which is the
// sum of btime of /proc/stat and /proc/uptime. None where these do not tell.
Figure WallClock(const LinuxHost& host);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_WALL_CLOCK_H_
