// buddy-stats.
#include <gtest/gtest.h>

#include <algorithm>
#include <sstream>
#include <string>
#include <vector>

#include "tests/harness/golden.h"
#include "tests/harness/lines.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kNames[] = "system_buddy";
constexpr char kMemNodes[] = "memory_memNodes";
constexpr char kStats[] = "system_buddy_comprehensive";

constexpr size_t kSizes = 19;

constexpr char kTitle[] =
    "\n MEMMAP BUDDY STATS: Sat Nov 21 10:00:00 2026\n"
    " --------------------------------------------\n";

// A name among the instances, and the memory node that it tells.
struct Name {
  std::string text;
  uint32_t memNode = 0;
};

// Free and used buffers of each size: `first` and up, and `first` + 500 and up. Every other byte
// of the record is set.
RawRecord Buffers(uint32_t first) {
  RawRecord record(236);
  for (uint32_t size = 0; size < kSizes; ++size) {
    record.U32(8 + 12 * size, first + size).U32(12 + 12 * size, first + 500 + size);
  }
  return record;
}

// The buddies are read by the first 15 characters of their names. Figures of the first one begin
// at 1000, those of the next one at 2000, and so on; memory node n is on NUMA node n + 100.
Scenario Host(const std::vector<Name>& names) {
  Scenario scenario;
  Items instances;
  uint32_t first = 1000;
  for (const Name& name : names) {
    instances.emplace_back(name.text);
    scenario.Bytes(kMemNodes, {name.memNode},
                   RawRecord(28).U8(0, static_cast<uint8_t>(name.memNode + 100)));
    scenario.Bytes(kStats, {name.text.substr(0, 15)}, Buffers(first));
    first += 1000;
  }
  return scenario.List(kNames, {}, instances);
}

Scenario TwoNodes() {
  return Host({{"memmap-01-hi", 1}, {"memmap-00-hi", 0}, {"memmap-00-lo", 0}, {"memmap-01-lo", 1}});
}

TallyRun BuddyStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "buddy-stats"});
  return RunTally(scenario, args);
}

// The rows in CSV, with the Total row; memNode is among the columns anyway.
std::string Cells(const Scenario& scenario, const std::string& columns) {
  const TallyRun run = BuddyStats(scenario, {"-q", "-s", columns});
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
  return Rows(run.out);
}

// The names in the order of the rows.
std::string Order(const std::vector<Name>& names) {
  std::string order;
  std::istringstream rows(Cells(Host(names), "name"));
  for (std::string row; std::getline(rows, row) && row != "Total,";) {
    order += (order.empty() ? "" : " ") + row.substr(0, row.find(','));
  }
  return order;
}

constexpr char kColumns[] = "name:type:numaNode:4KBfree:1GBused";
constexpr char kHead[] =
    "   Selected columns : name:memNode:type:numaNode:4KBfree:1GBused\n\n"
    "----------------------------------------------------------------\n"
    "                name memNode type numaNode    4KBfree    1GBused\n"
    "----------------------------------------------------------------\n";
constexpr char kLow0[] = "        memmap-00-lo       0  low      100       3000       3518\n";
constexpr char kHigh0[] = "        memmap-00-hi       0 high      100       2000       2518\n";
constexpr char kLow1[] = "        memmap-01-lo       1  low      101       4000       4518\n";
constexpr char kHigh1[] = "        memmap-01-hi       1 high      101       1000       1518\n";
constexpr char kDescriptions[] =
    "Description of report header labels:\n"
    "                name: Name of the buddy\n"
    "             memNode: Memory node the buddy belongs to\n"
    "                type: Legacy memory type name\n"
    "            numaNode: NUMA node the buddy belongs to\n"
    "             4KBfree: free 4KB buffers\n"
    "             1GBused: used 1GB buffers\n";

// The end of a report: the totals, each 10 characters wide, between lines of dashes.
std::string Total(const std::string& cells) {
  return Dashes(64) + "               Total                       " + cells + "\n" + Dashes(64);
}

// Runs with kColumns and descriptions.
void ExpectReport(const Scenario& scenario, const std::string& rows, const std::string& warnings,
                  int status = 0) {
  const TallyRun run = BuddyStats(scenario, {"-v", "-s", kColumns});
  EXPECT_EQ(run.out, std::string(kTitle) + kHead + rows);
  EXPECT_EQ(run.err, warnings);
  EXPECT_EQ(run.status, status);
}

