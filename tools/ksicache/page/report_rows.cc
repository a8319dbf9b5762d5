#include "tools/ksicache/page/report_rows.h"

#include <string>

#include "tools/ksicache/error.h"

namespace ksicache {

bool RunForPage(const tally::Report& report, const Origin& origin, RowSink& sink,
                Problems& problems) {
  sink.Expect(report, origin);
  std::string error;
  try {
    RunReport(report, sink);
    error = sink.TakeComplaint();
  } catch (const DataError& caught) {
    error = caught.what();
  }
  problems.AddDiagnostics();
  if (!error.empty()) problems.Add(error);
  return error.empty();
}

}  // namespace ksicache
