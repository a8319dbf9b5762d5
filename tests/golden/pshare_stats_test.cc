// pshare-stats.
#include <gtest/gtest.h>

#include <string>

#include "tests/harness/lines.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kNode[] = "memory_pshare_stats";

constexpr char kTitle[] =
    "\n PSHARE STATS: Sat Nov 21 10:00:00 2026\n"
    " --------------------------------------\n";
constexpr char kPeaks[] =
    "   Peak chain length : 1031\n"
    "   Peak chain index  : 1032\n"
    "   Peak ref.  count  : 1033\n";
constexpr char kAllColumns[] = "   Selected columns  : (all)\n\n";
constexpr char kHeader[] =
    "----------------------------------------------------------------------------\n"
    "       cow       cow1       zero       used  reclaimed     totAdd  totRemove\n"
    "----------------------------------------------------------------------------\n";
constexpr char kKilobytes[] =
    "   4004092    8008188    1212284     161636    2020476     242460         28\n";
constexpr char kMegabytes[] =
    "      3910       7820       1183        157       1973        236          0\n";
constexpr char kPages[] =
    "   1001023    2002047     303071      40409     505119      60615          7\n";
constexpr char kCsv[] =
    "cow,cow1,zero,used,reclaimed,totAdd,totRemove\n"
    "4004092,8008188,1212284,161636,2020476,242460,28\n";

// Figures in pages; every other byte of the record is set.
RawRecord Record() {
  return RawRecord(208)
      .U64(0, 1001023)  // cow
      .U64(8, 2002047)  // cow1
      .U64(16, 303071)  // zero
      .U64(32, 40409)   // used
      .U64(40, 505119)  // reclaimed
      .U64(48, 60615)   // totAdd
      .U64(56, 7)       // totRemove
      .U64(168, 1031)   // peak chain length
      .U64(176, 1032)   // peak chain index
      .U64(184, 1033);  // peak reference count
}

Scenario Host(const RawRecord& record = Record()) { return Scenario().Bytes(kNode, {}, record); }

TallyRun PshareStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "pshare-stats"});
  return RunTally(scenario, args);
}

// The cell of `cow` when the kernel counts `pages`.
std::string Cow(uint64_t pages, const std::string& unit) {
  const TallyRun run = PshareStats(Host(Record().U64(0, pages)), {"-q", "-s", "cow", "-u", unit});
  EXPECT_EQ(run.status, 0);
  return Rows(run.out);
}

