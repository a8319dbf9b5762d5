#include "reports/reports.h"

#include "framework/name_list.h"

namespace tally {
namespace {

constexpr const Report* reportNames[] = {
    &groupStats, &vmStats,    &uwStats,    &pshareStats,     &pshareHintStats,
    &swapStats,  &buddyStats, &compStats,  &lpoolStats,      &heapStats,
    &guestStats, &zipStats,   &lpageStats, &asyncRemapStats, &pmemStats,
};

}  // namespace

std::span<const Report* const> Reports() { return reportNames; }

const Report* FindReport(const char* name) {
  for (const Report* report : reportNames) {
    if (SameName(report->name, name)) return report;
  }
  return nullptr;
}

}  // namespace tally