void ExpectNoBuddies(const Scenario& scenario, const std::string& warnings = "") {
  ExpectReport(scenario, Total("         0          0") + kDescriptions, warnings);
  const TallyRun csv = BuddyStats(scenario, {"-q", "-s", "name:4KBfree:1GBused"});
  EXPECT_EQ(csv.out, "name,memNode,4KBfree,1GBused\nTotal,,0,0\n");
  EXPECT_EQ(csv.status, 0);
}

TEST(BuddyStats, PrintsBuddiesByNodeAndType) {
  ExpectTallyGolden("golden/buddy_stats.txt", TwoNodes(), {"-r", "buddy-stats", "-v"});
}

TEST(BuddyStats, ReadsTheKernelInOrder) {
  EXPECT_EQ(BuddyStats(Host({{"memmap-12-hi", 12}, {"other"}, {"memmap-03-lo", 3}})).Calls(),
            "CheckSig() CreateAndAllocateParams(1,99,12672) GetInstanceList(system_buddy) "
            "UsedCount(system_buddy,[]) GetString(system_buddy,[],0) "
            "Create(1,1) AddInt(12) Get(memory_memNodes,[12]) Destroy() "
            "UsedCount(system_buddy,[]) GetString(system_buddy,[],1) "
            "UsedCount(system_buddy,[]) GetString(system_buddy,[],2) "
            "Create(1,1) AddInt(3) Get(memory_memNodes,[3]) Destroy() "
            "UsedCount(system_buddy,[]) "
            "Destroy(system_buddy,[]) "
            "Create(1,1) AddString('memmap-03-lo') "
            "Get(system_buddy_comprehensive,['memmap-03-lo']) Destroy() "
            "Create(1,1) AddString('memmap-12-hi') "
            "Get(system_buddy_comprehensive,['memmap-12-hi']) Destroy()");
}

TEST(BuddyStats, PassesOverOtherNames) {
  EXPECT_EQ(Cells(Host({{"Memmap-00-lo"},
                        {"memma"},
                        {""},
                        {"memmap-02-lo", 2},
                        {"xmemmap-00-lo"},
                        {"heap"},
                        {"memMap-00-lo"}}),
                  "name:4KBfree"),
            "memmap-02-lo,2,4000\nTotal,,4000\n");
}

TEST(BuddyStats, TakesNodeAndTypeFromTheName) {
  const struct {
    const char* name;
    uint32_t memNode;
    const char* row;
  } names[] = {
      {"memmap-3-lo", 3, "memmap-3-lo,3,low\n"},
      {"memmap-03-hi", 3, "memmap-03-hi,3,high\n"},
      {"memmap-12-o", 12, "memmap-12-o,12,low\n"},
      {"memmap-12-lO", 12, "memmap-12-lO,12,high\n"},
      {"memmap-12-lo ", 12, "memmap-12-lo ,12,high\n"},
      {"memmap", 0, "memmap,0,high\n"},
      {"memmapo", 0, "memmapo,0,low\n"},
      {"memmap-", 0, "memmap-,0,high\n"},
      {"memmap7", 0, "memmap7,0,high\n"},
      {"memmap77", 7, "memmap77,7,high\n"},
      {"memmap-x9-o", 0, "memmap-x9-o,0,low\n"},
      {"memmap- 5-lo", 5, "memmap- 5-lo,5,low\n"},
      {"memmap-+6-lo", 6, "memmap-+6-lo,6,low\n"},
      {"memmap--1-lo", UINT32_MAX, "memmap--1-lo,4294967295,low\n"},
      {"memmap-0x10-lo", 0, "memmap-0x10-lo,0,low\n"},
      {"memmap-010-lo", 10, "memmap-010-lo,10,low\n"},
      {"memmap-12345678", 12345678, "memmap-12345678,12345678,high\n"},
  };
  for (const auto& [name, memNode, row] : names) {
    EXPECT_EQ(Cells(Host({{name, memNode}}), "name:type"), std::string(row) + "Total,,\n");
  }
}

