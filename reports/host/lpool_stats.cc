// lpool-stats: one row for each pool of large pages, memory node by memory node: first the node's
// page sharing pool (memory/lpage/nodeList/psharePool), then the pool of each virtual machine on it
// (memory/lpage/nodeList/vmPools). Figures are counts of 4 KB and 2 MB pages.

#include <string>
#include <string_view>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/loss.h"
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "LPAGE POOL STATS",
    .ruleLength = 43,
    .options = "s:vq",
    .totalRow = true,
};

struct LPoolRow {
  std::string_view name;
  uint32_t nodeID;
  KSI_LargePagePool pool;
};

// sic: C34
constexpr Column<LPoolRow> kColumns[] = {
    Text("name", "Large page pool name", [](const LPoolRow& row) { return row.name; })
        .Key()
        .Wide(15)
        .Total(kLabel)
        .Fixed(),
    Id("nodeID", "Home memory node the pool", [](const LPoolRow& row) { return row.nodeID; })
        .Key()
        .Wide(7),
    Count("nrLPages", "# of large pages in the pool",
          [](const LPoolRow& row) { return row.pool.nrLPages; })
        .Wide(16),
    Count("nrFreeSPages", "# of small pages free",
          [](const LPoolRow& row) { return row.pool.nrFreeSPages; })
        .Wide(16),
    Count("nrSPageAllocs", "Total small page alloc count",
          [](const LPoolRow& row) { return row.pool.nrSPageAllocs; })
        .Ever()
        .Wide(16),
    Count("nrSPageFrees", "Total small page free count",
          [](const LPoolRow& row) { return row.pool.nrSPageFrees; })
        .Ever()
        .Wide(16),
    Count("nrReapAttempts", "Total reap attemts",
          [](const LPoolRow& row) { return row.pool.nrReapAttempts; })
        .Ever()
        .Wide(16),
    Count("nrSPagesReaped", "Total number of small pages reaped",
          [](const LPoolRow& row) { return row.pool.nrSPagesReaped; })
        .Ever()
        .Wide(16),
    Count("nrDefragAttempts", "Total large page defrag attempts",
          [](const LPoolRow& row) { return row.pool.nrDefragAttempts; })
        .Ever()
        .Wide(16),
    Count("nrDefragCancelled", "Total defrag attempts cancelled",
          [](const LPoolRow& row) { return row.pool.nrDefragCancelled; })
        .Ever()
        .Wide(16),
    Count("nrDefragReaped", "Total defrag attempts reaped",
          [](const LPoolRow& row) { return row.pool.nrDefragReaped; })
        .Ever()
        .Wide(16),
    Count("nrLPagesDefragged", "Total number of large pages defragged",
          [](const LPoolRow& row) { return row.pool.nrLPagesDefragged; })
        .Ever()
        .Wide(16),
    Count("peakDefragAttempts", "Peak defrag attempts for any large page",
          [](const LPoolRow& row) { return row.pool.peakDefragAttempts; })
        .Wide(16),
    Count("nrCachehit", "Hit count in lpage victim cache",
          [](const LPoolRow& row) { return row.pool.nrCachehit; })
        .Ever()
        .Wide(16),
};
static_assert(IsSound(kColumns));

using LPoolContext = ReportContext<LPoolRow>;

// sic: C35
constexpr ReaderTexts kPSharePoolTexts = {
    .create = {Style::plain, "TallyGetPSharePoolStats: KSI_ParamListCreate() failure"},
    .firstKey = {Style::code, "TallyGetPSharePoolStats: KSI_ParamListAddInt() failure"},
    .read = {Style::code, "TallyGetVmPoolStats() failure"},
};
constexpr ReaderTexts kVmPoolTexts = {
    .create = {Style::plain, "TallyGetVmPoolStats: KSI_ParamListCreate() failure"},
    .firstKey = {Style::code, "TallyGetVmPoolStats: KSI_ParamListAddInt() failure"},
    .secondKey = {Style::code, "TallyGetVmPoolStats: KSI_ParamListAddString() failure"},
    .read = {Style::code, "TallyGetVmPoolStats() failure"},
};
constexpr ReaderTexts kVmPoolListTexts = {
    .create = {Style::plain, "TallyTraverseLPools: KSI_ParamListCreate() failure"},
    .firstKey = {Style::code, "TallyTraverseLPools: KSI_ParamListAddInt() failure"},
    .read = {Style::plain, "TallyTraverseLPools: KSI_GetInstanceListAllocHint() failure"},
};
constexpr Complaint kNoName = {Style::plain,
                               "TallyTraverseLPools: KSI_ParamListGetString() failure"};
