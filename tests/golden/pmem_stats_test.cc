// pmem-stats.
#include <gtest/gtest.h>

#include <string>

#include "tests/harness/lines.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kVolumes[] = "memory_pmem_volumes";
constexpr char kVolume[] = "memory_pmem_volumes_info";
constexpr char kStore[] = "memory_pmem_volumes_regionStore_info";
constexpr char kIsClean[] = "memory_pmem_volumes_regionStore_isClean";
constexpr char kRegions[] = "memory_pmem_volumes_regionStore_regions";
constexpr char kRegion[] = "memory_pmem_volumes_regionStore_regions_info";

// Two volumes: one called as they usually are, by 36 characters, and one by a short name.
constexpr char kA[] = "01234567-89ab-cdef-0123-456789abcdef";
constexpr char kB[] = "pmem-b";

// Figures from `first` + 1 to `first` + 6 in the order of the columns.
RawRecord Store(uint32_t first) {
  return RawRecord(40)
      .U64(0, first + 1)    // alloc2MBlocks
      .U64(8, first + 2)    // resvd2MBlocks
      .U64(16, first + 3)   // avail2MBlocks
      .U32(24, first + 4)   // totalRegions
      .U32(28, first + 5)   // freeRegions
      .U64(32, first + 6);  // total2MBlocks
}

RawRecord Region(uint64_t bytes, uint64_t reserved, uint32_t flags) {
  return RawRecord(60).U64(37, bytes).U64(45, reserved).U32(53, flags);
}

void AddVolume(Scenario& scenario, const char* name, const RawRecord& store, uint8_t isClean) {
  scenario.Bytes(kVolume, {name}, RawRecord(40))
      .Bytes(kStore, {name}, store)
      .Value(kIsClean, {name}, isClean);
}

Scenario Host() {
  Scenario scenario;
  scenario.List(kVolumes, {}, {kA, kB});
  AddVolume(scenario, kA, Store(1000), 1);
  AddVolume(scenario, kB, Store(2000), 0);
  scenario.List(kRegions, {kA}, {"region-1", "fedcba98-7654-3210-fedc-ba9876543210"})
      .Bytes(kRegion, {kA, "region-1"}, Region(3145727, 1, 0x21))
      .Bytes(kRegion, {kA, "fedcba98-7654-3210-fedc-ba9876543210"}, Region(5000003071, 2384, 0x7f))
      .List(kRegions, {kB}, {"region-1"})
      .Bytes(kRegion, {kB, "region-1"}, Region(1099511627777, 524288, 0));
  return scenario;
}

// A host with one volume and one region.
Scenario OneRegion(const RawRecord& region) {
  return Scenario()
      .List(kVolumes, {}, {"v"})
      .List(kRegions, {"v"}, {"r"})
      .Bytes(kRegion, {"v", "r"}, region);
}

TallyRun PmemStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "pmem-stats"});
  return RunTally(scenario, args);
}

// The rows in CSV.
std::string Cells(const Scenario& scenario, const std::string& columns, const Args& args = {}) {
  Args all = {"-q", "-s", columns};
  all.insert(all.end(), args.begin(), args.end());
  const TallyRun run = PmemStats(scenario, all);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
  return Rows(run.out);
}

std::string Title(const std::string& levels, const std::string& unit,
                  const std::string& columns = "(all)") {
  return "\n PERSISTENT MEMORY STATS: Sat Nov 21 10:00:00 2026\n"
         " -------------------------------------------------\n"
         "   No. of levels    : " +
         levels + "\n   Unit             : " + unit + "\n   Selected columns : " + columns + "\n\n";
}

// clang-format off
constexpr char kVolumeHeader[] =
    "                                    uuid alloc2MBlocks resvd2MBlocks avail2MBlocks totalRegions freeRegions total2MBlocks isClean\n";
constexpr char kVolumeRows[] =
    "    01234567-89ab-cdef-0123-456789abcdef          1001          1002          1003         1004        1005          1006       y\n"
    "                                  pmem-b          2001          2002          2003         2004        2005          2006       n\n";
constexpr char kRegionHeader[] =
    "                                    uuid                               regionUuid           size   reserved                                    flags\n";
constexpr char kRegionRows[] =
    "    01234567-89ab-cdef-0123-456789abcdef                                 region-1           3071          1                    allocated:persistResv\n"
    "    01234567-89ab-cdef-0123-456789abcdef     fedcba98-7654-3210-fedc-ba9876543210        4882815       2384 allocated:deleting:locked:readOnly:blockDev:persistResv:system\n"
    "                                  pmem-b                                 region-1     1073741824     524288                                   (none)\n";
