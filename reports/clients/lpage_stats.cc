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
};

struct LPageStatsRow {
  Client client;
  int32_t vmmLeader;
  KSI_VmLargePages lpage;
};

constexpr Column<LPageStatsRow> kColumns[] = {
    NameColumn<LPageStatsRow>("Virtual machine name", 20, kSum),
    kSchedGrpColumn<LPageStatsRow>,
    kParSchedGroupColumn<LPageStatsRow>,
    WorldGrpColumn<LPageStatsRow>("u"),
    {"nrBackings", "Current number of lpage backings", 10, "u", kSum, nullptr,
     [](const LPageStatsRow& row) -> Cell { return row.lpage.nrBackings; }},
    {"nrAllocSuccess", "Number of lpage mapping attempts succeeded", 10, "Lu", kSum, nullptr,
     [](const LPageStatsRow& row) -> Cell { return row.lpage.nrAllocSuccess; }},
    {"nrLocked", "Number of guest lpage mappings created", 10, "Lu", kSum, nullptr,
     [](const LPageStatsRow& row) -> Cell { return row.lpage.nrLocked; }},
    {"nrBroken", "Number of guest lpage mappings broken", 10, "Lu", kSum, nullptr,
     [](const LPageStatsRow& row) -> Cell { return row.lpage.nrBroken; }},
    {"maxSwapThreshold", "Current max swap-in threshold to map lpage", 10, "Lu", kSum, nullptr,
     [](const LPageStatsRow& row) -> Cell { return row.lpage.maxSwapThreshold; }},
    {"nrFailPinned", "Number of lpage mapping attempts failed due to pinning", 10, "Lu", kSum,
     nullptr, [](const LPageStatsRow& row) -> Cell { return row.lpage.nrFailPinned; }},
    {"nrFailSwapped", "Number of lpage mapping attempts failed to avoid excessive swapins", 10,
     "Lu", kSum, nullptr, [](const LPageStatsRow& row) -> Cell { return row.lpage.nrFailSwapped; }},
    {"nrFailPinnedLate", "Number of lpage mapping attempts failed due to late pinning", 10, "Lu",
     kSum, nullptr, [](const LPageStatsRow& row) -> Cell { return row.lpage.nrFailPinnedLate; }},
    {"nrFailNoMem", "Number of lpage mapping attempts failed due to lack of memory", 10, "Lu", kSum,
     nullptr, [](const LPageStatsRow& row) -> Cell { return row.lpage.nrFailNoMem; }},
};

Status ReadLPageStats(uint64_t /*gid*/, LPageStatsRow& row) {
  Status status = kSuccess;
  if ((status = Tally_GetVmmLeaderID(row.client.worldGrp, row.vmmLeader)) ||
      (status = ReadClientRecord("TallyLPageGetLPageStats", row.vmmLeader,
                                 KSI_NODE_memory_lpage_vmLPage, row.lpage))) {
    return status;
  }
  return kSuccess;
}

constexpr GroupVisitor TallyLPageStatsGroup = VisitVirtualMachine<LPageStatsRow, ReadLPageStats>;

}  // namespace

Status TallyLPageStats(int argc, char** argv) {
  ReportContext<LPageStatsRow> context(kFrame, kColumns);
  return RunClientReport(context, TallyLPageStatsGroup, argc, argv);
}

}  // namespace tally
