// What a page draws of which columns: the one place of the page that knows columns by name.
//
// A host's memory divides as comp-stats tells; heaps lie in the kernel's part, machines and
// processes, which hang in the tree of groups, in that of the clients (web/balance.js). Who has
// memory, and how much, diff/memory.h says.
#ifndef TOOLS_KSICACHE_PAGE_ROLES_H_
#define TOOLS_KSICACHE_PAGE_ROLES_H_

#include <cstddef>
#include <span>
#include <string>
#include <string_view>

namespace ksicache::roles {

inline constexpr const char* kHostReport = "comp-stats";
inline constexpr const char* kTotal = "total";
inline constexpr const char* kManaged = "managedByMemMap";  // the others are taken at start
inline constexpr const char* kState = "memState";
inline constexpr const char* kFree = "free";

// A part of the host's memory. `key` is what the page's style and scripts call it.
struct Part {
  const char* key;
  const char* title;
  const char* column;
};

// Of the memory that is managed, from the bottom of the stack up.
inline constexpr Part kParts[] = {
    {"kernel", "Kernel data and heaps", "dataAndHeap"},
    {"caches", "Caches and clients of the kernel", "knvClientConsumed"},
    {"clients", "Machines and processes", "otherConsumed"},
    {"free", "Free", kFree},
};

// The memory that is taken at start, and what is managed but in no part.
inline constexpr const char* kStart = "Taken at start";
inline constexpr const char* kRest = "Not told apart";

// Of the memory that is taken at start.
inline constexpr Part kStartParts[] = {
    {"start", "Kernel code", "kernelCode"},
    {"start", "Overhead of the allocator", "buddyOvhd"},
    {"start", "Low memory that is kept", "rsvdLow"},
};

// The rows of a report as things with a size, for readers without scripts.
struct Things {
  const char* title;
  const char* report;
  const char* name;
  const char* number;  // the kernel's, of the group; empty: they have none
  const char* size;
};

inline constexpr Things kThings[] = {
    {"Machines", "vm-stats", "name", "schedGrp", "consumed"},
    {"Groups", "group-stats", "name", "gid", "consumed"},
    {"Processes", "uw-stats", "name", "schedGrp", "consumed"},
    {"Heaps", "heap-stats", "name", "", "size"},
};

// Those of a report; null if its rows are none.
const Things* ThingsOf(std::string_view report);

// The tree of groups, in which machines and processes hang.
struct Groups {
  const char* report;
  const char* name;
  const char* id;
  const char* parent;
};

inline constexpr Groups kGroups = {"group-stats", "name", "gid", "parGid"};

// A figure of each row of a report over time: a number, or a state of the memory.
struct Line {
  const char* title;
  const char* report;
  const char* column;
  bool isLessWorse = false;  // the less, the worse
};

// Those of one report stand together.
inline constexpr Line kLines[] = {
    {"Machines: consumed", "vm-stats", "consumed"},
    {"Machines: ballooned", "vm-stats", "ballooned"},
    {"Machines: swapped", "vm-stats", "swapped"},
    {"Machines: compressed", "vm-stats", "zipped"},
    {"Machines: saved by sharing", "vm-stats", "sharedSaved"},
    {"Groups: consumed", "group-stats", "consumed"},
    {"Pressure: how much of the time groups may run", "group-stats", "throttlePct", true},
    {"Processes: consumed", "uw-stats", "consumed"},
    {"Heaps: size", "heap-stats", "size"},
    {"The host: free", kHostReport, kFree},
    {"Pressure: the state of the host's memory", kHostReport, kState},
};

// As reports show the memory states, from best to worst.
std::span<const char* const> States();

// The place of a state among them; as many as there are if it is none.
size_t StateOf(std::string_view state);

// All of it for the page's scripts.
std::string ToJson();

}  // namespace ksicache::roles

#endif  // TOOLS_KSICACHE_PAGE_ROLES_H_
