#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <initializer_list>
#include <string>
#include <utility>

#include "tests/harness/golden.h"
#include "tests/harness/hosts.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/report.h"

namespace harness {
namespace {

constexpr Report kAsyncRemapStats("asyncremap-stats");

constexpr char kClients[] = "sched_groups_members_memClients";
constexpr char kTypes[] = "sched_memClients_remapTypes";

// clang-format off
constexpr char kKilobytes[] =
    "name,grpLeader,type,added,prepared,filtered,staged,remapped,canceled,cUnprepared,cPrepared,cStaged\n"
    "hostd,100,largePage,104444,105468,106492,107516,108540,109564,110588,111612,112636\n"
    "hostd,100,a type of more than 28 letters,206844,207868,208892,209916,210940,211964,212988,214012,215036\n"
    "hostd,102,numa,309244,310268,311292,312316,313340,314364,315388,316412,317436\n"
    "a helper of many letters,-300,largePage,4398046922748,4398046923772,4398046924796,4398046925820,4398046926844,4398046927868,4398046928892,4398046929916,4398046930940\n"
    ",,,4398047543280,4398047547376,4398047551472,4398047555568,4398047559664,4398047563760,4398047567856,4398047571952,4398047576048\n";
constexpr char kMegabytes[] =
    "hostd,100,largePage,101,102,103,104,105,106,107,108,109\n"
    "hostd,100,a type of more than 28 letters,201,202,203,204,205,206,207,208,209\n"
    "hostd,102,numa,301,302,303,304,305,306,307,308,309\n"
    "a helper of many letters,-300,largePage,4294967697,4294967698,4294967699,4294967700,4294967701,4294967702,4294967703,4294967704,4294967705\n"
    ",,,4294968303,4294968307,4294968311,4294968315,4294968319,4294968323,4294968327,4294968331,4294968335\n";
constexpr char kPages[] =
    "hostd,100,largePage,26111,26367,26623,26879,27135,27391,27647,27903,28159\n"
    "hostd,100,a type of more than 28 letters,51711,51967,52223,52479,52735,52991,53247,53503,53759\n"
    "hostd,102,numa,77311,77567,77823,78079,78335,78591,78847,79103,79359\n"
    "a helper of many letters,-300,largePage,1099511730687,1099511730943,1099511731199,1099511731455,1099511731711,1099511731967,1099511732223,1099511732479,1099511732735\n"
    ",,,1099511885820,1099511886844,1099511887868,1099511888892,1099511889916,1099511890940,1099511891964,1099511892988,1099511894012\n";
// clang-format on

// Counts of pages in the order of the columns: `first` MB and nearly one more in the first, one MB
// more in each next one.
RawRecord RawPages(uint64_t first) {
  RawRecord record(80);
  for (const size_t offset : std::initializer_list<size_t>{0, 16, 8, 24, 40, 32, 48, 56, 64}) {
    record.U64(offset, 256 * first++ + 255);
  }
  return record;
}

// User world 10 with the clients 100, 101, which has no types, and 102; user world 20 with -300.
Scenario RawUserWorlds() {
  const char* const longType = "a type of more than 28 letters";
  Scenario host = TwoUserWorlds();
  host.List(kClients, {10}, {100, 101, 102})
      .List(kTypes, {100}, {"largePage", longType})
      .List(kTypes, {101}, {})
      .List(kTypes, {102}, {"numa"})
      .List(kTypes, {-300}, {"largePage"})
      .Bytes(kTypes, {100, "largePage"}, RawPages(101))
      .Bytes(kTypes, {100, longType}, RawPages(201))
      .Bytes(kTypes, {102, "numa"}, RawPages(301))
      .Bytes(kTypes, {-300, "largePage"}, RawPages(4294967697));
  return host;
}

// User world 10 with one client that has one type.
Scenario OneType(const KSI_RemapType& pages, const UserWorld& world = {}) {
  Scenario host;
  AddUserWorld(host, 10, world);
  return host.List(kClients, {10}, {100})
      .List(kTypes, {100}, {"numa"})
      .Value(kTypes, {100, "numa"}, pages);
}

std::string Rows(const Scenario& host, const std::string& columns, const Args& args = {}) {
  Args all = {"-g", "10"};
  all.insert(all.end(), args.begin(), args.end());
  return kAsyncRemapStats.Rows(host, columns, all);
}

TEST(AsyncRemapStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/asyncremap_stats.txt", RawUserWorlds(),
                    {"-r", "asyncremap-stats", "-g", "4", "-v"});
}

TEST(AsyncRemapStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kAsyncRemapStats.Run(RawUserWorlds(), {"-q"}).out, kKilobytes);
  EXPECT_EQ(kAsyncRemapStats.Rows(RawUserWorlds(), "", {"-u", "mb"}), kMegabytes);
  EXPECT_EQ(kAsyncRemapStats.Rows(RawUserWorlds(), "", {"-u", "pg"}), kPages);
}

