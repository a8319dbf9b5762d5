// What the kernel keeps for itself of the host's memory.
#ifndef KNVLIBS_LINUX_MEMORY_KERNEL_MEMORY_H_
#define KNVLIBS_LINUX_MEMORY_KERNEL_MEMORY_H_

#include <cstdint>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// In KB: slabs, page tables, vmalloc with the kernel's stacks, what is kept for each processor,
// compressed memory, and pages that the page allocator keeps ready on the lists of processors,
// which neither MemFree counts nor anybody uses.
[[nodiscard]] Status ReadKernelMemory(const LinuxHost& host, uint64_t& size);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_KERNEL_MEMORY_H_
