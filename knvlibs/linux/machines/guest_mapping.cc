#include "knvlibs/linux/machines/guest_mapping.h"

#include <algorithm>
#include <vector>

namespace ksi {
namespace {

uint64_t SizeOf(const Mapping& mapping) { return (mapping.end - mapping.start) / 1024; }

// Joins what the kernel has cut: mappings side by side of the same memory.
std::vector<Mapping> Joined(const std::vector<Mapping>& mappings) {
  std::vector<Mapping> joined;
  for (const Mapping& mapping : mappings) {
    if (!mapping.isWritable) continue;
    if (!joined.empty() && joined.back().end == mapping.start &&
        joined.back().name == mapping.name &&
        joined.back().isNotInherited == mapping.isNotInherited) {
      joined.back().end = mapping.end;
      joined.back().memory.Add(mapping.memory);
    } else {
      joined.push_back(mapping);
    }
  }
  return joined;
}

// The mapping of a block of guest memory: the smallest that holds it, for the kernel may have
// joined it with a neighbour.
std::vector<Mapping>::const_iterator FindBlock(const std::vector<Mapping>& mappings,
                                               uint64_t size) {
  auto best = mappings.end();
  for (auto at = mappings.begin(); at != mappings.end(); ++at) {
    if (SizeOf(*at) >= size && (best == mappings.end() || SizeOf(*at) < SizeOf(*best))) best = at;
  }
  return best;
}

}  // namespace

Status ReadGuestMapping(const LinuxHost& host, int32_t pid, const QemuCommandLine& line,
                        GuestMapping* guest) {
  std::vector<Mapping> mappings;
  const Status status = ReadMappings(host, pid, &mappings);
  if (status != kOk) return status;
  mappings = Joined(mappings);
  *guest = GuestMapping();

  if (line.blocks.empty()) {
    // QEMU's default: then it is the largest thing that QEMU keeps from its children.
    std::erase_if(mappings, [](const Mapping& mapping) { return !mapping.isNotInherited; });
    const auto largest = std::ranges::max_element(mappings, {}, SizeOf);
    if (largest != mappings.end()) *guest = {SizeOf(*largest), largest->memory};
    return kOk;
  }
  GuestMapping sum;
  for (const uint64_t size : line.blocks) {
    const auto block = FindBlock(mappings, size);
    if (block == mappings.end()) return kOk;
    if (sum.size == kNoValue) {
      sum = {size, block->memory};
    } else {
      sum.size += size;
      sum.memory.Add(block->memory);
    }
    mappings.erase(block);
  }
  *guest = sum;
  return kOk;
}

}  // namespace ksi
