// comp-stats, and through it what all reports share: columns, units and CSV.
#include <gtest/gtest.h>

#include <string>

#include "tests/harness/hosts.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr uint64_t kNoValue = UINT64_MAX;

constexpr char kTitle[] =
    "\n COMPREHENSIVE STATS: Sat Nov 21 10:00:00 2026\n"
    " ---------------------------------------------\n";
constexpr char kKilobytes[] = "   Unit             : KB\n";
constexpr char kAllColumns[] = "   Selected columns : (all)\n\n";
// clang-format off
constexpr char kHeader[] =
    "     total  discarded managedByMemMap reliableMem kernelCode   critical dataAndHeap  buddyOvhd    rsvdLow managedByMemSched    minFree knvClientConsumed otherConsumed       free    numHigh   numClear    numSoft    numHard     numLow memState\n";
constexpr char kRowInKilobytes[] =
    "   1000000    1003072         1001024     1002048    1006144    1004096     1007168    1005120    1010240           2000000    2001024           1008192       1009216    1011264         11         21         32         43          4     High\n";
constexpr char kRowInMegabytes[] =
    "       976        979             977         978        982        980         983        981        986              1953       1954               984           985        987         11         21         32         43          4     High\n";
constexpr char kRowInPages[] =
    "    250000     250768          250256      250512     251536     251024      251792     251280     252560            500000     500256            252048        252304     252816         11         21         32         43          4     High\n";
// clang-format on
constexpr char kCsv[] =
    "total,discarded,managedByMemMap,reliableMem,kernelCode,critical,dataAndHeap,buddyOvhd,rsvdLow,"
    "managedByMemSched,minFree,knvClientConsumed,otherConsumed,free,numHigh,numClear,numSoft,"
    "numHard,numLow,memState\n"
    "1000000,1003072,1001024,1002048,1006144,1004096,1007168,1005120,1010240,2000000,2001024,"
    "1008192,1009216,1011264,11,21,32,43,4,High\n";

std::string Dashes(size_t count) { return std::string(count, '-') + "\n"; }

std::string Header() { return Dashes(241) + kHeader + Dashes(241); }

Scenario Host(const HostMemory& memory = {}) {
  Scenario scenario;
  AddHostMemory(scenario, memory);
  return scenario;
}

TallyRun CompStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "comp-stats"});
  return RunTally(scenario, args);
}

// The row's cells of these columns, in CSV.
std::string Cells(const HostMemory& memory, const std::string& columns, const Args& args = {}) {
  Args all = {"-q", "-s", columns};
  all.insert(all.end(), args.begin(), args.end());
  const TallyRun run = CompStats(Host(memory), all);
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err, "");
  return run.out.substr(run.out.find('\n') + 1);
}

