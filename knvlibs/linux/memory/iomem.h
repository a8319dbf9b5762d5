// /proc/iomem: what lies where in the physical address space.
#ifndef KNVLIBS_LINUX_MEMORY_IOMEM_H_
#define KNVLIBS_LINUX_MEMORY_IOMEM_H_

#include <string_view>

#include "knvlibs/linux/host/host.h"

namespace ksi {

// The size in bytes of all ranges of this name; none where the file cannot be read, or hides the
// addresses as it does from ordinary users.
Figure IomemSize(const LinuxHost& host, std::string_view name);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_IOMEM_H_
