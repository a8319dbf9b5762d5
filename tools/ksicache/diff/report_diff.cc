#include "tools/ksicache/diff/report_diff.h"

#include <algorithm>
#include <cstdlib>
#include <string_view>

#include "framework/display_unit.h"
#include "framework/name_list.h"
#include "reports/reports.h"
#include "tools/ksicache/diff/unit.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

using tally::IsMemory;
using tally::Kind;

// Whether there is none of it where there is nothing.
bool IsAmount(Kind kind) {
  return IsMemory(kind) || kind == Kind::count || kind == Kind::microseconds;
}

bool CanGrow(Kind kind) { return IsAmount(kind) || kind == Kind::percent || kind == Kind::time; }

std::optional<int64_t> Difference(const Value& before, const Value& after) {
  const std::optional<int64_t> from = NumberOf(before);
  const std::optional<int64_t> to = NumberOf(after);
  int64_t growth = 0;
  if (!from || !to || __builtin_sub_overflow(*to, *from, &growth)) return std::nullopt;
  return growth;
}

// How much the amounts of a column say of who grew: memory more than what is counted, and what was
// counted for ever least.
int RankOf(const RowColumn& column) {
  if (!IsAmount(column.kind)) return 0;
  if (column.isCounter) return 1;
  return IsMemory(column.kind) ? 3 : 2;
}

// What the things of a report have taken, which says who grew.
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

int64_t SizeOf(int64_t growth) { return growth == INT64_MIN ? INT64_MAX : std::abs(growth); }

}  // namespace

ReportDiff::ReportDiff(const Rows& before, const Rows& after, const GroupPaths* pathsBefore,
                       const GroupPaths* pathsAfter, double seconds, const std::string* by)
    : before_(before), after_(after) {
  measure_ = ColumnCalled(by != nullptr ? *by : UseOf(after.GetReport()));
  if (by != nullptr && !measure_) {
    throw UsageError(std::string(after.GetReport().name) + " has no column " + *by +
                     " that could grow");
  }
  for (const Match& match : MatchAll(IdentitiesOf(before, pathsBefore),
                                     IdentitiesOf(after, pathsAfter), pathsBefore == nullptr)) {
    Compare(match, seconds);
  }
  by_ = by != nullptr || HasChanged(measure_) ? measure_ : Best();
  std::ranges::stable_sort(changed_, std::ranges::greater(),
                           [this](const RowChange& row) { return SizeOf(GrowthOf(row, by_)); });
}

std::optional<size_t> ReportDiff::ColumnCalled(std::string_view name) const {
  for (size_t i = 0; i < Columns().size(); ++i) {
    if (tally::SameName(name, Columns()[i].name) && CanGrow(Columns()[i].kind)) return i;
  }
  return std::nullopt;
}

Change ReportDiff::ChangeOf(size_t column, const Match& match, double seconds) const {
  constexpr Value kNothing = {ValueType::none, 0, {}};
  constexpr Value kZero = {ValueType::unsignedNumber, 0, {}};
  const RowColumn& info = Columns()[column];
  Change change = {column,
                   match.IsNew() ? kNothing : before_.At(match.before)[column],
                   match.IsGone() ? kNothing : after_.At(match.after)[column],
                   {},
                   {}};
  const bool isThroughout = !match.IsNew() && !match.IsGone();
  if (!CanGrow(info.kind) || (!isThroughout && !IsAmount(info.kind))) return change;
  change.growth =
      Difference(match.IsNew() ? kZero : change.before, match.IsGone() ? kZero : change.after);
  if (!info.isCounter || !change.growth || !isThroughout) return change;
  // The one that was given last may be the earlier one.
  if (*change.growth != 0 && (*change.growth < 0) != (seconds < 0)) {
    change.isRestarted = true;
    change.growth.reset();
  } else if (seconds != 0) {
    change.perSecond = static_cast<double>(*change.growth) / seconds;
  }
  return change;
}

void ReportDiff::Compare(const Match& match, double seconds) {
  if ((match.IsNew() && !before_.IsWhole()) || (match.IsGone() && !after_.IsWhole())) {
    ++unknown_;
    return;
  }
  RowChange row = {match, {}};
  const bool isThroughout = !match.IsNew() && !match.IsGone();
  for (size_t i = 0; i < Columns().size(); ++i) {
    if (Columns()[i].isKey) continue;
    const bool isSame =
        isThroughout && IsSame(before_.At(match.before)[i], after_.At(match.after)[i]);
    if (isSame) continue;
    const Change change = ChangeOf(i, match, seconds);
    if (isThroughout || change.growth.value_or(0) != 0) row.changes.push_back(change);
  }
  if (isThroughout && row.changes.empty()) {
    ++unchanged_;
  } else {
    changed_.push_back(std::move(row));
  }
}

std::optional<size_t> ReportDiff::Best() const {
  std::optional<size_t> best;
  int64_t most = 0;
  for (const RowChange& row : changed_) {
    for (const Change& change : row.changes) {
      const int rank = RankOf(Columns()[change.column]);
      const int64_t size = SizeOf(change.growth.value_or(0));
      if (rank == 0 || size == 0) continue;
      const int bestRank = best ? RankOf(Columns()[*best]) : 0;
      if (rank < bestRank || (rank == bestRank && size <= most)) continue;
      best = change.column;
      most = size;
    }
  }
  return best;
}

int64_t ReportDiff::GrowthOf(const RowChange& row, std::optional<size_t> column) {
  const auto found = std::ranges::find(row.changes, column, &Change::column);
  return found == row.changes.end() ? 0 : found->growth.value_or(0);
}

bool ReportDiff::HasChanged(std::optional<size_t> column) const {
  return std::ranges::any_of(changed_,
                             [&](const RowChange& row) { return GrowthOf(row, column) != 0; });
}

std::optional<int64_t> ReportDiff::LargestBytes() const {
  if (!measure_ || !IsMemory(Columns()[*measure_].kind)) return std::nullopt;
  int64_t largest = 0;
  for (const RowChange& row : changed_) largest = std::max(largest, GrowthOf(row, measure_));
  const std::string_view unit = Columns()[*measure_].unit;
  const auto* found = std::ranges::find(tally::kUnitNames, unit, &tally::UnitName::title);
  int64_t bytes = 0;
  const bool isTooLarge = __builtin_mul_overflow(largest, BytesIn(found->unit), &bytes);
  return isTooLarge ? INT64_MAX : bytes;
}

std::span<const Value> ReportDiff::RowOf(const RowChange& row) const {
  return row.match.IsGone() ? before_.At(row.match.before) : after_.At(row.match.after);
}

}  // namespace ksicache
