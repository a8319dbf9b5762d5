// The reports' entries, one a report; the front end picks one by name. Each goes on with the scan
// of the command line, prints its report and returns a status.
#ifndef REPORTS_REPORTS_H_
#define REPORTS_REPORTS_H_

#include "framework/status.h"

namespace tally {

using ReportEntry = Status (*)(int argc, char** argv);

Status TallyCompStats(int argc, char** argv);

}  // namespace tally

#endif  // REPORTS_REPORTS_H_