// sic: C36
constexpr Complaint kNoMemInfo = {Style::plain, "TallyTraversLPools: KSI_Get hardwareInfo failure"};
constexpr Complaint kNoNumVMs = {Style::plain, "TallyTraversLPools: KSI_Get numVMs failure"};

Status TallyGetPSharePoolStats(uint32_t node, KSI_LargePagePool& pool) {
  return ReadRecord(KSI_NODE_memory_lpage_nodeList_psharePool, {.capacity = 1, .first = node},
                    kPSharePoolTexts, pool);
}

Status TallyGetVmPoolStats(uint32_t node, const char* vmName, KSI_LargePagePool& pool) {
  return ReadRecord(KSI_NODE_memory_lpage_nodeList_vmPools,
                    {.capacity = 2, .first = node, .second = vmName}, kVmPoolTexts, pool);
}

Status ListVmPools(uint32_t node, uint32_t hint, ParamList& names) {
  const Status status =
      ListInstances(KSI_NODE_memory_lpage_nodeList_vmPools, {.capacity = 2, .first = node},
                    kVmPoolListTexts, names, hint);
  return status == kSuccess ? kSuccess : kFailure;
}

// Prints the pools of one memory node. A pool that cannot be read has no row.
Status PrintPools(uint32_t node, uint32_t numVMs, LPoolContext& context) {
  LPoolRow row = {};
  row.nodeID = node;
  const std::string psharePool = "pshare-" + std::to_string(node);
  row.name = psharePool;
  if (NoteLoss(TallyGetPSharePoolStats(node, row.pool)) == kSuccess) context.PrintRow(row);

  ParamList names;
  if (Status status = ListVmPools(node, numVMs, names)) return status;
  const Status status = ForEachName(names, kNoName, [&](const char* name) {
    row.name = name;
    if (NoteLoss(TallyGetVmPoolStats(node, name, row.pool)) == kSuccess) context.PrintRow(row);
    return kSuccess;
  });
  if (status == kSuccess) return kSuccess;
  // sic: C37
  static_cast<void>(names.release());
  return kFailure;
}

Status TallyTraverseLPools(LPoolContext& context) {
  KSI_MemInfo memInfo;
  if (kNoMemInfo.Of(KSI_Get(KSI_NODE_memory_memInfo, nullptr, &memInfo, sizeof memInfo)) !=
      kSuccess) {
    return kFailure;
  }
  uint32_t numVMs = 0;
  if (kNoNumVMs.Of(KSI_Get(KSI_NODE_sched_globalStats_numVMs, nullptr, &numVMs, sizeof numVMs)) !=
      kSuccess) {
    return kFailure;
  }
  for (uint32_t node = 0; node < memInfo.numNodes; ++node) {
    if (Status status = PrintPools(node, numVMs, context)) return status;
  }
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  LPoolContext context(kFrame, kColumns, sink);
  if (Status status = context.Settle(options)) return status;
  context.Begin();
  if (Status status = TallyTraverseLPools(context)) return status;
  context.PrintTotal();
  context.PrintDescriptions();
  if (context.options().verbose) {
    context.Note(
        "Displayed stats are either in small 4K page (SPage) or large 2M page (LPage) units");
  }
  return kSuccess;
}

}  // namespace

const Report lpoolStats = {
    .name = "lpool-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyLPoolStats,
};

Status TallyLPoolStats(int argc, char** argv) { return PrintReport(lpoolStats, argc, argv); }

}  // namespace tally
