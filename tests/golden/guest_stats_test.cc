#include <gtest/gtest.h>

#include <string>

#include "tests/harness/golden.h"
#include "tests/harness/hosts.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/report.h"

namespace harness {
namespace {

constexpr Report kGuestStats("guest-stats");

// clang-format off
constexpr char kKilobytes[] =
    "name,schedGrp,parSchedGroup,worldGrp,memTotal,lpageTotal,memNeeded\n"
    "web,10,4,100,104447,2049,105471\n"
    "a database in its 28 letters,20,18446744073709551615,-300,4398046717951,-2147483648,4398046718975\n"
    "Total,,,,4398046822398,-2147481599,4398046824446\n";
constexpr char kMegabytes[] =
    "web,10,4,100,101,2049,102\n"
    "a database in its 28 letters,20,18446744073709551615,-300,4294967497,-2147483648,4294967498\n"
    "Total,,,,4294967599,-2147481599,4294967601\n";
constexpr char kPages[] =
    "web,10,4,100,26111,2049,26367\n"
    "a database in its 28 letters,20,18446744073709551615,-300,1099511679487,-2147483648,1099511679743\n"
    "Total,,,,1099511705599,-2147481599,1099511706111\n";
// clang-format on

Scenario RawMachines() {
  Scenario host = TwoMachines();
  host.Bytes("sched_memClients_tally_guest", {100},
             RawRecord(20).Amounts(101, {0, 12}).U32(8, 2049))
      .Bytes("sched_memClients_tally_guest", {-300},
             RawRecord(20).Amounts(4294967497, {0, 12}).U32(8, 0x80000000));
  return host;
}

// The two machines with these guests.
Scenario Guests(const KSI_GuestTally& first, const KSI_GuestTally& second) {
  Scenario host = TwoMachines();
  host.Value("sched_memClients_tally_guest", {100}, first)
      .Value("sched_memClients_tally_guest", {-300}, second);
  return host;
}

std::string Rows(const Scenario& host, const Args& args = {}) {
  return kGuestStats.Rows(host, "memTotal:lpageTotal:memNeeded", args);
}

TEST(GuestStats, PrintsATableWithDescriptions) {
  ExpectTallyGolden("golden/guest_stats.txt", RawMachines(),
                    {"-r", "guest-stats", "-g", "4", "-v"});
}

TEST(GuestStats, ShowsEachFieldInItsColumn) {
  EXPECT_EQ(kGuestStats.Run(RawMachines(), {"-q"}).out, kKilobytes);
  EXPECT_EQ(kGuestStats.Rows(RawMachines(), "", {"-u", "mb"}), kMegabytes);
  EXPECT_EQ(kGuestStats.Rows(RawMachines(), "", {"-u", "pg"}), kPages);
}

TEST(GuestStats, ReadsAMachineInOrder) {
  Scenario host;
  AddVirtualMachine(host, 20, {.leader = -300});
  EXPECT_EQ(kGuestStats.Run(host, {"-g", "20", "-l", "1"}).Calls(),
            ReadsOfClient20() +
                "Create(1,2) AddInt(-300) Get(sched_memClients_tally_guest,[-300]) RemoveLast() "
                "Destroy() "
                "Destroy(sched_groups_members_groups,[20])");
}

TEST(GuestStats, LeavesWhatIsNotKnownOutOfTheTotals) {
  const KSI_GuestTally known = {.memTotal = 4096, .lpageTotal = 7, .memNeeded = 2048};
  const KSI_GuestTally unknown = {
      .memTotal = kAllOnes, .lpageTotal = UINT32_MAX, .memNeeded = kAllOnes};
  EXPECT_EQ(Rows(Guests(unknown, known)), "-1,-1,-1\n4096,7,2048\n4096,7,2048\n");
  EXPECT_EQ(Rows(Guests(unknown, known), {"-u", "mb"}), "-1,-1,-1\n4,7,2\n4,7,2\n");
  EXPECT_EQ(Rows(Guests(known, unknown), {"-u", "pg"}), "1024,7,512\n-1,-1,-1\n1024,7,512\n");
  EXPECT_EQ(Rows(Guests(unknown, unknown)), "-1,-1,-1\n-1,-1,-1\n0,0,0\n");
}

TEST(GuestStats, LeavesOutOnlyTheFigureThatIsNotKnown) {
  const KSI_GuestTally first = {.memTotal = kAllOnes, .lpageTotal = 5, .memNeeded = 100};
  const KSI_GuestTally second = {.memTotal = 8, .lpageTotal = UINT32_MAX, .memNeeded = 20};
  EXPECT_EQ(Rows(Guests(first, second)), "-1,5,100\n8,-1,20\n8,5,120\n");
}

TEST(GuestStats, ConvertsTotalsOnce) {
  const KSI_GuestTally guest = {.memTotal = 1023, .lpageTotal = 3, .memNeeded = 513};
  EXPECT_EQ(Rows(Guests(guest, guest), {"-u", "mb"}), "0,3,0\n0,3,0\n1,6,1\n");
}

TEST(GuestStats, NeverConvertsLargePages) {
  const KSI_GuestTally guest = {.memTotal = 4096, .lpageTotal = 4096, .memNeeded = 6};
  EXPECT_EQ(Rows(Guests(guest, guest), {"-u", "pg"}), "1024,4096,1\n1024,4096,1\n2048,8192,3\n");
}

TEST(GuestStats, SumsWrap) {
  const KSI_GuestTally first = {
      .memTotal = kAllOnes - 1, .lpageTotal = INT32_MAX, .memNeeded = uint64_t{1} << 63};
  const KSI_GuestTally second = {.memTotal = 3, .lpageTotal = 3, .memNeeded = kAllOnes >> 1};
  EXPECT_EQ(Rows(Guests(first, second)),
            "-2,2147483647,-9223372036854775808\n3,3,9223372036854775807\n1,-2147483646,-1\n");
  // A sum of all ones is as little known as a figure.
  EXPECT_EQ(Rows(Guests(first, second), {"-u", "mb"}),
            "18014398509481983,2147483647,9007199254740992\n0,3,9007199254740991\n"
            "0,-2147483646,-1\n");
  const KSI_GuestTally third = {.memTotal = 0, .lpageTotal = UINT32_MAX - 1, .memNeeded = 0};
  EXPECT_EQ(Rows(Guests(third, third)), "0,-2,0\n0,-2,0\n0,-4,0\n");
}

TEST(GuestStats, TotalsAreZeroWithoutMachines) {
  Scenario host;
  AddGroup(host, 4, {});
  const TallyRun run = kGuestStats.Run(host, {"-u", "pg"});
  EXPECT_EQ(
      run.out,
      "\n GUEST STATS: Sat Nov 21 10:00:00 2026\n"
      " -------------------------------------\n"
      "   Start Group ID   : 4\n"
      "   No. of levels    : 12\n"
      "   Unit             : Page (4K)\n"
      "   Selected columns : (all)\n\n"
      "-----------------------------------------------------------------------------------------\n"
      "                name   schedGrp parSchedGroup   worldGrp   memTotal lpageTotal  memNeeded\n"
      "-----------------------------------------------------------------------------------------\n"
      "-----------------------------------------------------------------------------------------\n"
      "               Total                                              0          0          0\n"
      "-----------------------------------------------------------------------------------------"
      "\n");
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(kGuestStats.Rows(host, ""), "Total,,,,0,0,0\n");
}

TEST(GuestStatsFailure, HidesTheMachine) {
  ExpectFailuresHideGroup10(kGuestStats, TwoMachines(),
                            {{"sched_memClients_tally_guest",
                              {100},
                              "TallyGuestGetStats() failure, error code: 195887107\n"}});
}

}  // namespace
}  // namespace harness
