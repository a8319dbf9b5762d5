// All moments of a recording from one time to another, as commands are given them:
// "FILE@FROM..TO".
#ifndef TOOLS_KSICACHE_NAMED_SPAN_H_
#define TOOLS_KSICACHE_NAMED_SPAN_H_

#include <cstdint>
#include <optional>
#include <string>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/recording/when.h"

namespace ksicache {

// Times that are left out are empty.
struct NamedSpan {
  std::string fileName;
  std::string from;
  std::string to;
};

// None if the name means something else. A file that has the whole name is that file.
std::optional<NamedSpan> SpanOf(const std::string& name);
bool IsSpan(const std::string& name);

// The moments of a span: those with numbers and times from the first to the last.
struct MomentSpan {
  struct Numbers {
    int64_t first;
    int64_t last;
  };

  Numbers numbers;
  ksi::Span times;

  bool Has(int64_t number, int64_t taken) const {
    return numbers.first <= number && number <= numbers.last && times.first <= taken &&
           taken <= times.last;
  }

  // Whether a part may have some of them.
  bool HasSome(const ksi::RecordingFile::Part& part) const {
    return numbers.first < part.End() && part.number <= numbers.last && times.first <= part.last &&
           part.first <= times.last;
  }
};

// The moments that are meant. FROM and TO are as of recording/when.h: dates and times of day bound
// the times, in whole seconds, wherever the clock was set, and a TO without a date is the first
// such time after FROM; the other forms, which mean a moment wherever it was recorded, bound the
// numbers. Fails with a DataError if there are no moments, or if one is no time.
MomentSpan MomentsOf(const NamedSpan& named, ksi::RecordingFile& recording);

// That no moment of a recording is in a span. `all`: the times of its moments.
std::string NoneInSpan(const ksi::Span& all);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_NAMED_SPAN_H_
