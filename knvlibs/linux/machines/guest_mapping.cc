#include "knvlibs/linux/machines/guest_mapping.h"

#include <algorithm>
#include <span>
#include <vector>

#include "knvlibs/linux/host/walk_time.h"
#include "knvlibs/linux/machines/page_map.h"

namespace ksi {
namespace {

struct FoundBlock {
  Mapping mapping;
  bool isTold;  // by its address that it is this one
};

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

// The mapping of a block of guest memory: that at its address, else the smallest that holds it, for
// the kernel may have joined it with a neighbour.
std::vector<Mapping>::iterator FindBlock(std::vector<Mapping>& mappings, const MemoryBlock& block) {
  auto best = mappings.end();
  for (auto at = mappings.begin(); at != mappings.end(); ++at) {
    const bool isThere =
        !block.address || (at->start <= *block.address && *block.address < at->end);
    if (!isThere || SizeOf(*at) < block.size) continue;
    if (best == mappings.end() || SizeOf(*at) < SizeOf(*best)) best = at;
  }
  return best;
}

// The mappings of all blocks, and those that are left; none if one of them is not there.
std::vector<FoundBlock> FindBlocks(std::vector<MemoryBlock> blocks, std::vector<Mapping>& left) {
  // What has an address is not to be taken for another block.
  std::stable_partition(blocks.begin(), blocks.end(),
                        [](const MemoryBlock& block) { return block.address.has_value(); });
  std::vector<FoundBlock> found;
  for (const MemoryBlock& block : blocks) {
    const auto mapping = block.size ? FindBlock(left, block) : left.end();
    if (mapping == left.end()) return {};
    found.push_back({*mapping, block.address.has_value()});
    left.erase(mapping);
  }
  return found;
}

// Whether one of the blocks may be another one than that: there is other memory of its size, such
// as of a module that is about to be plugged in. Only smaps tells what cannot be a guest's.
bool MayBeMistaken(const std::vector<FoundBlock>& blocks, const std::vector<Mapping>& left,
                   MappingsFile file) {
  return std::ranges::any_of(left, [&](const Mapping& other) {
    const bool mayBeMemory = other.isDontCopy || file == MappingsFile::kMaps;
    return mayBeMemory && std::ranges::any_of(blocks, [&other](const FoundBlock& block) {
             return !block.isTold && SizeOf(block.mapping) == SizeOf(other);
           });
  });
}

// QEMU's default memory is the largest thing that it keeps from its children.
std::vector<FoundBlock> FindDefault(std::vector<Mapping>& left) {
  auto largest = left.end();
  for (auto at = left.begin(); at != left.end(); ++at) {
    if (!at->isDontCopy) continue;
    if (largest == left.end() || SizeOf(*at) > SizeOf(*largest)) largest = at;
  }
  if (largest == left.end()) return {};
  const FoundBlock block = {*largest, false};
  left.erase(largest);
  return {block};
}

// Whether memory for a guest may be left. Memory of devices is kept from children, too: that of a
// screen is 16 MB, and no module is as small.
bool MayHoldModule(const std::vector<Mapping>& left) {
  constexpr uint64_t kLargestOfDevices = uint64_t{16} << 10;
  return std::ranges::any_of(left, [](const Mapping& mapping) {
    return mapping.isDontCopy && SizeOf(mapping) > kLargestOfDevices;
  });
}

bool IsShort(const LinuxHost& host, const Process& process) {
  const Figure size = SumOf({process.vmRss, process.vmSwap});
  const Figure tables = process.vmPte;
  return !host.IsThisMachine() ||
         (size && *size <= kShortWalkKB && tables && *tables <= kShortWalkTablesKB);
}

// Whether the kernel moves memory to the NUMA node that uses it: then kernels that do not tell of
// merged pages yet leave huge pages, which they have marked for it, out of smaps.
bool MayBalance(const LinuxHost& host) {
  Figure balances;
  return host.IsThisMachine() &&
         (host.ReadNumberIfAny("/proc/sys/kernel/numa_balancing", balances) != kOk ||
          balances.value_or(0) != 0);
}

void TakeSmaps(const std::vector<FoundBlock>& blocks, GuestMapping& guest) {
  Smaps sum = blocks.front().mapping.smaps;
  for (const FoundBlock& block : std::span(blocks).subspan(1)) sum.Add(block.mapping.smaps);
  guest.resident = SumOf({sum.rss, sum.hugetlb});
  if (sum.hugetlb == 0u) guest.referenced = sum.referenced;
  guest.swapped = sum.swap;
  guest.huge = SumOf({sum.anonHugePages, sum.shmemPmdMapped, sum.hugetlb});
  guest.merged = sum.ksm;
}

Status TakePages(const LinuxHost& host, int32_t pid, const std::vector<FoundBlock>& blocks,
                 GuestMapping& guest) {
  std::vector<AddressRange> ranges;
  ranges.reserve(blocks.size());
  for (const auto& [mapping, isTold] : blocks) ranges.push_back({mapping.start, mapping.end});
  PageCounts counts;
  const Status status = CountPages(host, pid, ranges, counts);
  guest.resident = counts.resident;
  guest.swapped = counts.swapped;
  guest.huge = counts.huge;
  return status;
}

}  // namespace

Status ReadQemuMappings(const LinuxHost& host, const Process& process, QemuMappings& mappings) {
  mappings.file = IsShort(host, process) ? MappingsFile::kSmaps : MappingsFile::kMaps;
  mappings.mappings.clear();
  if (mappings.file == MappingsFile::kSmaps && !MayWalk(host)) return kOk;
  const Walk walk(host);
  const Status status = ReadMappings(host, process.pid, mappings.file, mappings.mappings);
  mappings.mappings = Joined(mappings.mappings);
  return status;
}

bool IsMade(const QemuMappings& mappings, const MachineMemory& start) {
  if (mappings.file == MappingsFile::kSmaps) {
    return std::ranges::any_of(mappings.mappings, &Mapping::isDontCopy);
  }
  std::vector<Mapping> left = mappings.mappings;
  return !FindBlocks(start.AllBlocks(), left).empty();
}

Status MeasureGuest(const LinuxHost& host, int32_t pid, const QemuMappings& mappings,
                    MachineMemory memory, bool isSure, GuestMapping& guest) {
  guest = GuestMapping();
  const bool isSmaps = mappings.file == MappingsFile::kSmaps;
  std::vector<Mapping> left = mappings.mappings;
  std::vector<FoundBlock> blocks =
      memory.base ? FindBlocks(memory.AllBlocks(), left) : FindDefault(left);
  if (!memory.base && !blocks.empty()) memory.base = SizeOf(blocks.front().mapping);
  if (!isSure && (!isSmaps || blocks.empty() || MayHoldModule(left))) {
    memory.modules.reset();
    blocks.clear();
  }
  const bool mayBeMistaken = MayBeMistaken(blocks, left, mappings.file);
  guest.memory = std::move(memory);
  if (blocks.empty() || mayBeMistaken) return kOk;
  // The kernel may have joined a block with what lies beside it.
  const Figure size = guest.memory.Size();
  if (isSmaps) TakeSmaps(blocks, guest);
  Status status = kOk;
  if (!isSmaps || (!guest.merged && MayBalance(host))) {
    status = TakePages(host, pid, blocks, guest);
  }
  guest.resident = LesserOf(guest.resident, size);
  guest.huge = LesserOf(guest.huge, size);
  if (!guest.resident) guest.referenced = guest.merged = std::nullopt;  // parts of nothing known
  return status;
}

}  // namespace ksi
