// zip-stats: one row for each virtual machine on its compression cache (memClients/memzipInfo of
// the world group). Sizes arrive in kilobytes; counts and times are shown as they are. In the Total
// row the times are the mean of the machines' averages.

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "VIRTUAL MACHINE COMPRESSION STATS",
    .ruleLength = 61,
    .options = "g:l:s:u:vq",
    .totalRow = true,
};

struct ZipStatsRow {
  Client client;
  KSI_MemzipInfo zip;
};

constexpr Column<ZipStatsRow> kColumns[] = {
    NameColumn<ZipStatsRow>("Virtual machine name").Wide(20).Total(kLabel),
    kSchedGrpColumn<ZipStatsRow>,
    kParSchedGroupColumn<ZipStatsRow>,
    kWorldGrpColumn<ZipStatsRow>,
    Kilobytes("totalCache", "Total compression cache configured",
              [](const ZipStatsRow& row) { return row.zip.totalCache; }),
    Kilobytes("maxCache", "Maximum compression cache",
              [](const ZipStatsRow& row) { return row.zip.maxCache; }),
    Kilobytes("usedCache", "Total compression cache used",
              [](const ZipStatsRow& row) { return row.zip.usedCache; }),
    Kilobytes("zipped", "Total memory compressed",
              [](const ZipStatsRow& row) { return row.zip.zipped; })
        .Ever(),
    Kilobytes("unZipped", "Total memory decompressed",
              [](const ZipStatsRow& row) { return row.zip.unZipped; })
        .Ever(),
    Kilobytes("zipRejected", "Total memory rejected",
              [](const ZipStatsRow& row) { return row.zip.zipRejected; })
        .Ever(),
    Count("nrFreeHalf", "Total free half pages",
          [](const ZipStatsRow& row) { return row.zip.nrFreeHalf; })
        .As("Lu"),
    Count("nrFreeQuarter", "Total free quarter pages",
          [](const ZipStatsRow& row) { return row.zip.nrFreeQuarter; })
        .As("Lu"),
    // sic: C21
    Microseconds("avgZipTime", "Average compression time in usec",
                 [](const ZipStatsRow& row) { return row.zip.avgZipTime; })
        .Total(kMean),
    Microseconds("avgUnzipTime", "Average decompression time in usec",
                 [](const ZipStatsRow& row) { return row.zip.avgUnzipTime; })
        .Total(kMean),
};
static_assert(IsSound(kColumns));

constexpr Complaint kRead = {Style::code, "TallyZipGetZipStats() failure"};

Status ReadZipStats(uint64_t /*gid*/, ZipStatsRow& row) {
  return ReadClientRecord(kRead, row.client.worldGrp, KSI_NODE_sched_memClients_memzipInfo,
                          row.zip);
}

constexpr GroupVisitor TallyZipStatsGroup = VisitVirtualMachine<ZipStatsRow, ReadZipStats>;

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<ZipStatsRow>(kFrame, kColumns, TallyZipStatsGroup, options, sink);
}

}  // namespace

const Report zipStats = {
    .name = "zip-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyZipStats,
};

Status TallyZipStats(int argc, char** argv) { return PrintReport(zipStats, argc, argv); }

}  // namespace tally
