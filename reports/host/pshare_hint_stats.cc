// pshareHint-stats: the hints that page sharing keeps, by kind of page: a row for regular pages,
// one for large pages and the Total row. memory/pshare/stats counts in pages; it has all hints and
// the large ones, so the regular ones are the difference. The active hints of the Total row are the
// kernel's own count, which need not be the sum of the rows.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "PSHARE HINT STATS",
    .ruleLength = 43,
    .options = "s:u:vq",
    .totalRow = true,
};

struct HintRow {
  const char* type;
  Computed<uint64_t> totAdd;  // pages, as the others
  Computed<uint64_t> totRemove;
  Computed<uint64_t> active;
};

constexpr Column<HintRow> kColumns[] = {
    Text("type", "Hint type (regular or large page hint)",
         [](const HintRow& row) { return row.type; })
        .Key()
        .Total(kLabel),
    Pages("totAdd", "Total hints added", [](const HintRow& row) { return row.totAdd; })
        .Ever()
        .Wide(15),
    Pages("totRemove", "Total hints removed", [](const HintRow& row) { return row.totRemove; })
        .Ever()
        .Wide(15),
    Pages("active", "Currently active hints", [](const HintRow& row) { return row.active; })
        .Wide(15),
};
static_assert(IsSound(kColumns));

constexpr ReaderTexts kTexts = {
    .create = {Style::plain, "TallyPShareHintGetStats: KSI_ParamListCreate() failure"},
};

Status Run(const ReportOptions& options, Sink& sink) {
  ReportContext<HintRow> context(kFrame, kColumns, sink);
  if (Status status = context.Settle(options)) return status;
  KSI_PshareStats stats;
  if (Status status = ReadRecord(KSI_NODE_memory_pshare_stats, {.capacity = 1}, kTexts, stats)) {
    return status;
  }
  context.SelectColumns();
  context.Begin();
  const auto added = Known(stats.hintsAdded);
  const auto removed = Known(stats.hintsRemoved);
  const auto lpageAdded = Known(stats.lpageHintsAdded);
  const auto lpageRemoved = Known(stats.lpageHintsRemoved);
  const auto regularAdded = added - lpageAdded;
  const auto regularRemoved = removed - lpageRemoved;
  context.PrintRow({"regular", regularAdded, regularRemoved, regularAdded - regularRemoved});
  context.PrintRow({"lpage", lpageAdded, lpageRemoved, lpageAdded - lpageRemoved});
  context.Rule();
  // sic: C28
  context.PrintTotalRow({"Total", added, removed, Known(stats.hintsActive)});
  context.Rule();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace

const Report pshareHintStats = {
    .name = "pshareHint-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyPShareHintStats,
};

Status TallyPShareHintStats(int argc, char** argv) {
  return PrintReport(pshareHintStats, argc, argv);
}

}  // namespace tally
