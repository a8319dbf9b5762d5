// All reports, for the front end, which picks one by name, and for programs that run one into a
// sink of their own. The entries, one a report, go on with the scan of the command line, print the
// report and return a status.
#ifndef REPORTS_REPORTS_H_
#define REPORTS_REPORTS_H_

#include <span>

#include "framework/report.h"
#include "framework/status.h"

namespace tally {

// In the order of their numbers.
std::span<const Report* const> Reports();

// The report called `name`, in any case; null when there is none.
const Report* FindReport(const char* name);

[[nodiscard]] Status TallyGroupStats(int argc, char** argv);
[[nodiscard]] Status TallyVMStats(int argc, char** argv);
[[nodiscard]] Status TallyUWStats(int argc, char** argv);
[[nodiscard]] Status TallyPShareStats(int argc, char** argv);
[[nodiscard]] Status TallyPShareHintStats(int argc, char** argv);
[[nodiscard]] Status TallySwapStats(int argc, char** argv);
[[nodiscard]] Status TallyBuddyStats(int argc, char** argv);
[[nodiscard]] Status TallyCompStats(int argc, char** argv);
[[nodiscard]] Status TallyLPoolStats(int argc, char** argv);
[[nodiscard]] Status TallyHeapStats(int argc, char** argv);
[[nodiscard]] Status TallyGuestStats(int argc, char** argv);
[[nodiscard]] Status TallyZipStats(int argc, char** argv);
[[nodiscard]] Status TallyLPageStats(int argc, char** argv);
[[nodiscard]] Status TallyAsyncRemapStats(int argc, char** argv);
[[nodiscard]] Status TallyPMemStats(int argc, char** argv);

extern const Report groupStats;
extern const Report vmStats;
extern const Report uwStats;
extern const Report pshareStats;
extern const Report pshareHintStats;
extern const Report swapStats;
extern const Report buddyStats;
extern const Report compStats;
extern const Report lpoolStats;
extern const Report heapStats;
extern const Report guestStats;
extern const Report zipStats;
extern const Report lpageStats;
extern const Report asyncRemapStats;
extern const Report pmemStats;

}  // namespace tally

#endif  // REPORTS_REPORTS_H_
