#include "tools/ksicache/export/metric_rows.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <string>

namespace ksicache {
namespace {

std::string Added(MetricRows& rows, std::string labels) {
  rows.Add(labels, {});
  return labels;
}

TEST(MetricRows, CountsThoseOfOneName) {
  MetricRows rows;
  rows.Clear(0);
  for (int64_t moment = 0; moment < 2; ++moment) {
    ASSERT_TRUE(rows.BeginMoment("h", moment, moment));
    EXPECT_EQ(Added(rows, R"({name="a")"), R"({name="a")");
    EXPECT_EQ(Added(rows, R"({name="b")"), R"({name="b")");
    EXPECT_EQ(Added(rows, R"({name="a")"), R"({name="a",nth="2")");
    EXPECT_EQ(Added(rows, R"({name="a")"), R"({name="a",nth="3")");
    EXPECT_EQ(Added(rows, "{"), "{");
    EXPECT_EQ(Added(rows, "{"), R"({nth="2")");
  }
  EXPECT_EQ(rows.LabelsOf(2), R"({name="a",nth="2")");
  EXPECT_EQ(rows.At(2).series, rows.At(8).series);
}

// Whoever gives all things one name makes none of this slow.
TEST(MetricRows, LooksUpEachRowTwiceAtMost) {
  constexpr uint64_t kRows = 10'000;
  MetricRows rows;
  rows.Clear(0);
  for (int64_t moment = 0; moment < 2; ++moment) {
    ASSERT_TRUE(rows.BeginMoment("h", moment, moment));
    for (uint64_t i = 0; i < kRows; ++i) Added(rows, R"({name="a")");
  }
  EXPECT_EQ(rows.Count(), 2 * kRows);
  EXPECT_LE(rows.LookUps(), 4 * kRows);
}

// A name may look like the count of others.
TEST(MetricRows, TakesNoLabelTwice) {
  MetricRows rows;
  rows.Clear(0);
  ASSERT_TRUE(rows.BeginMoment("h", 0, 0));
  Added(rows, R"({a="",nth="2")");
  Added(rows, R"({a="")");
  EXPECT_EQ(Added(rows, R"({a="")"), R"({a="",nth="3")");
}

}  // namespace
}  // namespace ksicache
