// Times, in microseconds: those of the clock on the wall since 1970.
#ifndef KNVLIBS_TIMES_H_
#define KNVLIBS_TIMES_H_

#include <cstdint>
#include <ctime>
#include <optional>
#include <string>

namespace ksi {

constexpr int64_t kSecond = 1'000'000;
constexpr int64_t kMinute = 60 * kSecond;
constexpr int64_t kHour = 60 * kMinute;
constexpr int64_t kDay = 24 * kHour;

// What a clock of the system says.
int64_t ReadClock(clockid_t clock);

// The time from `b` to `a`. Files may tell times that lie farther apart than a number holds: then
// it is the farthest.
int64_t TimeBetween(int64_t b, int64_t a);

// "2026-11-21T10:05:30Z", as files and messages tell times.
std::string TextOfTime(int64_t time);

// The time that such a text tells; none if it is none, or no date that there is.
std::optional<int64_t> TimeOfText(const std::string& text);

}  // namespace ksi

#endif  // KNVLIBS_TIMES_H_
