// A moment of a recording, as people call it.
//
//   2026-11-21T10:05[:30][Z]   a date and a time; of the second, if it has none, the end
//   2026-11-21[Z]              the same at 00:00
//   10:05[:30][Z]              the latest such time that is not after the last moment
//   -10m                       so long before the last moment: s, m, h, d
//   first, last
//
// Times are local ones, or UTC with a Z. T and Z may be small, and T a blank. The last moment is
// the one recorded last.
#ifndef KNVLIBS_RECORDING_WHEN_H_
#define KNVLIBS_RECORDING_WHEN_H_

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace ksi {

// From one time to another, us since 1970: those that files may tell (times.h).
struct Span {
  int64_t first;
  int64_t last;
};

// "2026-11-21T10:00:00Z to 2026-11-21T12:00:00Z"
std::string TextOfSpan(const Span& span);

// Forms that people know, for whoever was given another one.
inline constexpr const char* kWhenForms = "2026-11-21T10:05, 10:05, -10m and last";

// How long before the last moment "-10m" is, us; none of other forms, and of what is none. It is
// farther than any two moments are apart, and no more.
std::optional<int64_t> TimeBack(std::string_view when);

// The time that is meant, us since 1970: the moment is that at it or before. None if it is no time.
// `span`: from the first moment of the recording to the last.
std::optional<int64_t> TimeOf(std::string_view when, const Span& span);

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_WHEN_H_
