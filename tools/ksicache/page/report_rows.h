// Runs reports for a page.
#ifndef TOOLS_KSICACHE_PAGE_REPORT_ROWS_H_
#define TOOLS_KSICACHE_PAGE_REPORT_ROWS_H_

#include "framework/report.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// Runs a report on the moment that the library answers from; what is wrong with it is added to the
// problems. False if it failed.
bool RunForPage(const tally::Report& report, const Origin& origin, RowSink& sink,
                Problems& problems);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_REPORT_ROWS_H_