TEST(AsyncRemapStats, ReadsAUserWorldInOrder) {
  Scenario host;
  AddUserWorld(host, 20, {});
  host.List(kClients, {20}, {-300, 7})
      .List(kTypes, {-300}, {"large", "numa"})
      .List(kTypes, {7}, {})
      .Value(kTypes, {-300, "large"}, KSI_RemapType{})
      .Value(kTypes, {-300, "numa"}, KSI_RemapType{});
  EXPECT_EQ(kAsyncRemapStats.Run(host, {"-g", "20"}).Calls(),
            "CheckSig() "
            "Create(1,2) AddInt(20) GetInstanceListAlloc(sched_groups_members_groups,[20]) "
            "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[20]) "
            "Create(1,2) AddInt(20) Get(sched_groups_groupFlags,[20]) RemoveLast() Destroy() "
            "Create(1,2) AddInt(20) Get(sched_groups_groupName,[20]) RemoveLast() Destroy() "
            "Create(1,1) AddInt(20) GetInstanceListAlloc(sched_groups_members_memClients,[20]) "
            "Destroy() UsedCount(sched_groups_members_memClients,[20]) "
            "GetUInt32(sched_groups_members_memClients,[20],0) "
            "Create(1,1) AddInt(-300) GetInstanceListAlloc(sched_memClients_remapTypes,[-300]) "
            "Destroy() UsedCount(sched_memClients_remapTypes,[-300]) "
            "GetString(sched_memClients_remapTypes,[-300],0) "
            "Create(1,2) AddInt(-300) AddString('large') "
            "Get(sched_memClients_remapTypes,[-300,'large']) Destroy() "
            "GetString(sched_memClients_remapTypes,[-300],1) "
            "Create(1,2) AddInt(-300) AddString('numa') "
            "Get(sched_memClients_remapTypes,[-300,'numa']) Destroy() "
            "Destroy(sched_memClients_remapTypes,[-300]) "
            "GetUInt32(sched_groups_members_memClients,[20],1) "
            "Create(1,1) AddInt(7) GetInstanceListAlloc(sched_memClients_remapTypes,[7]) "
            "Destroy() UsedCount(sched_memClients_remapTypes,[7]) "
            "Destroy(sched_memClients_remapTypes,[7]) "
            "Destroy(sched_groups_members_memClients,[20]) "
            "Destroy(sched_groups_members_groups,[20])");
}

TEST(AsyncRemapStats, ShowsOnlyUserWorlds) {
  Scenario host = OneType({}, {.name = "both", .flags = 0x7fff});
  AddGroup(host, 4, {.flags = 0xffff & ~0x8, .children = {40, 8}});
  AddVirtualMachine(host, 40, {});
  AddGroup(host, 8, {.flags = 0, .children = {10}});
  EXPECT_EQ(kAsyncRemapStats.Rows(host, "name"), "both,numa\n,\n");
}

TEST(AsyncRemapStats, TakesTheLow32BitsOfAClientsId) {
  Scenario host;
  AddUserWorld(host, 10, {});
  host.List(kClients, {10}, {0x1fffffffe}).List(kTypes, {-2}, {"numa"});
  host.Value(kTypes, {-2, "numa"}, KSI_RemapType{});
  EXPECT_EQ(Rows(host, "grpLeader"), "-2,numa\n,\n");
}

