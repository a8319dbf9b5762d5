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
    .totalRow = true,
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
  const auto limit = static_cast<uint64_t>(kilobytes);
  return limit >= KSI_UW_NO_LIMIT ? KSI_NO_VALUE : limit;
}

// sic: C17
constexpr Column<UWStatsRow> kColumns[] = {
    Text("type", "Type of user-world (uw: stand-alone, vm: VM-based)",
         [](const UWStatsRow& row) { return row.typeNames.text(); })
        .Wide(20),
    NameColumn<UWStatsRow>("User world name").Wide(20),
    kSchedGrpColumn<UWStatsRow>,
    kParSchedGroupColumn<UWStatsRow>,
    kWorldGrpColumn<UWStatsRow>,
    Kilobytes("min", "Configured memory reservation",
              [](const UWStatsRow& row) { return row.uw.min; }),
    Kilobytes("max", "Configured memory limit",
              [](const UWStatsRow& row) { return LimitOrNone(row.uw.max); })
        .AsSigned("Ld")
        .Total(kBlank),
    Kilobytes("minLimit", "Configured memory reservation limit",
              [](const UWStatsRow& row) { return LimitOrNone(row.uw.minLimit); })
        .AsSigned("Ld")
        .Total(kBlank),
    Count("shares", "Configured memory shares", [](const UWStatsRow& row) { return row.uw.shares; })
        .As("Ld")
        .Total(kBlank),
    Kilobytes("totalResv", "Total memory reservation",
              [](const UWStatsRow& row) { return row.uw.totalResv; }),
    Kilobytes("pinnedResv", "Memory reserved for pinning purposes",
              [](const UWStatsRow& row) { return row.uw.pinnedResv; }),
    // sic: C18
    Kilobytes("memSizeLimit", "Limit on virtual address-space size",
              [](const UWStatsRow& row) { return row.uw.memSizeLimit; })
        .Total(kBlank),
    Kilobytes("memSize", "Current virtual address-space size",
              [](const UWStatsRow& row) { return row.uw.memSize; }),
    Kilobytes("memBStore", "Memory backing store consumed",
              [](const UWStatsRow& row) { return row.uw.memBStore; }),
    Kilobytes("swapBStore", "Swap backing store consumed",
              [](const UWStatsRow& row) { return row.uw.swapBStore; }),
    Kilobytes("mapped",
              "Virtual address-space size backed by physical memory (private + shared + pinned)",
              [](const UWStatsRow& row) { return row.uw.mapped; }),
    Kilobytes("touched", "Virtual memory touched used by VM",
              [](const UWStatsRow& row) { return row.uw.touched; }),
    Kilobytes("swappable", "Non-shared mapped memory that can be reclaimed",
              [](const UWStatsRow& row) { return row.uw.swappable; }),
    Kilobytes("cow", "COW memory", [](const UWStatsRow& row) { return row.uw.cow; }),
    Kilobytes("pageable", "Accounted pageable memory",
              [](const UWStatsRow& row) { return row.uw.pageable; }),
    Kilobytes("pageableUnacct", "Unaccounted pageable memory",
              [](const UWStatsRow& row) { return row.uw.pageableUnacct; }),
    Kilobytes("pinned", "Non-swappable mapped memory",
              [](const UWStatsRow& row) { return row.uw.pinned; }),
    Kilobytes("prealloced", "Preallocated memory",
              [](const UWStatsRow& row) { return row.uw.prealloced; }),
    Kilobytes("shm", "SHM memory", [](const UWStatsRow& row) { return row.uw.shm; }),
    Kilobytes("allocTgt", "Physical memory allocation target",
              [](const UWStatsRow& row) { return row.uw.allocTgt; }),
    Kilobytes("consumed", "Physical memory consumed",
              [](const UWStatsRow& row) { return Consumed(row.uw); }),
    Kilobytes("swapTgt", "Swap target", [](const UWStatsRow& row) { return row.uw.swapTgt; }),
    Kilobytes("swapped", "Memory swapped to secondary storage",
              [](const UWStatsRow& row) { return row.uw.swapped; }),
    Flag("useReliableMem", "Uses Reliable memory",
         [](const UWStatsRow& row) { return row.uw.useReliableMem; })
        .Wide(1)
        .As("s"),
    Code("swapScope", "Swap scope", [](const UWStatsRow& row) { return row.uw.swapScope; }).Wide(1),
};
static_assert(IsSound(kColumns));

constexpr Complaint kTallyRead = {Style::code, "TallyUWGetUWStats() failure"};

Status TallyUWStatsGroup(uint64_t gid, uint32_t /*childCount*/, int /*csvMode*/, void* opaque) {
  auto& context = *static_cast<ReportContext<UWStatsRow>*>(opaque);
  UWStatsRow row;
  uint32_t flags = 0;
  if (Status status = Tally_GroupGetFlags(gid, flags)) return status;
  if ((flags & KSI_GROUP_USER_WORLD) == 0 || !context.filter().Passes(flags)) return kSuccess;
  row.type = flags & (KSI_GROUP_VM | KSI_GROUP_USER_WORLD);
  row.typeNames = FormatFlagMask(row.type, uwTypeNames);
  if (Status status = ReadClient(gid, row.client)) return status;
  if (Status status = ReadClientRecord(kTallyRead, row.client.worldGrp,
                                       KSI_NODE_sched_memClients_tally_uw, row.uw)) {
    return status;
  }
  context.PrintRow(row);
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<UWStatsRow>(kFrame, kColumns, TallyUWStatsGroup, options, sink);
}

}  // namespace

const Report uwStats = {
    .name = "uw-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyUWStats,
};

Status TallyUWStats(int argc, char** argv) { return PrintReport(uwStats, argc, argv); }

}  // namespace tally
