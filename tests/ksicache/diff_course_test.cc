#include "tools/ksicache/diff/course.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>
#include <vector>

namespace ksicache {
namespace {

// Points from 0 to 1.
std::vector<Point> Noisy(size_t count, double (*figure)(double), double noise) {
  std::mt19937 random(7);
  std::normal_distribution<double> normal;
  std::vector<Point> points;
  for (size_t i = 0; i < count; ++i) {
    const double x = static_cast<double>(i) / static_cast<double>(count);
    points.push_back({x, figure(x) + noise * normal(random)});
  }
  return points;
}

TEST(Course, BeginsLate) {
  for (const size_t count : {60U, 200U}) {
    SCOPED_TRACE(count);
    const std::vector<Point> points = Noisy(
        count, [](double x) { return 1000 + 300 * std::max(0.0, x - 0.7); }, 2);
    EXPECT_FALSE(SteadyCourse(points));
    const std::optional<Course> course = LateCourse(points);
    ASSERT_TRUE(course);
    EXPECT_NEAR(*course->begun, 0.7, 0.05);
    EXPECT_NEAR(course->growth, 85, 15);
    EXPECT_NEAR(course->perSecond, 300, 30);
    EXPECT_FALSE(course->stopped);
  }
}

TEST(Course, IsNotLateWhatOnlySwings) {
  EXPECT_FALSE(LateCourse(Noisy(
      200, [](double x) { return std::sin(x * 9); }, 0.02)));
  EXPECT_FALSE(LateCourse(Noisy(
      200, [](double x) { return x > 0.8 ? 100.0 : 0.0; }, 1)));
  EXPECT_FALSE(LateCourse(Noisy(
      200, [](double) { return 5.0; }, 1)));
  EXPECT_FALSE(LateCourse(Noisy(
      200, [](double) { return 5.0; }, 0)));
}

TEST(Course, ClimbsSteps) {
  for (const double noise : {0.0, 1.0, 4.0}) {
    SCOPED_TRACE(noise);
    const std::vector<Point> points = Noisy(
        200, [](double x) { return std::floor(x * 5) * 100; }, noise);
    EXPECT_FALSE(SteadyCourse(points));
    const std::optional<Course> course = SteppedCourse(points);
    ASSERT_TRUE(course);
    EXPECT_EQ(course->steps, 4U);
    EXPECT_NEAR(course->lastStep, 0.8, 0.03);
    EXPECT_NEAR(course->growth, 400, 10);
  }
}

TEST(Course, ClimbsNoStepsThatGoDownOrOn) {
  const auto isStepped = [](double (*figure)(double), double noise) {
    return SteppedCourse(Noisy(200, figure, noise)).has_value();
  };
  EXPECT_FALSE(isStepped([](double x) { return x > 0.5 ? 100.0 : 0.0; }, 1));
  EXPECT_FALSE(isStepped([](double x) { return x * 100; }, 0.1));
  EXPECT_FALSE(isStepped([](double x) { return x > 0.9 ? 0.0 : std::floor(x * 5) * 100; }, 1));
  EXPECT_FALSE(isStepped([](double x) { return std::floor(x * 5) * 3; }, 4));
  EXPECT_FALSE(isStepped([](double) { return 7.0; }, 0));
}

}  // namespace
}  // namespace ksicache
