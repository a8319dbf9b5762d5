// Reports, run on the host and on moments of cache files.
#ifndef TOOLS_KSICACHE_REPORT_RUN_H_
#define TOOLS_KSICACHE_REPORT_RUN_H_

#include <cstdint>
#include <functional>
#include <string>

#include "framework/report.h"

namespace ksicache {

// Whose moment is reported on.
struct Origin {
  std::string host;
  std::string time;  // "2026-11-21T10:00:00Z"
  int64_t taken;     // the same, us since 1970
};

// The host that the library reads by itself, now. Fails with an Error if its kernel's definitions
// are not the library's.
Origin LiveOrigin();

// Calls `visit` with each moment that `name` means while the library answers from it: of "FILE" and
// "FILE@WHEN" the one that KSI_UseCache takes, of "FILE@FROM..TO", of which either may be left out,
// all that a recording has from the one time to the other. Fails with a DataError.
void ForEachMoment(const std::string& name, const std::function<void(const Origin&)>& visit);

// Runs a report on what the library answers from, of `selection` with the groups to start from, the
// levels to go down and the flags, as far as it takes them; by itself it has all rows. Fails with a
// DataError that starts with the report's name, after the library's diagnostics, if rows are
// missing; the others have been given.
void RunReport(const tally::Report& report, tally::Sink& sink,
               const tally::ReportOptions& selection = {});

// Whether levels, for the report, are those of groups.
bool GoesDownGroups(const tally::Report& report);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_REPORT_RUN_H_
