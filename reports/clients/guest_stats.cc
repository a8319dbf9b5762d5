// guest-stats: one row for each virtual machine on what its guest reports of its memory
// (memClients/tally/guest of the world group). A guest that reports nothing shows -1 and adds
// nothing to the Total row. Memory arrives in kilobytes.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "GUEST STATS",
    .ruleLength = 37,
    .options = "g:l:s:u:vq",
    .totalRow = true,
    .selectColumnsAt = SelectColumnsAt::beforeUnit,
};

struct GuestStatsRow {
  Client client;
  KSI_GuestTally guest;
};

constexpr Column<GuestStatsRow> kColumns[] = {
    NameColumn<GuestStatsRow>("Virtual machine name").Wide(20).Total(kLabel),
    kSchedGrpColumn<GuestStatsRow>,
    kParSchedGroupColumn<GuestStatsRow>,
    kWorldGrpColumn<GuestStatsRow>,
    Kilobytes("memTotal", "Total memory",
              [](const GuestStatsRow& row) { return row.guest.memTotal; })
        .AsSigned("Ld")
        .Total(kKnownSum),
    Count("lpageTotal", "Total large pages available for guest apps",
          [](const GuestStatsRow& row) { return static_cast<int32_t>(row.guest.lpageTotal); })
        .Total(kKnownSum),
    Kilobytes("memNeeded", "Memory required by current workload",
              [](const GuestStatsRow& row) { return row.guest.memNeeded; })
        .AsSigned("Ld")
        .Total(kKnownSum),
};
static_assert(IsSound(kColumns));

constexpr Complaint kRead = {Style::code, "TallyGuestGetStats() failure"};

Status ReadGuestStats(uint64_t /*gid*/, GuestStatsRow& row) {
  return ReadClientRecord(kRead, row.client.worldGrp, KSI_NODE_sched_memClients_tally_guest,
                          row.guest);
}

constexpr GroupVisitor TallyGuestStatsGroup = VisitVirtualMachine<GuestStatsRow, ReadGuestStats>;

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<GuestStatsRow>(kFrame, kColumns, TallyGuestStatsGroup, options, sink);
}

}  // namespace

const Report guestStats = {
    .name = "guest-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyGuestStats,
};

Status TallyGuestStats(int argc, char** argv) { return PrintReport(guestStats, argc, argv); }

}  // namespace tally
