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
};

struct SwapStatsRow {
  Client client;
  int32_t vmmLeader;
  KSI_SwapInfo swap;
  KSI_VmmTally vmm;
};

constexpr Column<SwapStatsRow> kColumns[] = {
    NameColumn<SwapStatsRow>("Virtual machine name", 20, kSum),
    kSchedGrpColumn<SwapStatsRow>,
    kParSchedGroupColumn<SwapStatsRow>,
    WorldGrpColumn<SwapStatsRow>("d"),
    {"isSwapping", "is the VM currently swapping out", 10, "c", kBlank, nullptr,
     [](const SwapStatsRow& row) -> Cell { return row.swap.isSwapping != 0 ? 'y' : 'n'; }},
    {"CurSwapper", "knv or vmm swapper currently active", 10, "s", kBlank, nullptr,
     [](const SwapStatsRow& row) -> Cell { return row.swap.curSwapper == 0 ? "vmm" : "knv"; }},
    {"cacheUsage", "Swap slot cache usage", 10, "Lu", kBlank, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.cacheUsage; }},
    {"swapoutReady", "Ready-time spent by swap-out client", 10, "Lu", kBlank, nullptr,
     [](const SwapStatsRow& row) -> Cell { return row.swap.swapoutReady; }},
    {"swapTgt", "Host swap target", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.swapTgt; }},
    {"swapped", "Amount swapped by host", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.swapped; }},
    {"swapRead", "Total guest phsyical memory read, and not released, from swap space", 10, "Lu",
     kSum, FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.swap.swapRead; }},
    {"swapIn", "Total guest phsyical memory swapped in, and released, from swap space", 10, "Lu",
     kSum, FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.swap.swapIn; }},
    {"swapOut", "Total guest physical memory swapped out to swap space", 10, "Lu", kSum,
     FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.swap.swapOut; }},
    {"discarded", "Total swapped memory discarded from swap space", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.discarded; }},
    {"COWSwapper", "Total guest physical memory swapped out which was marked as COW by Kernova", 10,
     "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.COWSwapper; }},
    {"vmmSwapOn", "Number of times vmm swapper was turned on", 10, "Lu", kSum, nullptr,
     [](const SwapStatsRow& row) -> Cell { return row.swap.vmmSwapOn; }},
    {"knvSwapOn", "Number of times knv swapper was turned on", 10, "Lu", kSum, nullptr,
     [](const SwapStatsRow& row) -> Cell { return row.swap.knvSwapOn; }},
    {"llswapped", "Memory swapped to llswap", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.vmm.llswapped; }},
    {"llswapUsed", "Total space used in llswap including internal fragmentation", 10, "Lu", kSum,
     FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.vmm.llswapUsed; }},
    {"totalReg", "Total space in the regular swap file", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.totalReg; }},
    {"freeReg", "Free space in the regular swap file", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.freeReg; }},
    {"cptTgt", "Total checkpoint memory to read", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.cptTgt; }},
    {"cptRead", "Checkpoint memory read from checkpoint file", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.cptRead; }},
    {"cptWritten", "Checkpoint memory written to checkpoint file", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.cptWritten; }},
    {"totalMig", "Total space in the migration swap file", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.totalMig; }},
    {"freeMig", "Free space in the migration swap file", 10, "Lu", kSum, FromKilobytes,
     [](const SwapStatsRow& row) -> Cell { return row.swap.freeMig; }},
    {"gblSwapRead", "Guest physical memory read from global swap file", 10, "Lu", kSum,
     FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.swap.gblSwapRead; }},
    {"gblSwapIn", "Guest physical memory swapped in from global swap file", 10, "Lu", kSum,
     FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.swap.gblSwapIn; }},
    {"gblSwapOut", "Guest physical memory swapped out to global swap file", 10, "Lu", kSum,
     FromKilobytes, [](const SwapStatsRow& row) -> Cell { return row.swap.gblSwapOut; }},
};

// The swapping is read before the tally here, the other way round from vm-stats.
Status ReadSwapStats(uint64_t /*gid*/, SwapStatsRow& row) {
  Status status = kSuccess;
  if ((status = Tally_GetVmmLeaderID(row.client.worldGrp, row.vmmLeader)) ||
      (status = ReadClientRecord("TallySwapGetSwapStats", row.vmmLeader,
                                 KSI_NODE_sched_memClients_swapInfo, row.swap)) ||
      (status = ReadClientRecord("TallyVMGetVMMStats", row.client.worldGrp,
                                 KSI_NODE_sched_memClients_tally_vmm, row.vmm))) {
    return status;
  }
  return kSuccess;
}

constexpr GroupVisitor TallySwapStatsGroup = VisitVirtualMachine<SwapStatsRow, ReadSwapStats>;

}  // namespace

Status TallySwapStats(int argc, char** argv) {
  ReportContext<SwapStatsRow> context(kFrame, kColumns);
  return RunClientReport(context, TallySwapStatsGroup, argc, argv);
}

}  // namespace tally