TEST(AsyncRemapStats, TurnsPagesIntoTheUnit) {
  KSI_RemapType pages{};
  pages.added = 3;
  EXPECT_EQ(Rows(OneType(pages), "added"), "numa,12\n,12\n");
  EXPECT_EQ(Rows(OneType(pages), "added", {"-u", "pg"}), "numa,3\n,3\n");
  EXPECT_EQ(Rows(OneType(pages), "added", {"-u", "mb"}), "numa,0\n,0\n");
}

TEST(AsyncRemapStats, KilobytesWrap) {
  // All ones are a count like any other.
  KSI_RemapType pages;
  std::memset(&pages, 0xff, sizeof pages);
  const std::pair<const char*, std::string> units[] = {{"kb", ",18446744073709551612"},
                                                       {"mb", ",18014398509481983"},
                                                       {"pg", ",4611686018427387903"}};
  for (const auto& [unit, figure] : units) {
    std::string figures;
    for (int column = 4; column <= 12; ++column) figures += figure;
    EXPECT_EQ(Rows(OneType(pages), "", {"-u", unit}),
              "world,100,numa" + figures + "\n,," + figures + "\n");
  }
  pages.added = uint64_t{1} << 62;
  EXPECT_EQ(Rows(OneType(pages), "added"), "numa,0\n,0\n");
}

TEST(AsyncRemapStats, TotalsAreConvertedOnceAndWrap) {
  KSI_RemapType first{};
  first.cPrepared = 255;
  first.cStaged = kAllOnes;
  KSI_RemapType second{};
  second.cPrepared = 1;
  second.cStaged = 3;
  Scenario host = OneType(first);
  host.List(kTypes, {100}, {"numa", "other"}).Value(kTypes, {100, "other"}, second);
  EXPECT_EQ(Rows(host, "cPrepared:cStaged", {"-u", "mb"}),
            "numa,0,18014398509481983\nother,0,0\n,1,0\n");
  EXPECT_EQ(Rows(host, "cStaged"), "numa,18446744073709551612\nother,12\n,8\n");
}

TEST(AsyncRemapStats, ShowsNothingOfAClientWithoutTypes) {
  EXPECT_EQ(Rows(OneType({}).List(kTypes, {100}, {}), "added"), ",0\n");
  EXPECT_EQ(Rows(OneType({}).List(kClients, {10}, {}), "added"), ",0\n");
}

TEST(AsyncRemapStats, Shows63LettersOfAName) {
  const std::string name(64, 'n');
  EXPECT_EQ(Rows(OneType({}, {.name = name}), "name"), name.substr(1) + ",numa\n,\n");
  EXPECT_EQ(Rows(OneType({}, {.name = ""}), "name"), ",numa\n,\n");
}

TEST(AsyncRemapStats, AlwaysShowsTheType) {
  EXPECT_EQ(Rows(OneType({}), "bogus"), "numa\n\n");
  const TallyRun run = kAsyncRemapStats.Run(OneType({}).List(kClients, {10}, {}),
                                            {"-g", "10", "-s", "cstaged:ADDED", "-u", "pg"});
  EXPECT_EQ(run.out,
            "\n ASYNC_REMAP STATS: Sat Nov 21 10:00:00 2026\n"
            " -------------------------------------------\n"
            "   Start Group ID   : 10\n"
            "   Unit             : Page (4K)\n"
            "   Selected columns : type:added:cStaged\n\n"
            "--------------------------------------------------\n"
            "                        type      added    cStaged\n"
            "--------------------------------------------------\n"
            "--------------------------------------------------\n"
            "                                      0          0\n"
            "--------------------------------------------------\n");
  EXPECT_EQ(run.status, 0);
}

// A user world on the twelfth level, and one below it.
TEST(AsyncRemapStats, AlwaysGoesDownTwelveLevels) {
  Scenario host = OneType({}, {.name = "twelfth"});
  for (int id = 1000; id < 1010; ++id) AddGroup(host, id, {.children = {id + 1}});
  AddGroup(host, 1010, {.children = {10}});
  AddUserWorld(host, 20, {.name = "thirteenth"});
  host.List("sched_groups_members_groups", {10}, {20});
  const std::string whole = kAsyncRemapStats.Run(host, {"-g", "1000"}).out;
  EXPECT_NE(whole.find("twelfth"), std::string::npos);
  EXPECT_EQ(whole.find("thirteenth"), std::string::npos);
  EXPECT_EQ(whole.find("No. of levels"), std::string::npos);
  for (const Args& levels : {Args{"-l", "2"}, {"-l2"}, {"-l", "0"}, {"--level", "2"}}) {
    Args args = {"-g", "1000"};
    args.insert(args.end(), levels.begin(), levels.end());
    const TallyRun run = kAsyncRemapStats.Run(host, args);
    EXPECT_EQ(run.out, whole);
    EXPECT_EQ(run.err, "");
    EXPECT_EQ(run.status, 0);
  }
}

