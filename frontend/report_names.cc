#include "frontend/report_names.h"

#include "framework/name_list.h"

namespace tally {
namespace {

constexpr ReportName reportNames[] = {
    {"comp-stats", TallyCompStats},
};

}  // namespace

const ReportName* FindReport(const char* name) {
  for (const ReportName& report : reportNames) {
    if (SameName(report.name, name)) return &report;
  }
  return nullptr;
}

}  // namespace tally