TEST(BuddyStats, CutsLongNames) {
  const struct {
    const char* name;
    uint32_t memNode;
    const char* row;
  } names[] = {
      {"memmap-00-hi--o-hi", 0, "memmap-00-hi--o,0,low\n"},
      {"memmap-00-lo---lo", 0, "memmap-00-lo---,0,high\n"},
      {"memmap-00-hi--oX", 0, "memmap-00-hi--o,0,low\n"},
      {"memmap-00-hi---o", 0, "memmap-00-hi---,0,high\n"},
      {"memmap-1234567890-lo", 12345678, "memmap-12345678,12345678,high\n"},
      {"memmap-02-lo and a name that goes on and on and on", 2, "memmap-02-lo an,2,high\n"},
  };
  for (const auto& [name, memNode, row] : names) {
    const Scenario host = Host({{name, memNode}});
    EXPECT_EQ(Cells(host, "name:type"), std::string(row) + "Total,,\n");
    const std::string cut = std::string(name).substr(0, 15);
    EXPECT_TRUE(BuddyStats(host).Calls().ends_with(
        "AddString('" + cut + "') Get(system_buddy_comprehensive,['" + cut + "']) Destroy()"));
  }
}

// All but the first byte of the record is set.
TEST(BuddyStats, TakesTheNumaNodeFromOneByte) {
  for (const int numaNode : {0, 1, 127, 128, 255}) {
    Scenario host = Host({{"memmap-00-lo", 0}});
    host.Bytes(kMemNodes, {0}, RawRecord(28).U8(0, static_cast<uint8_t>(numaNode)));
    EXPECT_EQ(Cells(host, "numaNode"), "0," + std::to_string(numaNode) + "\n,\n");
  }
}

TEST(BuddyStats, SortsByNodeAndLowMemoryFirst) {
  std::vector<Name> names = {
      {"memmap-00-hi", 0}, {"memmap-00-lo", 0}, {"memmap-01-hi", 1}, {"memmap-01-lo", 1}};
  do {
    EXPECT_EQ(Order(names), "memmap-00-lo memmap-00-hi memmap-01-lo memmap-01-hi");
  } while (std::next_permutation(names.begin(), names.end(),
                                 [](const Name& a, const Name& b) { return a.text < b.text; }));
  EXPECT_EQ(Order({{"memmap-10-lo", 10}, {"memmap-9-lo", 9}, {"memmap-02-lo", 2}}),
            "memmap-02-lo memmap-9-lo memmap-10-lo");
}

// The first of a selection changes places with what is first, which need not stay in its order.
TEST(BuddyStats, LeavesTiesAsTheSelectionSortDoes) {
  EXPECT_EQ(Order({{"memmap-00-hi", 0}, {"memmap-00-ab", 0}}), "memmap-00-hi memmap-00-ab");
  EXPECT_EQ(Order({{"memmap-00-hi", 0}, {"memmap-00-ab", 0}, {"memmap-00-lo", 0}}),
            "memmap-00-lo memmap-00-ab memmap-00-hi");
  EXPECT_EQ(Order({{"memmap-01-a", 1}, {"memmap-01-b", 1}, {"memmap-00-a", 0}}),
            "memmap-00-a memmap-01-b memmap-01-a");
}

// Each of two low buddies of a node sorts before the other.
TEST(BuddyStats, SortsSeveralLowBuddiesOfANode) {
  EXPECT_EQ(Order({{"memmap-00-lo", 0}, {"memmap-00-lo2", 0}}), "memmap-00-lo2 memmap-00-lo");
  EXPECT_EQ(Order({{"memmap-00-lo", 0}, {"memmap-00-lo2", 0}, {"memmap-00-lo3", 0}}),
            "memmap-00-lo3 memmap-00-lo memmap-00-lo2");
}

