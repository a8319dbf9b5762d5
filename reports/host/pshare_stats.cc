// pshare-stats: one row on the memory that the host shares between pages of the same content, and
// in the title block the peaks of the table that finds them. All is memory/pshare/stats, which
// counts in pages.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/report.h"
#include "reports/host/host_record.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "PSHARE STATS",
    .ruleLength = 38,
    .options = "s:u:vq",
    .labelWidth = 17,
};

constexpr Column<KSI_PshareStats> kColumns[] = {
    {"cow", "Client memory marked copy-on-write", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.cow); }},
    {"cow1", "Client's COWed memory with single ref", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.cow1); }},
    {"zero", "Zeroed client memory", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.zero); }},
    {"used", "Machine memory used for backing COWed client memory", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.used); }},
    {"reclaimed", "Machine memory reclaimed via pshare", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.reclaimed); }},
    {"totAdd", "Total client memory added to pshare table", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.totAdd); }},
    {"totRemove", "Total client memory removed from pshare table", 10, "Lu", kSum, ShiftKilobytes,
     [](const KSI_PshareStats& row) -> Cell { return PagesToKilobytes(row.totRemove); }},
};

}  // namespace

Status TallyPShareStats(int argc, char** argv) {
  ReportContext<KSI_PshareStats> context(kFrame, kColumns);
  if (Status status = context.Begin(argc, argv)) return status;
  KSI_PshareStats row;
  if (Status status = ReadHostRecord("TallyPShareGetStats", KSI_NODE_memory_pshare_stats,
                                     {.capacity = 1}, row)) {
    return status;
  }
  context.PrintTitleBlock({{"Peak chain length", row.peakChainLength},
                           {"Peak chain index", row.peakChainIndex},
                           {"Peak ref.  count", row.peakRefCount}});
  context.PrintHead();
  context.PrintRow(row);
  context.PrintDashes();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace tally
