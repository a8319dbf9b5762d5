// heap-stats.
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <string>
#include <vector>

#include "tests/harness/golden.h"
#include "tests/harness/lines.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kHeaps[] = "system_heaps";
constexpr char kStats[] = "system_heaps_stats";

constexpr char kTitle[] =
    "\n HEAP STATS: Sat Nov 21 10:00:00 2026\n"
    " ------------------------------------\n";
constexpr char kCsvHeader[] =
    "name,dynGrow,lowerLimit,upperLimit,reserved,numRanges,dlMallocOvdh,used,avail,size,initial,"
    "max,pctFreeOfCur,maxAvail,pctFreeOfMax,lowPctFreeOfMax,numSuccAllocs,numFailAllocs,"
    "numGrowthOps,numShrinkOps,numReqsPerGrowth,avgAllocSize\n";
constexpr char kMainInBytes[] =
    "mainHeap,1,1001,1002,3,4,5000007,59999346,30000777,90000123,20000321,4000000001,33,"
    "3500000011,87,12,1000019,20,23,24,22,12345678\n";
constexpr char kNetInBytes[] =
    "netBuffers,0,2001,2002,203,204,6002047,70004096,4095,70008191,1048575,3000001023,44,"
    "2000002047,66,5,3000000019,220,223,224,222,4096\n";
constexpr char kTotalInBytes[] =
    "Total,,,,,0,11002054,130003442,30004872,160008314,21048896,7000001024,,5500002058,,,,,246,"
    "248,,\n";

// The bytes that are no field are set, those behind the name's NUL too.
RawRecord MainHeap() {
  return RawRecord(144)
      .Text(0, "mainHeap")
      .U8(8, 0)
      .U8(36, 1)            // dynGrow
      .U32(41, 1001)        // lowerLimit
      .U32(45, 1002)        // upperLimit
      .U8(49, 3)            // reserved
      .U32(58, 4)           // numRanges
      .U32(62, 5000007)     // dlMallocOvdh
      .U32(66, 90000123)    // size
      .U32(70, 20000321)    // initial
      .U32(78, 30000777)    // avail
      .U32(86, 33)          // pctFreeOfCur
      .U32(94, 4000000001)  // max
      .U32(98, 3500000011)  // maxAvail
      .U32(102, 87)         // pctFreeOfMax
      .U32(106, 12)         // lowPctFreeOfMax
      .U32(114, 1000019)    // numSuccAllocs
      .U32(118, 20)         // numFailAllocs
      .U32(126, 12345678)   // avgAllocSize
      .U32(130, 22)         // numReqsPerGrowth
      .U32(134, 23)         // numGrowthOps
      .U32(138, 24);        // numShrinkOps
}

RawRecord NetHeap() {
  return RawRecord(144)
      .Text(0, "netBuffers")
      .U8(10, 0)
      .U8(36, 0)
      .U32(41, 2001)
      .U32(45, 2002)
      .U8(49, 203)
      .U32(58, 204)
      .U32(62, 6002047)
      .U32(66, 70008191)
      .U32(70, 1048575)
      .U32(78, 4095)
      .U32(86, 44)
      .U32(94, 3000001023)
      .U32(98, 2000002047)
      .U32(102, 66)
      .U32(106, 5)
      .U32(114, 3000000019)
      .U32(118, 220)
      .U32(126, 4096)
      .U32(130, 222)
      .U32(134, 223)
      .U32(138, 224);
}

// The instances are not called like the heaps: the rows show the records' names.
Scenario Heaps(const std::vector<RawRecord>& heaps) {
  Scenario scenario;
  Items names;
  for (const RawRecord& heap : heaps) {
    const Item name = "heap-" + std::to_string(names.size());
    names.push_back(name);
    scenario.Bytes(kStats, {name}, heap);
  }
  return scenario.List(kHeaps, {}, names);
}

Scenario Host() { return Heaps({MainHeap(), NetHeap()}); }