TEST(AsyncRemapStats, HasNoFiltersAndTags) {
  EXPECT_EQ(Rows(OneType({}), "added", {"-i", "vm", "-e", "uw", "-t", "--iFilter=vm", "--tags"}),
            "numa,0\n,0\n");
}

// Expects the report from user world 10 on to fail with these diagnostics after these rows of one
// page each, and not to visit group 12 below.
void ExpectFailure(const Scenario& host, const std::string& warnings,
                   const std::string& rows = "") {
  const TallyRun start = kAsyncRemapStats.Run(host, {"-g", "10", "-q", "-s", "grpLeader:added"});
  const size_t count = static_cast<size_t>(std::count(rows.begin(), rows.end(), '\n'));
  EXPECT_EQ(start.out, "grpLeader,type,added\n" + rows + ",," + std::to_string(4 * count) + "\n");
  EXPECT_EQ(start.err, warnings);
  EXPECT_EQ(start.status, 1);
  EXPECT_EQ(start.Calls().find("[12]"), std::string::npos);
}

// Below group 4 user world 10 with the clients 100 and 101, each with the types "a" and "b" and one
// page each, and 20 with client -300 and the type "c".
Scenario Family() {
  KSI_RemapType page{};
  page.added = 1;
  Scenario host = TwoUserWorlds();
  host.List(kClients, {10}, {100, 101});
  for (const int client : {100, 101}) {
    host.List(kTypes, {client}, {"a", "b"})
        .Value(kTypes, {client, "a"}, page)
        .Value(kTypes, {client, "b"}, page);
  }
  return host.List(kTypes, {-300}, {"c"}).Value(kTypes, {-300, "c"}, page);
}

constexpr char kClient403[] = "TallyAsyncRemapReportCallback:403 failure: ";
constexpr char kType310[] = "TallyAsyncRemapReportCallbackInt:310 failure: ";

TEST(AsyncRemapFailure, OfAGroupsReads) {
  ExpectFailure(Family().Fails("sched_groups_groupFlags", {10}, 0xbad0003),
                "Tally_GroupGetFlags() failure, error code: 195887107\n");
  ExpectFailure(Family().Fails("sched_groups_groupName", {10}, 0xbad0003),
                "Tally_GroupGetName() failure, error code: 195887107\n");
}

// The walk, the flags and the name take three lists and keys.
TEST(AsyncRemapFailure, OfTheListForTheClientsIsSilent) {
  ExpectFailure(Family().FailCall("Create", 4, 0xbad0014), "");
}

TEST(AsyncRemapFailure, OfTheGroupsKey) {
  ExpectFailure(Family().FailCall("AddInt", 4, 0xbad00b4),
                "TallyAsyncRemapReportCallback:394 failure: Too many elements for list\n");
}

TEST(AsyncRemapFailure, OfTheClients) {
  ExpectFailure(Family().Fails(kClients, {10}, 0xbad0003),
                "TallyAsyncRemapReportCallback:396 failure: Not found\n");
}

TEST(AsyncRemapFailure, OfAClientsId) {
  const std::string warning = "TallyAsyncRemapReportCallback:401 failure: Bad parameter type\n";
  ExpectFailure(Family().List(kClients, {10}, {"100", 101}), warning);
  ExpectFailure(Family().List(kClients, {10}, {100, Item::Unreadable(0xbad0084), 101}), warning,
                "100,a,4\n100,b,4\n");
}

