// pshareHint-stats: the hints that page sharing keeps, by kind of page: a row for regular pages,
// one for large pages and the Total row. memory/pshare/stats counts in pages; it has all hints and
// the large ones, so the regular ones are the difference. The active hints of the Total row are the
// kernel's own count, which need not be the sum of the rows.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/report.h"
#include "reports/host/host_record.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "PSHARE HINT STATS",
    .ruleLength = 43,
    .options = "s:u:vq",
};

struct HintRow {
  const char* type;
  uint64_t totAdd;  // pages, as the others
  uint64_t totRemove;
  uint64_t active;
};

constexpr Column<HintRow> kColumns[] = {
    {"type", "Hint type (regular or large page hint)", 10, "s", kSum, nullptr,
     [](const HintRow& row) -> Cell { return row.type; }},
    {"totAdd", "Total hints added", 15, "Lu", kSum, ShiftKilobytes,
     [](const HintRow& row) -> Cell { return PagesToKilobytes(row.totAdd); }},
    {"totRemove", "Total hints removed", 15, "Lu", kSum, ShiftKilobytes,
     [](const HintRow& row) -> Cell { return PagesToKilobytes(row.totRemove); }},
    {"active", "Currently active hints", 15, "Lu", kSum, ShiftKilobytes,
     [](const HintRow& row) -> Cell { return PagesToKilobytes(row.active); }},
};

}  // namespace

Status TallyPShareHintStats(int argc, char** argv) {
  ReportContext<HintRow> context(kFrame, kColumns);
  if (Status status = context.Begin(argc, argv)) return status;
  KSI_PshareStats stats;
  if (Status status = ReadHostRecord("TallyPShareHintGetStats", KSI_NODE_memory_pshare_stats,
                                     {.capacity = 1}, stats)) {
    return status;
  }
  context.SelectColumns();
  context.PrintTitleBlock();
  context.PrintHead();
  const uint64_t regularAdded = stats.hintsAdded - stats.lpageHintsAdded;
  const uint64_t regularRemoved = stats.hintsRemoved - stats.lpageHintsRemoved;
  context.PrintRow({"regular", regularAdded, regularRemoved, regularAdded - regularRemoved});
  context.PrintRow({"lpage", stats.lpageHintsAdded, stats.lpageHintsRemoved,
                    stats.lpageHintsAdded - stats.lpageHintsRemoved});
  context.PrintDashes();
  context.PrintTotalRow({"Total", stats.hintsAdded, stats.hintsRemoved, stats.hintsActive});
  context.PrintDashes();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace tally