TallyRun HeapStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "heap-stats"});
  return RunTally(scenario, args);
}

// The rows in CSV, with the Total row; name is among the columns anyway.
std::string Cells(const Scenario& scenario, const std::string& columns, const Args& args = {}) {
  Args all = {"-q", "-s", columns};
  all.insert(all.end(), args.begin(), args.end());
  const TallyRun run = HeapStats(scenario, all);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
  return Rows(run.out);
}

constexpr char kDescriptions[] =
    "Description of report header labels:\n"
    "                name: heap name\n"
    "                size: current size\n";

// The report of Host() on the column size.
std::string Sizes(const std::string& title, const std::string& rows) {
  return kTitle + ("   Unit             : " + title + "\n") +
         "   Selected columns : name:size\n\n"
         "----------------------------------------------\n"
         "                               name       size\n"
         "----------------------------------------------\n" +
         rows;
}
std::string SizesInBytes() {
  return Sizes("Bytes",
               "                           mainHeap   90000123\n"
               "                         netBuffers   70008191\n"
               "----------------------------------------------\n"
               "                              Total  160008314\n"
               "----------------------------------------------\n");
}
std::string SizesInKilobytes() {
  return Sizes("KB",
               "                           mainHeap      87890\n"
               "                         netBuffers      68367\n"
               "----------------------------------------------\n"
               "                              Total     156258\n"
               "----------------------------------------------\n");
}

TEST(HeapStats, PrintsHeaps) {
  ExpectTallyGolden("golden/heap_stats.txt", Host(), {"-r", "heap-stats", "-v"});
}

TEST(HeapStats, ReadsTheKernelInOrder) {
  EXPECT_EQ(HeapStats(Host()).Calls(),
            "CheckSig() GetInstanceListAlloc(system_heaps) UsedCount(system_heaps,[]) Create(1,1) "
            "GetString(system_heaps,[],0) AddString('heap-0') "
            "Get(system_heaps_stats,['heap-0']) RemoveLast() "
            "GetString(system_heaps,[],1) AddString('heap-1') "
            "Get(system_heaps_stats,['heap-1']) RemoveLast() "
            "Destroy() Destroy(system_heaps,[])");
}

TEST(HeapStats, ShowsUnits) {
  const std::string kilobytes =
      "mainHeap,1,1001,1002,3,4,4882,58593,29297,87890,19531,3906250,33,3417968,87,12,1000019,20,"
      "23,24,22,12056\n"
      "netBuffers,0,2001,2002,203,204,5861,68363,3,68367,1023,2929688,44,1953126,66,5,3000000019,"
      "220,223,224,222,4\n"
      "Total,,,,,0,10744,126956,29301,156258,20555,6835938,,5371095,,,,,246,248,,\n";
  const std::string pages =
      "mainHeap,1,1001,1002,3,4,1220,14648,7324,21972,4882,976562,33,854492,87,12,1000019,20,23,"
      "24,22,3014\n"
      "netBuffers,0,2001,2002,203,204,1465,17090,0,17091,255,732422,44,488281,66,5,3000000019,"
      "220,223,224,222,1\n"
      "Total,,,,,0,2686,31739,7325,39064,5138,1708984,,1342773,,,,,246,248,,\n";
  const std::string megabytes =
      "mainHeap,1,1001,1002,3,4,4,57,28,85,19,3814,33,3337,87,12,1000019,20,23,24,22,11\n"
      "netBuffers,0,2001,2002,203,204,5,66,0,66,0,2861,44,1907,66,5,3000000019,220,223,224,222,"
      "0\n"
      "Total,,,,,0,10,123,28,152,20,6675,,5245,,,,,246,248,,\n";
  const std::string bytes = std::string(kMainInBytes) + kNetInBytes + kTotalInBytes;
  const struct {
    Args args;
    const char* title;
    std::string rows;
  } units[] = {{{}, "Bytes", bytes},
               {{"-u", "b"}, "Bytes", bytes},
               {{"-u", "B"}, "Bytes", bytes},
               {{"-u", "kb"}, "KB", kilobytes},
               {{"--unit", "KB"}, "KB", kilobytes},
               {{"-u", "pg"}, "Page (4K)", pages},
               {{"-u", "mb"}, "MB", megabytes},
               {{"-u", "gb", "-u", "Mb"}, "MB", megabytes}};
  for (const auto& [args, title, rows] : units) {
    const TallyRun table = HeapStats(Host(), args);
    EXPECT_TRUE(table.out.starts_with(kTitle + ("   Unit             : " + std::string(title)) +
                                      "\n   Selected columns : (all)\n\n-----"))
        << table.out;
    Args csv = args;
    csv.emplace_back("-q");
    EXPECT_EQ(HeapStats(Host(), csv).out, kCsvHeader + rows);
  }
}

