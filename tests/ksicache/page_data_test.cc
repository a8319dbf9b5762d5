// What ksicache page reads: which moments, what things are called, and what was wrong when.
#include <algorithm>
#include <string>
#include <vector>

#include "tests/ksicache/export_fixture.h"
#include "tools/ksicache/page/lines.h"
#include "tools/ksicache/page/names.h"
#include "tools/ksicache/page/page_data.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/survey.h"

namespace ksi {
namespace {

using Places = std::vector<size_t>;
using Texts = std::vector<std::string>;

class PageDataTest : public ExportTest {
 protected:
  // A recording of what happens to the hypervisor, as examples/story tells it.
  std::string Story(const std::string& text) const {
    WriteContent(Path("host.story"), text);
    harness::Program program;
    program.path = TALLY_STORY;
    program.args = {"story", KSICACHE_PROGRAM, TALLY_EXAMPLE_JSON, Path("host.story"),
                    Path("host.rec")};
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 0) << result.err;
    return Path("host.rec");
  }
};

// The heap's, when free memory is not the least.
TEST_F(PageDataTest, HasTheMomentOfAPeakInFull) {
#ifdef TALLY_SANITIZED
  GTEST_SKIP() << "sanitizers take more than a minute to make so many moments";
#endif
  const std::string recording = Story(
      "step  60\n"
      "time  cache      leak    build    balloon  swapped  unshared\n"
      "13:00 123731968  0       0        0        0        0\n"
      "17:29 123731968  0       0        0        0        0\n"
      "17:30 122731968  400000  0        0        0        0\n"
      "17:31 123731968  0       0        0        0        0\n"
      "18:00 123731968  0       0        0        0        0\n");
  ksicache::PageData data;
  ksicache::ReadPage(recording + "@..", data);
  EXPECT_EQ(data.survey.moments.size(), 301);
  EXPECT_LT(data.tables.full.moments.size(), 301);
  EXPECT_TRUE(std::ranges::binary_search(data.tables.full.moments, size_t{270}));
}

ksicache::RowColumn ColumnOf(const char* name, bool isKey) {
  return {name, "", isKey ? tally::Kind::text : tally::Kind::bytes, isKey, false, false, "", {}};
}

TEST(ReportLines, KnowTheWorstMoments) {
  ksicache::PageTexts texts;
  ksicache::ThingNames names;
  ksicache::ReportLines lines(texts, "heap-stats", {"size"}, names);
  const std::vector<ksicache::RowColumn> columns = {ColumnOf("name", true),
                                                    ColumnOf("size", false)};
  const std::vector<std::vector<uint64_t>> sizes = {{5, 50, 7}, {5, 90, 8}, {5, 90, 3}, {5, 20, 9}};
  for (size_t moment = 0; moment < sizes.size(); ++moment) {
    lines.BeginMoment(moment, moment);
    lines.Begin(columns);
    for (size_t i = 0; i < 3; ++i) {
      const std::string name(1, static_cast<char>('a' + i));
      const std::vector<ksicache::Value> row = {
          {ksicache::ValueType::text, 0, name},
          {ksicache::ValueType::unsignedNumber, sizes[moment][i], {}}};
      lines.Row(row);
    }
    lines.End(true);
  }
  // All together, "b" and "c"; "a" is always the same.
  EXPECT_EQ(lines.WorstMoments(0, false, 3), (Places{1, 1, 3}));
  EXPECT_EQ(lines.WorstMoments(0, true, 3), (Places{3, 3, 2}));
  EXPECT_EQ(lines.WorstMoments(0, false, 1), (Places{1, 1}));
  EXPECT_EQ(lines.ThingsToJson(), R"(["a","b","c"])");
}

TEST(ThingNames, HaveNumbersWhereTheyAreThoseOfSeveral) {
  ksicache::ThingNames names;
  for (const int moment : {0, 1}) {
    names.Add("alone", 4);
    names.Add("cc1plus", (int64_t{1} << 40) + 11048 + moment);
    names.Add("", 7);
  }
  EXPECT_EQ(names.Of("alone", 4), "alone");
  EXPECT_EQ(names.Of("cc1plus", (int64_t{1} << 40) + 11049), "cc1plus 11049");
  EXPECT_EQ(names.Of("", 7), "(no name)");
}

TEST(Problems, AreToldWithTheirTimes) {
  constexpr int64_t kSecond = 1'000'000;
  ksicache::Problems problems;
  problems.Add("of none");
  problems.At(20 * kSecond);
  problems.Add("twice");
  problems.At(10 * kSecond);
  problems.Add("once");
  problems.Add("twice");
  problems.Add("twice");
  EXPECT_EQ(problems.All(), (Texts{"of none", "twice", "once"}));
  EXPECT_EQ(problems.WithTimes(),
            (Texts{"of none", "twice, at 1970-01-01T00:00:10Z to 1970-01-01T00:00:20Z, 2 moments",
                   "once, at 1970-01-01T00:00:10Z"}));
  EXPECT_EQ(problems.FirstTimes(), (std::vector<int64_t>{10 * kSecond, 10 * kSecond}));
  for (int64_t i = 0; i < 2000; ++i) {
    problems.At(i * kSecond);
    problems.Add("often");
  }
  EXPECT_EQ(problems.WithTimes().back(),
            "often, at 1970-01-01T00:00:00Z and later, 1000 moments or more");
}

}  // namespace
}  // namespace ksi