TEST(PshareStats, PrintsOneRow) {
  const TallyRun run = PshareStats(Host());
  EXPECT_EQ(run.out, kTitle + std::string("   Unit              : KB\n") + kPeaks + kAllColumns +
                         kHeader + kKilobytes + Dashes(76));
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(PshareStats, ReadsTheKernelOnce) {
  EXPECT_EQ(PshareStats(Host()).Calls(),
            "CheckSig() Create(1,1) Get(memory_pshare_stats,[]) Destroy()");
}

TEST(PshareStats, ShowsUnits) {
  const struct {
    const char* word;
    const char* title;
    const char* row;
  } units[] = {{"kb", "KB", kKilobytes}, {"KB", "KB", kKilobytes},    {"mb", "MB", kMegabytes},
               {"Mb", "MB", kMegabytes}, {"pg", "Page (4K)", kPages}, {"PG", "Page (4K)", kPages}};
  for (const auto& [word, title, row] : units) {
    const std::string text = std::string(kTitle) + "   Unit              : " + title + "\n" +
                             kPeaks + kAllColumns + kHeader + row + Dashes(76);
    EXPECT_EQ(PshareStats(Host(), {"-u", word}).out, text);
    EXPECT_EQ(PshareStats(Host(), {"--unit", word}).out, text);
  }
}

TEST(PshareStats, RefusesOtherUnits) {
  for (const char* word : {"b", "B", "gb", "", "pages"}) {
    const TallyRun run = PshareStats(Host(), {"-v", "-u", word});
    EXPECT_EQ(run.out, "") << word;
    EXPECT_EQ(run.err, "Invalid unit specified. Choose from {mb, kb, pg}\n") << word;
    EXPECT_EQ(run.status, 1) << word;
    EXPECT_EQ(run.Calls(), "CheckSig()") << word;
  }
}

TEST(PshareStats, DropsFractionsOfAMegabyte) {
  EXPECT_EQ(Cow(255, "mb"), "0\n");
  EXPECT_EQ(Cow(256, "mb"), "1\n");
  EXPECT_EQ(Cow(511, "mb"), "1\n");
  EXPECT_EQ(Cow(1, "kb"), "4\n");
  EXPECT_EQ(Cow(1, "pg"), "1\n");
  EXPECT_EQ(Cow(0, "kb"), "0\n");
}

TEST(PshareStats, LosesTheTwoTopBits) {
  constexpr uint64_t kTopBits = uint64_t{3} << 62;
  EXPECT_EQ(Cow(kTopBits + 256, "kb"), "1024\n");
  EXPECT_EQ(Cow(kTopBits + 256, "mb"), "1\n");
  EXPECT_EQ(Cow(kTopBits + 256, "pg"), "256\n");
  EXPECT_EQ(Cow(kTopBits - 1, "kb"), "18446744073709551612\n");
  EXPECT_EQ(Cow((uint64_t{1} << 62) - 1, "pg"), "4611686018427387903\n");
  EXPECT_EQ(Cow(uint64_t{1} << 62, "pg"), "0\n");
}

// There is no word for "no value" among these figures.
TEST(PshareStats, ConvertsAllOnes) {
  EXPECT_EQ(Cow(kAllOnes, "kb"), "18446744073709551612\n");
  EXPECT_EQ(Cow(kAllOnes, "mb"), "18014398509481983\n");
  EXPECT_EQ(Cow(kAllOnes, "pg"), "4611686018427387903\n");
}

TEST(PshareStats, ShowsThePeaksAsTheyAre) {
  const Scenario host =
      Host(Record().U64(168, kAllOnes).U64(176, 0).U64(184, (uint64_t{1} << 63) + 5));
  for (const char* unit : {"kb", "mb", "pg"}) {
    const TallyRun run = PshareStats(host, {"-u", unit});
    EXPECT_NE(run.out.find("\n   Peak chain length : 18446744073709551615\n"
                           "   Peak chain index  : 0\n"
                           "   Peak ref.  count  : 9223372036854775813\n"
                           "   Selected columns  : (all)\n\n"),
              std::string::npos)
        << run.out;
  }
}

TEST(PshareStats, PrintsCsv) {
  for (const char* option : {"-q", "--csvMode"}) {
    EXPECT_EQ(PshareStats(Host(), {option}).out, kCsv);
  }
}

TEST(PshareStats, ShowsSelectedColumns) {
  for (const char* option : {"-s", "--cSelect"}) {
    const TallyRun run = PshareStats(Host(), {option, "totRemove:COW"});
    EXPECT_EQ(run.out, kTitle + std::string("   Unit              : KB\n") + kPeaks +
                           "   Selected columns  : cow:totRemove\n\n"
                           "---------------------\n"
                           "       cow  totRemove\n"
                           "---------------------\n"
                           "   4004092         28\n"
                           "---------------------\n");
  }
}

TEST(PshareStats, HidesEveryColumn) {
  const TallyRun run = PshareStats(Host(), {"-s", "cow2"});
  EXPECT_EQ(run.out, kTitle + std::string("   Unit              : KB\n") + kPeaks +
                         "   Selected columns  : (none)\n\n\n\n\n\n\n");
  EXPECT_EQ(run.status, 0);
}

TEST(PshareStats, RealignsAfterAWideValue) {
  const TallyRun run = PshareStats(Host(Record().U64(0, kAllOnes)), {"-s", "cow:cow1:zero"});
  EXPECT_NE(run.out.find("\n"
                         "--------------------------------\n"
                         "       cow       cow1       zero\n"
                         "--------------------------------\n"
                         "18446744073709551612 8008188 1212284\n"
                         "--------------------------------\n"),
            std::string::npos)
      << run.out;
}

TEST(PshareStats, DescribesTheColumns) {
  constexpr char kDescriptions[] =
      "Description of report header labels:\n"
      "                 cow: Client memory marked copy-on-write\n"
      "                cow1: Client's COWed memory with single ref\n"
      "                zero: Zeroed client memory\n"
      "                used: Machine memory used for backing COWed client memory\n"
      "           reclaimed: Machine memory reclaimed via pshare\n"
      "              totAdd: Total client memory added to pshare table\n"
      "           totRemove: Total client memory removed from pshare table\n";
  for (const char* option : {"-v", "--verbose"}) {
    EXPECT_EQ(PshareStats(Host(), {option}).out, PshareStats(Host()).out + kDescriptions);
    EXPECT_EQ(PshareStats(Host(), {option, "-q"}).out, std::string(kCsv) + kDescriptions);
  }
}

TEST(PshareStats, PassesOverUnknownOptions) {
  const TallyRun run = PshareStats(Host(), {"-x", "-l", "0", "--tags", "-i", "bogus", "-q"});
  EXPECT_EQ(run.out, kCsv);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(PshareStatsFailure, OfTheList) {
  for (const Args& args : {Args{}, Args{"-v"}, Args{"-q", "-v"}}) {
    const TallyRun run = PshareStats(Host().FailCall("Create", 1, 0xbad0014), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, "TallyPShareGetStats: KSI_ParamListCreate() failure\n");
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(), "CheckSig() Create(1,1)=NULL");
  }
}

TEST(PshareStatsFailure, OfTheRecord) {
  for (const Args& args : {Args{}, Args{"-v"}, Args{"-q", "-v"}}) {
    const TallyRun run = PshareStats(Host().Fails(kNode, {}, 0xbad0003), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, "");
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(),
              "CheckSig() Create(1,1) Get(memory_pshare_stats,[])=0xbad0003 Destroy()");
  }
}

}  // namespace
}  // namespace harness
