// swap-stats: one row for each virtual machine on how the host swaps it.
//
// Nearly all figures are the swapping of the machine's VMM leader (memClients/swapInfo); the two of
// the local swap are in its world group's tally (memClients/tally/vmm). Memory arrives in
// kilobytes; counts and times are shown as they are.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "VIRTUAL MACHINE SWAP STATS",
    .ruleLength = 52,
    .options = "g:l:s:u:vq",
    .totalRow = true,
};

struct SwapStatsRow {
  Client client;
  int32_t vmmLeader;
  KSI_SwapInfo swap;
  KSI_VmmTally vmm;
};

// sic: C19
constexpr Column<SwapStatsRow> kColumns[] = {
    NameColumn<SwapStatsRow>("Virtual machine name").Wide(20).Total(kLabel),
    kSchedGrpColumn<SwapStatsRow>,
    kParSchedGroupColumn<SwapStatsRow>,
    kWorldGrpColumn<SwapStatsRow>,
    Flag("isSwapping", "is the VM currently swapping out",
         [](const SwapStatsRow& row) { return row.swap.isSwapping; }),
    Text("CurSwapper", "knv or vmm swapper currently active",
         [](const SwapStatsRow& row) {
           const auto swapper = Known(row.swap.curSwapper);
           return Computed<const char*>{swapper.value == 0 ? "vmm" : "knv", swapper.isKnown};
         }),
    // sic: C20
    Kilobytes("cacheUsage", "Swap slot cache usage",
              [](const SwapStatsRow& row) { return row.swap.cacheUsage; })
        .Total(kBlank),
    Time("swapoutReady", "Ready-time spent by swap-out client",
         [](const SwapStatsRow& row) { return row.swap.swapoutReady; })
        .Ever(),
    Kilobytes("swapTgt", "Host swap target",
              [](const SwapStatsRow& row) { return row.swap.swapTgt; }),
    Kilobytes("swapped", "Amount swapped by host",
              [](const SwapStatsRow& row) { return row.swap.swapped; }),
    Kilobytes("swapRead", "Total guest phsyical memory read, and not released, from swap space",
              [](const SwapStatsRow& row) { return row.swap.swapRead; }),
    Kilobytes("swapIn", "Total guest phsyical memory swapped in, and released, from swap space",
              [](const SwapStatsRow& row) { return row.swap.swapIn; })
        .Ever(),
    Kilobytes("swapOut", "Total guest physical memory swapped out to swap space",
              [](const SwapStatsRow& row) { return row.swap.swapOut; })
        .Ever(),
    Kilobytes("discarded", "Total swapped memory discarded from swap space",
              [](const SwapStatsRow& row) { return row.swap.discarded; })
        .Ever(),
    Kilobytes("COWSwapper",
              "Total guest physical memory swapped out which was marked as COW by Kernova",
              [](const SwapStatsRow& row) { return row.swap.COWSwapper; })
        .Ever(),
    Count("vmmSwapOn", "Number of times vmm swapper was turned on",
          [](const SwapStatsRow& row) { return row.swap.vmmSwapOn; })
        .Ever()
        .As("Lu"),
    Count("knvSwapOn", "Number of times knv swapper was turned on",
          [](const SwapStatsRow& row) { return row.swap.knvSwapOn; })
        .Ever()
        .As("Lu"),
    Kilobytes("llswapped", "Memory swapped to llswap",
              [](const SwapStatsRow& row) { return row.vmm.llswapped; }),
    Kilobytes("llswapUsed", "Total space used in llswap including internal fragmentation",
              [](const SwapStatsRow& row) { return row.vmm.llswapUsed; }),
    Kilobytes("totalReg", "Total space in the regular swap file",
              [](const SwapStatsRow& row) { return row.swap.totalReg; }),
    Kilobytes("freeReg", "Free space in the regular swap file",
              [](const SwapStatsRow& row) { return row.swap.freeReg; }),
    Kilobytes("cptTgt", "Total checkpoint memory to read",
              [](const SwapStatsRow& row) { return row.swap.cptTgt; }),
    Kilobytes("cptRead", "Checkpoint memory read from checkpoint file",
              [](const SwapStatsRow& row) { return row.swap.cptRead; })
        .Ever(),
    Kilobytes("cptWritten", "Checkpoint memory written to checkpoint file",
              [](const SwapStatsRow& row) { return row.swap.cptWritten; })
        .Ever(),
    Kilobytes("totalMig", "Total space in the migration swap file",
              [](const SwapStatsRow& row) { return row.swap.totalMig; }),
    Kilobytes("freeMig", "Free space in the migration swap file",
              [](const SwapStatsRow& row) { return row.swap.freeMig; }),
    Kilobytes("gblSwapRead", "Guest physical memory read from global swap file",
              [](const SwapStatsRow& row) { return row.swap.gblSwapRead; }),
    Kilobytes("gblSwapIn", "Guest physical memory swapped in from global swap file",
              [](const SwapStatsRow& row) { return row.swap.gblSwapIn; })
        .Ever(),
    Kilobytes("gblSwapOut", "Guest physical memory swapped out to global swap file",
              [](const SwapStatsRow& row) { return row.swap.gblSwapOut; })
        .Ever(),
};
static_assert(IsSound(kColumns));

constexpr Complaint kSwapRead = {Style::code, "TallySwapGetSwapStats() failure"};
constexpr Complaint kTallyRead = {Style::code, "TallyVMGetVMMStats() failure"};

// The swapping is read before the tally here, the other way round from vm-stats.
Status ReadSwapStats(uint64_t /*gid*/, SwapStatsRow& row) {
  if (Status status = Tally_GetVmmLeaderID(row.client.worldGrp, row.vmmLeader)) return status;
  if (Status status = ReadClientRecord(kSwapRead, row.vmmLeader, KSI_NODE_sched_memClients_swapInfo,
                                       row.swap)) {
    return status;
  }
  return ReadClientRecord(kTallyRead, row.client.worldGrp, KSI_NODE_sched_memClients_tally_vmm,
                          row.vmm);
}

constexpr GroupVisitor TallySwapStatsGroup = VisitVirtualMachine<SwapStatsRow, ReadSwapStats>;

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<SwapStatsRow>(kFrame, kColumns, TallySwapStatsGroup, options, sink);
}

}  // namespace

const Report swapStats = {
    .name = "swap-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallySwapStats,
};

Status TallySwapStats(int argc, char** argv) { return PrintReport(swapStats, argc, argv); }

}  // namespace tally
