// lpage-stats: one row for each virtual machine on the large pages that back it, from
// memory/lpage/vmLPage of its VMM leader. All figures are counts: the unit only stands in the
// title.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "VIRTUAL MACHINE LARGE PAGE STATS",
    .ruleLength = 58,
    .options = "g:l:s:u:vq",
    .totalRow = true,
};

struct LPageStatsRow {
  Client client;
  int32_t vmmLeader;
  KSI_VmLargePages lpage;
};

// sic: C22
constexpr Column<LPageStatsRow> kColumns[] = {
    NameColumn<LPageStatsRow>("Virtual machine name").Wide(20).Total(kLabel),
    kSchedGrpColumn<LPageStatsRow>,
    kParSchedGroupColumn<LPageStatsRow>,
    kWorldGrpColumn<LPageStatsRow>.AsUnsigned("u"),
    Count("nrBackings", "Current number of lpage backings",
          [](const LPageStatsRow& row) { return row.lpage.nrBackings; }),
    Count("nrAllocSuccess", "Number of lpage mapping attempts succeeded",
          [](const LPageStatsRow& row) { return row.lpage.nrAllocSuccess; })
        .Ever(),
    Count("nrLocked", "Number of guest lpage mappings created",
          [](const LPageStatsRow& row) { return row.lpage.nrLocked; })
        .Ever()
        .As("Lu"),
    Count("nrBroken", "Number of guest lpage mappings broken",
          [](const LPageStatsRow& row) { return row.lpage.nrBroken; })
        .Ever(),
    Count("maxSwapThreshold", "Current max swap-in threshold to map lpage",
          [](const LPageStatsRow& row) { return row.lpage.maxSwapThreshold; })
        .As("Lu"),
    Count("nrFailPinned", "Number of lpage mapping attempts failed due to pinning",
          [](const LPageStatsRow& row) { return row.lpage.nrFailPinned; })
        .Ever(),
    Count("nrFailSwapped", "Number of lpage mapping attempts failed to avoid excessive swapins",
          [](const LPageStatsRow& row) { return row.lpage.nrFailSwapped; })
        .Ever(),
    Count("nrFailPinnedLate", "Number of lpage mapping attempts failed due to late pinning",
          [](const LPageStatsRow& row) { return row.lpage.nrFailPinnedLate; })
        .Ever(),
    Count("nrFailNoMem", "Number of lpage mapping attempts failed due to lack of memory",
          [](const LPageStatsRow& row) { return row.lpage.nrFailNoMem; })
        .Ever(),
};
static_assert(IsSound(kColumns));

constexpr Complaint kRead = {Style::code, "TallyLPageGetLPageStats() failure"};

Status ReadLPageStats(uint64_t /*gid*/, LPageStatsRow& row) {
  if (Status status = Tally_GetVmmLeaderID(row.client.worldGrp, row.vmmLeader)) return status;
  return ReadClientRecord(kRead, row.vmmLeader, KSI_NODE_memory_lpage_vmLPage, row.lpage);
}

constexpr GroupVisitor TallyLPageStatsGroup = VisitVirtualMachine<LPageStatsRow, ReadLPageStats>;

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<LPageStatsRow>(kFrame, kColumns, TallyLPageStatsGroup, options, sink);
}

}  // namespace

const Report lpageStats = {
    .name = "lpage-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyLPageStats,
};

Status TallyLPageStats(int argc, char** argv) { return PrintReport(lpageStats, argc, argv); }

}  // namespace tally
