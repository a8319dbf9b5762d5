// The changes of a report's rows, for people and for programs.
#ifndef TOOLS_KSICACHE_DIFF_REPORT_OUTPUT_H_
#define TOOLS_KSICACHE_DIFF_REPORT_OUTPUT_H_

#include <cstddef>

#include "tools/ksicache/diff/moments.h"
#include "tools/ksicache/diff/report_diff.h"

namespace ksicache {

// Prints the first `top` of the rows that changed. Fails with an OutputError.
void PrintReportDiff(const Sides& sides, const ReportDiff& diff, size_t top);
void PrintReportDiffJson(const Sides& sides, const ReportDiff& diff, size_t top);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_REPORT_OUTPUT_H_
