#include "tools/ksicache/diff/slope.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <vector>

namespace ksicache {
namespace {

// Points at 0, 1, 2, ...
template <class Of>
std::vector<Point> Series(int count, Of&& of) {
  std::vector<Point> points;
  for (int i = 0; i < count; ++i) points.push_back({double(i), of(double(i))});
  return points;
}

TEST(MedianSlope, IsThatOfALine) {
  EXPECT_DOUBLE_EQ(MedianSlope(Series(20, [](double x) { return 3 * x - 7; })), 3);
  EXPECT_DOUBLE_EQ(MedianSlope(Series(1000, [](double x) { return -2 * x; })), -2);
}

TEST(MedianSlope, WildPointsDoNotBendIt) {
  EXPECT_DOUBLE_EQ(
      MedianSlope(Series(20, [](double x) { return x == 3 || x == 19 ? 1e9 : 5 * x; })), 5);
}

TEST(MedianSlope, WithoutARunThereIsNone) {
  EXPECT_EQ(MedianSlope({}), 0);
  const std::vector<Point> points = {{1, 2}, {1, 5}};
  EXPECT_EQ(MedianSlope(points), 0);
}

TEST(Trend, TakesAPointForEachStretch) {
  EXPECT_FALSE(TrendOf(Series(11, [](double x) { return x; })).has_value());
  EXPECT_TRUE(TrendOf(Series(12, [](double x) { return x; })).has_value());
}

TEST(Trend, ALineIsSteady) {
  const Trend trend = *TrendOf(Series(25, [](double x) { return 10 + 2 * x; }));
  EXPECT_DOUBLE_EQ(trend.growth, 48);
  EXPECT_NEAR(trend.wander, 0, 1e-9);
  EXPECT_TRUE(trend.IsSteady());
  EXPECT_FALSE(TrendOf(Series(25, [](double x) { return 10 - 2 * x; }))->IsSteady());
  EXPECT_FALSE(TrendOf(Series(25, [](double) { return 10.0; }))->IsSteady());
}

TEST(Trend, ASlowLeakBelowNoiseIsSteady) {
  // Noise of two thirds of what it grows by.
  const auto noise = [](double x) { return std::sin(x * x * 12.9898) * 100; };
  EXPECT_TRUE(TrendOf(Series(200, [&](double x) { return x * 1.5 + noise(x); }))->IsSteady());
  EXPECT_FALSE(TrendOf(Series(200, noise))->IsSteady());
}

// What can be told does not change at some number of points.
TEST(Trend, FewPointsTellOfALeakBelowNoise) {
  const auto noise = [](double x) { return std::sin(x * x * 12.9898); };
  for (int count = 40; count < 200; ++count) {
    EXPECT_TRUE(
        TrendOf(Series(count, [&](double x) { return x * 10 / count + noise(x); }))->IsSteady())
        << count;
    EXPECT_FALSE(TrendOf(Series(count, noise))->IsSteady()) << count;
  }
}

TEST(Ramp, IsWhereASeriesGrows) {
  const auto rampOf = [](auto&& of) { return RampOf(Series(97, of)); };
  const Ramp line = rampOf([](double x) { return 3 * x; });
  EXPECT_EQ(line.begin, 0);
  EXPECT_EQ(line.end, 96);
  const Ramp stopped = rampOf([](double x) { return std::min(x, 72.0); });
  EXPECT_EQ(stopped.begin, 0);
  EXPECT_EQ(stopped.end, 72);
  const Ramp both = rampOf([](double x) { return std::clamp(x, 24.0, 60.0); });
  EXPECT_EQ(both.begin, 24);
  EXPECT_EQ(both.end, 60);
  // A saw-tooth on its way up has no part that grows alone.
  const Ramp saw = rampOf([](double x) { return x / 4 + std::fmod(x, 12); });
  EXPECT_EQ(saw.begin, 0);
  EXPECT_EQ(saw.end, 96);
}

TEST(Trend, WhatGoesUpAndDownIsNot) {
  EXPECT_FALSE(TrendOf(Series(200, [](double x) { return std::fmod(x, 30); }))->IsSteady());
  EXPECT_FALSE(TrendOf(Series(200, [](double x) { return std::fmod(x, 150); }))->IsSteady());
  EXPECT_FALSE(TrendOf(Series(200, [](double x) { return std::sin(x / 16); }))->IsSteady());
  EXPECT_FALSE(TrendOf(Series(200, [](double x) { return x < 120 ? 1.0 : 9.0; }))->IsSteady());
}

}  // namespace
}  // namespace ksicache
