#include <gtest/gtest.h>

#include <cstdint>

#include "tools/ksicache/diff/largest_growth.h"

namespace ksicache {
namespace {

TEST(LargestGrowth, IsThatOfWhatChanged) {
  LargestGrowth largest;
  EXPECT_EQ(largest.Find(), 0);
  largest.Changed(-5);
  EXPECT_EQ(largest.Find(), 0);
  largest.Changed(7);
  largest.Changed(3);
  EXPECT_EQ(largest.Find(), 7);
}

// The largest takes the place of the largest, so that no order of them is an alarm.
TEST(LargestGrowth, TakesWhatCameForWhatHasGone) {
  LargestGrowth largest;
  for (const int64_t had : {100, 400, 200}) largest.Gone("worker", had);
  for (const int64_t has : {210, 110, 405}) largest.Came("worker", has);
  EXPECT_EQ(largest.Find(), 10);
  largest.Came("worker", 60);
  largest.Gone("other", 1000);
  EXPECT_EQ(largest.Find(), 60);
}

TEST(LargestGrowth, OneMoreHasGrownByAllItHas) {
  LargestGrowth largest;
  largest.Gone("worker", 100);
  for (const int64_t has : {90, 80}) largest.Came("worker", has);
  EXPECT_EQ(largest.Find(), 80);
}

TEST(LargestGrowth, HoldsAnyFigure) {
  LargestGrowth largest;
  largest.Gone("worker", INT64_MIN);
  largest.Came("worker", INT64_MAX);
  EXPECT_EQ(largest.Find(), INT64_MAX);
}

}  // namespace
}  // namespace ksicache