// clang-format on
constexpr char kVolumeDescriptions[] =
    "Description of report header labels:\n"
    "                uuid: Volume UUID\n"
    "       alloc2MBlocks: Allocated 2M Blocks\n"
    "       resvd2MBlocks: Reserved 2M Blocks\n"
    "       avail2MBlocks: Available Reservable 2M Blocks\n"
    "        totalRegions: Total regions in the region store\n"
    "         freeRegions: Free regions in the region store\n"
    "       total2MBlocks: Total 2M Blocks\n"
    "             isClean: Is region store clean ?\n";
constexpr char kRegionDescriptions[] =
    "Description of report header labels:\n"
    "                uuid: Volume UUID\n"
    "          regionUuid: Region UUID\n"
    "                size: Region memory size\n"
    "            reserved: Reserved 2M blocks\n"
    "               flags: Flags\n";

// Two lines of dashes stand below the header.
std::string VolumeTable(const std::string& rows) {
  return Dashes(129) + kVolumeHeader + Dashes(129) + Dashes(129) + rows + Dashes(129);
}
std::string RegionTable(const std::string& rows) {
  return Dashes(148) + kRegionHeader + Dashes(148) + Dashes(148) + rows + Dashes(148);
}

TEST(PmemStats, PrintsVolumes) {
  const TallyRun run = PmemStats(Host());
  EXPECT_EQ(run.out, Title("1", "KB") + VolumeTable(kVolumeRows));
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(PmemStats, PrintsRegions) {
  for (const Args& args : {Args{"-l", "2"}, Args{"--level", "2"}}) {
    const TallyRun run = PmemStats(Host(), args);
    EXPECT_EQ(run.out, Title("2", "KB") + RegionTable(kRegionRows));
    EXPECT_EQ(run.err, "");
    EXPECT_EQ(run.status, 0);
  }
}

TEST(PmemStats, ReadsVolumesInOrder) {
  const Scenario host = Host().List(kVolumes, {}, {kB, kB});
  const std::string volume =
      "Create(1,2) AddString('pmem-b') Get(memory_pmem_volumes_info,['pmem-b']) RemoveLast() "
      "Destroy() "
      "Create(1,2) AddString('pmem-b') Get(memory_pmem_volumes_regionStore_info,['pmem-b']) "
      "Get(memory_pmem_volumes_regionStore_isClean,['pmem-b']) RemoveLast() Destroy() ";
  EXPECT_EQ(PmemStats(host).Calls(),
            "CheckSig() GetInstanceListAlloc(memory_pmem_volumes) "
            "UsedCount(memory_pmem_volumes,[]) GetString(memory_pmem_volumes,[],0) " +
                volume + "GetString(memory_pmem_volumes,[],1) " + volume +
                "Destroy(memory_pmem_volumes,[])");
}

TEST(PmemStats, ReadsRegionsInOrder) {
  Scenario host = OneRegion(Region(0, 0, 0));
  host.List(kRegions, {"v"}, {"r", "s"}).Bytes(kRegion, {"v", "s"}, Region(0, 0, 0));
  EXPECT_EQ(PmemStats(host, {"-l", "2"}).Calls(),
            "CheckSig() GetInstanceListAlloc(memory_pmem_volumes) "
            "UsedCount(memory_pmem_volumes,[]) GetString(memory_pmem_volumes,[],0) "
            "Create(1,2) AddString('v') "
            "GetInstanceListAlloc(memory_pmem_volumes_regionStore_regions,['v']) RemoveLast() "
            "Destroy() "
            "UsedCount(memory_pmem_volumes_regionStore_regions,['v']) "
            "GetString(memory_pmem_volumes_regionStore_regions,['v'],0) "
            "Create(1,3) AddString('v') AddString('r') "
            "Get(memory_pmem_volumes_regionStore_regions_info,['v','r']) RemoveLast() "
            "RemoveLast() Destroy() "
            "GetString(memory_pmem_volumes_regionStore_regions,['v'],1) "
            "Create(1,3) AddString('v') AddString('s') "
            "Get(memory_pmem_volumes_regionStore_regions_info,['v','s']) RemoveLast() "
            "RemoveLast() Destroy() "
            "Destroy(memory_pmem_volumes_regionStore_regions,['v']) "
            "Destroy(memory_pmem_volumes,[])");
}

TEST(PmemStats, TakesALevel) {
  const struct {
    const char* argument;
    const char* shown;
    const char* warnings;
  } levels[] = {
      {"1", "1", ""},
      {"2", "2", ""},
      {"+2", "2", ""},
      {" 2nd", "2", ""},
      {"3", "3", ""},
      {"11", "11", ""},
      {"12", "12", ""},
      {"13", "12", "Specified level 13 too high, reseting to 12\n"},
      {"2147483647", "12", "Specified level 2147483647 too high, reseting to 12\n"},
      {"-5", "4294967291", ""},
      {"-1", "4294967295", ""},
      {"-2", "4294967294", ""},
      {"-2147483648", "2147483648", ""},
      // Levels have 32 bits.
      {"2147483648", "2147483648", ""},
      {"4294967295", "4294967295", ""},
      {"4294967298", "2", ""},
  };
  for (const auto& [argument, shown, warnings] : levels) {
    const TallyRun run = PmemStats(Host(), {"-l", argument});
    EXPECT_EQ(run.out, Title(shown, "KB") + (std::string(shown) == "2" ? RegionTable(kRegionRows)
                                                                       : VolumeTable(kVolumeRows)));
    EXPECT_EQ(run.err, warnings);
    EXPECT_EQ(run.status, 0);
  }
}

TEST(PmemStats, RefusesLevelZero) {
  for (const char* argument : {"0", "-0", "abc", "", "0x2", "4294967296"}) {
    const TallyRun run = PmemStats(Host(), {"-v", "-l", argument, "-u", "gb"});
    EXPECT_EQ(run.out, "") << argument;
    EXPECT_EQ(run.err, "Invalid level " + std::string(argument) + ", must be > 0\n");
    EXPECT_EQ(run.status, 1) << argument;
    EXPECT_EQ(run.Calls(), "CheckSig()") << argument;
  }
}

TEST(PmemStats, TakesTheLastLevel) {
  const TallyRun run = PmemStats(Host(), {"-l", "2", "-l", "14", "-l", "7"});
  EXPECT_EQ(run.out, Title("7", "KB") + VolumeTable(kVolumeRows));
  EXPECT_EQ(run.err, "Specified level 14 too high, reseting to 12\n");
}

TEST(PmemStats, ShowsUnits) {
  const std::string names[] = {std::string(kA) + ",region-1,",
                               std::string(kA) + ",fedcba98-7654-3210-fedc-ba9876543210,",
                               "pmem-b,region-1,"};
  const struct {
    const char* word;
    const char* title;
    const char* sizes[3];
  } units[] = {{"kb", "KB", {"3071", "4882815", "1073741824"}},
               {"KB", "KB", {"3071", "4882815", "1073741824"}},
               {"pg", "Page (4K)", {"767", "1220703", "268435456"}},
               {"Pg", "Page (4K)", {"767", "1220703", "268435456"}},
               {"mb", "MB", {"2", "4768", "1048576"}}};
  for (const auto& [word, title, sizes] : units) {
    EXPECT_EQ(PmemStats(Host(), {"-u", word}).out, Title("1", title) + VolumeTable(kVolumeRows));
    EXPECT_TRUE(PmemStats(Host(), {"-l2", "--unit", word}).out.starts_with(Title("2", title)));
    std::string rows;
    for (size_t i = 0; i < 3; ++i) rows += names[i] + sizes[i] + "\n";
    EXPECT_EQ(Cells(Host(), "uuid:regionUuid:size", {"-l2", "-u", word}), rows);
  }
}

TEST(PmemStats, RefusesOtherUnits) {
  for (const char* level : {"1", "2"}) {
    for (const char* word : {"b", "B", "gb", ""}) {
      const TallyRun run = PmemStats(Host(), {"-v", "-l", level, "-u", word});
      EXPECT_EQ(run.out, "") << word;
      EXPECT_EQ(run.err, "Invalid unit specified. Choose from {mb, kb, pg}\n") << word;
      EXPECT_EQ(run.status, 1) << word;
      EXPECT_EQ(run.Calls(), "CheckSig()") << word;
    }
  }
  EXPECT_EQ(PmemStats(Host(), {"-u", "gb", "-l", "99"}).err,
            "Specified level 99 too high, reseting to 12\n"
            "Invalid unit specified. Choose from {mb, kb, pg}\n");
}

TEST(PmemStats, ConvertsSizesOfRegions) {
  const struct {
    uint64_t bytes;
    const char* kilobytes;
    const char* pages;
    const char* megabytes;
  } sizes[] = {{0, "0", "0", "0"},
               {1023, "0", "0", "0"},
               {1024, "1", "0", "0"},
               {4095, "3", "0", "0"},
               {4096, "4", "1", "0"},
               {1048575, "1023", "255", "0"},
               {1048576, "1024", "256", "1"},
               {kAllOnes, "18014398509481983", "4503599627370495", "17592186044415"}};
  for (const auto& [bytes, kilobytes, pages, megabytes] : sizes) {
    const Scenario host = OneRegion(Region(bytes, kAllOnes, 0));
    const std::string end = ",18446744073709551615\n";
    EXPECT_EQ(Cells(host, "size:reserved", {"-l2"}), kilobytes + end);
    EXPECT_EQ(Cells(host, "size:reserved", {"-l2", "-u", "pg"}), pages + end);
    EXPECT_EQ(Cells(host, "size:reserved", {"-l2", "-u", "mb"}), megabytes + end);
  }
}

TEST(PmemStats, NamesFlags) {
  const struct {
    uint32_t flags;
    const char* names;
  } cells[] = {{0, "(none)\n"},
               {0x1, "allocated\n"},
               {0x2, "deleting\n"},
               {0x4, "locked\n"},
               {0x8, "readOnly\n"},
               {0x10, "blockDev\n"},
               {0x20, "persistResv\n"},
               {0x40, "system\n"},
               {0x21, "allocated:persistResv\n"},
               {0x46, "deleting:locked:system\n"},
               {0x7f, "allocated:deleting:locked:readOnly:blockDev:persistResv:system\n"},
               {UINT32_MAX, "allocated:deleting:locked:readOnly:blockDev:persistResv:system\n"},
               {0x80, "(none)\n"},
               {0xffffff80, "(none)\n"}};
  for (const auto& [flags, names] : cells) {
    EXPECT_EQ(Cells(OneRegion(Region(0, 0, flags)), "flags", {"-l", "2"}), names);
  }
}

TEST(PmemStats, TellsCleanStores) {
  for (const int flag : {0, 1, 2, 128, 255}) {
    Scenario host = Scenario().List(kVolumes, {}, {"v"});
    AddVolume(host, "v", Store(0), static_cast<uint8_t>(flag));
    EXPECT_EQ(Cells(host, "isClean"), flag == 0 ? "n\n" : "y\n");
  }
}

TEST(PmemStats, ShowsAllOnes) {
  const RawRecord store = RawRecord(40).U64({0, 8, 16, 32}, kAllOnes).U32({24, 28}, UINT32_MAX);
  Scenario host = Scenario().List(kVolumes, {}, {"v"});
  AddVolume(host, "v", store, 1);
  for (const char* unit : {"kb", "pg", "mb"}) {
    EXPECT_EQ(Rows(PmemStats(host, {"-q", "-u", unit}).out),
              "v,18446744073709551615,18446744073709551615,18446744073709551615,4294967295,"
              "4294967295,18446744073709551615,y\n");
  }
}

// A row has 36 characters of a volume's name, a key has all of them.
TEST(PmemStats, CutsNamesOfVolumesInRowsOnly) {
  const std::string name = std::string(kA) + "X and a name that goes on and on";
  const std::string region(60, 'r');
  Scenario host = Scenario().List(kVolumes, {}, {name, kA, ""});
  AddVolume(host, name.c_str(), Store(10), 1);
  AddVolume(host, kA, Store(20), 0);
  AddVolume(host, "", Store(30), 0);
  host.List(kRegions, {name}, {region}).Bytes(kRegion, {name, region}, Region(1024, 2, 4));
  host.List(kRegions, {kA}, {}).List(kRegions, {""}, {});
  EXPECT_EQ(Cells(host, "uuid:alloc2MBlocks"), std::string(kA) + ",11\n" + kA + ",21\n,31\n");
  EXPECT_EQ(Cells(host, "uuid:regionUuid:size", {"-l", "2"}),
            std::string(kA) + "," + region + ",1\n");
}

TEST(PmemStats, RealignsAfterAWideName) {
  const std::string region(45, 'r');
  const Scenario host = Scenario()
                            .List(kVolumes, {}, {kA})
                            .List(kRegions, {kA}, {region})
                            .Bytes(kRegion, {kA, region}, Region(9216, 1, 0x21));
  EXPECT_EQ(PmemStats(host, {"-l", "2"}).out,
            Title("2", "KB") + RegionTable("    " + std::string(kA) + " " + region +
                                           "         9          1"
                                           "                    allocated:persistResv\n"));
}

TEST(PmemStats, PrintsAnEmptyReport) {
  const Scenario host = Scenario().List(kVolumes, {}, {});
  for (const Args& args : {Args{}, Args{"-v"}}) {
    const bool verbose = !args.empty();
    EXPECT_EQ(PmemStats(host, args).out,
              Title("1", "KB") + VolumeTable("") + (verbose ? kVolumeDescriptions : ""));
  }
  EXPECT_EQ(PmemStats(host, {"-l", "2"}).out, Title("2", "KB") + RegionTable(""));
  EXPECT_EQ(PmemStats(host, {"-l", "2", "-q"}).out, "uuid,regionUuid,size,reserved,flags\n");
  EXPECT_EQ(PmemStats(host, {"-l", "2"}).status, 0);
}

TEST(PmemStats, PassesOverVolumesWithoutRegions) {
  Scenario host = Host();
  host.List(kRegions, {kA}, {});
  EXPECT_EQ(Cells(host, "uuid:regionUuid", {"-l", "2"}), "pmem-b,region-1\n");
}

TEST(PmemStats, PrintsCsv) {
  for (const char* option : {"-q", "--csvMode"}) {
    EXPECT_EQ(PmemStats(Host(), {option}).out,
              "uuid,alloc2MBlocks,resvd2MBlocks,avail2MBlocks,totalRegions,freeRegions,"
              "total2MBlocks,isClean\n"
              "01234567-89ab-cdef-0123-456789abcdef,1001,1002,1003,1004,1005,1006,y\n"
              "pmem-b,2001,2002,2003,2004,2005,2006,n\n");
    EXPECT_EQ(PmemStats(Host(), {option, "-l", "2"}).out,
              "uuid,regionUuid,size,reserved,flags\n"
              "01234567-89ab-cdef-0123-456789abcdef,region-1,3071,1,allocated:persistResv\n"
              "01234567-89ab-cdef-0123-456789abcdef,fedcba98-7654-3210-fedc-ba9876543210,4882815,"
              "2384,allocated:deleting:locked:readOnly:blockDev:persistResv:system\n"
              "pmem-b,region-1,1073741824,524288,(none)\n");
  }
}

TEST(PmemStats, ShowsSelectedColumns) {
  for (const char* option : {"-s", "--cSelect"}) {
    EXPECT_EQ(PmemStats(Host(), {option, "isclean:FREEREGIONS"}).out,
              Title("1", "KB", "freeRegions:isClean") +
                  "-------------------\n"
                  "freeRegions isClean\n"
                  "-------------------\n"
                  "-------------------\n"
                  "       1005       y\n"
                  "       2005       n\n"
                  "-------------------\n");
    EXPECT_EQ(PmemStats(Host(), {option, "flags:size:isClean", "-q", "-l2"}).out,
              "size,flags\n3071,allocated:persistResv\n"
              "4882815,allocated:deleting:locked:readOnly:blockDev:persistResv:system\n"
              "1073741824,(none)\n");
  }
}

// A level's columns are its own.
TEST(PmemStats, HidesEveryColumn) {
  EXPECT_EQ(PmemStats(Host(), {"-s", "size:flags"}).out,
            Title("1", "KB", "(none)") + "\n\n\n\n\n\n\n");
  EXPECT_EQ(PmemStats(Host(), {"-q", "-l2", "-s", "isClean"}).out, "\n\n\n\n");
}

TEST(PmemStats, DescribesTheColumns) {
  for (const char* option : {"-v", "--verbose"}) {
    EXPECT_EQ(PmemStats(Host(), {option}).out,
              Title("1", "KB") + VolumeTable(kVolumeRows) + kVolumeDescriptions);
    EXPECT_EQ(PmemStats(Host(), {option, "-l", "2"}).out,
              Title("2", "KB") + RegionTable(kRegionRows) + kRegionDescriptions);
    EXPECT_EQ(PmemStats(Host(), {option, "-q", "-s", "isClean"}).out,
              "isClean\ny\nn\nDescription of report header labels:\n"
              "             isClean: Is region store clean ?\n");
  }
}

TEST(PmemStats, PassesOverUnknownOptions) {
  const TallyRun run =
      PmemStats(Host(), {"-x", "-g", "5", "--tags", "--eFilter", "bogus", "-q", "-s", "isClean"});
  EXPECT_EQ(run.out, "isClean\ny\nn\n");
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

// Failures end the rows; the rest of the report follows, and it succeeds.
void ExpectVolumes(const Scenario& scenario, const std::string& rows, const std::string& warnings) {
  const TallyRun run = PmemStats(scenario, {"-v", "-s", "alloc2MBlocks:isClean"});
  EXPECT_EQ(run.out, Title("1", "KB", "alloc2MBlocks:isClean") +
                         "---------------------\n"
                         "alloc2MBlocks isClean\n"
                         "---------------------\n"
                         "---------------------\n" +
                         rows +
                         "---------------------\n"
                         "Description of report header labels:\n"
                         "       alloc2MBlocks: Allocated 2M Blocks\n"
                         "             isClean: Is region store clean ?\n");
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, 0);
}
constexpr char kFirstVolume[] = "         1001       y\n";

TEST(PmemStatsVolumeFailure, OfTheVolumes) {
  const Scenario host = Host().Fails(kVolumes, {}, 0xbad0003);
  ExpectVolumes(host, "", "");
  EXPECT_EQ(PmemStats(host).Calls(),
            "CheckSig() GetInstanceListAlloc(memory_pmem_volumes)=0xbad0003");
}

TEST(PmemStatsVolumeFailure, OfAName) {
  const Item bad = Item::Unreadable(0xbad0003);
  const std::string warnings = "PMemRegionStoreReport: KSI_ParamListGetString Failure\n";
  ExpectVolumes(Host().List(kVolumes, {}, {kA, bad, kB}), kFirstVolume, warnings);
  ExpectVolumes(Host().List(kVolumes, {}, {bad, kA}), "", warnings);
  ExpectVolumes(Host().List(kVolumes, {}, {kA, 5}), kFirstVolume, warnings);
}

TEST(PmemStatsVolumeFailure, OfTheVolumesRecord) {
  const std::string warnings = "PMemRegionStoreReport: PMemGetVolumeInfo failure\n";
  ExpectVolumes(Host().FailCall("Create", 3, 0xbad0014), kFirstVolume,
                "PMemGetVolumeInfo: KSI_ParamListCreate failure\n" + warnings);
  ExpectVolumes(Host().FailCall("AddString", 3, 0xbad00b4), kFirstVolume,
                "PMemGetVolumeInfo: KSI_ParamListAddString failure\n" + warnings);
  ExpectVolumes(Host().Fails(kVolume, {kB}, 0xbad0003), kFirstVolume, warnings);
  const Scenario host = Host().Fails(kVolume, {kA}, 0xbad0017);
  ExpectVolumes(host, "", warnings);
  EXPECT_TRUE(PmemStats(host).Calls().ends_with(
      "=0xbad0017 RemoveLast() Destroy() Destroy(memory_pmem_volumes,[])"));
}

TEST(PmemStatsVolumeFailure, OfTheRegionStore) {
  const std::string warnings = "PMemRegionStoreReport: PMemGetRegionStoreInfo failure\n";
  ExpectVolumes(Host().FailCall("Create", 4, 0xbad0014), kFirstVolume,
                "PMemGetRegionStoreInfo: KSI_ParamListCreate failure\n" + warnings);
  ExpectVolumes(Host().FailCall("AddString", 4, 0xbad00b4), kFirstVolume,
                "PMemGetRegionStoreInfo: KSI_ParamListAddString failure\n" + warnings);
  const Scenario host = Host().Fails(kStore, {kB}, 0xbad0003);
  ExpectVolumes(host, kFirstVolume, "PMemGetRegionStoreInfo: KSI_Get failure\n" + warnings);
  EXPECT_TRUE(PmemStats(host).Calls().ends_with(
      "Get(memory_pmem_volumes_regionStore_info,['pmem-b'])=0xbad0003 RemoveLast() Destroy() "
      "Destroy(memory_pmem_volumes,[])"));
}

TEST(PmemStatsVolumeFailure, OfTheCleanFlag) {
  const Scenario host = Host().Fails(kIsClean, {kB}, 0xbad0003);
  ExpectVolumes(host, kFirstVolume, "PMemRegionStoreReport: PMemGetRegionStoreInfo failure\n");
  EXPECT_TRUE(PmemStats(host).Calls().ends_with(
      "Get(memory_pmem_volumes_regionStore_isClean,['pmem-b'])=0xbad0003 RemoveLast() Destroy() "
      "Destroy(memory_pmem_volumes,[])"));
}

// The same at the level of regions: Host() has two regions in the first volume and one in the
// second.
void ExpectRegions(const Scenario& scenario, const std::string& rows, const std::string& warnings) {
  const TallyRun run = PmemStats(scenario, {"-v", "-l", "2", "-s", "size:reserved"});
  EXPECT_EQ(run.out, Title("2", "KB", "size:reserved") +
                         "-------------------------\n"
                         "          size   reserved\n"
                         "-------------------------\n"
                         "-------------------------\n" +
                         rows +
                         "-------------------------\n"
                         "Description of report header labels:\n"
                         "                size: Region memory size\n"
                         "            reserved: Reserved 2M blocks\n");
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, 0);
}
constexpr char kFirstRegion[] = "          3071          1\n";
constexpr char kTwoRegions[] =
    "          3071          1\n"
    "       4882815       2384\n";

