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

// The times that files may tell: those of the years 0 to 9999. What is told of another one is
// damage, so that all that is read may be added and subtracted.
constexpr int64_t kFirstTime = -62'167'219'200 * kSecond;
constexpr int64_t kLastTime = 253'402'300'800 * kSecond - 1;

// No two of them are as far apart.
constexpr int64_t kFarthest = int64_t{1} << 59;
static_assert(kLastTime - kFirstTime < kFarthest);

// Times are told, and compared, in seconds.
constexpr int64_t SecondOf(int64_t time) { return time / kSecond - (time % kSecond < 0 ? 1 : 0); }

// What a clock of the system says.
int64_t ReadClock(clockid_t clock);

// The time from `b` to `a`; the farthest that there is if sums of times are farther apart.
int64_t TimeBetween(int64_t b, int64_t a);

// "2026-11-21T10:05:30Z", as files and messages tell times.
std::string TextOfTime(int64_t time);

// The time that such a text tells; none if it is none, or no date that there is.
std::optional<int64_t> TimeOfText(const std::string& text);

}  // namespace ksi

#endif  // KNVLIBS_TIMES_H_
