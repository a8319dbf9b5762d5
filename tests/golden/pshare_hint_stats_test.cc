// pshareHint-stats.
#include <gtest/gtest.h>

#include <string>

#include "tests/harness/lines.h"
#include "tests/harness/raw_record.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kNode[] = "memory_pshare_stats";

constexpr char kTitle[] =
    "\n PSHARE HINT STATS: Sat Nov 21 10:00:00 2026\n"
    " -------------------------------------------\n";
constexpr char kAllColumns[] = "   Selected columns : (all)\n\n";
constexpr char kHeader[] =
    "----------------------------------------------------------\n"
    "      type          totAdd       totRemove          active\n"
    "----------------------------------------------------------\n";
constexpr char kKilobytes[] =
    "   regular         1983616         1040256          943360\n"
    "     lpage         2020476          161788         1858688\n"
    "----------------------------------------------------------\n"
    "     Total         4004092         1202044         3108860\n"
    "----------------------------------------------------------\n";
constexpr char kMegabytes[] =
    "   regular            1937            1015             921\n"
    "     lpage            1973             157            1815\n"
    "----------------------------------------------------------\n"
    "     Total            3910            1173            3035\n"
    "----------------------------------------------------------\n";
constexpr char kPages[] =
    "   regular          495904          260064          235840\n"
    "     lpage          505119           40447          464672\n"
    "----------------------------------------------------------\n"
    "     Total         1001023          300511          777215\n"
    "----------------------------------------------------------\n";
constexpr char kCsv[] =
    "type,totAdd,totRemove,active\n"
    "regular,1983616,1040256,943360\n"
    "lpage,2020476,161788,1858688\n"
    "Total,4004092,1202044,3108860\n";

// Hints in pages.
struct Hints {
  uint64_t active = 777215;
  uint64_t added = 1001023;
  uint64_t removed = 300511;
  uint64_t lpageAdded = 505119;
  uint64_t lpageRemoved = 40447;
};

// Every other byte of the record is set.
Scenario Host(const Hints& hints = {}) {
  return Scenario().Bytes(kNode, {},
                          RawRecord(208)
                              .U64(64, hints.active)
                              .U64(72, hints.added)
                              .U64(80, hints.removed)
                              .U64(88, hints.lpageAdded)
                              .U64(96, hints.lpageRemoved));
}

TallyRun PshareHintStats(const Scenario& scenario, Args args = {}) {
  args.insert(args.begin(), {"-r", "pshareHint-stats"});
  return RunTally(scenario, args);
}

std::string CsvRows(const Hints& hints, const std::string& unit) {
  return Rows(PshareHintStats(Host(hints), {"-q", "-u", unit}).out);
}