TEST(HeapStats, RefusesOtherUnits) {
  for (const char* word : {"gb", "", "bytes", "bb", "k"}) {
    const TallyRun run = HeapStats(Host(), {"-v", "-u", word});
    EXPECT_EQ(run.out, "") << word;
    EXPECT_EQ(run.err, "Invalid unit specified. Choose from {mb, kb, pg, b}\n") << word;
    EXPECT_EQ(run.status, 1) << word;
    EXPECT_EQ(run.Calls(), "CheckSig()") << word;
  }
}

// --verbose takes the unit back and does not turn descriptions on, but leaves them on.
TEST(HeapStats, TakesVerboseForAUnit) {
  const struct {
    Args args;
    std::string out;
  } runs[] = {
      {{"--verbose"}, SizesInBytes()},
      {{"-v"}, SizesInBytes() + kDescriptions},
      {{"-u", "kb"}, SizesInKilobytes()},
      {{"-u", "kb", "-v"}, SizesInKilobytes() + kDescriptions},
      {{"-u", "kb", "--verbose"}, SizesInBytes()},
      {{"--verbose", "-u", "kb"}, SizesInKilobytes()},
      {{"-v", "--verbose"}, SizesInBytes() + kDescriptions},
      {{"-u", "kb", "--verbose", "-v"}, SizesInBytes() + kDescriptions},
      {{"-u", "gb", "--verb"}, SizesInBytes()},
  };
  for (const auto& [args, out] : runs) {
    Args all = {"-s", "size"};
    all.insert(all.end(), args.begin(), args.end());
    const TallyRun run = HeapStats(Host(), all);
    EXPECT_EQ(run.out, out);
    EXPECT_EQ(run.err, "");
    EXPECT_EQ(run.status, 0);
  }
}

TEST(HeapStats, DropsFractions) {
  const Scenario host = Heaps({MainHeap().U32(66, 1023).U32(78, 0).U32(70, 4095).U32(94, 1048575),
                               MainHeap().U32(66, 1023).U32(78, 0).U32(70, 1).U32(94, 1)});
  EXPECT_EQ(Cells(host, "used:size", {"-u", "kb"}), "mainHeap,0,0\nmainHeap,0,0\nTotal,1,1\n");
  EXPECT_EQ(Cells(host, "initial", {"-u", "pg"}), "mainHeap,0\nmainHeap,0\nTotal,1\n");
  EXPECT_EQ(Cells(host, "max", {"-u", "mb"}), "mainHeap,0\nmainHeap,0\nTotal,1\n");
}

// 1025 - 2 bytes are no kilobyte, though 1025 bytes are one.
TEST(HeapStats, ConvertsAfterTheSubtraction) {
  EXPECT_EQ(Cells(Heaps({MainHeap().U32(66, 1025).U32(78, 2)}), "used:size", {"-u", "kb"}),
            "mainHeap,0,1\nTotal,0,1\n");
}

