// pmem-stats: the host's persistent memory. At level 2 one row for each region of each volume, at
// any other level one row for each volume on its region store.
//
// Volumes are the instances of memory/pmem/volumes, regions those of regionStore/regions of a
// volume; both are read by name. Blocks are 2 MB and shown as they are, sizes arrive in bytes. Any
// failure ends the rows, but not the report.

#include <string_view>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
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

// Whole kilobytes are shifted on, so that even bytes come rounded down to them.
uint64_t FromRegionBytes(uint64_t bytes, DisplayUnit unit) {
  return ShiftKilobytes(bytes >> 10, unit);
}

constexpr Column<VolumeRow> kVolumeColumns[] = {
    {"uuid", "Volume UUID", 40, "s", kSum, nullptr,
     [](const VolumeRow& row) -> Cell { return row.uuid; }},
    {"alloc2MBlocks", "Allocated 2M Blocks", 10, "Lu", kBlank, nullptr,
     [](const VolumeRow& row) -> Cell { return row.store.alloc2MBlocks; }},
    {"resvd2MBlocks", "Reserved 2M Blocks", 10, "Lu", kBlank, nullptr,
     [](const VolumeRow& row) -> Cell { return row.store.resvd2MBlocks; }},
    {"avail2MBlocks", "Available Reservable 2M Blocks", 10, "Lu", kSum, nullptr,
     [](const VolumeRow& row) -> Cell { return row.store.avail2MBlocks; }},
    {"totalRegions", "Total regions in the region store", 10, "Lu", kSum, nullptr,
     [](const VolumeRow& row) -> Cell { return row.store.totalRegions; }},
    {"freeRegions", "Free regions in the region store", 10, "Lu", kSum, nullptr,
     [](const VolumeRow& row) -> Cell { return row.store.freeRegions; }},
    {"total2MBlocks", "Total 2M Blocks", 10, "Lu", kSum, nullptr,
     [](const VolumeRow& row) -> Cell { return row.store.total2MBlocks; }},
    {"isClean", "Is region store clean ?", 4, "c", kSum, nullptr,
     [](const VolumeRow& row) -> Cell { return row.isClean != 0 ? 'y' : 'n'; }},
};