TEST(PshareHintStats, PrintsRegularLargeAndTotal) {
  const TallyRun run = PshareHintStats(Host());
  EXPECT_EQ(run.out, kTitle + std::string("   Unit             : KB\n") + kAllColumns + kHeader +
                         kKilobytes);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(PshareHintStats, ReadsTheKernelOnce) {
  EXPECT_EQ(PshareHintStats(Host()).Calls(),
            "CheckSig() Create(1,1) Get(memory_pshare_stats,[]) Destroy()");
}

TEST(PshareHintStats, ShowsUnits) {
  const struct {
    const char* word;
    const char* title;
    const char* rows;
  } units[] = {{"kb", "KB", kKilobytes},
               {"MB", "MB", kMegabytes},
               {"mb", "MB", kMegabytes},
               {"pg", "Page (4K)", kPages},
               {"pG", "Page (4K)", kPages}};
  for (const auto& [word, title, rows] : units) {
    const std::string text = std::string(kTitle) + "   Unit             : " + title + "\n" +
                             kAllColumns + kHeader + rows;
    EXPECT_EQ(PshareHintStats(Host(), {"-u", word}).out, text);
    EXPECT_EQ(PshareHintStats(Host(), {"--unit", word}).out, text);
  }
}

TEST(PshareHintStats, RefusesOtherUnits) {
  for (const char* word : {"b", "B", "gb", "", "kbs"}) {
    const TallyRun run = PshareHintStats(Host(), {"-v", "-u", word});
    EXPECT_EQ(run.out, "") << word;
    EXPECT_EQ(run.err, "Invalid unit specified. Choose from {mb, kb, pg}\n") << word;
    EXPECT_EQ(run.status, 1) << word;
    EXPECT_EQ(run.Calls(), "CheckSig()") << word;
  }
}

TEST(PshareHintStats, LetsDifferencesWrap) {
  const Hints hints{.active = 3, .added = 5, .removed = 9, .lpageAdded = 7, .lpageRemoved = 2};
  EXPECT_EQ(CsvRows(hints, "kb"),
            "regular,18446744073709551608,28,18446744073709551580\n"
            "lpage,28,8,20\n"
            "Total,20,36,12\n");
  EXPECT_EQ(CsvRows(hints, "pg"),
            "regular,4611686018427387902,7,4611686018427387895\n"
            "lpage,7,2,5\n"
            "Total,5,9,3\n");
  EXPECT_EQ(CsvRows(hints, "mb"),
            "regular,18014398509481983,0,18014398509481983\n"
            "lpage,0,0,0\n"
            "Total,0,0,0\n");
}

// Operands that are converted one by one give 3 - 2 = 1 MB and 2 - 1 = 1 MB here.
TEST(PshareHintStats, ConvertsAfterTheSubtraction) {
  const Hints hints{
      .active = 0, .added = 768, .removed = 512, .lpageAdded = 767, .lpageRemoved = 511};
  EXPECT_EQ(CsvRows(hints, "mb"), "regular,0,0,0\nlpage,2,1,1\nTotal,3,2,0\n");
}

TEST(PshareHintStats, ShowsTheKernelsOwnTotalOfActiveHints) {
  const Hints hints{
      .active = 1000000, .added = 30, .removed = 20, .lpageAdded = 3, .lpageRemoved = 2};
  EXPECT_EQ(CsvRows(hints, "pg"), "regular,27,18,9\nlpage,3,2,1\nTotal,30,20,1000000\n");
}

TEST(PshareHintStats, ConvertsAllOnes) {
  const Hints hints{
      .active = kAllOnes, .added = kAllOnes, .removed = 0, .lpageAdded = 0, .lpageRemoved = 0};
  EXPECT_EQ(CsvRows(hints, "kb"),
            "regular,18446744073709551612,0,18446744073709551612\n"
            "lpage,0,0,0\n"
            "Total,18446744073709551612,0,18446744073709551612\n");
  EXPECT_EQ(CsvRows(hints, "pg"),
            "regular,4611686018427387903,0,4611686018427387903\n"
            "lpage,0,0,0\n"
            "Total,4611686018427387903,0,4611686018427387903\n");
}

TEST(PshareHintStats, LosesTheTwoTopBits) {
  constexpr uint64_t kTopBits = uint64_t{3} << 62;
  const Hints hints{.active = kTopBits + 1,
                    .added = kTopBits + 7,
                    .removed = 2,
                    .lpageAdded = kTopBits + 4,
                    .lpageRemoved = 1};
  EXPECT_EQ(CsvRows(hints, "pg"), "regular,3,1,2\nlpage,4,1,3\nTotal,7,2,1\n");
}

TEST(PshareHintStats, PrintsCsv) {
  for (const char* option : {"-q", "--csvMode"}) {
    EXPECT_EQ(PshareHintStats(Host(), {option}).out, kCsv);
  }
}

TEST(PshareHintStats, ShowsSelectedColumns) {
  for (const char* option : {"-s", "--cSelect"}) {
    const TallyRun run = PshareHintStats(Host(), {option, "active"});
    EXPECT_EQ(run.out, kTitle + std::string("   Unit             : KB\n") +
                           "   Selected columns : active\n\n"
                           "---------------\n"
                           "         active\n"
                           "---------------\n"
                           "         943360\n"
                           "        1858688\n"
                           "---------------\n"
                           "        3108860\n"
                           "---------------\n");
  }
  EXPECT_EQ(PshareHintStats(Host(), {"-q", "-s", "totRemove:type"}).out,
            "type,totRemove\nregular,1040256\nlpage,161788\nTotal,1202044\n");
}

TEST(PshareHintStats, HidesEveryColumn) {
  const TallyRun run = PshareHintStats(Host(), {"-s", ""});
  EXPECT_EQ(run.out, kTitle + std::string("   Unit             : KB\n") +
                         "   Selected columns : (none)\n\n\n\n\n\n\n\n\n\n");
  EXPECT_EQ(run.status, 0);
}

TEST(PshareHintStats, RealignsAfterAWideValue) {
  const Hints hints{.active = 3, .added = 5, .removed = 9, .lpageAdded = 7, .lpageRemoved = 2};
  const TallyRun run = PshareHintStats(Host(hints));
  EXPECT_EQ(run.out, kTitle + std::string("   Unit             : KB\n") + kAllColumns + kHeader +
                         "   regular 18446744073709551608         28 18446744073709551580\n"
                         "     lpage              28               8              20\n" +
                         Dashes(58) +
                         "     Total              20              36              12\n" +
                         Dashes(58));
}

TEST(PshareHintStats, DescribesTheColumns) {
  constexpr char kDescriptions[] =
      "Description of report header labels:\n"
      "                type: Hint type (regular or large page hint)\n"
      "              totAdd: Total hints added\n"
      "           totRemove: Total hints removed\n"
      "              active: Currently active hints\n";
  for (const char* option : {"-v", "--verbose"}) {
    EXPECT_EQ(PshareHintStats(Host(), {option}).out, PshareHintStats(Host()).out + kDescriptions);
    EXPECT_EQ(PshareHintStats(Host(), {option, "-q"}).out, std::string(kCsv) + kDescriptions);
  }
}

TEST(PshareHintStats, PassesOverUnknownOptions) {
  const TallyRun run = PshareHintStats(Host(), {"-x", "-l", "0", "--tags", "-i", "bogus", "-q"});
  EXPECT_EQ(run.out, kCsv);
  EXPECT_EQ(run.err, "");
  EXPECT_EQ(run.status, 0);
}

TEST(PshareHintStatsFailure, OfTheList) {
  for (const Args& args : {Args{}, Args{"-v"}, Args{"-q", "-v"}}) {
    const TallyRun run = PshareHintStats(Host().FailCall("Create", 1, 0xbad0014), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, "TallyPShareHintGetStats: KSI_ParamListCreate() failure\n");
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(), "CheckSig() Create(1,1)=NULL");
  }
}

TEST(PshareHintStatsFailure, OfTheRecord) {
  for (const Args& args : {Args{}, Args{"-v"}, Args{"-q", "-v"}}) {
    const TallyRun run = PshareHintStats(Host().Fails(kNode, {}, 0xbad0003), args);
    EXPECT_EQ(run.out, "");
    EXPECT_EQ(run.err, "");
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.Calls(),
              "CheckSig() Create(1,1) Get(memory_pshare_stats,[])=0xbad0003 Destroy()");
  }
}

}  // namespace
}  // namespace harness
