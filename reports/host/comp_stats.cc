// comp-stats: one row on how the host's physical memory is divided, the state the memory is in and
// how often it came into each state.
//
// The division is memory/comprehensive; the share that the scheduler manages, the free memory it
// keeps and the state are sched/globalStats/memory/tally; the entries into a state are counted from
// sched/globalStats/memory/stateTransitions, which tells for each state how often it was left.

#include <algorithm>
#include <iterator>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "COMPREHENSIVE STATS",
    .ruleLength = 45,
    .options = "s:u:vq",
};

#define NAME(number, identifier, name, title) name,
#define TITLE(number, identifier, name, title) title,
// The memory states from best to worst; the last one stands for any other.
constexpr const char* memStateNames[] = {KSI_MEMORY_STATES(NAME) "unknown"};
constexpr const char* kMemStateTitles[] = {KSI_MEMORY_STATES(TITLE) "Unknown"};
#undef NAME
#undef TITLE
constexpr uint32_t kMemStates = std::size(memStateNames) - 1;

struct CompRow {
  KSI_Comprehensive memory;
  KSI_GlobalTally tally;
  KSI_StateTransitions transitions[kMemStates];
};

// Entries into a state: down from the better one and up from the worse one.
Computed<uint32_t> Entries(const CompRow& row, uint32_t state) {
  const auto fromBetter =
      Known(state == KSI_MEMORY_STATE_HIGH ? 1 : row.transitions[state - 1].down);  // sic: C33
  if (state == KSI_MEMORY_STATE_LOW) return fromBetter;
  return fromBetter + Known(row.transitions[state + 1].up);
}

// sic: C32
constexpr Column<CompRow> kColumns[] = {
    Kilobytes("total", "Total physical memory on host",
              [](const CompRow& row) { return row.memory.total; }),
    Kilobytes("discarded", "Discarded by kernova  ",
              [](const CompRow& row) { return row.memory.discarded; }),
    Kilobytes("managedByMemMap", "Memory managed by MemMap",
              [](const CompRow& row) { return row.memory.managedByMemMap; }),
    Kilobytes("reliableMem", "Reliable memory",
              [](const CompRow& row) { return row.memory.reliableMem; }),
    Kilobytes("kernelCode", "Kernova code region",
              [](const CompRow& row) { return row.memory.kernelCode; }),
    Kilobytes("critical", "Critical space", [](const CompRow& row) { return row.memory.critical; }),
    Kilobytes("dataAndHeap", "Kernova data and heap",
              [](const CompRow& row) { return row.memory.dataAndHeap; }),
    Kilobytes("buddyOvhd", "Memmap buddy overhead ",
              [](const CompRow& row) { return row.memory.buddyOvhd; }),
    Kilobytes("rsvdLow", "Reserved low memory",
              [](const CompRow& row) { return row.memory.rsvdLow; }),
    Kilobytes("managedByMemSched", "Memory managed by MemSched",
              [](const CompRow& row) { return row.tally.managedByMemSched; }),
    Kilobytes("minFree", "Min Free", [](const CompRow& row) { return row.tally.minFree; }),
    Kilobytes("knvClientConsumed", "Consumed by kernova clients",
              [](const CompRow& row) { return row.memory.knvClientConsumed; }),
    Kilobytes("otherConsumed", "Consumed by non-kernova clients",
              [](const CompRow& row) { return row.memory.otherConsumed; }),
    Kilobytes("free", "Available (Free) physical memory",
              [](const CompRow& row) { return row.memory.free; }),
    Count("numHigh", "Num times host in high state",
          [](const CompRow& row) { return Entries(row, KSI_MEMORY_STATE_HIGH); })
        .Ever(),
    Count("numClear", "Num times host in clear state",
          [](const CompRow& row) { return Entries(row, KSI_MEMORY_STATE_CLEAR); })
        .Ever(),
    Count("numSoft", "Num times host in soft state",
          [](const CompRow& row) { return Entries(row, KSI_MEMORY_STATE_SOFT); })
        .Ever(),
    Count("numHard", "Num of times host in hard state",
          [](const CompRow& row) { return Entries(row, KSI_MEMORY_STATE_HARD); })
        .Ever(),
    Count("numLow", "Num of times host in low state",
          [](const CompRow& row) { return Entries(row, KSI_MEMORY_STATE_LOW); })
        .Ever(),
    Text("memState", "Current memory state",
         [](const CompRow& row) {
           const auto state = Known(row.tally.memState);
           return Computed<const char*>{kMemStateTitles[std::min(state.value, kMemStates)],
                                        state.isKnown};
         })
        .Wide(7)
        .States(kMemStateTitles),
};
static_assert(IsSound(kColumns));

constexpr ReaderTexts kMemMapTexts = {
    .create = {Style::plain, "TallyCompGetMemMapStats: KSI_ParamListCreate() failure"},
};
constexpr ReaderTexts kGlobalTexts = {
    .create = {Style::plain, "TallyCompGetGlobalTally: KSI_ParamListCreate() failure"},
};

Status TallyCompGetMemMapStats(CompRow& row) {
  return ReadRecord(KSI_NODE_memory_comprehensive, {.capacity = 1}, kMemMapTexts, row.memory);
}

Status TallyCompGetGlobalTally(CompRow& row) {
  if (Status status = ReadRecord(KSI_NODE_sched_globalStats_memory_tally, {.capacity = 1},
                                 kGlobalTexts, row.tally)) {
    return status;
  }
  for (uint32_t state = 0; state < kMemStates; ++state) {
    if (Status status = ReadRecord(KSI_NODE_sched_globalStats_memory_stateTransitions,
                                   {.capacity = 2, .first = memStateNames[state]}, kGlobalTexts,
                                   row.transitions[state])) {
      return status;
    }
  }
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  ReportContext<CompRow> context(kFrame, kColumns, sink);
  if (Status status = context.Settle(options)) return status;
  context.Begin();
  CompRow row;
  if (Status status = TallyCompGetMemMapStats(row)) return status;
  if (Status status = TallyCompGetGlobalTally(row)) return status;
  context.PrintRow(row);
  context.Rule();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace

const Report compStats = {
    .name = "comp-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyCompStats,
};

Status TallyCompStats(int argc, char** argv) { return PrintReport(compStats, argc, argv); }

}  // namespace tally
