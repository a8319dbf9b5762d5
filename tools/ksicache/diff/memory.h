// A host's memory at one moment, and who has it.
#ifndef TOOLS_KSICACHE_DIFF_MEMORY_H_
#define TOOLS_KSICACHE_DIFF_MEMORY_H_

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "tools/ksicache/report_run.h"

namespace ksicache {

// Of what the things are that have memory.
enum class Part : uint8_t {
  machines,
  overheads,
  userWorlds,
  pageTables,
  heaps,
  groups,
  heapUse,
  largePages,
  machineSharing,
  hostSharing,
  worldsOfName,
};

struct PartInfo {
  Part part;
  const char* name;    // of many
  const char* one;     // of one
  const char* of;      // what stands before the name of one
  const char* source;  // the report and the column
  bool isAdded;        // to what is explained: no two that are added have memory in common
  bool isSaved;        // it is memory that is not needed: what is lost of it grows elsewhere
};

inline constexpr PartInfo kParts[] = {
    {Part::machines, "machines", "machine", "machine ", "vm-stats consumed", true, false},
    {Part::overheads, "overheads of machines", "overhead of a machine", "overhead of ",
     "vm-stats ovhd", true, false},
    {Part::userWorlds, "user worlds", "user world", "user world ", "uw-stats consumed", true,
     false},
    {Part::pageTables, "page tables", "page table", "page tables of ", "group-stats ovhd", true,
     false},
    {Part::heaps, "heaps", "heap", "heap ", "heap-stats size", true, false},
    {Part::groups, "groups", "group", "group ", "group-stats consumed", false, false},
    {Part::heapUse, "heaps", "heap", "heap ", "heap-stats used", false, false},
    {Part::largePages, "pools of large pages", "pool of large pages", "large pages ",
     "lpool-stats nrLPages", false, false},
    {Part::machineSharing, "page sharing", "page sharing", "sharing lost by ",
     "vm-stats sharedSaved", false, true},
    {Part::hostSharing, "page sharing", "page sharing", "sharing lost by ",
     "pshare-stats reclaimed", false, true},
    {Part::worldsOfName, "user worlds", "user world", "user worlds ", "uw-stats consumed", false,
     false},
};

constexpr const PartInfo& InfoOf(Part part) { return kParts[static_cast<size_t>(part)]; }

// What one thing has, in bytes.
struct Amount {
  std::string identity;  // in its part
  std::string name;
  int64_t number = -1;  // the kernel's, of a group; -1: it has none, or there are several
  std::optional<int64_t> bytes;
  std::optional<int64_t> limit;  // that it cannot grow beyond
};

// The host's own figures, in bytes.
struct HostMemory {
  std::optional<int64_t> total;
  std::optional<int64_t> free;
  std::optional<int64_t> kernel;
  std::optional<int64_t> caches;
  std::optional<int64_t> others;
};

// The things of a part. Of those that are missing from one that is not whole nothing is known.
struct Things {
  std::vector<Amount> amounts;
  bool isWhole = true;
};

struct Memory {
  HostMemory host;
  std::array<Things, std::size(kParts)> parts;
  std::vector<std::string> complaints;  // why reports have failed

  const Things& Of(Part part) const { return parts[static_cast<size_t>(part)]; }
};

struct MemoryOptions {
  // The numbers of groups and processes are not to be part of identities, but the names on the way
  // to them.
  bool byPath = false;
  // Large pages, page sharing, and all user worlds of a name together, too, which are no part of a
  // balance. Numbers alone are identities then: a name may change meanwhile.
  bool isAll = false;
};

// Reads that of the moment which the library answers from.
Memory ReadMemory(const Origin& origin, const MemoryOptions& options);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_MEMORY_H_
