// Reads reports of moments for a page.
#ifndef TOOLS_KSICACHE_PAGE_MOMENT_READER_H_
#define TOOLS_KSICACHE_PAGE_MOMENT_READER_H_

#include <cstddef>
#include <string>
#include <vector>

#include "tools/ksicache/page/lines.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/survey.h"
#include "tools/ksicache/page/table_stream.h"

namespace ksicache {

// What a page is made of, and what was wrong with it.
struct PageSource {
  std::string name;  // "FILE", "FILE@WHEN" or "FILE@FROM..TO"
  Survey survey;
  Problems& problems;
};

// Rows of reports at some moments.
struct MomentTables {
  std::vector<size_t> moments;       // their places in the survey
  std::vector<TableStream> streams;  // one a report
  std::string bytes;                 // deflated: of each moment the rows of each report
};

// All reports, in the order of tally's, of `wanted` moments. Stops when there are at least `fewest`
// moments and more than `room` bytes; what has been read is whole.
MomentTables ReadTables(const PageSource& source, const std::vector<size_t>& wanted, size_t fewest,
                        size_t room, PageTexts& texts);

// The host's report alone.
MomentTables ReadPoints(const PageSource& source, const std::vector<size_t>& wanted,
                        PageTexts& texts);

// The lines of all moments (roles::kLines), of each report that has some.
struct PageLines {
  struct OfReport {
    std::string report;
    std::vector<const char*> columns;
    ReportLines lines;
  };
  Line times;  // when the moments of each stretch were taken
  bool isCut = false;
  std::vector<OfReport> reports;
  std::string bytes;  // deflated: the times and the lines of each report
};

// As exact as `room` bytes allow.
PageLines ReadLines(const PageSource& source, size_t room, PageTexts& texts);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_MOMENT_READER_H_
