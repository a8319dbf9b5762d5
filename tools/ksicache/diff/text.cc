#include "tools/ksicache/diff/text.h"

#include <array>
#include <cmath>
#include <cstdio>

#include "knvlibs/characters.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

std::string Formatted(const char* format, double number) {
  std::array<char, 400> text = {};
  static_cast<void>(std::snprintf(text.data(), text.size(), format, number));
  return text.data();
}

size_t CharactersIn(std::string_view text) {
  size_t count = 0;
  for (; !text.empty(); ++count) text.remove_prefix(ksi::FirstOf(text).size);
  return count;
}

// The bytes of the first characters.
std::string_view First(std::string_view text, size_t count) {
  size_t size = 0;
  for (; count > 0 && size < text.size(); --count) size += ksi::FirstOf(text.substr(size)).size;
  return text.substr(0, size);
}

}  // namespace

std::string DurationText(double seconds) {
  struct Unit {
    const char* name;
    int64_t size;
  };
  constexpr Unit kUnits[] = {{"d", 86400}, {"h", 3600}, {"m", 60}, {"s", 1}};
  const auto whole = static_cast<int64_t>(std::llround(std::fabs(seconds)));
  const std::string sign = seconds < 0 ? "-" : "";
  for (size_t i = 0; i + 1 < std::size(kUnits); ++i) {
    if (whole < kUnits[i].size) continue;
    const int64_t rest = whole % kUnits[i].size / kUnits[i + 1].size;
    return sign + std::to_string(whole / kUnits[i].size) + kUnits[i].name + " " +
           std::to_string(rest) + kUnits[i + 1].name;
  }
  return sign + std::to_string(whole) + "s";
}

std::string NumberText(std::optional<int64_t> number) {
  return number ? std::to_string(*number) : kNoFigure;
}

std::string RateText(std::optional<double> rate) {
  if (!rate) return kNoFigure;
  const bool isSmall = *rate != 0 && std::fabs(*rate) < 0.1;
  return Formatted(isSmall ? "%.2g" : "%.1f", *rate);
}

std::string PartText(std::optional<int64_t> part, std::optional<int64_t> whole) {
  if (!part || !whole || *whole == 0) return kNoFigure;
  const double percent = 100 * static_cast<double>(*part) / static_cast<double>(*whole);
  if (percent != 0 && std::fabs(percent) < 0.5) return percent < 0 ? ">-1%" : "<1%";
  return Formatted("%.0f%%", percent);
}

std::string OnTheLeft(std::string_view text, size_t width) {
  constexpr std::string_view kCut = "...";
  std::string shown = Printable(text);
  const size_t count = CharactersIn(shown);
  if (count <= width) return shown + std::string(width - count, ' ');
  const size_t begin = (width - kCut.size()) / 2;
  const size_t end = width - kCut.size() - begin;
  const size_t skipped = First(shown, count - end).size();
  return std::string(First(shown, begin)) + std::string(kCut) + shown.substr(skipped);
}

std::string OnTheRight(std::string_view text, size_t width) {
  const std::string shown = Printable(text);
  const size_t count = CharactersIn(shown);
  return std::string(count < width ? width - count : 0, ' ') + shown;
}

}  // namespace ksicache
