// pshare-stats: one row on the memory that the host shares between pages of the same content, and
// in the title block the peaks of the table that finds them. All is memory/pshare/stats, which
// counts in pages.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "PSHARE STATS",
    .ruleLength = 38,
    .options = "s:u:vq",
    // sic: C27
    .labelWidth = 17,
};

constexpr Column<KSI_PshareStats> kColumns[] = {
    Pages("cow", "Client memory marked copy-on-write",
          [](const KSI_PshareStats& row) { return row.cow; }),
    Pages("cow1", "Client's COWed memory with single ref",
          [](const KSI_PshareStats& row) { return row.cow1; }),
    Pages("zero", "Zeroed client memory", [](const KSI_PshareStats& row) { return row.zero; }),
    Pages("used", "Machine memory used for backing COWed client memory",
          [](const KSI_PshareStats& row) { return row.used; }),
    Pages("reclaimed", "Machine memory reclaimed via pshare",
          [](const KSI_PshareStats& row) { return row.reclaimed; }),
    Pages("totAdd", "Total client memory added to pshare table",
          [](const KSI_PshareStats& row) { return row.totAdd; })
        .Ever(),
    Pages("totRemove", "Total client memory removed from pshare table",
          [](const KSI_PshareStats& row) { return row.totRemove; })
        .Ever(),
};
static_assert(IsSound(kColumns));

constexpr ReaderTexts kTexts = {
    .create = {Style::plain, "TallyPShareGetStats: KSI_ParamListCreate() failure"},
};

Status Run(const ReportOptions& options, Sink& sink) {
  ReportContext<KSI_PshareStats> context(kFrame, kColumns, sink);
  if (Status status = context.Settle(options)) return status;
  KSI_PshareStats row;
  if (Status status = ReadRecord(KSI_NODE_memory_pshare_stats, {.capacity = 1}, kTexts, row)) {
    return status;
  }
  context.Begin({{"Peak chain length", row.peakChainLength},
                 {"Peak chain index", row.peakChainIndex},
                 {"Peak ref.  count", row.peakRefCount}});
  context.PrintRow(row);
  context.Rule();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace

const Report pshareStats = {
    .name = "pshare-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyPShareStats,
};

Status TallyPShareStats(int argc, char** argv) { return PrintReport(pshareStats, argc, argv); }

}  // namespace tally
