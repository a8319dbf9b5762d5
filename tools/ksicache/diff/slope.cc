#include "tools/ksicache/diff/slope.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <vector>

namespace ksicache {
namespace {

// REQUIRES: there are numbers.
double MedianOf(std::span<double> numbers) {
  const auto middle = numbers.begin() + static_cast<std::ptrdiff_t>(numbers.size() / 2);
  std::ranges::nth_element(numbers, middle);
  if (numbers.size() % 2 != 0) return *middle;
  return (*middle + *std::max_element(numbers.begin(), middle)) / 2;
}

double MedianSlopeOfAll(std::span<const Point> points) {
  std::vector<double> slopes;
  slopes.reserve(points.size() * points.size() / 2);
  for (size_t i = 0; i < points.size(); ++i) {
    for (size_t j = i + 1; j < points.size(); ++j) {
      const double run = points[j].x - points[i].x;
      if (run != 0) slopes.push_back((points[j].y - points[i].y) / run);
    }
  }
  return slopes.empty() ? 0 : MedianOf(slopes);
}

// What independent noise would make the medians of stretches wander by: of twelve such figures the
// largest and the smallest are 3.26 standard deviations apart, and a median scatters 1.25 times as
// much as a mean. How much noise there is, the steps from one point to the next tell; in short
// stretches it cannot be told from what is carried on.
double NoiseOf(std::span<const Point> points) {
  constexpr size_t kFewest = 8 * kStretches;
  if (points.size() < kFewest) return 0;
  double squares = 0;
  for (size_t i = 1; i < points.size(); ++i) {
    const double step = points[i].y - points[i - 1].y;
    squares += step * step;
  }
  const double variance = squares / 2 / static_cast<double>(points.size() - 1);
  const double length = static_cast<double>(points.size()) / kStretches;
  return 3.26 * 1.25 * std::sqrt(variance / length);
}

// The median of a stretch, in its middle.
Point MiddleOf(std::span<const Point> stretch, std::vector<double>& scratch) {
  scratch.clear();
  double x = 0;
  for (const Point& point : stretch) {
    x += point.x;
    scratch.push_back(point.y);
  }
  return {x / static_cast<double>(stretch.size()), MedianOf(scratch)};
}

}  // namespace

double MedianSlope(std::span<const Point> points) {
  if (points.size() <= kMostPairedPoints) return MedianSlopeOfAll(points);
  std::vector<Point> some;
  for (size_t i = 0; i < kMostPairedPoints; ++i) {
    some.push_back(points[i * (points.size() - 1) / (kMostPairedPoints - 1)]);
  }
  return MedianSlopeOfAll(some);
}

std::optional<Trend> TrendOf(std::span<const Point> points) {
  if (points.size() < kStretches) return std::nullopt;
  std::array<Point, kStretches> medians;
  std::vector<double> scratch;
  for (size_t i = 0; i < kStretches; ++i) {
    const size_t begin = i * points.size() / kStretches;
    const size_t end = (i + 1) * points.size() / kStretches;
    medians[i] = MiddleOf(points.subspan(begin, end - begin), scratch);
  }
  const double slope = MedianSlopeOfAll(medians);
  double above = -1e300;
  double below = 1e300;
  for (const Point& median : medians) {
    const double off = median.y - slope * (median.x - points.front().x);
    above = std::max(above, off);
    below = std::min(below, off);
  }
  Trend trend = {.growth = slope * (points.back().x - points.front().x),
                 .wander = above - below,
                 .noise = NoiseOf(points),
                 .grown = medians.back().y - medians.front().y,
                 .rises = 0,
                 .falls = 0};
  for (size_t i = 1; i < kStretches; ++i) {
    if (medians[i].y > medians[i - 1].y) ++trend.rises;
    if (medians[i].y < medians[i - 1].y) ++trend.falls;
  }
  return trend;
}

}  // namespace ksicache