TEST(PmemStatsRegionFailure, OfTheVolumes) {
  ExpectRegions(Host().Fails(kVolumes, {}, 0xbad0003), "", "");
}

TEST(PmemStatsRegionFailure, OfAName) {
  const Item bad = Item::Unreadable(0xbad0003);
  const std::string warnings = "PMemRegionsReport: KSI_ParamListGetString failure\n";
  ExpectRegions(Host().List(kVolumes, {}, {kA, bad, kB}), kTwoRegions, warnings);
  ExpectRegions(Host().List(kVolumes, {}, {bad, kA}), "", warnings);
  const Scenario host = Host().List(kRegions, {kA}, {"region-1", bad});
  ExpectRegions(host, kFirstRegion, warnings);
  EXPECT_TRUE(
      PmemStats(host, {"-l", "2"})
          .Calls()
          .ends_with("GetString(memory_pmem_volumes_regionStore_regions,"
                     "['01234567-89ab-cdef-0123-456789abcdef'],1)=0xbad0003 "
                     "Destroy(memory_pmem_volumes_regionStore_regions,"
                     "['01234567-89ab-cdef-0123-456789abcdef']) Destroy(memory_pmem_volumes,[])"));
}

TEST(PmemStatsRegionFailure, OfAListOfRegions) {
  ExpectRegions(Host().FailCall("Create", 4, 0xbad0014), kTwoRegions,
                "PMemRegionsReport: KSI_ParamListCreate failure\n");
  ExpectRegions(Host().FailCall("AddString", 6, 0xbad00b4), kTwoRegions,
                "PMemRegionsReport: KSI_ParamListAddString failure\n");
  ExpectRegions(Host().Fails(kRegions, {kB}, 0xbad0003), kTwoRegions, "");
  ExpectRegions(Host().Fails(kRegions, {kA}, 0xbad0003), "", "");
}

