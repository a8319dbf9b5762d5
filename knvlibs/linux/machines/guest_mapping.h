// The memory of a guest as QEMU has it mapped.
#ifndef KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
#define KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_

#include <cstdint>
#include <vector>

#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/groups/smaps.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/machine_memory.h"
#include "knvlibs/status.h"

namespace ksi {

// The memory that QEMU may write; what the kernel has cut is joined.
struct QemuMappings {
  MappingsFile file = MappingsFile::kMaps;
  std::vector<Mapping> mappings;
};

// A small process is walked, of a large one the mappings are looked at. None where they may not be
// read. Fails with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status ReadQemuMappings(const LinuxHost& host, const Process& process,
                                      QemuMappings& mappings);

// Whether QEMU has made its machine: the memory that it starts with is there.
bool IsMade(const QemuMappings& mappings, const MachineMemory& start);

// KB. No figures if it cannot be found among the mappings of the process, or they may not be read.
struct GuestMapping {
  MachineMemory memory;
  Figure resident;    // hugetlb too, but not the kernel's zero page
  Figure referenced;  // only small processes tell, and not of hugetlb
  Figure swapped;
  Figure huge;    // of the resident, in pages of 2 MB or more
  Figure merged;  // of the resident, by page sharing
};

// Finds `memory` among the mappings and measures it; the pages of a large process are counted piece
// by piece. `isSure` tells that the memory is known to be this: else it has to be seen that there
// is no more. Fails with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status MeasureGuest(const LinuxHost& host, int32_t pid, const QemuMappings& mappings,
                                  MachineMemory memory, bool isSure, GuestMapping& guest);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_GUEST_MAPPING_H_
