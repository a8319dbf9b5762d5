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

  // The end of its second; none if there is no such day.
  std::optional<int64_t> Time() const {
    struct tm wanted = parts;
    // What is no date becomes another one.
    static_cast<void>(timegm(&wanted));
    if (wanted.tm_mday != parts.tm_mday) return std::nullopt;
    wanted = parts;
    wanted.tm_isdst = -1;
    const time_t seconds = isUtc ? timegm(&wanted) : mktime(&wanted);
    return int64_t{seconds} * kSecond + kSecond - 1;
  }
};

// Takes the date from the front of a text, and what parts it from the time.
bool TakeDate(std::string_view& text, struct tm& to) {
  constexpr std::string_view kForm = "####-##-##";
  if (!Match(text.substr(0, kForm.size()), kForm, {&to.tm_year, &to.tm_mon, &to.tm_mday})) {
    return false;
  }
  to.tm_year -= 1900;
  to.tm_mon -= 1;
  text.remove_prefix(kForm.size());
  if (text.starts_with('T') || text.starts_with('t') || text.starts_with(' ')) {
    text.remove_prefix(1);
  } else if (!text.empty()) {
    return false;
  } else {
    text = "00:00";
  }
  return to.tm_mon >= 0 && to.tm_mon <= 11 && to.tm_mday >= 1 && to.tm_mday <= 31;
}

std::optional<Clock> ClockOf(std::string_view text) {
  Clock clock;
  clock.isUtc = text.ends_with('Z') || text.ends_with('z');
  if (clock.isUtc) text.remove_suffix(1);
  struct tm& to = clock.parts;
  clock.hasDate = text.find('-') != std::string_view::npos;
  if (clock.hasDate && !TakeDate(text, to)) return std::nullopt;
  if (!Match(text, "##:##:##", {&to.tm_hour, &to.tm_min, &to.tm_sec}) &&
      !Match(text, "##:##", {&to.tm_hour, &to.tm_min})) {
    return std::nullopt;
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

}  // namespace

std::optional<int64_t> TimeBack(std::string_view when) {
  if (when.size() < 2 || when.front() != '-') return std::nullopt;
  const std::optional<int64_t> unit = UnitOf(when.back());
  const std::string_view number = when.substr(1, when.size() - 2);
  const char* const numberEnd = number.data() + number.size();
  int64_t count = 0;
  const auto [end, error] = std::from_chars(number.data(), numberEnd, count);
  int64_t back = 0;
  if (!unit || error != std::errc() || end != numberEnd || count < 0 ||
      __builtin_mul_overflow(count, *unit, &back)) {
    return std::nullopt;
  }
  return std::min(back, kFarthest);
}

std::string TextOfSpan(const Span& span) {
  return TextOfTime(span.first) + " to " + TextOfTime(span.last);
}

std::optional<int64_t> TimeOf(std::string_view when, const Span& span) {
  if (when == "first") return span.first;
  if (when == "last") return span.last;
  if (const std::optional<int64_t> back = TimeBack(when)) return span.last - *back;
  const std::optional<Clock> clock = ClockOf(when);
  if (!clock) return std::nullopt;
  return clock->hasDate ? clock->Time() : LatestOf(*clock, span.last);
}

}  // namespace ksi
