// How figures stand in the tables that people read, which are 80 columns wide.
#ifndef TOOLS_KSICACHE_DIFF_TEXT_H_
#define TOOLS_KSICACHE_DIFF_TEXT_H_

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace ksicache {

// The first `top` of what is shown, or all.
template <class Shown>
std::span<const Shown> FirstOf(const std::vector<Shown>& all, size_t top) {
  return std::span(all).first(std::min(top, all.size()));
}

// What stands for a figure that has no value.
inline constexpr const char* kNoFigure = "-";

// "5m 0s", "2d 3h", "1y 4d": the two largest units.
std::string DurationText(double seconds);

std::string NumberText(std::optional<int64_t> number);

// With one digit behind the point, and with three where it would be 0.
std::string RateText(std::optional<double> rate);

// The part of a whole in percent: "12%"; "<1%" is one that is less than that either way. None
// without a whole.
std::string PartText(std::optional<int64_t> part, std::optional<int64_t> whole);

// The text in `width` columns of a terminal; one that is too long loses its middle on the left, and
// keeps all on the right, where a space stands before it.
std::string OnTheLeft(std::string_view text, size_t width);
std::string OnTheRight(std::string_view text, size_t width);

// A name, with the number of its thing unless that is less than 0; of a process of Linux, which has
// the number of a group above all those of control groups, it is the kernel's own.
std::string NameText(std::string_view name, int64_t number);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_TEXT_H_
