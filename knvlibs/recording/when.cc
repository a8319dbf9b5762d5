#include "knvlibs/recording/when.h"

#include <algorithm>
#include <charconv>
#include <ctime>
#include <initializer_list>

#include "knvlibs/times.h"

namespace ksi {
namespace {

// Reads a pattern: a digit for each '#', else the character itself. The numbers are those of each
// run of digits.
bool Match(std::string_view text, std::string_view pattern, std::initializer_list<int*> numbers) {
  if (text.size() != pattern.size()) return false;
  const auto* number = numbers.begin();
  bool inNumber = false;
  for (size_t i = 0; i < text.size(); ++i) {
    if (pattern[i] != '#') {
      if (text[i] != pattern[i]) return false;
      if (inNumber) ++number;
      inNumber = false;
      continue;
    }
    if (text[i] < '0' || text[i] > '9') return false;
    **number = (inNumber ? **number * 10 : 0) + (text[i] - '0');
    inNumber = true;
  }
  return true;
}

// A time of day, with a date or without.
struct Clock {
  struct tm parts = {};
  bool hasDate = false;
  bool isUtc = false;

  // The end of its second; none if there is no such time.
  std::optional<int64_t> Time() const {
    struct tm wanted = parts;
    wanted.tm_isdst = -1;
    const time_t seconds = isUtc ? timegm(&wanted) : mktime(&wanted);
    // What is no date has become another one; clocks that are put forward leave out an hour only.
    if (wanted.tm_mday != parts.tm_mday || wanted.tm_mon != parts.tm_mon) return std::nullopt;
    int64_t time = 0;
    if (__builtin_mul_overflow(int64_t{seconds}, kSecond, &time) ||
        __builtin_add_overflow(time, kSecond - 1, &time)) {
      return std::nullopt;
    }
    return time;
  }
};

std::optional<Clock> ClockOf(std::string_view text) {
  Clock clock;
  clock.isUtc = text.ends_with('Z');
  if (clock.isUtc) text.remove_suffix(1);
  struct tm& to = clock.parts;
  clock.hasDate =
      Match(text, "####-##-##T##:##:##",
            {&to.tm_year, &to.tm_mon, &to.tm_mday, &to.tm_hour, &to.tm_min, &to.tm_sec}) ||
      Match(text, "####-##-##T##:##",
            {&to.tm_year, &to.tm_mon, &to.tm_mday, &to.tm_hour, &to.tm_min});
  if (clock.hasDate) {
    to.tm_year -= 1900;
    to.tm_mon -= 1;
    if (to.tm_mon < 0 || to.tm_mon > 11 || to.tm_mday < 1 || to.tm_mday > 31) return std::nullopt;
  } else {
    to = {};
    if (!Match(text, "##:##:##", {&to.tm_hour, &to.tm_min, &to.tm_sec}) &&
        !Match(text, "##:##", {&to.tm_hour, &to.tm_min})) {
      return std::nullopt;
    }
  }
  if (to.tm_hour > 23 || to.tm_min > 59 || to.tm_sec > 59) return std::nullopt;
  return clock;
}

// The latest time of day that is not after `last`.
std::optional<int64_t> LatestOf(Clock clock, int64_t last) {
  const time_t seconds = last / kSecond;
  struct tm day = {};
  if ((clock.isUtc ? gmtime_r(&seconds, &day) : localtime_r(&seconds, &day)) == nullptr) {
    return std::nullopt;
  }
  clock.parts.tm_year = day.tm_year;
  clock.parts.tm_mon = day.tm_mon;
  clock.parts.tm_mday = day.tm_mday;
  const std::optional<int64_t> time = clock.Time();
  if (!time || *time - (kSecond - 1) <= last) return time;
  // The day before, by its noon, which every day has.
  const time_t noon = seconds - (int64_t{day.tm_hour} + 12) * (kHour / kSecond);
  if ((clock.isUtc ? gmtime_r(&noon, &day) : localtime_r(&noon, &day)) == nullptr) {
    return std::nullopt;
  }
  clock.parts.tm_year = day.tm_year;
  clock.parts.tm_mon = day.tm_mon;
  clock.parts.tm_mday = day.tm_mday;
  return clock.Time();
}

std::optional<int64_t> UnitOf(char letter) {
  switch (letter) {
    case 's':
      return kSecond;
    case 'm':
      return kMinute;
    case 'h':
      return kHour;
    case 'd':
      return kDay;
    default:
      return std::nullopt;
  }
}

// "10m" before the last moment.
std::optional<int64_t> TimeBefore(std::string_view text, int64_t last) {
  if (text.empty()) return std::nullopt;
  const std::optional<int64_t> unit = UnitOf(text.back());
  text.remove_suffix(1);
  int64_t count = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
  int64_t before = 0;
  int64_t time = 0;
  if (!unit || error != std::errc() || end != text.data() + text.size() || count < 0 ||
      __builtin_mul_overflow(count, *unit, &before) ||
      __builtin_sub_overflow(last, before, &time)) {
    return std::nullopt;
  }
  return time;
}

}  // namespace

std::string TextOfSpan(const Span& span) {
  return TextOfTime(span.first) + " to " + TextOfTime(span.last);
}

std::optional<int64_t> TimeOf(std::string_view when, const Span& span) {
  if (when == "first") return span.first;
  if (when == "last") return span.last;
  if (when.starts_with('-')) return TimeBefore(when.substr(1), span.last);
  const std::optional<Clock> clock = ClockOf(when);
  if (!clock) return std::nullopt;
  return clock->hasDate ? clock->Time() : LatestOf(*clock, span.last);
}

}  // namespace ksi
