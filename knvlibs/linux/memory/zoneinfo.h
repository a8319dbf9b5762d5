// /proc/zoneinfo: the zones of every memory node and the watermarks of page reclaim.
#ifndef KNVLIBS_LINUX_MEMORY_ZONEINFO_H_
#define KNVLIBS_LINUX_MEMORY_ZONEINFO_H_

#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// Figures in pages.
struct Zone {
  uint64_t node = 0;
  std::string name;  // "DMA", "DMA32", "Normal", "Movable", "Device"
  uint64_t free = 0;
  uint64_t min = 0;
  uint64_t low = 0;
  uint64_t high = 0;
  uint64_t present = 0;
  uint64_t managed = 0;
  uint64_t perCpu = 0;  // free, but on the lists of single processors

  // Below 4 GB, kept for devices that reach no further.
  bool IsLow() const { return name.starts_with("DMA"); }
};

using Zones = std::vector<Zone>;

[[nodiscard]] Status ReadZones(const LinuxHost& host, Zones& zones);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_ZONEINFO_H_
