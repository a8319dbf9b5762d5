// Reads the lines of a page (roles::kLines), one moment after the other.
#ifndef TOOLS_KSICACHE_PAGE_LINES_READER_H_
#define TOOLS_KSICACHE_PAGE_LINES_READER_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "tools/ksicache/page/lines.h"
#include "tools/ksicache/page/names.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/survey.h"
#include "tools/ksicache/page/table_stream.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// Each report that has lines, and the lines of its columns.
struct PageLines {
  struct OfReport {
    std::string report;
    std::vector<const char*> columns;
    ReportLines lines;
  };
  Line moments;  // of each stretch: their places in the survey
  bool isCut = false;
  std::vector<OfReport> reports;
  std::string bytes;  // deflated: the steady times of the stretches and the lines of each report

  // The moments at which some of the figures were the worst, the most telling first, as their
  // places in the survey.
  std::vector<size_t> WorstMoments() const;
};

// However many moments there are, the lines have up to so many stretches as a screen has points.
class LinesReader {
 public:
  // The names of all things are added to `names`.
  LinesReader(PageTexts& texts, Names& names, Problems& problems);

  // The moment that the library answers from.
  void Read(const Origin& origin);

  // All of them, as exact as `room` bytes allow.
  PageLines Finish(const Survey& survey, size_t room);

 private:
  size_t NextStretch();
  void Thin();
  void Pack(const Survey& survey, size_t room);

  Problems& problems_;
  PageLines lines_;
  int64_t count_ = 0;     // of moments
  size_t inStretch_ = 0;  // of these
  size_t capacity_ = 1;   // of each stretch
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_LINES_READER_H_
