// buddy-stats: one row for each of the kernel's MemMap buddy allocators, with its free and used
// buffers of each size.
//
// The allocators are the instances of system/buddy called "memmap"; the name tells the memory node
// and whether the memory is low ("memmap-03-lo"). The memory node's NUMA node is
// memory/memNodes, the buffers are system/buddy/comprehensive, read by the allocator's name.
// Figures are counts.

#include <array>
#include <cstdlib>
#include <cstring>
#include <span>
#include <utility>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "MEMMAP BUDDY STATS",
    .ruleLength = 44,
    .options = "s:vq",
};

// Room for the names of all buddies, and for a row of each.
constexpr size_t kMaxBuddies = 99;

// Where a name tells the memory node and the type of memory: "memmap-03-lo".
constexpr size_t kNodeAt = 7;
constexpr size_t kTypeAt = 10;

struct BuddyRow {
  uint32_t numaNode;
  uint32_t memNode;
  bool isLow;
  char name[16];
  KSI_BuddyStats stats;
};

template <size_t kSize>
Cell Free(const BuddyRow& row) {
  return row.stats.buffers[kSize].free;
}

template <size_t kSize>
Cell Used(const BuddyRow& row) {
  return row.stats.buffers[kSize].used;
}

constexpr Column<BuddyRow> kColumns[] = {
    {"name", "Name of the buddy", 20, "s", kSum, nullptr,
     [](const BuddyRow& row) -> Cell { return row.name; }},
    {"memNode", "Memory node the buddy belongs to", 2, "u", kBlank, nullptr,
     [](const BuddyRow& row) -> Cell { return row.memNode; }, Fixed::yes},
    {"type", "Legacy memory type name", 4, "s", kBlank, nullptr,
     [](const BuddyRow& row) -> Cell { return row.isLow ? "low" : "high"; }},
    {"numaNode", "NUMA node the buddy belongs to", 2, "u", kBlank, nullptr,
     [](const BuddyRow& row) -> Cell { return row.numaNode; }},
    {"4KBfree", "free 4KB buffers", 10, "u", kSum, nullptr, Free<0>},
    {"8KBfree", "free 8KB buffers", 10, "u", kSum, nullptr, Free<1>},
    {"16KBfree", "free 16KB buffers", 10, "u", kSum, nullptr, Free<2>},
    {"32KBfree", "free 32KB buffers", 10, "u", kSum, nullptr, Free<3>},
    {"64KBfree", "free 64KB buffers", 10, "u", kSum, nullptr, Free<4>},
    {"128KBfree", "free 128 KB buffers", 10, "u", kSum, nullptr, Free<5>},
    {"256KBfree", "free 256 KB buffers", 10, "u", kSum, nullptr, Free<6>},
    {"512KBfree", "free 512 KB buffers", 10, "u", kSum, nullptr, Free<7>},
    {"1MBfree", "free 1MB buffers", 10, "u", kSum, nullptr, Free<8>},
    {"2MBfree", "free 2MB buffers", 10, "u", kSum, nullptr, Free<9>},
    {"4MBfree", "free 4MB buffers", 10, "u", kSum, nullptr, Free<10>},
    {"8MBfree", "free 8MB buffers", 10, "u", kSum, nullptr, Free<11>},
    {"16MBfree", "free 16MB buffers", 10, "u", kSum, nullptr, Free<12>},
    {"32MBfree", "free 32MB buffers", 10, "u", kSum, nullptr, Free<13>},
    {"64MBfree", "free 64MB buffers", 10, "u", kSum, nullptr, Free<14>},
    {"128MBfree", "free 128MB buffers", 10, "u", kSum, nullptr, Free<15>},
    {"256MBfree", "free 256MB buffers", 10, "u", kSum, nullptr, Free<16>},
    {"512MBfree", "free 256MB buffers", 10, "u", kSum, nullptr, Free<17>},
    {"1GBfree", "free 1GB buffers", 10, "u", kSum, nullptr, Free<18>},
    {"4KBused", "used 4KB buffers", 10, "u", kSum, nullptr, Used<0>},
    {"8KBused", "used 8KB buffers", 10, "u", kSum, nullptr, Used<1>},
    {"16KBused", "used 16KB buffers", 10, "u", kSum, nullptr, Used<2>},
    {"32KBused", "used 32KB buffers", 10, "u", kSum, nullptr, Used<3>},
    {"64KBused", "used 64KB buffers", 10, "u", kSum, nullptr, Used<4>},
    {"128KBused", "used 128 KB buffers", 10, "u", kSum, nullptr, Used<5>},
    {"256KBused", "used 256 KB buffers", 10, "u", kSum, nullptr, Used<6>},
    {"512KBused", "used 512 KB buffers", 10, "u", kSum, nullptr, Used<7>},
    {"1MBused", "used 1MB buffers", 10, "u", kSum, nullptr, Used<8>},
    {"2MBused", "used 2MB buffers", 10, "u", kSum, nullptr, Used<9>},
    {"4MBused", "used 4MB buffers", 10, "u", kSum, nullptr, Used<10>},
    {"8MBused", "used 8MB buffers", 10, "u", kSum, nullptr, Used<11>},
    {"16MBused", "used 16MB buffers", 10, "u", kSum, nullptr, Used<12>},
    {"32MBused", "used 32MB buffers", 10, "u", kSum, nullptr, Used<13>},
    {"64MBused", "used 64MB buffers", 10, "u", kSum, nullptr, Used<14>},
    {"128MBused", "used 128MB buffers", 10, "u", kSum, nullptr, Used<15>},
    {"256MBused", "used 256MB buffers", 10, "u", kSum, nullptr, Used<16>},
    {"512MBused", "used 512MB buffers", 10, "u", kSum, nullptr, Used<17>},
    {"1GBused", "used 1GB buffers", 10, "u", kSum, nullptr, Used<18>},
};

