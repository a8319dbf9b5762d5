// vm-stats: one row for each virtual machine, the groups flagged "vm", with what is configured for
// it, what backs it and how it is reclaimed.
//
// The figures are those of the machine's group (name, parent, memory statistics), its allocation
// together with that of its VMM's group, its world group's tally (memClients/tally/vmm) and the
// swapping of its VMM leader (memClients/swapInfo). Memory arrives in kilobytes.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "VIRTUAL MACHINE STATS",
    .ruleLength = 47,
    .options = "g:l:s:u:vq",
    .selectColumnsAt = SelectColumnsAt::beforeUnit,
};

struct VMStatsRow {
  Client client;
  int32_t vmmLeader;
  VmmAlloc allocation;
  KSI_VmmTally vmm;
  KSI_SwapInfo swap;
  KSI_GroupMemoryStats memory;
};

// The allocation's figures are kept in 32 bits, signed; -1 stays.
uint64_t FromSigned32Kilobytes(uint64_t kilobytes, DisplayUnit unit) {
  const auto narrow = [](uint64_t value) {
    return static_cast<uint64_t>(static_cast<int32_t>(value));
  };
  const uint64_t value = narrow(kilobytes);
  return value == kNoValue ? kNoValue : narrow(ShiftKilobytes(value, unit));
}

// A negative limit is none.
int32_t LimitOrNone(int64_t kilobytes) {
  const auto limit = static_cast<int32_t>(kilobytes);
  return limit < 0 ? -1 : limit;
}

constexpr Column<VMStatsRow> kColumns[] = {
    NameColumn<VMStatsRow>("Virtual machine name", 15, kSum),
    {"b", "Is balloon driver active?", 1, "c", kBlank, nullptr,
     [](const VMStatsRow& row) -> Cell { return row.vmm.balloonActive != 0 ? 'y' : 'n'; }},
    kSchedGrpColumn<VMStatsRow>,
    kParSchedGroupColumn<VMStatsRow>,
    WorldGrpColumn<VMStatsRow>("d"),
    {"memSizeLimit", "Upper bound on guest physical memory size", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.memSizeLimit; }},
    {"memSize", "Guest physical memory size", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.memSize; }},
    {"min", "Configured host physical memory reservation for guest", 10, "Ld", kSum,
     FromSigned32Kilobytes,
     [](const VMStatsRow& row) -> Cell { return static_cast<int32_t>(row.allocation.min); }},
    {"max", "Configured host physical memory limit for guest", 10, "Ld", kBlank,
     FromSigned32Kilobytes,
     [](const VMStatsRow& row) -> Cell { return LimitOrNone(row.allocation.max); }},
    {"minLimit", "Configured upper bound for VM reservation (includes ovhdResv)", 10, "Ld", kBlank,
     FromSigned32Kilobytes,
     [](const VMStatsRow& row) -> Cell { return LimitOrNone(row.allocation.minLimit); }},
    {"shares", "Configured shares", 10, "Ld", kBlank, nullptr,
     [](const VMStatsRow& row) -> Cell { return row.allocation.shares; }},
    {"ovhdResv", "Reserved overhead memory", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.memory.ovhdResv; }},
    {"ovhd", "Consumed overhead memory", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.memory.ovhd; }},
    {"allocTgt", "Host physical memory allocation target", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.allocTgt; }},
    {"consumed", "Host physical memory consumed by guest", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return Consumed(row.vmm); }},
    {"balloonTgt", "Target balloon size", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.balloonTgt; }},
    {"ballooned", "Actual balloon size", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.ballooned; }},
    {"swapTgt", "Host swap target", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.swapTgt; }},
    {"swapped", "Amount swapped by host", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.swap.swapped; }},
    {"mapped", "Guest physical memory backed by host memory", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.mapped; }},
    {"touched", "Guest physical memory actively used by VM", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.touched; }},
    {"zipped", "Guest physical memory that is compressed", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.zipped; }},
    {"vpmemRO", "Guest physical persistent memory that is cached read-only", 10, "Lu", kSum,
     FromKilobytes, [](const VMStatsRow& row) -> Cell { return row.vmm.vpmemRO; }},
    {"vpmemRW", "Guest physical persistent memory that is cached read-write", 10, "Lu", kSum,
     FromKilobytes, [](const VMStatsRow& row) -> Cell { return row.vmm.vpmemRW; }},
    {"vpmemUC", "Guest physical persistent memory that is not yet cached", 10, "Lu", kSum,
     FromKilobytes, [](const VMStatsRow& row) -> Cell { return row.vmm.vpmemUC; }},
    {"zipSaved", "Host physical memory saved by compression", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.zipSaved; }},
    {"shared", "Subset of mapped that is marked COW as a result of page-sharing", 10, "Lu", kSum,
     FromKilobytes, [](const VMStatsRow& row) -> Cell { return row.vmm.shared; }},
    {"zero", "Subset of shared pages that are zero-filled", 10, "Lu", kSum, FromKilobytes,
     [](const VMStatsRow& row) -> Cell { return row.vmm.zero; }},
    {"sharedSaved", "Host physical memory saved as a result of page-sharing", 10, "Lu", kSum,
     FromKilobytes, [](const VMStatsRow& row) -> Cell { return row.vmm.sharedSaved; }},
    {"useReliableMem", "Uses Reliable memory", 1, "s", kBlank, nullptr,
     [](const VMStatsRow& row) -> Cell { return row.vmm.useReliableMem != 0 ? "y" : "n"; }},
    {"swapScope", "Swap scope", 1, "Lu", kBlank, nullptr,
     [](const VMStatsRow& row) -> Cell { return row.vmm.swapScope; }},
};

Status ReadVMStats(uint64_t gid, VMStatsRow& row) {
  Status status = kSuccess;
  if ((status = Tally_GroupGetVMMAlloc(gid, row.allocation)) ||
      (status = ReadClientRecord("TallyVMGetVMMStats", row.client.worldGrp,
                                 KSI_NODE_sched_memClients_tally_vmm, row.vmm)) ||
      (status = Tally_GetVmmLeaderID(row.client.worldGrp, row.vmmLeader)) ||
      (status = ReadClientRecord("TallyVMGetSwapStats", row.vmmLeader,
                                 KSI_NODE_sched_memClients_swapInfo, row.swap)) ||
      (status = TallyGroupGetMemoryStats(gid, row.memory))) {
    return status;
  }
  return kSuccess;
}

constexpr GroupVisitor TallyVMStatsGroup = VisitVirtualMachine<VMStatsRow, ReadVMStats>;

}  // namespace

Status TallyVMStats(int argc, char** argv) {
  ReportContext<VMStatsRow> context(kFrame, kColumns);
  return RunClientReport(context, TallyVMStatsGroup, argc, argv);
}

}  // namespace tally