TEST(BuddyStats, KeepsBuddiesOfOneNameInTheirOrder) {
  Scenario host = Host({{"memmap-00-lo", 0}, {"memmap-00-lo", 0}, {"memmap-00-hi", 0}});
  host.Bytes(kStats, {"memmap-00-lo"}, Buffers(70));
  EXPECT_EQ(Cells(host, "name:4KBfree"),
            "memmap-00-lo,0,70\nmemmap-00-lo,0,70\nmemmap-00-hi,0,3000\nTotal,,3140\n");
  // The first of them is the one that changes places.
  EXPECT_EQ(Order({{"memmap-00-hi", 0},
                   {"memmap-00-lo", 0},
                   {"memmap-00-ab", 0},
                   {"memmap-00-lo", 0},
                   {"memmap-00-xy", 0},
                   {"memmap-00-lo", 0}}),
            "memmap-00-lo memmap-00-lo memmap-00-lo memmap-00-hi memmap-00-xy memmap-00-ab");
  // The same after they were cut.
  EXPECT_EQ(Order({{"memmap-00-lo---1", 0}, {"memmap-00-lo---2", 0}}),
            "memmap-00-lo--- memmap-00-lo---");
}

// Two characters tell the node to the sort: "10" of 100, "-1", "3-", nothing at all.
TEST(BuddyStats, SortsByTwoCharactersOfTheNode) {
  EXPECT_EQ(Order({{"memmap-20-lo", 20}, {"memmap-100-lo", 100}}), "memmap-100-lo memmap-20-lo");
  EXPECT_EQ(Order({{"memmap-00-lo", 0}, {"memmap--1-lo", UINT32_MAX}}),
            "memmap--1-lo memmap-00-lo");
  EXPECT_EQ(Order({{"memmap-4-lo", 4}, {"memmap-3-lo", 3}}), "memmap-3-lo memmap-4-lo");
  EXPECT_EQ(Order({{"memmap-02-lo", 2}, {"memmap- 1-lo", 1}}), "memmap- 1-lo memmap-02-lo");
  EXPECT_EQ(Order({{"memmap-01-lo", 1}, {"memmap", 0}}), "memmap memmap-01-lo");
  EXPECT_EQ(Order({{"memmap-1", 1}, {"memmap", 0}, {"memmap-0", 0}}), "memmap memmap-0 memmap-1");
}

// Written in different ways, the numbers are the same: then "lo" does not count.
TEST(BuddyStats, LeavesNodesOfTheSameNumber) {
  EXPECT_EQ(Order({{"memmap-1-hi", 1}, {"memmap-01-lo", 1}}), "memmap-1-hi memmap-01-lo");
  EXPECT_EQ(Order({{"memmap-01-lo", 1}, {"memmap-1-hi", 1}}), "memmap-01-lo memmap-1-hi");
  EXPECT_EQ(Order({{"memmap-xx-hi", 0}, {"memmap-00-lo", 0}}), "memmap-xx-hi memmap-00-lo");
  EXPECT_EQ(Order({{"memmap", 0}, {"memmap-00-lo", 0}}), "memmap memmap-00-lo");
  EXPECT_EQ(Order({{"memmap-00-lo", 0}, {"memmap", 0}}), "memmap-00-lo memmap");
}

// The type that sorts stands at one place, the type that shows at the end.
TEST(BuddyStats, SortsByLoInItsPlaceOnly) {
  EXPECT_EQ(
      Cells(Host({{"memmap-00-xlo", 0}, {"memmap-00-lox", 0}, {"memmap-00-LO", 0}}), "name:type"),
      "memmap-00-lox,0,high\nmemmap-00-xlo,0,low\nmemmap-00-LO,0,high\nTotal,,\n");
}

// `count` low buddies, of the nodes from `count` - 1 down to 0.
std::vector<Name> ManyBuddies(uint32_t count) {
  std::vector<Name> names;
  for (uint32_t node = count; node-- > 0;) {
    names.push_back({(node < 10 ? "memmap-0" : "memmap-") + std::to_string(node) + "-lo", node});
  }
  return names;
}

TEST(BuddyStats, ReportsAsManyBuddiesAsTheListHolds) {
  std::string rows;
  for (int node = 0; node < 99; ++node) {
    rows += std::to_string(node) + "," + std::to_string(1000 * (99 - node) + 517) + "\n";
  }
  EXPECT_EQ(Cells(Host(ManyBuddies(99)), "512MBused"), rows + ",5001183\n");
}

