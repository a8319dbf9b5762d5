#include "tools/ksicache/named_span.h"

#include <unistd.h>

#include <cstdint>
#include <string_view>

#include "knvlibs/times.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// `last`: whether it is the end of the span.
int64_t TimeIn(const std::string& when, const ksi::RecordingFile& recording, bool last) {
  const ksi::Span all = recording.Times();
  if (when.empty() || when == (last ? "last" : "first")) return last ? all.last : all.first;
  const auto& parts = recording.Parts();
  const std::optional<int64_t> time = ksi::TimeOf(when, {parts.front().first, parts.back().last});
  if (!time) {
    throw DataError(when + " is no time, as those of 10:05..10:10, -1h.. and first..last are: " +
                    "moments are of " + ksi::TextOfSpan(all));
  }
  return *time;
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
  const int64_t from = TimeIn(named.from, recording, false);
  const int64_t to = TimeIn(named.to, recording, true);
  return {from / ksi::kSecond * ksi::kSecond, to / ksi::kSecond * ksi::kSecond + ksi::kSecond - 1};
}

std::string NoneInSpan(const ksi::Span& all) {
  return "there is no moment in that time: moments are of " + ksi::TextOfSpan(all);
}

}  // namespace ksicache
