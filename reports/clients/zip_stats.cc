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
};

struct ZipStatsRow {
  Client client;
  KSI_MemzipInfo zip;
};

constexpr InTotal kMean = InTotal::mean;

constexpr Column<ZipStatsRow> kColumns[] = {
    NameColumn<ZipStatsRow>("Virtual machine name", 20, kSum),
    kSchedGrpColumn<ZipStatsRow>,
    kParSchedGroupColumn<ZipStatsRow>,
    WorldGrpColumn<ZipStatsRow>("d"),
    {"totalCache", "Total compression cache configured", 10, "Lu", kSum, FromKilobytes,
     [](const ZipStatsRow& row) -> Cell { return row.zip.totalCache; }},
    {"maxCache", "Maximum compression cache", 10, "Lu", kSum, FromKilobytes,
     [](const ZipStatsRow& row) -> Cell { return row.zip.maxCache; }},
    {"usedCache", "Total compression cache used", 10, "Lu", kSum, FromKilobytes,
     [](const ZipStatsRow& row) -> Cell { return row.zip.usedCache; }},
    {"zipped", "Total memory compressed", 10, "Lu", kSum, FromKilobytes,
     [](const ZipStatsRow& row) -> Cell { return row.zip.zipped; }},
    {"unZipped", "Total memory decompressed", 10, "Lu", kSum, FromKilobytes,
     [](const ZipStatsRow& row) -> Cell { return row.zip.unZipped; }},
    {"zipRejected", "Total memory rejected", 10, "Lu", kSum, FromKilobytes,
     [](const ZipStatsRow& row) -> Cell { return row.zip.zipRejected; }},
    {"nrFreeHalf", "Total free half pages", 10, "Lu", kSum, nullptr,
     [](const ZipStatsRow& row) -> Cell { return row.zip.nrFreeHalf; }},
    {"nrFreeQuarter", "Total free quarter pages", 10, "Lu", kSum, nullptr,
     [](const ZipStatsRow& row) -> Cell { return row.zip.nrFreeQuarter; }},
    {"avgZipTime", "Average compression time in usec", 10, "Lu", kMean, nullptr,
     [](const ZipStatsRow& row) -> Cell { return row.zip.avgZipTime; }},
    {"avgUnzipTime", "Average decompression time in usec", 10, "Lu", kMean, nullptr,
     [](const ZipStatsRow& row) -> Cell { return row.zip.avgUnzipTime; }},
};

Status ReadZipStats(uint64_t /*gid*/, ZipStatsRow& row) {
  return ReadClientRecord("TallyZipGetZipStats", row.client.worldGrp,
                          KSI_NODE_sched_memClients_memzipInfo, row.zip);
}

constexpr GroupVisitor TallyZipStatsGroup = VisitVirtualMachine<ZipStatsRow, ReadZipStats>;

}  // namespace

Status TallyZipStats(int argc, char** argv) {
  ReportContext<ZipStatsRow> context(kFrame, kColumns);
  return RunClientReport(context, TallyZipStatsGroup, argc, argv);
}

}  // namespace tally
