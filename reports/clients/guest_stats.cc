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
    .selectColumnsAt = SelectColumnsAt::beforeUnit,
};

struct GuestStatsRow {
  Client client;
  KSI_GuestTally guest;
};

constexpr InTotal kKnownSum = InTotal::knownSum;

constexpr Column<GuestStatsRow> kColumns[] = {
    NameColumn<GuestStatsRow>("Virtual machine name", 20, kSum),
    kSchedGrpColumn<GuestStatsRow>,
    kParSchedGroupColumn<GuestStatsRow>,
    WorldGrpColumn<GuestStatsRow>("d"),
    {"memTotal", "Total memory", 10, "Ld", kKnownSum, FromKilobytes,
     [](const GuestStatsRow& row) -> Cell { return row.guest.memTotal; }},
    {"lpageTotal", "Total large pages available for guest apps", 10, "d", kKnownSum, nullptr,
     [](const GuestStatsRow& row) -> Cell { return static_cast<int32_t>(row.guest.lpageTotal); }},
    {"memNeeded", "Memory required by current workload", 10, "Ld", kKnownSum, FromKilobytes,
     [](const GuestStatsRow& row) -> Cell { return row.guest.memNeeded; }},
};

Status ReadGuestStats(uint64_t /*gid*/, GuestStatsRow& row) {
  return ReadClientRecord("TallyGuestGetStats", row.client.worldGrp,
                          KSI_NODE_sched_memClients_tally_guest, row.guest);
}

constexpr GroupVisitor TallyGuestStatsGroup = VisitVirtualMachine<GuestStatsRow, ReadGuestStats>;

}  // namespace

Status TallyGuestStats(int argc, char** argv) {
  ReportContext<GuestStatsRow> context(kFrame, kColumns);
  return RunClientReport(context, TallyGuestStatsGroup, argc, argv);
}

}  // namespace tally