constexpr Column<RegionRow> kRegionColumns[] = {
    {"uuid", "Volume UUID", 40, "s", kSum, nullptr,
     [](const RegionRow& row) -> Cell { return row.uuid; }},
    {"regionUuid", "Region UUID", 40, "s", kSum, nullptr,
     [](const RegionRow& row) -> Cell { return row.regionUuid; }},
    {"size", "Region memory size", 14, "Lu", kSum, FromRegionBytes,
     [](const RegionRow& row) -> Cell { return row.region.size; }},
    {"reserved", "Reserved 2M blocks", 10, "Lu", kSum, nullptr,
     [](const RegionRow& row) -> Cell { return row.region.reserved; }},
    {"flags", "Flags", 40, "s", kSum, nullptr,
     [](const RegionRow& row) -> Cell { return row.flagNames.text(); }},
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

// The words of a reader: for what failed before the library was asked to read and, with
// `readFailure`, for the read itself.
auto WordsOf(const char* reader, const char* readFailure = nullptr) {
  return [reader, readFailure](ReadStep step, Status) {
    if (step == ReadStep::create) {
      Warning("%s: KSI_ParamListCreate failure\n", reader);
    } else if (step != ReadStep::read) {
      Warning("%s: KSI_ParamListAddString failure\n", reader);
    } else if (readFailure != nullptr) {
      Warning("%s: %s\n", reader, readFailure);
    }
  };
}

// A volume's own record only tells that the volume is there.
Status PMemGetVolumeInfo(const char* volume) {
  KSI_PmemVolume record;
  return KeyedGet(KSI_NODE_memory_pmem_volumes_info, VolumeKey(volume), record,
                  WordsOf("PMemGetVolumeInfo"));
}

Status PMemGetRegionStoreInfo(const char* volume, VolumeRow& row) {
  constexpr const char* kReader = "PMemGetRegionStoreInfo";
  const auto read = [&row](KSI_ParamList* list) {
    if (Status status = KSI_Get(KSI_NODE_memory_pmem_volumes_regionStore_info, list, &row.store,
                                sizeof row.store)) {
      Warning("%s: KSI_Get failure\n", kReader);
      return status;
    }
    return KSI_Get(KSI_NODE_memory_pmem_volumes_regionStore_isClean, list, &row.isClean,
                   sizeof row.isClean);
  };
  return KeyedRead(VolumeKey(volume), read, WordsOf(kReader));
}

Status GetRegionsInfo(const char* volume, const char* region, KSI_PmemRegion& record) {
  return KeyedGet(KSI_NODE_memory_pmem_volumes_regionStore_regions_info, RegionKeys(volume, region),
                  record, WordsOf("GetRegionsInfo", "KSI_Get failure"));
}

// Calls `print` with each name of a list until it fails; `failure` words a name that cannot be
// fetched. False when not all were printed.
template <class Print>
bool ForEachName(const ParamList& names, const char* failure, Print print) {
  const uint32_t count = KSI_ParamListUsedCount(names.get());
  for (uint32_t i = 0; i < count; ++i) {
    const char* name = nullptr;
    if (KSI_ParamListGetString(names.get(), i, &name) != kSuccess) {
      Warning("%s", failure);
      return false;
    }
    if (!print(name)) return false;
  }
  return true;
}

// The same for the volumes of the host.
template <class Print>
void ForEachVolume(const char* failure, Print print) {
  ParamList volumes;
  if (ListInstances(KSI_NODE_memory_pmem_volumes, nullptr, volumes) != kSuccess) return;
  ForEachName(volumes, failure, print);
}

void PMemRegionStoreReport(ReportContext<VolumeRow>& context) {
  ForEachVolume("PMemRegionStoreReport: KSI_ParamListGetString Failure\n", [&](const char* volume) {
    VolumeRow row = {.uuid = RowUuid(volume), .store = {}, .isClean = 0};
    if (PMemGetVolumeInfo(volume) != kSuccess) {
      Warning("PMemRegionStoreReport: PMemGetVolumeInfo failure\n");
      return false;
    }
    if (PMemGetRegionStoreInfo(volume, row) != kSuccess) {
      Warning("PMemRegionStoreReport: PMemGetRegionStoreInfo failure\n");
      return false;
    }
    context.PrintRow(row);
    return true;
  });
}

bool PrintRegion(const char* volume, const char* region, ReportContext<RegionRow>& context) {
  RegionRow row;
  row.uuid = RowUuid(volume);
  row.regionUuid = region;
  if (GetRegionsInfo(volume, region, row.region) != kSuccess) {
    Warning("PMemRegionsReport: GetRegionsInfo failure\n");
    return false;
  }
  row.flagNames = FormatFlagMask(row.region.flags, pmemFlagNames);
  context.PrintRow(row);
  return true;
}

void PMemRegionsReport(ReportContext<RegionRow>& context) {
  constexpr char kNameFailure[] = "PMemRegionsReport: KSI_ParamListGetString failure\n";
  ForEachVolume(kNameFailure, [&](const char* volume) {
    ParamList regions;
    if (KeyedList(KSI_NODE_memory_pmem_volumes_regionStore_regions, VolumeKey(volume), regions,
                  WordsOf("PMemRegionsReport")) != kSuccess) {
      return false;
    }
    return ForEachName(regions, kNameFailure,
                       [&](const char* region) { return PrintRegion(volume, region, context); });
  });
}

// Prints the report with the rows of `printRows`.
template <class Row>
Status Report(std::span<const Column<Row>> columns, void (*printRows)(ReportContext<Row>&),
              const ReportOptions& options) {
  ReportContext<Row> context(kFrame, columns);
  if (Status status = context.Begin(options)) return status;
  context.PrintTitleBlock();
  context.PrintHead();
  context.PrintDashes();
  printRows(context);
  context.PrintDashes();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace

Status TallyPMemStats(int argc, char** argv) {
  ReportOptions options;
  if (Status status = ParseReportOptions(kFrame, argc, argv, options)) return status;
  return options.levels == kRegionLevel
             ? Report<RegionRow>(kRegionColumns, PMemRegionsReport, options)
             : Report<VolumeRow>(kVolumeColumns, PMemRegionStoreReport, options);
}

}  // namespace tally
