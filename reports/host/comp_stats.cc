// comp-stats: one row on how the host's physical memory is divided, the state the memory is in and
// how often it came into each state.
//
// The division is memory/comprehensive; the share that the scheduler manages, the free memory it
// keeps and the state are sched/globalStats/memory/tally; the entries into a state are counted from
// sched/globalStats/memory/stateTransitions, which tells for each state how often it was left.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/report.h"
#include "reports/host/host_record.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "COMPREHENSIVE STATS",
    .ruleLength = 45,
    .options = "s:u:vq",
};

// The memory states from best to worst; the last one stands for any other.
enum MemState : uint32_t { kHigh, kClear, kSoft, kHard, kLow, kUnknown };

constexpr const char* memStateNames[] = {"high", "clear", "soft", "hard", "low", "unknown"};
constexpr const char* kMemStateTitles[] = {"High", "Clear", "Soft", "Hard", "Low", "Unknown"};

struct CompRow {
  KSI_Comprehensive memory;
  KSI_GlobalTally tally;
  KSI_StateTransitions transitions[kUnknown];
};

// Entries into a state: down from the better one and up from the worse one.
Cell Entries(const CompRow& row, MemState state) {
  uint32_t entries = state == kHigh ? 1 : row.transitions[state - 1].down;  // a host starts high
  if (state != kLow) entries += row.transitions[state + 1].up;
  return entries;
}

constexpr Column<CompRow> kColumns[] = {
    {"total", "Total physical memory on host", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.total; }},
    {"discarded", "Discarded by kernova  ", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.discarded; }},
    {"managedByMemMap", "Memory managed by MemMap", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.managedByMemMap; }},
    {"reliableMem", "Reliable memory", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.reliableMem; }},
    {"kernelCode", "Kernova code region", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.kernelCode; }},
    {"critical", "Critical space", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.critical; }},
    {"dataAndHeap", "Kernova data and heap", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.dataAndHeap; }},
    {"buddyOvhd", "Memmap buddy overhead ", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.buddyOvhd; }},
    {"rsvdLow", "Reserved low memory", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.rsvdLow; }},
    {"managedByMemSched", "Memory managed by MemSched", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.tally.managedByMemSched; }},
    {"minFree", "Min Free", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.tally.minFree; }},
    {"knvClientConsumed", "Consumed by kernova clients", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.knvClientConsumed; }},
    {"otherConsumed", "Consumed by non-kernova clients", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.otherConsumed; }},
    {"free", "Available (Free) physical memory", 10, "Lu", kBlank, FromKilobytes,
     [](const CompRow& row) -> Cell { return row.memory.free; }},
    {"numHigh", "Num times host in high state", 10, "u", kBlank, nullptr,
     [](const CompRow& row) { return Entries(row, kHigh); }},
    {"numClear", "Num times host in clear state", 10, "u", kBlank, nullptr,
     [](const CompRow& row) { return Entries(row, kClear); }},
    {"numSoft", "Num times host in soft state", 10, "u", kBlank, nullptr,
     [](const CompRow& row) { return Entries(row, kSoft); }},
    {"numHard", "Num of times host in hard state", 10, "u", kBlank, nullptr,
     [](const CompRow& row) { return Entries(row, kHard); }},
    {"numLow", "Num of times host in low state", 10, "u", kBlank, nullptr,
     [](const CompRow& row) { return Entries(row, kLow); }},
    {"memState", "Current memory state", 7, "s", kBlank, nullptr,
     [](const CompRow& row) -> Cell {
       const uint32_t state = row.tally.memState;
       return kMemStateTitles[state < kUnknown ? state : kUnknown];
     }},
};

Status TallyCompGetMemMapStats(CompRow& row) {
  return ReadHostRecord("TallyCompGetMemMapStats", KSI_NODE_memory_comprehensive, {.capacity = 1},
                        row.memory);
}

Status TallyCompGetGlobalTally(CompRow& row) {
  constexpr const char* kStep = "TallyCompGetGlobalTally";
  if (Status status = ReadHostRecord(kStep, KSI_NODE_sched_globalStats_memory_tally,
                                     {.capacity = 1}, row.tally)) {
    return status;
  }
  for (uint32_t state = kHigh; state < kUnknown; ++state) {
    if (Status status = ReadHostRecord(kStep, KSI_NODE_sched_globalStats_memory_stateTransitions,
                                       {.capacity = 2, .first = memStateNames[state]},
                                       row.transitions[state])) {
      return status;
    }
  }
  return kSuccess;
}

}  // namespace

Status TallyCompStats(int argc, char** argv) {
  ReportContext<CompRow> context(kFrame, kColumns);
  if (Status status = context.Begin(argc, argv)) return status;
  context.PrintTitleBlock();
  context.PrintHead();
  CompRow row;
  if (Status status = TallyCompGetMemMapStats(row)) return status;
  if (Status status = TallyCompGetGlobalTally(row)) return status;
  context.PrintRow(row);
  context.PrintDashes();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace tally
