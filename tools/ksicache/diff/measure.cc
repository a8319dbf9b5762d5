#include "tools/ksicache/diff/measure.h"

#include <algorithm>
#include <iterator>
#include <string_view>

#include "framework/name_list.h"
#include "reports/reports.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

using tally::Kind;

// What the things of a report have taken.
struct Use {
  const tally::Report* report;
  const char* column;
};
constexpr Use kUses[] = {
    {&tally::groupStats, "consumed"},  {&tally::vmStats, "consumed"},
    {&tally::uwStats, "consumed"},     {&tally::swapStats, "swapped"},
    {&tally::zipStats, "usedCache"},   {&tally::heapStats, "size"},
    {&tally::guestStats, "memNeeded"},
};

// Empty if it tells of nothing of the kind.
std::string_view UseOf(const tally::Report& report) {
  const auto* found = std::ranges::find(kUses, &report, &Use::report);
  return found == std::end(kUses) ? std::string_view() : found->column;
}

}  // namespace

bool IsAmount(Kind kind) {
  return IsMemory(kind) || kind == Kind::count || kind == Kind::microseconds;
}

bool CanGrow(Kind kind) { return IsAmount(kind) || kind == Kind::percent || kind == Kind::time; }

std::optional<size_t> MeasureOf(const tally::Report& report, std::span<const RowColumn> columns,
                                const std::string* by) {
  const std::string_view name = by == nullptr ? UseOf(report) : std::string_view(*by);
  for (size_t i = 0; i < columns.size(); ++i) {
    if (tally::SameName(name, columns[i].name) && CanGrow(columns[i].kind)) return i;
  }
  if (by == nullptr) return std::nullopt;
  throw UsageError(std::string(report.name) + " has no column " + *by + " that could grow");
}

}  // namespace ksicache
