// What is known of the moments themselves, as one more report.
#ifndef TOOLS_KSICACHE_MOMENT_REPORT_H_
#define TOOLS_KSICACHE_MOMENT_REPORT_H_

#include "framework/report.h"

namespace ksicache {

// A row for each moment: of which kernel it is.
extern const tally::Report kMomentReport;

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MOMENT_REPORT_H_
