// pmem-stats: the host's persistent memory. At level 2 one row for each region of each volume, at
// any other level one row for each volume on its region store.
//
// Volumes are the instances of memory/pmem/volumes, regions those of regionStore/regions of a
// volume; both are read by name. Blocks are 2 MB and shown as they are, sizes arrive in bytes. Any
// failure ends the rows, but not the report.

#include <string_view>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/loss.h"
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "PERSISTENT MEMORY STATS",
    .ruleLength = 49,
    .options = "l:s:u:vq",
    .defaultLevels = 1,
    // sic: C43
    .levelCheck = LevelCheck::asSigned,
    .selectColumnsAt = SelectColumnsAt::beforeUnit,
};

constexpr uint32_t kRegionLevel = 2;

constexpr FlagName pmemFlagNames[] = {
    {0, "noFlags"},
    {KSI_PMEM_ALLOCATED, "allocated"},
    {KSI_PMEM_DELETING, "deleting"},
    {KSI_PMEM_LOCKED, "locked"},
    {KSI_PMEM_READ_ONLY, "readOnly"},
    {KSI_PMEM_BLOCK_DEVICE, "blockDev"},
    {KSI_PMEM_PERSISTENT_RESERVATION, "persistResv"},
    {KSI_PMEM_SYSTEM, "system"},
    {0, nullptr},
};

struct VolumeRow {
  std::string_view uuid;
  KSI_PmemRegionStore store;
  uint8_t isClean;
};

struct RegionRow {
  std::string_view uuid;
  std::string_view regionUuid;
  KSI_PmemRegion region;
  NameWriter flagNames;
};

constexpr Column<VolumeRow> kVolumeColumns[] = {
    Text("uuid", "Volume UUID", [](const VolumeRow& row) { return row.uuid; }).Key().Wide(40),
    Count("alloc2MBlocks", "Allocated 2M Blocks",
          [](const VolumeRow& row) { return row.store.alloc2MBlocks; }),
    Count("resvd2MBlocks", "Reserved 2M Blocks",
          [](const VolumeRow& row) { return row.store.resvd2MBlocks; }),
    Count("avail2MBlocks", "Available Reservable 2M Blocks",
          [](const VolumeRow& row) { return row.store.avail2MBlocks; }),
    Count("totalRegions", "Total regions in the region store",
          [](const VolumeRow& row) { return row.store.totalRegions; })
        .As("Lu"),
    Count("freeRegions", "Free regions in the region store",
          [](const VolumeRow& row) { return row.store.freeRegions; })
        .As("Lu"),
    Count("total2MBlocks", "Total 2M Blocks",
          [](const VolumeRow& row) { return row.store.total2MBlocks; }),
    Flag("isClean", "Is region store clean ?", [](const VolumeRow& row) { return row.isClean; })
        .Wide(4),
};
static_assert(IsSound(kVolumeColumns));

constexpr Column<RegionRow> kRegionColumns[] = {
    Text("uuid", "Volume UUID", [](const RegionRow& row) { return row.uuid; }).Key().Wide(40),
    Text("regionUuid", "Region UUID", [](const RegionRow& row) { return row.regionUuid; })
        .Key()
        .Wide(40),
    Bytes("size", "Region memory size", [](const RegionRow& row) { return row.region.size; })
        .Wide(14),
    Count("reserved", "Reserved 2M blocks",
          [](const RegionRow& row) { return row.region.reserved; }),
    Text("flags", "Flags", [](const RegionRow& row) { return row.flagNames.text(); }).Wide(40),
};
static_assert(IsSound(kRegionColumns));

constexpr ReportVariant kVariants[] = {
    {1, kColumnInfos<kVolumeColumns>},
    {kRegionLevel, kColumnInfos<kRegionColumns>},
};

// A volume's name as a row shows it.
std::string_view RowUuid(const char* volume) {
  constexpr size_t kUuidLength = 36;
  return std::string_view(volume).substr(0, kUuidLength);
}

// The list of a read with one name, or with a volume's and a region's.
KeyList VolumeKey(const char* volume) {
  return {.capacity = 2, .first = volume, .removeKeys = true};
}
KeyList RegionKeys(const char* volume, const char* region) {
  return {.capacity = 3, .first = volume, .second = region, .removeKeys = true};
}

constexpr ReaderTexts kVolumeTexts = {
    .create = {Style::plain, "PMemGetVolumeInfo: KSI_ParamListCreate failure"},
    .firstKey = {Style::plain, "PMemGetVolumeInfo: KSI_ParamListAddString failure"},
};
constexpr ReaderTexts kRegionStoreTexts = {
    .create = {Style::plain, "PMemGetRegionStoreInfo: KSI_ParamListCreate failure"},
    .firstKey = {Style::plain, "PMemGetRegionStoreInfo: KSI_ParamListAddString failure"},
};
// sic: C46
constexpr Complaint kNoVolumeName = {Style::plain,
                                     "PMemRegionStoreReport: KSI_ParamListGetString Failure"};
constexpr Complaint kNoVolume = {Style::plain, "PMemRegionStoreReport: PMemGetVolumeInfo failure"};
constexpr Complaint kNoRegionStore = {Style::plain,
                                      "PMemRegionStoreReport: PMemGetRegionStoreInfo failure"};
