// All moments of a recording from one time to another, as commands are given them:
// "FILE@FROM..TO".
#ifndef TOOLS_KSICACHE_NAMED_SPAN_H_
#define TOOLS_KSICACHE_NAMED_SPAN_H_

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

// The times that are meant, which are seconds as a whole. FROM and TO are as of recording/when.h,
// but that a TO without a date is the first such time after FROM; without them, and with "first"
// and "last", there is no bound, wherever the clock was set. Fails with a DataError if there are no
// moments, or if one is no time.
ksi::Span TimesOf(const NamedSpan& named, const ksi::RecordingFile& recording);

// That no moment of a recording is in a span. `all`: the times of its moments.
std::string NoneInSpan(const ksi::Span& all);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_NAMED_SPAN_H_
