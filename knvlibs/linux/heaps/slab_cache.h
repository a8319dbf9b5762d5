// The slab caches, of which the kernel tells in two places.
#ifndef KNVLIBS_LINUX_HEAPS_SLAB_CACHE_H_
#define KNVLIBS_LINUX_HEAPS_SLAB_CACHE_H_

#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

struct SlabCache {
  std::string name;
  uint64_t activeObjects = 0;
  uint64_t objects = 0;
  uint64_t objectSize = 0;  // bytes
  uint64_t slabs = 0;
  uint64_t pagesPerSlab = 0;
};

// From /proc/slabinfo, in its order.
[[nodiscard]] Status ReadSlabinfo(const LinuxHost& host, std::vector<SlabCache>& caches);

// From /sys/kernel/slab, by name. This takes a handful of files for each cache.
[[nodiscard]] Status ReadSlabDirectory(const LinuxHost& host, std::vector<SlabCache>& caches);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HEAPS_SLAB_CACHE_H_