TEST(HeapStats, ShowsAllOnes) {
  const RawRecord heap = MainHeap().U8(36, 255).U8(49, 255).U32(
      {41, 45, 58, 62, 66, 70, 78, 86, 94, 98, 102, 106, 114, 118, 126, 130, 134, 138}, UINT32_MAX);
  EXPECT_EQ(Rows(HeapStats(Heaps({heap}), {"-q"}).out),
            "mainHeap,255,-1,-1,255,-1,4294967295,0,4294967295,4294967295,4294967295,4294967295,"
            "-1,4294967295,-1,-1,4294967295,4294967295,4294967295,4294967295,4294967295,"
            "4294967295\n"
            "Total,,,,,0,4294967295,0,4294967295,4294967295,4294967295,4294967295,,4294967295,,,,,"
            "4294967295,4294967295,,\n");
}

TEST(HeapStats, WrapsWhatIsUsed) {
  const Scenario host =
      Heaps({MainHeap().U32(66, 10).U32(78, 30), MainHeap().U32(66, 5).U32(78, 1)});
  EXPECT_EQ(Cells(host, "used"), "mainHeap,4294967276\nmainHeap,4\nTotal,18446744073709551600\n");
  EXPECT_EQ(Cells(host, "used", {"-u", "kb"}),
            "mainHeap,4194303\nmainHeap,0\nTotal,18014398509481983\n");
  // Over all heaps there is enough.
  EXPECT_EQ(
      Cells(Heaps({MainHeap().U32(66, 10).U32(78, 30), MainHeap().U32(66, 50).U32(78, 1)}), "used"),
      "mainHeap,4294967276\nmainHeap,49\nTotal,29\n");
}

TEST(HeapStats, AddsUpSizesIn64BitsAndOperationsIn32) {
  const RawRecord heap = MainHeap()
                             .U32({62, 66, 70, 94, 98}, 3000000000)
                             .U32(78, 0)
                             .U32(134, 4000000000)
                             .U32(138, UINT32_MAX);
  EXPECT_EQ(Cells(Heaps({heap, heap, heap}),
                  "dlMallocOvdh:used:avail:size:initial:max:maxAvail:numGrowthOps:numShrinkOps"),
            "mainHeap,3000000000,3000000000,0,3000000000,3000000000,3000000000,3000000000,"
            "4000000000,4294967295\n"
            "mainHeap,3000000000,3000000000,0,3000000000,3000000000,3000000000,3000000000,"
            "4000000000,4294967295\n"
            "mainHeap,3000000000,3000000000,0,3000000000,3000000000,3000000000,3000000000,"
            "4000000000,4294967295\n"
            "Total,9000000000,9000000000,0,9000000000,9000000000,9000000000,9000000000,"
            "3410065408,4294967293\n");
}

// The cell has the high half of the sum.
TEST(HeapStats, AddsUpRangesInTheWrongPlace) {
  const RawRecord one = MainHeap().U32(58, 1);
  const RawRecord all = MainHeap().U32(58, UINT32_MAX);
  EXPECT_EQ(Cells(Heaps({all}), "reserved:numRanges"), "mainHeap,3,-1\nTotal,,0\n");
  EXPECT_EQ(Cells(Heaps({all, one}), "reserved:numRanges"),
            "mainHeap,3,-1\nmainHeap,3,1\nTotal,,1\n");
  EXPECT_EQ(Cells(Heaps({all, all, all}), "numRanges:dlMallocOvdh"),
            "mainHeap,-1,5000007\nmainHeap,-1,5000007\nmainHeap,-1,5000007\nTotal,2,15000021\n");
}

