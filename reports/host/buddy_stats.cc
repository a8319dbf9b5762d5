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
#include <string>
#include <utility>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/loss.h"
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "MEMMAP BUDDY STATS",
    .ruleLength = 44,
    .options = "s:vq",
    .totalRow = true,
};

// Room for the names of all buddies, and for a row of each.
constexpr size_t kMaxBuddies = 99;

// Where a name tells the type of memory: "memmap-03-lo".
constexpr size_t kTypeAt = 10;

struct BuddyRow {
  uint32_t numaNode;
  uint32_t memNode;
  bool isLow;
  char name[16];
  KSI_BuddyStats stats;
};

// The buffers of the size 4 KB << kSize.
template <size_t kSize>
constexpr auto kFree = [](const BuddyRow& row) { return row.stats.buffers[kSize].free; };
template <size_t kSize>
constexpr auto kUsed = [](const BuddyRow& row) { return row.stats.buffers[kSize].used; };

// sic: C29
constexpr Column<BuddyRow> kColumns[] = {
    Text("name", "Name of the buddy", [](const BuddyRow& row) { return row.name; })
        .Key()
        .Wide(20)
        .Total(kLabel),
    Id("memNode", "Memory node the buddy belongs to",
       [](const BuddyRow& row) { return row.memNode; })
        .Wide(2)
        .Fixed(),
    Text("type", "Legacy memory type name",
         [](const BuddyRow& row) { return row.isLow ? "low" : "high"; })
        .Wide(4),
    Id("numaNode", "NUMA node the buddy belongs to",
       [](const BuddyRow& row) { return row.numaNode; })
        .Wide(2),
    Count("4KBfree", "free 4KB buffers", kFree<0>),
    Count("8KBfree", "free 8KB buffers", kFree<1>),
    Count("16KBfree", "free 16KB buffers", kFree<2>),
    Count("32KBfree", "free 32KB buffers", kFree<3>),
    Count("64KBfree", "free 64KB buffers", kFree<4>),
    Count("128KBfree", "free 128 KB buffers", kFree<5>),
    Count("256KBfree", "free 256 KB buffers", kFree<6>),
    Count("512KBfree", "free 512 KB buffers", kFree<7>),
    Count("1MBfree", "free 1MB buffers", kFree<8>),
    Count("2MBfree", "free 2MB buffers", kFree<9>),
    Count("4MBfree", "free 4MB buffers", kFree<10>),
    Count("8MBfree", "free 8MB buffers", kFree<11>),
    Count("16MBfree", "free 16MB buffers", kFree<12>),
    Count("32MBfree", "free 32MB buffers", kFree<13>),
    Count("64MBfree", "free 64MB buffers", kFree<14>),
    Count("128MBfree", "free 128MB buffers", kFree<15>),
    Count("256MBfree", "free 256MB buffers", kFree<16>),
    Count("512MBfree", "free 256MB buffers", kFree<17>),
    Count("1GBfree", "free 1GB buffers", kFree<18>),
    Count("4KBused", "used 4KB buffers", kUsed<0>),
    Count("8KBused", "used 8KB buffers", kUsed<1>),
    Count("16KBused", "used 16KB buffers", kUsed<2>),
    Count("32KBused", "used 32KB buffers", kUsed<3>),
    Count("64KBused", "used 64KB buffers", kUsed<4>),
    Count("128KBused", "used 128 KB buffers", kUsed<5>),
    Count("256KBused", "used 256 KB buffers", kUsed<6>),
    Count("512KBused", "used 512 KB buffers", kUsed<7>),
    Count("1MBused", "used 1MB buffers", kUsed<8>),
    Count("2MBused", "used 2MB buffers", kUsed<9>),
    Count("4MBused", "used 4MB buffers", kUsed<10>),
    Count("8MBused", "used 8MB buffers", kUsed<11>),
    Count("16MBused", "used 16MB buffers", kUsed<12>),
    Count("32MBused", "used 32MB buffers", kUsed<13>),
    Count("64MBused", "used 64MB buffers", kUsed<14>),
    Count("128MBused", "used 128MB buffers", kUsed<15>),
    Count("256MBused", "used 256MB buffers", kUsed<16>),
    Count("512MBused", "used 512MB buffers", kUsed<17>),
    Count("1GBused", "used 1GB buffers", kUsed<18>),
};
static_assert(IsSound(kColumns));

