// Reads the rows of reports at moments for a page.
#ifndef TOOLS_KSICACHE_PAGE_TABLES_READER_H_
#define TOOLS_KSICACHE_PAGE_TABLES_READER_H_

#include <cstddef>
#include <string>
#include <vector>

#include "tools/ksicache/page/names.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/survey.h"
#include "tools/ksicache/page/table_stream.h"

namespace ksicache {

// Which moments a page shows, as their places in the survey, in their order.
struct WantedMoments {
  std::vector<size_t> full;    // all reports, and who has the memory (memory_rows.h)
  std::vector<size_t> points;  // the host's report
  size_t told = 0;             // of those in full, the one to tell of without scripts
};

// Rows of reports at some moments.
struct MomentTables {
  std::vector<size_t> moments;       // their places in the survey
  std::vector<TableStream> streams;  // one a report, and behind them that of the memory
  std::string bytes;                 // deflated: of each moment the rows of each stream
};

// What there is to be told of moments.
struct PageTables {
  MomentTables full;    // the reports in the order of tally's
  MomentTables points;  // of the host's report alone
  size_t told =
      0;  // the moment to tell of without scripts, of which the streams of `full` keep rows
  bool isTooMuch = false;
};

// Reads what is wanted of a "FILE", "FILE@WHEN" or "FILE@FROM..TO". Stops with isTooMuch when
// there are at least `fewest` moments in full and more than `room` bytes of them.
PageTables ReadTables(const std::string& name, const Survey& survey, const WantedMoments& wanted,
                      size_t fewest, size_t room, PageTexts& texts, const Names& names,
                      Problems& problems);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_TABLES_READER_H_
