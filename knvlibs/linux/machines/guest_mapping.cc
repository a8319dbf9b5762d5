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
        joined.back().name == mapping.name && joined.back().isDontCopy == mapping.isDontCopy) {
      joined.back().end = mapping.end;
      joined.back().smaps.Add(mapping.smaps);
    } else {
      joined.push_back(mapping);
    }
  }
  return joined;
}

// The mapping of a block of guest memory: the smallest that holds it, for the kernel may have
// joined it with a neighbour.
std::vector<Mapping>::iterator FindBlock(std::vector<Mapping>& mappings, uint64_t size) {
  auto best = mappings.end();
  for (auto at = mappings.begin(); at != mappings.end(); ++at) {
    if (SizeOf(*at) >= size && (best == mappings.end() || SizeOf(*at) < SizeOf(*best))) best = at;
  }
  return best;
}

}  // namespace

Status ReadGuestMapping(const LinuxHost& host, int32_t pid, const QemuCommandLine& line,
                        GuestMapping& guest) {
  std::vector<Mapping> mappings;
  const Status status = ReadMappings(host, pid, mappings);
  if (status != kOk) return status;
  mappings = Joined(mappings);
  guest = GuestMapping();
  guest.isMade = std::ranges::any_of(mappings, &Mapping::isDontCopy);

  if (line.blocks.empty()) {
    // QEMU's default: then it is the largest thing that QEMU keeps from its children.
    std::erase_if(mappings, [](const Mapping& mapping) { return !mapping.isDontCopy; });
    const auto largest = std::ranges::max_element(mappings, {}, SizeOf);
    if (largest != mappings.end()) guest = {SizeOf(*largest), largest->smaps, guest.isMade};
    return kOk;
  }
  GuestMapping sum = guest;
  for (const Figure& size : line.blocks) {
    const auto block = size ? FindBlock(mappings, *size) : mappings.end();
    if (block == mappings.end()) return kOk;
    if (!sum.size) {
      sum = {size, block->smaps, guest.isMade};
    } else {
      sum.size = SumOf({sum.size, size});
      sum.smaps.Add(block->smaps);
    }
    mappings.erase(block);
  }
  guest = sum;
  return kOk;
}

}  // namespace ksi