// The NUMA node of a memory node.
Status TallyMemNode2NUMANode(uint32_t memNode, uint32_t& numaNode) {
  const std::string number = std::to_string(memNode);
  const std::string keyOf = "memNode " + number;
  const std::string path = "/memory/memNodes/" + number;
  const ReaderTexts texts = {
      .create = {Style::plain, "TallyMemNode2NUMANode: KSI_ParamListCreate() failure"},
      .firstKey = {Style::listNotMade, keyOf.c_str()},
      .read = {Style::errorReading, path.c_str()},
  };
  KSI_MemNode record = {};
  const Status status =
      ReadRecord(KSI_NODE_memory_memNodes, {.capacity = 1, .first = memNode}, texts, record);
  numaNode = record.numaNode;
  return status;
}

Status TallyBuddyGetStats(BuddyRow& row) {
  const std::string name = row.name;
  const std::string keyOf = "buddy " + name;
  const std::string path = name + "/comprehensive";
  const ReaderTexts texts = {
      .create = {Style::plain, "TallyBuddyGetStats: KSI_ParamListCreate() failure"},
      .firstKey = {Style::listNotMade, keyOf.c_str()},
      .read = {Style::errorReading, path.c_str()},
  };
  return ReadRecord(KSI_NODE_system_buddy_comprehensive, {.capacity = 1, .first = name.c_str()},
                    texts, row.stats);
}

// Fills a row from an allocator's name, which is cut to the row's field.
// sic: C30
Status ReadBuddyName(const char* name, BuddyRow& row) {
  std::strncpy(row.name, name, sizeof row.name - 1);
  row.name[sizeof row.name - 1] = '\0';
  row.isLow = row.name[std::strlen(row.name) - 1] == 'o';
  row.memNode = static_cast<uint32_t>(std::strtol(row.name + KSI_BUDDY_NODE_AT, nullptr, 10));
  return TallyMemNode2NUMANode(row.memNode, row.numaNode);
}

// The names of the allocators; null when they cannot be listed or do not fit.
ParamList ListBuddies() {
  constexpr size_t kNameBytes = 128;  // of one name
  // sic: C47
  ParamList names(KSI_ParamListCreateAndAllocateParams(1, kMaxBuddies, kMaxBuddies * kNameBytes));
  const Status status =
      names ? KSI_GetInstanceList(KSI_NODE_system_buddy, nullptr, names.get()) : kFailure;
  if (NoteLoss(status) != kSuccess) names.reset();
  return names;
}

// Puts the allocators into `rows` and returns how many there are. One whose NUMA node cannot be
// told is left out.
size_t ReadBuddies(std::span<BuddyRow, kMaxBuddies> rows) {
  constexpr char kPrefix[] = KSI_BUDDY_PREFIX;
  const ParamList names = ListBuddies();
  if (!names) return 0;
  size_t kept = 0;
  for (uint32_t i = 0; i < KSI_ParamListUsedCount(names.get()) && kept < rows.size(); ++i) {
    const char* name = nullptr;
    if (NoteLoss(KSI_ParamListGetString(names.get(), i, &name)) != kSuccess) break;
    if (std::strncmp(name, kPrefix, sizeof kPrefix - 1) != 0) continue;
    if (NoteLoss(ReadBuddyName(name, rows[kept])) == kSuccess) ++kept;
  }
  return kept;
}

// By memory node, the low memory of a node first; both as the names tell them.
bool SortsBefore(const BuddyRow& a, const BuddyRow& b) {
  if (std::strncmp(a.name, b.name, sizeof a.name) == 0) return false;
  if (std::strncmp(a.name + KSI_BUDDY_NODE_AT, b.name + KSI_BUDDY_NODE_AT, 2) == 0) {
    return std::strncmp(a.name + kTypeAt, "lo", 2) == 0;
  }
  const auto node = [](const BuddyRow& row) {
    char digits[3] = "  ";
    std::strncpy(digits, row.name + KSI_BUDDY_NODE_AT, 2);
    return std::strtol(digits, nullptr, 10);
  };
  return node(a) < node(b);
}

// sic: C31
void SortBuddies(std::span<BuddyRow> rows) {
  for (size_t place = 0; place < rows.size(); ++place) {
    size_t best = place;
    for (size_t other = place + 1; other < rows.size(); ++other) {
      if (SortsBefore(rows[other], rows[best])) best = other;
    }
    std::swap(rows[place], rows[best]);
  }
}

Status Run(const ReportOptions& options, Sink& sink) {
  ReportContext<BuddyRow> context(kFrame, kColumns, sink);
  if (Status status = context.Settle(options)) return status;
  context.Begin();
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

}  // namespace

const Report buddyStats = {
    .name = "buddy-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyBuddyStats,
};

Status TallyBuddyStats(int argc, char** argv) { return PrintReport(buddyStats, argc, argv); }

}  // namespace tally
