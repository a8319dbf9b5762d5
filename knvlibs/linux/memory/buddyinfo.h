// /proc/buddyinfo: the free pages of each zone of each memory node, by the size of their buffers;
// /proc/zoneinfo for what the zone manages in all.
#ifndef KNVLIBS_LINUX_MEMORY_BUDDYINFO_H_
#define KNVLIBS_LINUX_MEMORY_BUDDYINFO_H_

#include <string>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

struct Buddy {
  std::string name;
  KSI_BuddyStats stats;
};
using Buddies = std::vector<Buddy>;

[[nodiscard]] Status ReadBuddies(const LinuxHost& host, Buddies& buddies);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_BUDDYINFO_H_