// A buddy that is left out takes the room of no other one, and all are asked about in the order of
// their names.
TEST(BuddyStats, LeavesOutWhatCannotBeTold) {
  const std::vector<Name> names = ManyBuddies(70);
  Scenario host = Host(names);
  std::string warnings;
  for (const uint32_t node : {69U, 40U, 5U}) {
    host.Fails(kMemNodes, {node}, 0xbad0003);
    warnings += "Error 0xbad0003 while reading /memory/memNodes/" + std::to_string(node);
  }
  const TallyRun run = BuddyStats(host, {"-q", "-s", "name"});
  std::string rows;
  std::string calls;
  for (auto name = names.rbegin(); name != names.rend(); ++name) {
    if (name->memNode == 69 || name->memNode == 40 || name->memNode == 5) continue;
    rows += name->text + "," + std::to_string(name->memNode) + "\n";
    calls += " Create(1,1) AddString('" + name->text + "') Get(system_buddy_comprehensive,['" +
             name->text + "']) Destroy()";
  }
  EXPECT_EQ(Rows(run.out), rows + "Total,\n");
  EXPECT_EQ(run.err, warnings);
  EXPECT_TRUE(run.Calls().ends_with("Destroy(system_buddy,[])" + calls));
}

TEST(BuddyStats, HasRoomForNinetyNineNames) {
  std::vector<Name> names(98, {"other"});
  names.push_back({"memmap-07-lo", 7});
  EXPECT_EQ(Order(names), "memmap-07-lo");
  names.push_back({"memmap-08-lo", 8});
  ExpectNoBuddies(Host(names));
}

TEST(BuddyStats, PrintsCsv) {
  const auto figures = [](int first, int step) {
    std::string cells;
    for (int size = 0; size < 19; ++size) cells += "," + std::to_string(first + step * size);
    return cells;
  };
  const std::string csv =
      "name,memNode,type,numaNode,"
      "4KBfree,8KBfree,16KBfree,32KBfree,64KBfree,128KBfree,256KBfree,512KBfree,"
      "1MBfree,2MBfree,4MBfree,8MBfree,16MBfree,32MBfree,64MBfree,128MBfree,256MBfree,"
      "512MBfree,1GBfree,"
      "4KBused,8KBused,16KBused,32KBused,64KBused,128KBused,256KBused,512KBused,"
      "1MBused,2MBused,4MBused,8MBused,16MBused,32MBused,64MBused,128MBused,256MBused,"
      "512MBused,1GBused\n"
      "memmap-00-lo,0,low,100" +
      figures(3000, 1) + figures(3500, 1) + "\n" + "memmap-00-hi,0,high,100" + figures(2000, 1) +
      figures(2500, 1) + "\n" + "memmap-01-lo,1,low,101" + figures(4000, 1) + figures(4500, 1) +
      "\n" + "memmap-01-hi,1,high,101" + figures(1000, 1) + figures(1500, 1) + "\n" + "Total,,," +
      figures(10000, 4) + figures(12000, 4) + "\n";
  for (const char* option : {"-q", "--csvMode"}) {
    EXPECT_EQ(BuddyStats(TwoNodes(), {option}).out, csv);
  }
}

TEST(BuddyStats, DescribesTheShownColumns) {
  ExpectReport(
      TwoNodes(),
      std::string(kLow0) + kHigh0 + kLow1 + kHigh1 + Total("     10000      12072") + kDescriptions,
      "");
  for (const char* option : {"-v", "--verbose"}) {
    EXPECT_EQ(BuddyStats(TwoNodes(), {option, "-q", "-s", kColumns}).out,
              "name,memNode,type,numaNode,4KBfree,1GBused\n"
              "memmap-00-lo,0,low,100,3000,3518\n"
              "memmap-00-hi,0,high,100,2000,2518\n"
              "memmap-01-lo,1,low,101,4000,4518\n"
              "memmap-01-hi,1,high,101,1000,1518\n"
              "Total,,,,10000,12072\n" +
                  std::string(kDescriptions));
  }
}