TEST(CompStats, PrintsOneRow) {
  const TallyRun run = CompStats(Host());
  EXPECT_EQ(run.out, kTitle + std::string(kKilobytes) + kAllColumns + Header() + kRowInKilobytes +
                         Dashes(241));
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(CompStats, ReadsTheKernelInOrder) {
  EXPECT_EQ(CompStats(Host()).Calls(),
            "CheckSig() "
            "Create(1,1) Get(memory_comprehensive,[]) Destroy() "
            "Create(1,1) Get(sched_globalStats_memory_tally,[]) Destroy() "
            "Create(1,2) AddString('high') "
            "Get(sched_globalStats_memory_stateTransitions,['high']) Destroy() "
            "Create(1,2) AddString('clear') "
            "Get(sched_globalStats_memory_stateTransitions,['clear']) Destroy() "
            "Create(1,2) AddString('soft') "
            "Get(sched_globalStats_memory_stateTransitions,['soft']) Destroy() "
            "Create(1,2) AddString('hard') "
            "Get(sched_globalStats_memory_stateTransitions,['hard']) Destroy() "
            "Create(1,2) AddString('low') "
            "Get(sched_globalStats_memory_stateTransitions,['low']) Destroy()");
}

TEST(CompStats, ShowsMegabytes) {
  for (const char* word : {"mb", "MB", "Mb"}) {
    const TallyRun run = CompStats(Host(), {"-u", word});
    EXPECT_EQ(run.out, kTitle + std::string("   Unit             : MB\n") + kAllColumns + Header() +
                           kRowInMegabytes + Dashes(241));
  }
}

TEST(CompStats, ShowsPages) {
  const TallyRun run = CompStats(Host(), {"--unit", "pg"});
  EXPECT_EQ(run.out, kTitle + std::string("   Unit             : Page (4K)\n") + kAllColumns +
                         Header() + kRowInPages + Dashes(241));
}

TEST(CompStats, ShowsKilobytesWhenAskedTo) {
  EXPECT_EQ(CompStats(Host(), {"--unit=KB"}).out, CompStats(Host()).out);
}

TEST(CompStats, RefusesOtherUnits) {
  for (const char* word : {"b", "B", "gb", "", "m"}) {
    const TallyRun run = CompStats(Host(), {"-u", word});
    EXPECT_EQ(run.out, "") << word;
    EXPECT_EQ(run.err, "Invalid unit specified. Choose from {mb, kb, pg}\n") << word;
    EXPECT_EQ(run.status, 1) << word;
    EXPECT_EQ(run.Calls(), "CheckSig()") << word;
  }
}

TEST(CompStats, DropsFractions) {
  HostMemory host;
  host.memory.free = 7;
  host.memory.total = 1023;
  EXPECT_EQ(Cells(host, "free", {"-u", "pg"}), "1\n");
  EXPECT_EQ(Cells(host, "total", {"-u", "mb"}), "0\n");
  EXPECT_EQ(Cells(host, "total:free", {"-u", "kb"}), "1023,7\n");
}

TEST(CompStats, KeepsWhatIsNotAvailableInEveryUnit) {
  HostMemory host;
  host.memory.reliableMem = kNoValue;
  host.minFree = kNoValue;
  host.memory.free = kNoValue - 1;
  for (const char* unit : {"kb", "mb", "pg"}) {
    EXPECT_EQ(Cells(host, "reliableMem:minFree", {"-u", unit}),
              "18446744073709551615,18446744073709551615\n");
  }
  EXPECT_EQ(Cells(host, "free", {"-u", "mb"}), "18014398509481983\n");
}

TEST(CompStats, NamesTheMemoryState) {
  const struct {
    uint32_t state;
    const char* name;
  } states[] = {{0, "High\n"}, {1, "Clear\n"},   {2, "Soft\n"},    {3, "Hard\n"},
                {4, "Low\n"},  {5, "Unknown\n"}, {6, "Unknown\n"}, {UINT32_MAX, "Unknown\n"}};
  for (const auto& [state, name] : states) {
    HostMemory host;
    host.memState = state;
    EXPECT_EQ(Cells(host, "memState"), name);
  }
}

TEST(CompStats, CountsTheStartInTheHighState) {
  const HostMemory host{.up = {0, 0, 0, 0, 0}, .down = {0, 0, 0, 0, 0}};
  EXPECT_EQ(Cells(host, "numHigh:numClear:numSoft:numHard:numLow"), "1,0,0,0,0\n");
}

TEST(CompStats, CountsEntriesIn32Bits) {
  const HostMemory host{.up = {0, UINT32_MAX, UINT32_MAX, 2, 3},
                        .down = {2, UINT32_MAX, 5, UINT32_MAX, 0}};
  EXPECT_EQ(Cells(host, "numHigh:numClear:numSoft:numHard:numLow"), "0,1,1,8,4294967295\n");
}

TEST(CompStats, ReadsFieldsWhereTheyLie) {
  // Every byte that is not a field of the report is set.
  std::string global(sizeof(KSI_GlobalTally), '\xff');
  global.replace(12, 8, std::string("\x01\0\0\0\0\0\0\x01", 8));
  global.replace(36, 8, std::string("\x02\0\0\0\x01\0\0\0", 8));
  global.replace(68, 4, std::string("\x03\0\0\0", 4));
  std::string transitions(sizeof(KSI_StateTransitions), '\xff');
  transitions.replace(4, 4, std::string("\x04\0\0\0", 4));
  transitions.replace(20, 4, std::string("\x05\0\0\x80", 4));
  Scenario scenario = Host();
  scenario.Bytes("sched_globalStats_memory_tally", {}, global);
  for (const char* state : {"high", "clear", "soft", "hard", "low"}) {
    scenario.Bytes("sched_globalStats_memory_stateTransitions", {state}, transitions);
  }
  const TallyRun run = CompStats(
      scenario, {"-q", "-s", "managedByMemSched:minFree:numHigh:numHard:numLow:memState"});
  EXPECT_EQ(run.out,
            "managedByMemSched,minFree,numHigh,numHard,numLow,memState\n"
            "72057594037927937,4294967298,5,2147483657,2147483653,Hard\n");
}

TEST(CompStats, ShowsSelectedColumns) {
  const TallyRun run = CompStats(Host(), {"-s", "free:memState"});
  EXPECT_EQ(run.out, kTitle + std::string(kKilobytes) +
                         "   Selected columns : free:memState\n\n"
                         "-------------------\n"
                         "      free memState\n"
                         "-------------------\n"
                         "   1011264     High\n"
                         "-------------------\n");
}

TEST(CompStats, SelectsInTableOrderAndAnyCase) {
  const TallyRun run = CompStats(Host(), {"--cSelect", "MEMSTATE:bogus::Free", "-q"});
  EXPECT_EQ(run.out, "free,memState\n1011264,High\n");
}

TEST(CompStats, HidesEveryColumn) {
  const TallyRun table = CompStats(Host(), {"-s", "bogus"});
  EXPECT_EQ(table.out,
            kTitle + std::string(kKilobytes) + "   Selected columns : (none)\n\n\n\n\n\n\n");
  EXPECT_EQ(table.status, 0);
  EXPECT_EQ(CompStats(Host(), {"-s", "bogus", "-q"}).out, "\n\n");
}

TEST(CompStats, SeesTheFirst128CharactersOfTheSelection) {
  const std::string filler(123, 'x');
  EXPECT_EQ(CompStats(Host(), {"-q", "-s", filler + ":free"}).out, "free\n1011264\n");
  EXPECT_EQ(CompStats(Host(), {"-q", "-s", filler + "x:free"}).out, "\n\n");
}

TEST(CompStats, PrintsCsv) {
  for (const char* option : {"-q", "--csvMode"}) {
    EXPECT_EQ(CompStats(Host(), {option}).out, kCsv);
  }
}

TEST(CompStats, DescribesTheColumns) {
  const TallyRun run = CompStats(Host(), {"-v"});
  EXPECT_EQ(run.out, kTitle + std::string(kKilobytes) + kAllColumns + Header() + kRowInKilobytes +
                         Dashes(241) +
                         "Description of report header labels:\n"
                         "               total: Total physical memory on host\n"
                         "           discarded: Discarded by kernova  \n"
                         "     managedByMemMap: Memory managed by MemMap\n"
                         "         reliableMem: Reliable memory\n"
                         "          kernelCode: Kernova code region\n"
                         "            critical: Critical space\n"
                         "         dataAndHeap: Kernova data and heap\n"
                         "           buddyOvhd: Memmap buddy overhead \n"
                         "             rsvdLow: Reserved low memory\n"
                         "   managedByMemSched: Memory managed by MemSched\n"
                         "             minFree: Min Free\n"
                         "   knvClientConsumed: Consumed by kernova clients\n"
                         "       otherConsumed: Consumed by non-kernova clients\n"
                         "                free: Available (Free) physical memory\n"
                         "             numHigh: Num times host in high state\n"
                         "            numClear: Num times host in clear state\n"
                         "             numSoft: Num times host in soft state\n"
                         "             numHard: Num of times host in hard state\n"
                         "              numLow: Num of times host in low state\n"
                         "            memState: Current memory state\n");
}

TEST(CompStats, DescribesTheShownColumnsInCsvToo) {
  const TallyRun run = CompStats(Host(), {"--verbose", "-q", "-s", "free"});
  EXPECT_EQ(run.out,
            "free\n1011264\n"
            "Description of report header labels:\n"
            "                free: Available (Free) physical memory\n");
}

TEST(CompStats, RealignsAfterAWideValue) {
  HostMemory host;
  host.memory.total = 123456789012;  // 2 characters more than the column has
  const TallyRun run = CompStats(Host(host), {"-s", "total:discarded:free"});
  EXPECT_EQ(run.out.substr(run.out.find("-----\n     total")),
            "-----\n"
            "     total  discarded       free\n"
            "--------------------------------\n"
            "123456789012  1003072    1011264\n"
            "--------------------------------\n");
}

TEST(CompStats, CarriesTheWidthOfManyWideValues) {
  HostMemory host;
  host.memory.total = kNoValue;      // 20 characters in 10
  host.memory.discarded = kNoValue;  // 20 in 10 - 10
  host.memory.critical = kNoValue;   // 20 in 10 - 20: left-justified, though it has no room to
  const TallyRun run =
      CompStats(Host(host), {"-s", "total:discarded:critical:free:numHigh:numLow:memState"});
  // The free column is printed 20 characters to the left of its width: 7 digits and 13 blanks.
  EXPECT_NE(run.out.find("18446744073709551615 18446744073709551615 18446744073709551615 "
                         "1011264              "),
            std::string::npos)
      << run.out;
}

TEST(CompStats, PassesOverUnknownOptions) {
  const TallyRun run = CompStats(Host(), {"-x", "--bogus", "-l", "3", "word", "-q"});
  EXPECT_EQ(run.out, kCsv);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(CompStats, TakesTheLastOfAnOption) {
  EXPECT_EQ(CompStats(Host(), {"-u", "bogus", "-u", "mb", "-s", "x", "-s", "free", "-q"}).out,
            "free\n987\n");
}

// What is printed before the first read.
std::string Frame() { return kTitle + std::string(kKilobytes) + kAllColumns + Header(); }

void ExpectFailure(const Scenario& scenario, const std::string& warnings,
                   const std::string& lastCalls) {
  const TallyRun run = CompStats(scenario, {"-v"});
  EXPECT_EQ(run.out, Frame());
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, 1);
  EXPECT_TRUE(run.Calls().ends_with(lastCalls)) << run.Calls();
  EXPECT_EQ(CompStats(scenario, {"-v", "-q", "-s", "free"}).out, "free\n");
}

TEST(CompStatsFailure, OfTheListForTheComprehensiveNode) {
  ExpectFailure(Host().FailCall("Create", 1, 0xbad0014),
                "TallyCompGetMemMapStats: KSI_ParamListCreate() failure\n",
                "CheckSig() Create(1,1)=NULL");
}

TEST(CompStatsFailure, OfTheComprehensiveNode) {
  ExpectFailure(Host().Fails("memory_comprehensive", {}, 0xbad0003), "",
                "CheckSig() Create(1,1) Get(memory_comprehensive,[])=0xbad0003 Destroy()");
}

TEST(CompStatsFailure, OfTheListForTheGlobalStatistics) {
  ExpectFailure(Host().FailCall("Create", 2, 0xbad0014),
                "TallyCompGetGlobalTally: KSI_ParamListCreate() failure\n",
                "Destroy() Create(1,1)=NULL");
}

TEST(CompStatsFailure, OfTheGlobalStatistics) {
  ExpectFailure(Host().Fails("sched_globalStats_memory_tally", {}, 0xbad00c3), "",
                "Create(1,1) Get(sched_globalStats_memory_tally,[])=0xbad00c3 Destroy()");
}

TEST(CompStatsFailure, OfAStatesList) {
  for (const int number : {3, 4, 5, 6, 7}) {
    ExpectFailure(Host().FailCall("Create", number, 0xbad0014),
                  "TallyCompGetGlobalTally: KSI_ParamListCreate() failure\n",
                  "Destroy() Create(1,2)=NULL");
  }
}

TEST(CompStatsFailure, OfAStatesName) {
  ExpectFailure(Host().FailCall("AddString", 1, 0xbad00b4), "",
                "Create(1,2) AddString('high')=0xbad00b4 Destroy()");
  ExpectFailure(Host().FailCall("AddString", 5, 0xbad00b4), "",
                "Create(1,2) AddString('low')=0xbad00b4 Destroy()");
}

TEST(CompStatsFailure, OfAStatesTransitions) {
  for (const char* state : {"high", "clear", "soft", "hard", "low"}) {
    ExpectFailure(Host().Fails("sched_globalStats_memory_stateTransitions", {state}, 1), "",
                  std::string("Get(sched_globalStats_memory_stateTransitions,['") + state +
                      "'])=0x1 "
                      "Destroy()");
  }
}

}  // namespace
}  // namespace harness
