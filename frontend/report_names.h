#ifndef FRONTEND_REPORT_NAMES_H_
#define FRONTEND_REPORT_NAMES_H_

#include "reports/reports.h"

namespace tally {

struct ReportName {
  const char* name;
  ReportEntry entry;
};

// The report called `name`, in any case; null when there is none.
const ReportName* FindReport(const char* name);

}  // namespace tally

#endif  // FRONTEND_REPORT_NAMES_H_
