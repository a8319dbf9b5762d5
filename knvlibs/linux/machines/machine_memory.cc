#include "knvlibs/linux/machines/machine_memory.h"

namespace ksi {

Figure MachineMemory::Size() const {
  if (!modules) return std::nullopt;
  Figure size = base;
  for (const MemoryModule& module : *modules) size = SumOf({size, module.size});
  return size;
}

Figure MachineMemory::BalloonSize() const {
  if (!modules) return std::nullopt;
  Figure size = base;
  for (const MemoryModule& module : *modules) {
    if (module.isDimm) size = SumOf({size, module.size});
  }
  return size;
}

std::vector<MemoryBlock> MachineMemory::AllBlocks() const {
  if (!modules || blocks.empty()) return {};
  std::vector<MemoryBlock> all = blocks;
  for (const MemoryModule& module : *modules) all.push_back(module.block);
  return all;
}

}  // namespace ksi
