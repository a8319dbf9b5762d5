// What the memory of a virtual machine is made of.
#ifndef KNVLIBS_LINUX_MACHINES_MACHINE_MEMORY_H_
#define KNVLIBS_LINUX_MACHINES_MACHINE_MEMORY_H_

#include <cstdint>
#include <optional>
#include <vector>

#include "knvlibs/linux/host/figure.h"

namespace ksi {

// What QEMU maps for a part of the memory.
struct MemoryBlock {
  Figure size;     // KB
  Figure address;  // that it is mapped at, in QEMU; none where nobody tells

  friend bool operator==(const MemoryBlock&, const MemoryBlock&) = default;
};

// Memory that is plugged in: a DIMM, a persistent one, or a device whose size changes. KB.
struct MemoryModule {
  Figure size;  // what the guest has of it
  MemoryBlock block;
  bool isDimm = false;  // and not persistent: the balloon device takes it for memory

  friend bool operator==(const MemoryModule&, const MemoryModule&) = default;
};

// KB.
struct MachineMemory {
  Figure base;                      // what there is without modules
  std::vector<MemoryBlock> blocks;  // that the base is made of; none if it is not known
  // None if it is not known which there are.
  std::optional<std::vector<MemoryModule>> modules = std::vector<MemoryModule>();

  Figure Size() const;
  // What QEMU takes the balloon's size off.
  Figure BalloonSize() const;
  // All blocks as they are mapped; none if they are not known.
  std::vector<MemoryBlock> AllBlocks() const;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_MACHINE_MEMORY_H_
