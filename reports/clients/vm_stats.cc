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
    .totalRow = true,
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

// sic: C16
uint64_t FromSigned32Kilobytes(uint64_t kilobytes, DisplayUnit unit) {
  const auto narrow = [](uint64_t value) {
    return static_cast<uint64_t>(static_cast<int32_t>(value));
  };
  const uint64_t value = narrow(kilobytes);
  return value == KSI_NO_VALUE ? KSI_NO_VALUE : narrow(ShiftKilobytes(value, unit));
}

// A negative limit is none.
Computed<int32_t> LimitOrNone(int64_t kilobytes) {
  const auto limit = Cut<int32_t>(kilobytes);
  return limit.value < 0 ? Computed<int32_t>{-1, true} : limit;
}

constexpr Column<VMStatsRow> kColumns[] = {
    NameColumn<VMStatsRow>("Virtual machine name").Wide(15).Total(kLabel),
    Flag("b", "Is balloon driver active?",
         [](const VMStatsRow& row) { return row.vmm.balloonActive; })
        .Wide(1),
    kSchedGrpColumn<VMStatsRow>,
    kParSchedGroupColumn<VMStatsRow>,
    kWorldGrpColumn<VMStatsRow>,
    Kilobytes("memSizeLimit", "Upper bound on guest physical memory size",
              [](const VMStatsRow& row) { return row.vmm.memSizeLimit; }),
    Kilobytes("memSize", "Guest physical memory size",
              [](const VMStatsRow& row) { return row.vmm.memSize; }),
    Kilobytes("min", "Configured host physical memory reservation for guest",
              [](const VMStatsRow& row) { return Cut<int32_t>(row.allocation.min); })
        .Through(FromSigned32Kilobytes),
    Kilobytes("max", "Configured host physical memory limit for guest",
              [](const VMStatsRow& row) { return LimitOrNone(row.allocation.max); })
        .Through(FromSigned32Kilobytes)
        .Total(kBlank),
    Kilobytes("minLimit", "Configured upper bound for VM reservation (includes ovhdResv)",
              [](const VMStatsRow& row) { return LimitOrNone(row.allocation.minLimit); })
        .Through(FromSigned32Kilobytes)
        .Total(kBlank),
    Count("shares", "Configured shares",
          [](const VMStatsRow& row) { return row.allocation.shares; })
        .As("Ld")
        .Total(kBlank),
    Kilobytes("ovhdResv", "Reserved overhead memory",
              [](const VMStatsRow& row) { return row.memory.ovhdResv; }),
    Kilobytes("ovhd", "Consumed overhead memory",
              [](const VMStatsRow& row) { return row.memory.ovhd; }),
    Kilobytes("allocTgt", "Host physical memory allocation target",
              [](const VMStatsRow& row) { return row.vmm.allocTgt; }),
    Kilobytes("consumed", "Host physical memory consumed by guest",
              [](const VMStatsRow& row) { return Consumed(row.vmm); }),
    Kilobytes("balloonTgt", "Target balloon size",
              [](const VMStatsRow& row) { return row.vmm.balloonTgt; }),
    Kilobytes("ballooned", "Actual balloon size",
              [](const VMStatsRow& row) { return row.vmm.ballooned; }),
    Kilobytes("swapTgt", "Host swap target", [](const VMStatsRow& row) { return row.vmm.swapTgt; }),
    Kilobytes("swapped", "Amount swapped by host",
              [](const VMStatsRow& row) { return row.swap.swapped; }),
    Kilobytes("mapped", "Guest physical memory backed by host memory",
              [](const VMStatsRow& row) { return row.vmm.mapped; }),
    Kilobytes("touched", "Guest physical memory actively used by VM",
              [](const VMStatsRow& row) { return row.vmm.touched; }),
    Kilobytes("zipped", "Guest physical memory that is compressed",
              [](const VMStatsRow& row) { return row.vmm.zipped; }),
    Kilobytes("vpmemRO", "Guest physical persistent memory that is cached read-only",
              [](const VMStatsRow& row) { return row.vmm.vpmemRO; }),
    Kilobytes("vpmemRW", "Guest physical persistent memory that is cached read-write",
              [](const VMStatsRow& row) { return row.vmm.vpmemRW; }),
    Kilobytes("vpmemUC", "Guest physical persistent memory that is not yet cached",
              [](const VMStatsRow& row) { return row.vmm.vpmemUC; }),
    Kilobytes("zipSaved", "Host physical memory saved by compression",
              [](const VMStatsRow& row) { return row.vmm.zipSaved; }),
    Kilobytes("shared", "Subset of mapped that is marked COW as a result of page-sharing",
              [](const VMStatsRow& row) { return row.vmm.shared; }),
    Kilobytes("zero", "Subset of shared pages that are zero-filled",
              [](const VMStatsRow& row) { return row.vmm.zero; }),
    Kilobytes("sharedSaved", "Host physical memory saved as a result of page-sharing",
              [](const VMStatsRow& row) { return row.vmm.sharedSaved; }),
    Flag("useReliableMem", "Uses Reliable memory",
         [](const VMStatsRow& row) { return row.vmm.useReliableMem; })
        .Wide(1)
        .As("s"),
    Code("swapScope", "Swap scope", [](const VMStatsRow& row) { return row.vmm.swapScope; })
        .Wide(1),
};
static_assert(IsSound(kColumns));

constexpr Complaint kTallyRead = {Style::code, "TallyVMGetVMMStats() failure"};
constexpr Complaint kSwapRead = {Style::code, "TallyVMGetSwapStats() failure"};

Status ReadVMStats(uint64_t gid, VMStatsRow& row) {
  if (Status status = Tally_GroupGetVMMAlloc(gid, row.allocation)) return status;
  if (Status status = ReadClientRecord(kTallyRead, row.client.worldGrp,
                                       KSI_NODE_sched_memClients_tally_vmm, row.vmm)) {
    return status;
  }
  if (Status status = Tally_GetVmmLeaderID(row.client.worldGrp, row.vmmLeader)) return status;
  if (Status status = ReadClientRecord(kSwapRead, row.vmmLeader, KSI_NODE_sched_memClients_swapInfo,
                                       row.swap)) {
    return status;
  }
  return TallyGroupGetMemoryStats(gid, row.memory);
}

constexpr GroupVisitor TallyVMStatsGroup = VisitVirtualMachine<VMStatsRow, ReadVMStats>;

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<VMStatsRow>(kFrame, kColumns, TallyVMStatsGroup, options, sink);
}

}  // namespace

const Report vmStats = {
    .name = "vm-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyVMStats,
};

Status TallyVMStats(int argc, char** argv) { return PrintReport(vmStats, argc, argv); }

}  // namespace tally