TEST(AsyncRemapFailure, OfTheListForTheTypes) {
  ExpectFailure(Family().FailCall("Create", 5, 0xbad0014), std::string(kClient403) + "Failure\n");
  // After two types of the first client.
  ExpectFailure(Family().FailCall("Create", 8, 0xbad0014), std::string(kClient403) + "Failure\n",
                "100,a,4\n100,b,4\n");
}

TEST(AsyncRemapFailure, OfTheClientsKey) {
  ExpectFailure(Family().FailCall("AddInt", 5, 0xbad00b4),
                "TallyAsyncRemapReportCallbackInt:303 failure: Too many elements for list\n" +
                    std::string(kClient403) + "Too many elements for list\n");
}

TEST(AsyncRemapFailure, OfTheTypes) {
  const std::string warnings = "TallyAsyncRemapReportCallbackInt:305 failure: Not found\n" +
                               std::string(kClient403) + "Not found\n";
  ExpectFailure(Family().Fails(kTypes, {100}, 0xbad0003), warnings);
  ExpectFailure(Family().Fails(kTypes, {101}, 0xbad0003), warnings, "100,a,4\n100,b,4\n");
}

TEST(AsyncRemapFailure, OfATypesName) {
  const std::string warnings =
      "TallyAsyncRemapReportCallbackInt:308 failure: Bad parameter type\n" +
      std::string(kClient403) + "Bad parameter type\n";
  ExpectFailure(Family().List(kTypes, {100}, {5}), warnings);
  ExpectFailure(Family().List(kTypes, {100}, {"a", Item::Unreadable(0xbad0084), "b"}), warnings,
                "100,a,4\n");
}

TEST(AsyncRemapFailure, OfTheListForARecord) {
  ExpectFailure(Family().FailCall("Create", 6, 0xbad0014),
                std::string(kType310) + "Failure\n" + kClient403 + "Failure\n");
}

TEST(AsyncRemapFailure, OfARecordsKeys) {
  const std::string followUp = std::string(kType310) + "Too many elements for list\n" + kClient403 +
                               "Too many elements for list\n";
  ExpectFailure(Family().FailCall("AddInt", 6, 0xbad00b4),
                "TallyAsyncRemapGetStats:137 failure: Too many elements for list\n" + followUp);
  ExpectFailure(Family().FailCall("AddString", 1, 0xbad00b4),
                "TallyAsyncRemapGetStats:138 failure: Too many elements for list\n" + followUp);
}

TEST(AsyncRemapFailure, OfARecord) {
  const std::string warnings = "TallyAsyncRemapGetStats:140 failure: Not found\n" +
                               std::string(kType310) + "Not found\n" + kClient403 + "Not found\n";
  ExpectFailure(Family().Fails(kTypes, {100, "a"}, 0xbad0003), warnings);
  ExpectFailure(Family().Fails(kTypes, {100, "b"}, 0xbad0003), warnings, "100,a,4\n");
  ExpectFailure(Family().Fails(kTypes, {101, "b"}, 0xbad0003), warnings,
                "100,a,4\n100,b,4\n101,a,4\n");
}

TEST(AsyncRemapFailure, PassesOverTheRestOfTheGroupOnly) {
  const TallyRun run = kAsyncRemapStats.Run(Family().Fails(kTypes, {100, "b"}, 0xbad0014),
                                            {"-q", "-s", "grpLeader:added"});
  EXPECT_EQ(run.out, "grpLeader,type,added\n100,a,4\n-300,c,4\n,,8\n");
  EXPECT_EQ(run.err,
            "TallyAsyncRemapGetStats:140 failure: Out of memory\n"
            "TallyAsyncRemapReportCallbackInt:310 failure: Out of memory\n"
            "TallyAsyncRemapReportCallback:403 failure: Out of memory\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.Calls().find("[12]"), std::string::npos);
}

TEST(AsyncRemapFailure, GivesTheMessageOfAnyStatus) {
  const std::pair<uint32_t, const char*> messages[] = {
      {1, "Failure"}, {0xbad0160, "Unknown status"}, {0x2bad0000, "Opaque service console status"}};
  for (const auto& [status, message] : messages) {
    ExpectFailure(Family().Fails(kClients, {10}, status),
                  std::string("TallyAsyncRemapReportCallback:396 failure: ") + message + "\n");
  }
}

}  // namespace
}  // namespace harness