constexpr Complaint kNoRegionName = {Style::plain,
                                     "PMemRegionsReport: KSI_ParamListGetString failure"};
constexpr Complaint kNoRegion = {Style::plain, "PMemRegionsReport: GetRegionsInfo failure"};
constexpr Complaint kRegionStoreRead = {Style::plain, "PMemGetRegionStoreInfo: KSI_Get failure"};
constexpr ReaderTexts kRegionListTexts = {
    .create = {Style::plain, "PMemRegionsReport: KSI_ParamListCreate failure"},
    .firstKey = {Style::plain, "PMemRegionsReport: KSI_ParamListAddString failure"},
};
constexpr Complaint kRegionKey = {Style::plain, "GetRegionsInfo: KSI_ParamListAddString failure"};
constexpr ReaderTexts kRegionTexts = {
    .create = {Style::plain, "GetRegionsInfo: KSI_ParamListCreate failure"},
    .firstKey = kRegionKey,
    .secondKey = kRegionKey,
    .read = {Style::plain, "GetRegionsInfo: KSI_Get failure"},
};

// A volume's own record only tells that the volume is there.
Status PMemGetVolumeInfo(const char* volume) {
  KSI_PmemVolume record;
  return ReadRecord(KSI_NODE_memory_pmem_volumes_info, VolumeKey(volume), kVolumeTexts, record);
}

Status PMemGetRegionStoreInfo(const char* volume, VolumeRow& row) {
  return KeyedRead(VolumeKey(volume), kRegionStoreTexts, [&row](KSI_ParamList* list) {
    if (Status status = kRegionStoreRead.Of(KSI_Get(KSI_NODE_memory_pmem_volumes_regionStore_info,
                                                    list, &row.store, sizeof row.store))) {
      return status;
    }
    return KSI_Get(KSI_NODE_memory_pmem_volumes_regionStore_isClean, list, &row.isClean,
                   sizeof row.isClean);
  });
}

Status GetRegionsInfo(const char* volume, const char* region, KSI_PmemRegion& record) {
  return ReadRecord(KSI_NODE_memory_pmem_volumes_regionStore_regions_info,
                    RegionKeys(volume, region), kRegionTexts, record);
}

// Calls `print` with each volume of the host until it fails.
template <class Print>
void ForEachVolume(const Complaint& notFetched, Print print) {
  ParamList volumes;
  if (NoteLoss(ListInstances(KSI_NODE_memory_pmem_volumes, nullptr, volumes)) != kSuccess) return;
  // A failure has been told, and ends the rows.
  NoteLoss(ForEachName(volumes, notFetched, print));
}

void PMemRegionStoreReport(ReportContext<VolumeRow>& context) {
  ForEachVolume(kNoVolumeName, [&](const char* volume) {
    VolumeRow row = {.uuid = RowUuid(volume), .store = {}, .isClean = 0};
    if (Status status = kNoVolume.Of(PMemGetVolumeInfo(volume))) return status;
    if (Status status = kNoRegionStore.Of(PMemGetRegionStoreInfo(volume, row))) return status;
    context.PrintRow(row);
    return kSuccess;
  });
}

Status PrintRegion(const char* volume, const char* region, ReportContext<RegionRow>& context) {
  RegionRow row;
  row.uuid = RowUuid(volume);
  row.regionUuid = region;
  if (Status status = kNoRegion.Of(GetRegionsInfo(volume, region, row.region))) return status;
  row.flagNames = FormatFlagMask(row.region.flags, pmemFlagNames);
  context.PrintRow(row);
  return kSuccess;
}

void PMemRegionsReport(ReportContext<RegionRow>& context) {
  ForEachVolume(kNoRegionName, [&](const char* volume) {
    ParamList regions;
    if (Status status = ListInstances(KSI_NODE_memory_pmem_volumes_regionStore_regions,
                                      VolumeKey(volume), kRegionListTexts, regions)) {
      return status;
    }
    return ForEachName(regions, kNoRegionName,
                       [&](const char* region) { return PrintRegion(volume, region, context); });
  });
}

// Prints the report with the rows of `printRows`.
template <class Row>
Status RunVariant(std::span<const Column<Row>> columns, void (*printRows)(ReportContext<Row>&),
                  const ReportOptions& options, Sink& sink) {
  ReportContext<Row> context(kFrame, columns, sink);
  if (Status status = context.Settle(options)) return status;
  context.Begin();
  // sic: C44
  context.Rule();
  // sic: C45
  printRows(context);
  context.Rule();
  context.PrintDescriptions();
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  return options.levels == kRegionLevel
             ? RunVariant<RegionRow>(kRegionColumns, PMemRegionsReport, options, sink)
             : RunVariant<VolumeRow>(kVolumeColumns, PMemRegionStoreReport, options, sink);
}

}  // namespace

const Report pmemStats = {
    .name = "pmem-stats",
    .frame = &kFrame,
    .variants = kVariants,
    .run = Run,
    .entry = TallyPMemStats,
};

Status TallyPMemStats(int argc, char** argv) { return PrintReport(pmemStats, argc, argv); }

}  // namespace tally
