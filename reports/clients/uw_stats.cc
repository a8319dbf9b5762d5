// uw-stats: one row for each user world, the groups flagged "uw", whose type passes the filters.
//
// All memory figures are those of the world group's tally (memClients/tally/uw), what is configured
// for the user world included. They arrive in kilobytes.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "USER-WORLD STATS",
    .ruleLength = 42,
    .options = "e:g:i:l:s:u:vq",
    .filterNames = uwTypeNames,
};

struct UWStatsRow {
  uint32_t type;  // the group flags that are in uwTypeNames
  NameWriter typeNames;
  Client client;
  KSI_UwTally uw;
};

// A limit of so many kilobytes and more stands for none: it is that of a page count, 0xFFFFFFFC.
uint64_t LimitOrNone(int64_t kilobytes) {
  constexpr uint64_t kNoLimit = 0x3FFFFFFF0;
  const auto limit = static_cast<uint64_t>(kilobytes);
  return limit >= kNoLimit ? kNoValue : limit;
}

// Neither type nor name has a cell in the Total row: it bears no label.
constexpr Column<UWStatsRow> kColumns[] = {
    {"type", "Type of user-world (uw: stand-alone, vm: VM-based)", 20, "s", kBlank, nullptr,
     [](const UWStatsRow& row) -> Cell { return row.typeNames.text(); }},
    NameColumn<UWStatsRow>("User world name", 20, kBlank),
    kSchedGrpColumn<UWStatsRow>,
    kParSchedGroupColumn<UWStatsRow>,
    WorldGrpColumn<UWStatsRow>("d"),
    {"min", "Configured memory reservation", 10, "Ld", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.min; }},
    {"max", "Configured memory limit", 10, "Ld", kBlank, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return LimitOrNone(row.uw.max); }},
    {"minLimit", "Configured memory reservation limit", 10, "Ld", kBlank, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return LimitOrNone(row.uw.minLimit); }},
    {"shares", "Configured memory shares", 10, "Ld", kBlank, nullptr,
     [](const UWStatsRow& row) -> Cell { return row.uw.shares; }},
    {"totalResv", "Total memory reservation", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.totalResv; }},
    {"pinnedResv", "Memory reserved for pinning purposes", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.pinnedResv; }},
    {"memSizeLimit", "Limit on virtual address-space size", 10, "Ld", kBlank, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.memSizeLimit; }},
    {"memSize", "Current virtual address-space size", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.memSize; }},
    {"memBStore", "Memory backing store consumed", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.memBStore; }},
    {"swapBStore", "Swap backing store consumed", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.swapBStore; }},
    {"mapped", "Virtual address-space size backed by physical memory (private + shared + pinned)",
     10, "Lu", kSum, FromKilobytes, [](const UWStatsRow& row) -> Cell { return row.uw.mapped; }},
    {"touched", "Virtual memory touched used by VM", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.touched; }},
    {"swappable", "Non-shared mapped memory that can be reclaimed", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.swappable; }},
    {"cow", "COW memory", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.cow; }},
    {"pageable", "Accounted pageable memory", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.pageable; }},
    {"pageableUnacct", "Unaccounted pageable memory", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.pageableUnacct; }},
    {"pinned", "Non-swappable mapped memory", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.pinned; }},
    {"prealloced", "Preallocated memory", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.prealloced; }},
    {"shm", "SHM memory", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.shm; }},
    {"allocTgt", "Physical memory allocation target", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.allocTgt; }},
    {"consumed", "Physical memory consumed", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return Consumed(row.uw); }},
    {"swapTgt", "Swap target", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.swapTgt; }},
    {"swapped", "Memory swapped to secondary storage", 10, "Lu", kSum, FromKilobytes,
     [](const UWStatsRow& row) -> Cell { return row.uw.swapped; }},
    {"useReliableMem", "Uses Reliable memory", 1, "s", kBlank, nullptr,
     [](const UWStatsRow& row) -> Cell { return row.uw.useReliableMem != 0 ? "y" : "n"; }},
    {"swapScope", "Swap scope", 1, "Lu", kBlank, nullptr,
     [](const UWStatsRow& row) -> Cell { return row.uw.swapScope; }},
};

Status TallyUWStatsGroup(uint64_t gid, uint32_t /*childCount*/, int /*csvMode*/, void* opaque) {
  auto& context = *static_cast<ReportContext<UWStatsRow>*>(opaque);
  UWStatsRow row;
  uint32_t flags = 0;
  Status status = kSuccess;
  if ((status = Tally_GroupGetFlags(gid, flags))) return status;
  if ((flags & KSI_GROUP_USER_WORLD) == 0 || !context.filter().Passes(flags)) return kSuccess;
  row.type = flags & (KSI_GROUP_VM | KSI_GROUP_USER_WORLD);
  row.typeNames = FormatFlagMask(row.type, uwTypeNames);
  if ((status = ReadClient(gid, row.client)) ||
      (status = ReadClientRecord("TallyUWGetUWStats", row.client.worldGrp,
                                 KSI_NODE_sched_memClients_tally_uw, row.uw))) {
    return status;
  }
  context.PrintRow(row);
  return kSuccess;
}

}  // namespace

Status TallyUWStats(int argc, char** argv) {
  ReportContext<UWStatsRow> context(kFrame, kColumns);
  return RunClientReport(context, TallyUWStatsGroup, argc, argv);
}

}  // namespace tally