TEST(HeapStats, ShowsNamesOf36Characters) {
  const std::string name = "a-heap-name-of-thirty-six-characters";
  const TallyRun run = HeapStats(Heaps({MainHeap().Text(0, name), MainHeap().U8(0, 0)}),
                                 {"-s", "dynGrow:used:size"});
  EXPECT_TRUE(
      run.out.ends_with("\n"
                        "                               name      dynGrow       used       size\n"
                        "----------------------------------------------------------------------\n"
                        "a-heap-name-of-thirty-six-characters           1   59999346   90000123\n"
                        "                                               1   59999346   90000123\n"
                        "----------------------------------------------------------------------\n"
                        "                              Total               119998692  180000246\n"
                        "----------------------------------------------------------------------\n"))
      << run.out;
}

TEST(HeapStats, AlwaysShowsTheName) {
  for (const char* option : {"-s", "--cSelect"}) {
    EXPECT_EQ(HeapStats(Host(), {option, "SIZE"}).out, SizesInBytes());
    EXPECT_EQ(HeapStats(Host(), {option, "bogus", "-q"}).out,
              "name\nmainHeap\nnetBuffers\nTotal\n");
  }
}

TEST(HeapStats, PrintsCsv) {
  const std::string csv = std::string(kCsvHeader) + kMainInBytes + kNetInBytes + kTotalInBytes;
  EXPECT_EQ(HeapStats(Host(), {"-q"}).out, csv);
  EXPECT_EQ(HeapStats(Host(), {"--csvMode"}).out, csv);
  EXPECT_EQ(HeapStats(Host(), {"-q", "-v", "-s", "size"}).out,
            "name,size\nmainHeap,90000123\nnetBuffers,70008191\nTotal,160008314\n" +
                std::string(kDescriptions));
}

