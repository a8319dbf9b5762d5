// How a figure went that grew: all the time, from some time on, or in steps.
#ifndef TOOLS_KSICACHE_DIFF_COURSE_H_
#define TOOLS_KSICACHE_DIFF_COURSE_H_

#include <cstddef>
#include <optional>
#include <span>

#include "tools/ksicache/diff/slope.h"

namespace ksicache {

struct Course {
  double growth;
  double perSecond;  // while it grew
  // When it began to grow and when it stopped; none if not within the time.
  std::optional<double> begun = std::nullopt;
  std::optional<double> stopped = std::nullopt;
  // In how many steps, and when the last of them was; 0: not in steps.
  size_t steps = 0;
  double lastStep = 0;
};

// Of all the following x does not fall; none if it did not grow so.

// It grew steadily as far as its Trend tells.
std::optional<Course> SteadyCourse(std::span<const Point> points);

// It grew steadily from some time on, in the second half of the time, by more than three times what
// it moved in the first half.
std::optional<Course> LateCourse(std::span<const Point> points);

// It grew in a few steps, was level in between and never fell.
std::optional<Course> SteppedCourse(std::span<const Point> points);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_COURSE_H_
