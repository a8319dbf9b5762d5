#include "frontend/report_names.h"

#include "framework/name_list.h"

namespace tally {
namespace {

constexpr ReportName reportNames[] = {
    {"group-stats", TallyGroupStats},
    {"vm-stats", TallyVMStats},
    {"uw-stats", TallyUWStats},
    {"pshare-stats", TallyPShareStats},
    {"pshareHint-stats", TallyPShareHintStats},
    {"swap-stats", TallySwapStats},
    {"buddy-stats", TallyBuddyStats},
    {"comp-stats", TallyCompStats},
    {"lpool-stats", TallyLPoolStats},
    {"heap-stats", TallyHeapStats},
    {"guest-stats", TallyGuestStats},
    {"zip-stats", TallyZipStats},
    {"lpage-stats", TallyLPageStats},
    {"asyncremap-stats", TallyAsyncRemapStats},
    {"pmem-stats", TallyPMemStats},
};

}  // namespace

const ReportName* FindReport(const char* name) {
  for (const ReportName& report : reportNames) {
    if (SameName(report.name, name)) return &report;
  }
  return nullptr;
}

}  // namespace tally
