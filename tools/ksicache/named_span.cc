#include "tools/ksicache/named_span.h"

#include <unistd.h>

#include <cstdint>
#include <string_view>

#include "knvlibs/recording/chunk.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

using ksi::chunk::Minus;
using ksi::chunk::Plus;

// `span`: as of TimeOf.
int64_t TimeIn(const std::string& when, const ksi::Span& span, const ksi::Span& all) {
  const std::optional<int64_t> time = ksi::TimeOf(when, span);
  if (!time) {
    throw DataError(when + " is no time, as those of 10:05..10:10, -1h.. and first..last are: " +
                    "moments are of " + ksi::TextOfSpan(all));
  }
  return *time / ksi::kSecond * ksi::kSecond;
}

// A time of day that was not recorded is the one nearest to what was: at 11:00 a recording that
// ended at 10:06 has nothing, though 11:00 of the day before is before all of it.
int64_t BehindAll(int64_t from, const ksi::Span& all) {
  const int64_t later = Plus(from, ksi::kDay);
  return Minus(all.first, from) > Minus(later, all.last) ? later : from;
}
int64_t BeforeAll(int64_t to, const ksi::Span& all) {
  const int64_t earlier = Minus(to, ksi::kDay);
  return Minus(to, all.last) > Minus(all.first, earlier) ? earlier : to;
}

// Whether a time has no date, so that each day has it.
bool IsOfAnyDay(const std::string& when) {
  return !when.empty() && when[0] >= '0' && when[0] <= '9' && when.find('-') == std::string::npos;
}

}  // namespace

std::optional<NamedSpan> SpanOf(const std::string& name) {
  constexpr std::string_view kTo = "..";
  const size_t at = name.rfind('@');
  const size_t to = at == std::string::npos ? at : name.find(kTo, at);
  if (to == std::string::npos || access(name.c_str(), F_OK) == 0) return std::nullopt;
  return NamedSpan{name.substr(0, at), name.substr(at + 1, to - at - 1),
                   name.substr(to + kTo.size())};
}

bool IsSpan(const std::string& name) { return SpanOf(name).has_value(); }

ksi::Span TimesOf(const NamedSpan& named, const ksi::RecordingFile& recording) {
  if (recording.Parts().empty()) throw DataError("it has no moments yet");
  const auto& parts = recording.Parts();
  const ksi::Span recorded = {parts.front().first, parts.back().last};
  const ksi::Span all = recording.Times();
  ksi::Span times = {all.first / ksi::kSecond * ksi::kSecond, all.last};
  if (!named.from.empty() && named.from != "first") {
    times.first = TimeIn(named.from, recorded, all);
    if (IsOfAnyDay(named.from)) times.first = BehindAll(times.first, all);
  }
  if (!named.to.empty() && named.to != "last") {
    const ksi::Span dayFromThere = {times.first, Plus(times.first, ksi::kDay - 1)};
    const bool isOfAnyDay = IsOfAnyDay(named.to);
    times.last = TimeIn(named.to, isOfAnyDay ? dayFromThere : recorded, all);
    if (isOfAnyDay && named.from.empty()) times.last = BeforeAll(times.last, all);
    times.last += ksi::kSecond - 1;
  }
  return times;
}

std::string NoneInSpan(const ksi::Span& all) {
  return "there is no moment in that time: moments are of " + ksi::TextOfSpan(all);
}

}  // namespace ksicache