TEST(BuddyStats, AlwaysShowsTheMemoryNode) {
  for (const char* option : {"-s", "--cSelect"}) {
    EXPECT_EQ(BuddyStats(TwoNodes(), {option, "4KBFREE"}).out,
              std::string(kTitle) +
                  "   Selected columns : memNode:4KBfree\n\n"
                  "------------------\n"
                  "memNode    4KBfree\n"
                  "------------------\n"
                  "      0       3000\n"
                  "      0       2000\n"
                  "      1       4000\n"
                  "      1       1000\n"
                  "------------------\n"
                  "             10000\n"
                  "------------------\n");
  }
  EXPECT_EQ(BuddyStats(Host({{"memmap-03-lo", 3}}), {"-s", "bogus"}).out,
            std::string(kTitle) +
                "   Selected columns : memNode\n\n"
                "-------\nmemNode\n-------\n      3\n-------\n       \n-------\n");
  EXPECT_EQ(BuddyStats(TwoNodes(), {"-q", "-s", "8KBused:4KBfree"}).out,
            "memNode,4KBfree,8KBused\n0,3000,3501\n0,2000,2501\n1,4000,4501\n1,1000,1501\n"
            ",10000,12004\n");
}

TEST(BuddyStats, AddsUpIn32Bits) {
  Scenario host = Host({{"memmap-00-lo", 0}, {"memmap-01-lo", 1}});
  host.Bytes(kStats, {"memmap-00-lo"},
             RawRecord(236).U32(8, UINT32_MAX).U32(224, 1).U32(228, UINT32_MAX));
  host.Bytes(kStats, {"memmap-01-lo"},
             RawRecord(236).U32(8, 2).U32(224, 2147483648).U32(228, UINT32_MAX));
  EXPECT_EQ(Cells(host, "4KBfree:1GBfree:1GBused"),
            "0,4294967295,1,4294967295\n"
            "1,2,2147483648,4294967295\n"
            ",1,2147483649,4294967294\n");
}

TEST(BuddyStats, RealignsAfterAWideValue) {
  const TallyRun run =
      BuddyStats(Host({{"memmap--1-lo", UINT32_MAX}}), {"-s", "memNode:type:numaNode:4KBfree"});
  EXPECT_TRUE(
      run.out.ends_with("\n"
                        "memNode type numaNode    4KBfree\n"
                        "--------------------------------\n"
                        "4294967295 low     99       1000\n"
                        "--------------------------------\n"
                        "                            1000\n"
                        "--------------------------------\n"))
      << run.out;
}

