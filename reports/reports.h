// The reports' entries, one a report; the front end picks one by name. Each goes on with the scan
// of the command line, prints its report and returns a status.
#ifndef REPORTS_REPORTS_H_
#define REPORTS_REPORTS_H_

#include "framework/status.h"

namespace tally {

using ReportEntry = Status (*)(int argc, char** argv);

Status TallyGroupStats(int argc, char** argv);
Status TallyVMStats(int argc, char** argv);
Status TallyUWStats(int argc, char** argv);
Status TallyPShareStats(int argc, char** argv);
Status TallyPShareHintStats(int argc, char** argv);
Status TallySwapStats(int argc, char** argv);
Status TallyBuddyStats(int argc, char** argv);
Status TallyCompStats(int argc, char** argv);
Status TallyLPoolStats(int argc, char** argv);
Status TallyHeapStats(int argc, char** argv);
Status TallyGuestStats(int argc, char** argv);
Status TallyZipStats(int argc, char** argv);
Status TallyLPageStats(int argc, char** argv);
Status TallyAsyncRemapStats(int argc, char** argv);
Status TallyPMemStats(int argc, char** argv);

}  // namespace tally

#endif  // REPORTS_REPORTS_H_