// The NUMA node of a memory node.
Status TallyMemNode2NUMANode(uint32_t memNode, uint32_t& numaNode) {
  KSI_MemNode record = {};
  const Status status = KeyedGet(
      KSI_NODE_memory_memNodes, {.capacity = 1, .first = memNode}, record,
      [memNode](ReadStep step, Status failed) {
        if (step == ReadStep::create) {
          Warning("TallyMemNode2NUMANode: KSI_ParamListCreate() failure\n");
        } else if (step == ReadStep::read) {
          Warning("Error %#x while reading /memory/memNodes/%u", failed, memNode);
        } else {
          Warning("The param list for memNode %u could not be created: %#x", memNode, failed);
        }
      });
  numaNode = record.numaNode;
  return status;
}

Status TallyBuddyGetStats(BuddyRow& row) {
  return KeyedGet(KSI_NODE_system_buddy_comprehensive, {.capacity = 1, .first = row.name},
                  row.stats, [&row](ReadStep step, Status failed) {
                    if (step == ReadStep::create) {
                      Warning("TallyBuddyGetStats: KSI_ParamListCreate() failure\n");
                    } else if (step == ReadStep::read) {
                      Warning("Error %#x while reading %s/comprehensive", failed, row.name);
                    } else {
                      Warning("The param list for buddy %s could not be created: %#x", row.name,
                              failed);
                    }
                  });
}

// Fills a row from an allocator's name, which is cut to the row's field.
Status ReadBuddyName(const char* name, BuddyRow& row) {
  std::strncpy(row.name, name, sizeof row.name - 1);
  row.name[sizeof row.name - 1] = '\0';
  row.isLow = row.name[std::strlen(row.name) - 1] == 'o';
  row.memNode = static_cast<uint32_t>(std::strtol(row.name + kNodeAt, nullptr, 10));
  return TallyMemNode2NUMANode(row.memNode, row.numaNode);
}

// Puts the allocators into `rows` and returns how many there are. One whose NUMA node cannot be
// told is left out.
size_t ReadBuddies(std::span<BuddyRow, kMaxBuddies> rows) {
  constexpr char kPrefix[] = "memmap";
  constexpr size_t kNameBytes = 12672;
  const ParamList names(KSI_ParamListCreateAndAllocateParams(1, kMaxBuddies, kNameBytes));
  if (!names || KSI_GetInstanceList(KSI_NODE_system_buddy, nullptr, names.get()) != kSuccess) {
    return 0;
  }
  size_t kept = 0;
  for (uint32_t i = 0; i < KSI_ParamListUsedCount(names.get()) && kept < rows.size(); ++i) {
    const char* name = nullptr;
    if (KSI_ParamListGetString(names.get(), i, &name) != kSuccess) break;
    if (std::strncmp(name, kPrefix, sizeof kPrefix - 1) != 0) continue;
    if (ReadBuddyName(name, rows[kept]) == kSuccess) ++kept;
  }
  return kept;
}

// By memory node, the low memory of a node first; both as the names tell them.
bool SortsBefore(const BuddyRow& a, const BuddyRow& b) {
  if (std::strncmp(a.name, b.name, sizeof a.name) == 0) return false;
  if (std::strncmp(a.name + kNodeAt, b.name + kNodeAt, 2) == 0) {
    return std::strncmp(a.name + kTypeAt, "lo", 2) == 0;
  }
  const auto node = [](const BuddyRow& row) {
    char digits[3] = "  ";
    std::strncpy(digits, row.name + kNodeAt, 2);
    return std::strtol(digits, nullptr, 10);
  };
  return node(a) < node(b);
}

// A selection sort: the order is not a strict one for every set of names, and what it makes of the
// others is what users know.
void SortBuddies(std::span<BuddyRow> rows) {
  for (size_t place = 0; place < rows.size(); ++place) {
    size_t best = place;
    for (size_t other = place + 1; other < rows.size(); ++other) {
      if (SortsBefore(rows[other], rows[best])) best = other;
    }
    std::swap(rows[place], rows[best]);
  }
}

}  // namespace

Status TallyBuddyStats(int argc, char** argv) {
  ReportContext<BuddyRow> context(kFrame, kColumns);
  if (Status status = context.Begin(argc, argv)) return status;
  context.PrintTitleBlock();
  context.PrintHead();
  std::array<BuddyRow, kMaxBuddies> rows = {};
  const std::span<BuddyRow> buddies = std::span(rows).first(ReadBuddies(rows));
  SortBuddies(buddies);
  for (BuddyRow& row : buddies) {
    if (Status status = TallyBuddyGetStats(row)) return status;
    context.PrintRow(row);
  }
  context.PrintTotal();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace tally
