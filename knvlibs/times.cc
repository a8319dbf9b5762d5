#include "knvlibs/times.h"

#include <algorithm>
#include <array>
#include <limits>

namespace ksi {
namespace {

constexpr const char* kForm = "%Y-%m-%dT%H:%M:%SZ";

std::string TextOf(const struct tm& parts) {
  std::array<char, 64> text = {};
  return {text.data(), strftime(text.data(), text.size(), kForm, &parts)};
}

}  // namespace

int64_t ReadClock(clockid_t clock) {
  struct timespec now = {};
  clock_gettime(clock, &now);
  return int64_t{now.tv_sec} * kSecond + now.tv_nsec / 1000;
}

int64_t TimeBetween(int64_t b, int64_t a) {
  constexpr int64_t kMost = std::numeric_limits<int64_t>::max();
  int64_t time = 0;
  if (__builtin_sub_overflow(a, b, &time)) return a < b ? -kMost : kMost;
  return std::max(time, -kMost);
}

std::string TextOfTime(int64_t time) {
  const time_t seconds = SecondOf(time);
  struct tm parts = {};
  return gmtime_r(&seconds, &parts) == nullptr ? std::to_string(time) : TextOf(parts);
}

std::optional<int64_t> TimeOfText(const std::string& text) {
  struct tm parts = {};
  if (strptime(text.c_str(), kForm, &parts) == nullptr) return std::nullopt;
  const time_t seconds = timegm(&parts);  // makes the 30th of February the 2nd of March
  if (TextOf(parts) != text) return std::nullopt;
  return int64_t{seconds} * kSecond;
}

}  // namespace ksi