TEST(PmemStatsRegionFailure, OfARegion) {
  const std::string warnings = "PMemRegionsReport: GetRegionsInfo failure\n";
  ExpectRegions(Host().FailCall("Create", 3, 0xbad0014), kFirstRegion,
                "GetRegionsInfo: KSI_ParamListCreate failure\n" + warnings);
  for (const int key : {4, 5}) {
    ExpectRegions(Host().FailCall("AddString", key, 0xbad00b4), kFirstRegion,
                  "GetRegionsInfo: KSI_ParamListAddString failure\n" + warnings);
  }
  const Scenario host = Host().Fails(kRegion, {kA, "region-1"}, 0xbad0003);
  ExpectRegions(host, "", "GetRegionsInfo: KSI_Get failure\n" + warnings);
  EXPECT_NE(PmemStats(host, {"-l", "2"})
                .Calls()
                .find("=0xbad0003 RemoveLast() RemoveLast() Destroy() "
                      "Destroy(memory_pmem_volumes_regionStore_regions,"),
            std::string::npos);
  ExpectRegions(Host().Fails(kRegion, {kB, "region-1"}, 0xbad0017), kTwoRegions,
                "GetRegionsInfo: KSI_Get failure\n" + warnings);
}

}  // namespace
}  // namespace harness
