// Huge pages: hugetlb has a pool for each size of them.
#ifndef KNVLIBS_LINUX_MEMORY_HUGEPAGES_H_
#define KNVLIBS_LINUX_MEMORY_HUGEPAGES_H_

#include <cstdint>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// Where the pools of the whole host lie.
constexpr std::string_view kHugePagePools = "/sys/kernel/mm/hugepages";

// The sizes of the pools in a directory, in KB, ascending; none if the kernel has no huge pages.
[[nodiscard]] Status ListHugePageSizes(const LinuxHost& host, std::string_view directory,
                                       std::vector<uint64_t>& sizesKB);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_HUGEPAGES_H_