TEST(HeapStats, PassesOverUnknownOptions) {
  const TallyRun run = HeapStats(Host(), {"-x", "-l", "0", "--tags", "-i", "bogus", "-s", "size"});
  EXPECT_EQ(run.out, SizesInBytes());
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

// A heap that is gone leaves neither a row nor a gap, wherever it stood.
TEST(HeapStats, PassesOverHeapsThatAreGone) {
  const RawRecord heaps[] = {MainHeap().U32(66, 100), MainHeap().U32(66, 20),
                             MainHeap().U32(66, 3)};
  const Scenario host = Heaps({heaps[0], heaps[1], heaps[2]});
  const auto without = [&host](const char* heap) {
    Scenario scenario = host;
    return Cells(scenario.Fails(kStats, {heap}, 0xbad0003), "size");
  };
  EXPECT_EQ(Cells(host, "size"), "mainHeap,100\nmainHeap,20\nmainHeap,3\nTotal,123\n");
  EXPECT_EQ(without("heap-0"), "mainHeap,20\nmainHeap,3\nTotal,23\n");
  EXPECT_EQ(without("heap-1"), "mainHeap,100\nmainHeap,3\nTotal,103\n");
  EXPECT_EQ(without("heap-2"), "mainHeap,100\nmainHeap,20\nTotal,120\n");

  Scenario none = host;
  for (const char* heap : {"heap-0", "heap-1", "heap-2"}) none.Fails(kStats, {heap}, 0xbad0003);
  EXPECT_EQ(Cells(none, "size"), "Total,0\n");
  EXPECT_TRUE(HeapStats(none).Calls().ends_with(
      "AddString('heap-2') Get(system_heaps_stats,['heap-2'])=0xbad0003 RemoveLast() "
      "Destroy() Destroy(system_heaps,[])"));
}

TEST(HeapStats, PrintsAnEmptyReport) {
  const TallyRun run = HeapStats(Heaps({}), {"-v", "-s", "size"});
  EXPECT_EQ(run.out, Sizes("Bytes",
                           "----------------------------------------------\n"
                           "                              Total          0\n"
                           "----------------------------------------------\n") +
                         kDescriptions);
  EXPECT_EQ(run.err, "TallyHeapGetMemMapStats: KSI_ParamListUsedCount() returned 0\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(HeapStats(Heaps({}), {"-q"}).out,
            std::string(kCsvHeader) + "Total,,,,,0,0,0,0,0,0,0,,0,,,,,0,0,,\n");
}

// No part of the report is printed, and yet it succeeds.
void ExpectFailure(const Scenario& scenario, const std::string& operation,
                   const std::string& lastCalls) {
  for (const Args& args : {Args{}, Args{"-v"}, Args{"-q", "-v"}}) {
    const TallyRun run = HeapStats(scenario, args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, "TallyHeapGetMemMapStats: " + operation + " failure\n");
    EXPECT_EQ(run.status, 0);
    EXPECT_TRUE(run.Calls().ends_with(lastCalls)) << run.Calls();
  }
}

TEST(HeapStatsFailure, OfTheInstances) {
  ExpectFailure(Host().Fails(kHeaps, {}, 0xbad0003), "KSI_GetInstanceListAlloc() for heapList",
                "CheckSig() GetInstanceListAlloc(system_heaps)=0xbad0003");
}

// Lowers the address space of the programs that are run while it lives.
class AddressSpaceLimit {
 public:
  explicit AddressSpaceLimit(rlim_t bytes) {
    getrlimit(RLIMIT_AS, &before_);
    const rlimit limit{bytes, before_.rlim_max};
    setrlimit(RLIMIT_AS, &limit);
  }
  ~AddressSpaceLimit() { setrlimit(RLIMIT_AS, &before_); }
  AddressSpaceLimit(const AddressSpaceLimit&) = delete;
  AddressSpaceLimit& operator=(const AddressSpaceLimit&) = delete;

 private:
  rlimit before_{};
};

TEST(HeapStatsFailure, OfTheMemoryForTheRecords) {
#ifdef TALLY_SANITIZED
  GTEST_SKIP() << "sanitizers need all of the address space";
#endif
  const AddressSpaceLimit limit(1 << 30);
  ExpectFailure(Host().Count(kHeaps, {}, UINT32_MAX), "malloc() for stats",
                "UsedCount(system_heaps,[]) Destroy(system_heaps,[])");
}

TEST(HeapStatsFailure, OfTheList) {
  ExpectFailure(Host().FailCall("Create", 1, 0xbad0014), "KSI_ParamListCreate() for heapParam",
                "Create(1,1)=NULL Destroy(system_heaps,[])");
}

TEST(HeapStatsFailure, OfAName) {
  const Item bad = Item::Unreadable(0xbad0003);
  const std::string operation = "KSI_ParamListGetString()";
  ExpectFailure(Host().List(kHeaps, {}, {"heap-0", bad, "heap-1"}), operation,
                "GetString(system_heaps,[],1)=0xbad0003 Destroy() Destroy(system_heaps,[])");
  ExpectFailure(Host().List(kHeaps, {}, {bad}), operation,
                "GetString(system_heaps,[],0)=0xbad0003 Destroy() Destroy(system_heaps,[])");
  ExpectFailure(Host().Count(kHeaps, {}, 3), operation,
                "GetString(system_heaps,[],2)=0xbad0003 Destroy() Destroy(system_heaps,[])");
}

TEST(HeapStatsFailure, OfAHeapsKey) {
  ExpectFailure(Host().FailCall("AddString", 2, 0xbad0003), "KSI_ParamListAddString()",
                "AddString('heap-1')=0xbad0003 Destroy() Destroy(system_heaps,[])");
}

TEST(HeapStatsFailure, OfAHeap) {
  for (const char* heap : {"heap-0", "heap-1"}) {
    Scenario host = Host();
    host.Fails(kStats, {heap}, 0xbad0002);
    ExpectFailure(host, "KSI_Get()", "Destroy() Destroy(system_heaps,[])");
  }
  ExpectFailure(Host().Fails(kStats, {"heap-0"}, 0xbad0003).Fails(kStats, {"heap-1"}, 1),
                "KSI_Get()",
                "Get(system_heaps_stats,['heap-1'])=0x1 RemoveLast() Destroy() "
                "Destroy(system_heaps,[])");
}

}  // namespace
}  // namespace harness