TEST(BuddyStats, PassesOverUnknownOptions) {
  const TallyRun run =
      BuddyStats(TwoNodes(), {"-u", "bogus", "--unit", "mb", "-l", "0", "-x", "-q", "-s", "bogus"});
  EXPECT_EQ(run.out, "memNode\n0\n0\n1\n1\n\n");
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(BuddyStats, PrintsAnEmptyReport) {
  ExpectNoBuddies(Host({}));
  ExpectNoBuddies(Host({{"heap"}, {"other"}}));
}

TEST(BuddyStatsFailure, OfTheNameList) {
  const Scenario host = TwoNodes().FailCall("CreateAndAllocateParams", 1, 0xbad0014);
  ExpectNoBuddies(host);
  EXPECT_EQ(BuddyStats(host).Calls(), "CheckSig() CreateAndAllocateParams(1,99,12672)=NULL");
}

TEST(BuddyStatsFailure, OfTheNames) {
  const Scenario host = TwoNodes().Fails(kNames, {}, 0xbad0003);
  ExpectNoBuddies(host);
  EXPECT_EQ(BuddyStats(host).Calls(),
            "CheckSig() CreateAndAllocateParams(1,99,12672) "
            "GetInstanceList(system_buddy)=0xbad0003 Destroy()");
}

TEST(BuddyStatsFailure, OfAName) {
  const Item bad = Item::Unreadable(0xbad0003);
  Scenario host = TwoNodes();
  host.List(kNames, {}, {"memmap-00-hi", "memmap-00-lo", bad, "memmap-01-lo"});
  ExpectReport(host, std::string(kLow0) + kHigh0 + Total("      5000       6036") + kDescriptions,
               "");
  ExpectNoBuddies(host.List(kNames, {}, {bad, "memmap-00-hi"}));
  // A number is no name.
  ExpectNoBuddies(host.List(kNames, {}, {5, "memmap-00-hi"}));
}

TEST(BuddyStatsFailure, OfTheListForAMemoryNode) {
  ExpectReport(TwoNodes().FailCall("Create", 2, 0xbad0014),
               std::string(kLow0) + kLow1 + kHigh1 + Total("      8000       9554") + kDescriptions,
               "TallyMemNode2NUMANode: KSI_ParamListCreate() failure\n");
}

// Some messages end without a newline.
TEST(BuddyStatsFailure, OfTheMemoryNodesNumber) {
  const std::string rows =
      std::string(kLow0) + kHigh0 + kHigh1 + Total("      6000       7554") + kDescriptions;
  ExpectReport(TwoNodes().FailCall("AddInt", 4, 0xbad00b4), rows,
               "The param list for memNode 1 could not be created: 0xbad00b4");
  ExpectReport(TwoNodes().FailCall("AddInt", 4, 5), rows,
               "The param list for memNode 1 could not be created: 0x5");
}

TEST(BuddyStatsFailure, OfTheMemoryNode) {
  const Scenario host = TwoNodes().Fails(kMemNodes, {1}, 0xbad0003);
  ExpectReport(host, std::string(kLow0) + kHigh0 + Total("      5000       6036") + kDescriptions,
               "Error 0xbad0003 while reading /memory/memNodes/1"
               "Error 0xbad0003 while reading /memory/memNodes/1");
  EXPECT_NE(BuddyStats(host).Calls().find(
                "Create(1,1) AddInt(1) Get(memory_memNodes,[1])=0xbad0003 Destroy() "),
            std::string::npos);
  ExpectNoBuddies(Host({{"memmap--2-lo", 4294967294}}).Fails(kMemNodes, {4294967294}, 0xbad0017),
                  "Error 0xbad0017 while reading /memory/memNodes/4294967294");
}

// The next buddy takes the place of one that is left out, and nothing of that one shows.
TEST(BuddyStatsFailure, LeavesNoTrace) {
  Scenario host = Host({{"memmap-88-loooooo", 88}, {"memmap-2", 2}, {"memmap-99-lo", 99}});
  host.Fails(kMemNodes, {88}, 0xbad0003).Fails(kMemNodes, {99}, 0xbad0003);
  const TallyRun run = BuddyStats(host, {"-q", "-s", "name:type:numaNode:4KBfree"});
  EXPECT_EQ(run.out,
            "name,memNode,type,numaNode,4KBfree\nmemmap-2,2,high,102,2000\nTotal,,,,2000\n");
  EXPECT_EQ(run.err,
            "Error 0xbad0003 while reading /memory/memNodes/88"
            "Error 0xbad0003 while reading /memory/memNodes/99");
  EXPECT_EQ(run.status, 0);
}

// What was printed stays; neither totals nor descriptions follow.
TEST(BuddyStatsFailure, OfTheListForABuddy) {
  const std::string warnings = "TallyBuddyGetStats: KSI_ParamListCreate() failure\n";
  ExpectReport(TwoNodes().FailCall("Create", 5, 0xbad0014), "", warnings, 1);
  ExpectReport(TwoNodes().FailCall("Create", 7, 0xbad0014), std::string(kLow0) + kHigh0, warnings,
               1);
}

TEST(BuddyStatsFailure, OfABuddysName) {
  const Scenario host = TwoNodes().FailCall("AddString", 4, 0xbad00b4);
  ExpectReport(host, std::string(kLow0) + kHigh0 + kLow1,
               "The param list for buddy memmap-01-hi could not be created: 0xbad00b4", 1);
  EXPECT_TRUE(BuddyStats(host).Calls().ends_with("AddString('memmap-01-hi')=0xbad00b4 Destroy()"));
}

TEST(BuddyStatsFailure, OfABuddy) {
  const Scenario host = TwoNodes().Fails(kStats, {"memmap-00-hi"}, 0xbad0003);
  ExpectReport(host, kLow0, "Error 0xbad0003 while reading memmap-00-hi/comprehensive", 1);
  EXPECT_TRUE(BuddyStats(host).Calls().ends_with(
      "Get(system_buddy_comprehensive,['memmap-00-hi'])=0xbad0003 Destroy()"));
  EXPECT_EQ(BuddyStats(host, {"-q", "-v", "-s", "name:4KBfree"}).out,
            "name,memNode,4KBfree\nmemmap-00-lo,0,3000\n");
}

}  // namespace
}  // namespace harness
