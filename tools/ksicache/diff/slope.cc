#include "tools/ksicache/diff/slope.h"

#include <algorithm>
#include <cmath>
#include <vector>

namespace ksicache {
namespace {

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

// How far points lie off a line. The steps from one to the next tell how much of that is noise:
// what is carried on from point to point makes small steps on its way far from the line.
struct Rest {
  double noise;   // its variance by the steps
  double spread;  // its variance as a whole
};

Rest RestOf(std::span<const Point> points, double slope) {
  const auto off = [&](size_t i) { return points[i].y - slope * (points[i].x - points[0].x); };
  double mean = 0;
  for (size_t i = 0; i < points.size(); ++i) mean += off(i) / static_cast<double>(points.size());
  Rest rest = {0, 0};
  for (size_t i = 0; i < points.size(); ++i) {
    rest.spread += std::pow(off(i) - mean, 2);
    if (i > 0) rest.noise += std::pow(off(i) - off(i - 1), 2) / 2;
  }
  const auto steps = static_cast<double>(points.size() - 1);
  return {rest.noise / steps, rest.spread / steps};
}

// The squares of how far points lie off the ramp between two times that comes closest to them; the
// greatest number if there is none. What is less than a hundredth of their height counts as that.
double OffRamp(std::span<const Point> points, const Ramp& ramp) {
  const auto count = static_cast<double>(points.size());
  const auto at = [&](const Point& point) {
    return std::clamp(point.x, ramp.begin, ramp.end) - ramp.begin;
  };
  Point mean = {0, 0};
  for (const Point& point : points) mean = {mean.x + at(point) / count, mean.y + point.y / count};
  double xx = 0;
  double xy = 0;
  double yy = 0;
  for (const Point& point : points) {
    const Point off = {at(point) - mean.x, point.y - mean.y};
    xx += off.x * off.x;
    xy += off.x * off.y;
    yy += off.y * off.y;
  }
  return xx == 0 ? yy : std::max(yy - xy * xy / xx, yy / 1e4);
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

double MedianOf(std::span<double> numbers) {
  const auto middle = numbers.begin() + static_cast<std::ptrdiff_t>(numbers.size() / 2);
  std::ranges::nth_element(numbers, middle);
  if (numbers.size() % 2 != 0) return *middle;
  return (*middle + *std::max_element(numbers.begin(), middle)) / 2;
}

double MedianSlope(std::span<const Point> points) {
  if (points.size() <= kMostPairedPoints) return MedianSlopeOfAll(points);
  std::vector<Point> some;
  for (size_t i = 0; i < kMostPairedPoints; ++i) {
    some.push_back(points[i * (points.size() - 1) / (kMostPairedPoints - 1)]);
  }
  return MedianSlopeOfAll(some);
}

std::vector<Point> MediansOf(std::span<const Point> points, size_t stretches) {
  std::vector<Point> medians;
  std::vector<double> scratch;
  for (size_t i = 0; i < stretches; ++i) {
    const size_t begin = i * points.size() / stretches;
    const size_t end = (i + 1) * points.size() / stretches;
    medians.push_back(MiddleOf(points.subspan(begin, end - begin), scratch));
  }
  return medians;
}

std::optional<Trend> TrendOf(std::span<const Point> points) {
  if (points.size() < kStretches) return std::nullopt;
  const std::vector<Point> medians = MediansOf(points, kStretches);
  const double slope = MedianSlopeOfAll(medians);
  double above = -1e300;
  double below = 1e300;
  for (const Point& median : medians) {
    const double off = median.y - slope * (median.x - points.front().x);
    above = std::max(above, off);
    below = std::min(below, off);
  }
  const Rest rest = RestOf(points, slope);
  // The slope of a line through evenly spread points with noise of variance 1 has that of 12
  // divided by their number and the square of the time.
  Trend trend = {.growth = slope * (points.back().x - points.front().x),
                 .wander = above - below,
                 .scatter = std::sqrt(12 * rest.noise / static_cast<double>(points.size())),
                 .roughness = rest.spread == 0 ? 1 : rest.noise / rest.spread,
                 .grown = medians.back().y - medians.front().y,
                 .rises = 0,
                 .falls = 0};
  for (size_t i = 1; i < kStretches; ++i) {
    if (medians[i].y > medians[i - 1].y) ++trend.rises;
    if (medians[i].y < medians[i - 1].y) ++trend.falls;
  }
  return trend;
}

Ramp RampOf(std::span<const Point> points) {
  constexpr size_t kPlaces = 48;
  constexpr size_t kShortest = kPlaces / 12;
  const auto place = [&](size_t i) { return points[i * (points.size() - 1) / kPlaces].x; };
  const Ramp whole = {points.front().x, points.back().x};
  const double most = OffRamp(points, whole) / 2;
  Ramp best = whole;
  double least = most;
  for (size_t begin = 0; begin + kShortest <= kPlaces; ++begin) {
    for (size_t end = begin + kShortest; end <= kPlaces; ++end) {
      const Ramp ramp = {place(begin), place(end)};
      const double off = OffRamp(points, ramp);
      if (off >= least) continue;
      least = off;
      best = ramp;
    }
  }
  // A few points at either end are no rest.
  const double few = 2 * (whole.end - whole.begin) / kPlaces;
  if (best.begin < whole.begin + few) best.begin = whole.begin;
  if (best.end > whole.end - few) best.end = whole.end;
  return best;
}

}  // namespace ksicache
