#include "tools/ksicache/named_span.h"

#include <unistd.h>

#include <cstdint>
#include <string_view>

#include "knvlibs/recording/earlier_moment.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// A time of day that was not recorded is the one nearest to what was: at 11:00 a recording that
// ended at 10:06 has nothing, though 11:00 of the day before is before all of it.
int64_t BehindAll(int64_t from, const ksi::Span& all) {
  const int64_t later = from + ksi::kDay;
  return all.first - from > later - all.last ? later : from;
}
int64_t BeforeAll(int64_t to, const ksi::Span& all) {
  const int64_t earlier = to - ksi::kDay;
  return to - all.last > all.first - earlier ? earlier : to;
}

// Whether a time has no date, so that each day has it.
bool IsOfAnyDay(const std::string& when) {
  return !when.empty() && when[0] >= '0' && when[0] <= '9' && when.find('-') == std::string::npos;
}

// Finds the bounds of a span, which at first is all of the recording.
class Bounds {
 public:
  explicit Bounds(ksi::RecordingFile& recording)
      : recording_(recording),
        recorded_{Parts().front().first, Parts().back().last},
        all_(recording.Times()),
        span_{{Parts().front().number, Parts().back().End() - 1}, all_},
        from_(all_.first) {}

  void BeginWith(const std::string& when) {
    if (when.empty() || when == "first") return;
    if (when == "last") {
      span_.numbers.first = span_.numbers.last;
      from_ = recorded_.last;
    } else if (const std::optional<int64_t> back = ksi::TimeBack(when)) {
      BeginBack(*back);
    } else {
      from_ = TimeIn(when, recorded_);
      if (IsOfAnyDay(when)) from_ = BehindAll(from_, all_);
      span_.times.first = from_;
    }
  }

  void EndWith(const std::string& when, bool hasBegin) {
    if (when.empty() || when == "last") return;
    if (when == "first") {
      span_.numbers.last = Parts().front().number;
    } else if (const std::optional<int64_t> back = ksi::TimeBack(when)) {
      EndBack(*back);
    } else {
      const bool isOfAnyDay = IsOfAnyDay(when);
      const ksi::Span dayFromThere = {from_, from_ + ksi::kDay - 1};
      int64_t to = TimeIn(when, isOfAnyDay ? dayFromThere : recorded_);
      if (isOfAnyDay && !hasBegin) to = BeforeAll(to, all_);
      span_.times.last = to + ksi::kSecond - 1;
    }
  }

  const MomentSpan& Span() const { return span_; }

 private:
  const std::vector<ksi::RecordingFile::Part>& Parts() const { return recording_.Parts(); }

  // `span`: as of TimeOf. The beginning of its second.
  int64_t TimeIn(const std::string& when, const ksi::Span& span) const {
    const std::optional<int64_t> time = ksi::TimeOf(when, span);
    if (time) return ksi::SecondOf(*time) * ksi::kSecond;
    throw DataError(when + " is no time, as " + ksi::kWhenForms + " are: moments are of " +
                    ksi::TextOfSpan(all_));
  }

  // Where what would tell how much time passed is damaged, the clock on the wall does.
  void BeginBack(int64_t back) {
    if (ksi::EarlierMoment(recording_).FindFirst(back, span_.numbers.first, from_) == ksi::kOk) {
      from_ = ksi::SecondOf(from_) * ksi::kSecond;
    } else {
      span_.numbers.first = Parts().front().number;
      from_ = ksi::SecondOf(recorded_.last - back) * ksi::kSecond;
      span_.times.first = from_;
    }
  }

  void EndBack(int64_t back) {
    int64_t asked = 0;
    if (ksi::EarlierMoment(recording_).Find(back, span_.numbers.last, asked) == ksi::kOk) return;
    span_.numbers.last = Parts().back().End() - 1;
    span_.times.last = ksi::SecondOf(recorded_.last - back) * ksi::kSecond + ksi::kSecond - 1;
  }

  ksi::RecordingFile& recording_;
  ksi::Span recorded_;  // when the moments recorded first and last were taken
  ksi::Span all_;       // the earliest and the latest time
  MomentSpan span_;
  int64_t from_;  // when it begins
};

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

MomentSpan MomentsOf(const NamedSpan& named, ksi::RecordingFile& recording) {
  if (recording.Parts().empty()) throw DataError("it has no moments yet");
  Bounds bounds(recording);
  bounds.BeginWith(named.from);
  bounds.EndWith(named.to, !named.from.empty());
  return bounds.Span();
}

std::string NoneInSpan(const ksi::Span& all) {
  return "there is no moment in that time: moments are of " + ksi::TextOfSpan(all);
}

}  // namespace ksicache
