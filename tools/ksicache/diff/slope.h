// Slopes that a few wild points, steps and saw-teeth do not bend.
#ifndef TOOLS_KSICACHE_DIFF_SLOPE_H_
#define TOOLS_KSICACHE_DIFF_SLOPE_H_

#include <cstddef>
#include <optional>
#include <span>
#include <vector>

namespace ksicache {

struct Point {
  double x;
  double y;
};

// The median of the slopes between all pairs of points, half of which may be anything (Theil and
// Sen). Of more than kMostPairedPoints so many, evenly spread, are taken. 0 if no two have
// different x.
inline constexpr size_t kMostPairedPoints = 400;
double MedianSlope(std::span<const Point> points);

// REQUIRES: there are numbers. Puts them into another order.
double MedianOf(std::span<double> numbers);

// The medians of so many stretches of a series, each as many points long, in their middles.
// REQUIRES: there are no fewer points.
std::vector<Point> MediansOf(std::span<const Point> points, size_t stretches);

// The fewest points that a trend can be told from: one for each of its stretches.
inline constexpr size_t kStretches = 12;

// A line through the medians of the stretches of a series, each as many points long.
struct Trend {
  double growth;     // of the line, from the first point to the last
  double wander;     // between the medians that lie farthest above and below the line
  double scatter;    // the standard deviation that noise alone would give the growth
  double roughness;  // how much of what is about the line comes anew with each point: 1 of noise,
                     // about 0 of what is carried on from point to point
  double grown;      // from the first median to the last
  size_t rises;      // of the medians, above the one before
  size_t falls;      // and below it

  // Whether it grew all the time. Where the points are moved by noise alone, the growth has to
  // stand out from that. Where chance carries a figure on from point to point it moves far beyond
  // the noise, and such a figure hardly ever grows by so many times its wander; no more does one
  // that goes up and down, or in a step. One that began or ended to grow meanwhile wanders for that
  // alone; it is told by never having gone back.
  bool IsSteady() const {
    constexpr double kLeastRoughness = 0.6;
    constexpr double kMostWander = 7.3;
    constexpr double kTimesScatter = 8;
    constexpr double kTimesWander = 8;
    constexpr double kTimesWanderRising = 3;
    constexpr size_t kMostRests = 3;
    if (growth <= 0) return false;
    const bool isNoise = roughness > kLeastRoughness && wander < kMostWander * scatter;
    const bool isRising = falls == 0 && rises + kMostRests >= kStretches - 1;
    return growth > (isRising ? kTimesWanderRising : kTimesWander) * wander ||
           (isNoise && growth > kTimesScatter * scatter);
  }
};

// None of too few points.
// REQUIRES: x does not fall.
std::optional<Trend> TrendOf(std::span<const Point> points);

// When a series grew that is level before and after.
struct Ramp {
  double begin;
  double end;
};

// All of the time unless a line that is level before or behind lies much closer to the points than
// a straight one, and so for more than a few points.
// REQUIRES: x does not fall, and there are kStretches points.
Ramp RampOf(std::span<const Point> points);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_SLOPE_H_
