#include "tools/ksicache/diff/course.h"

#include <algorithm>
#include <cmath>
#include <vector>

namespace ksicache {
namespace {

std::span<const Point> Between(std::span<const Point> points, const Ramp& ramp) {
  const auto begin = std::ranges::lower_bound(points, ramp.begin, {}, &Point::x);
  const auto end = std::ranges::upper_bound(points, ramp.end, {}, &Point::x);
  return {begin, end};
}

Course OnRamp(std::span<const Point> points, const Ramp& ramp, double growth) {
  Course course = {growth, MedianSlope(Between(points, ramp))};
  if (ramp.begin > points.front().x) course.begun = ramp.begin;
  if (ramp.end < points.back().x) course.stopped = ramp.end;
  return course;
}

// Whether it ended far above all of its first half.
bool RoseLate(std::span<const Point> points) {
  const std::vector<Point> medians = MediansOf(points, kStretches);
  const auto half = std::span(medians).first(kStretches / 2);
  const auto [least, most] = std::ranges::minmax(half, {}, &Point::y);
  return medians.back().y - most.y > 3 * (most.y - least.y);
}

// The standard deviation of what comes anew with each point: half of the steps from one to the next
// are smaller than 0.954 times that, however large the others are.
double NoiseOf(std::span<const Point> points) {
  std::vector<double> steps;
  for (size_t i = 1; i < points.size(); ++i) {
    steps.push_back(std::fabs(points[i].y - points[i - 1].y));
  }
  return MedianOf(steps) / 0.954;
}

// The steps of a series of medians, each of which may take two of them.
class Stairs {
 public:
  // `least`: what moves less has not moved.
  Stairs(std::span<const Point> medians, double least) : medians_(medians), least_(least) {
    for (size_t i = 1; i < medians_.size() && isSound_; ++i) Take(i);
  }

  bool AreFew() const {
    constexpr size_t kFewest = 3;
    constexpr size_t kMost = 7;
    constexpr double kLargestPart = 0.6;
    const double grown = medians_.back().y - medians_.front().y;
    return isSound_ && count_ >= kFewest && count_ <= kMost && largest_ <= kLargestPart * grown;
  }

  size_t Count() const { return count_; }
  double Last() const { return last_; }

 private:
  void Take(size_t i) {
    const double rise = medians_[i].y - medians_[i - 1].y;
    if (rise <= least_) {
      if (medians_[i].y < level_ - least_) isSound_ = false;
      rising_ = 0;
      return;
    }
    if (++rising_ == 1) {
      ++count_;
      height_ = 0;
    }
    // What goes on rising climbs no stairs.
    if (rising_ > 2) isSound_ = false;
    height_ += rise;
    largest_ = std::max(largest_, height_);
    level_ = medians_[i].y;
    last_ = medians_[i].x;
  }

  std::span<const Point> medians_;
  double least_;
  double level_ = medians_.front().y;
  bool isSound_ = true;
  size_t rising_ = 0;  // so many of the last medians, one after the other
  double height_ = 0;  // of the step at hand
  double largest_ = 0;
  size_t count_ = 0;
  double last_ = 0;
};

}  // namespace

std::optional<Course> SteadyCourse(std::span<const Point> points) {
  const std::optional<Trend> trend = TrendOf(points);
  if (!trend || !trend->IsSteady()) return std::nullopt;
  return OnRamp(points, RampOf(points), trend->grown);
}

std::optional<Course> LateCourse(std::span<const Point> points) {
  if (points.size() < kStretches || !RoseLate(points)) return std::nullopt;
  const Ramp ramp = RampOf(points);
  const std::optional<Trend> trend = TrendOf(Between(points, ramp));
  if (ramp.begin == points.front().x || !trend || !trend->IsSteady()) return std::nullopt;
  return OnRamp(points, ramp, trend->grown);
}

std::optional<Course> SteppedCourse(std::span<const Point> points) {
  constexpr size_t kMostMedians = 48;
  if (points.size() < kStretches) return std::nullopt;
  const std::vector<Point> medians =
      MediansOf(points, std::clamp(points.size() / 3, kStretches, kMostMedians));
  // The medians of three points scatter by 0.7 of what the points do.
  const Stairs stairs(medians, 6 * 0.7 * NoiseOf(points));
  if (!stairs.AreFew()) return std::nullopt;
  const double growth = medians.back().y - medians.front().y;
  const double run = medians.back().x - medians.front().x;
  return Course{.growth = growth,
                .perSecond = run > 0 ? growth / run : 0,
                .steps = stairs.Count(),
                .lastStep = stairs.Last()};
}

}  // namespace ksicache
