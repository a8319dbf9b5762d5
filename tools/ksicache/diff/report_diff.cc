#include "tools/ksicache/diff/report_diff.h"

#include <algorithm>
#include <cstdlib>
#include <string_view>

#include "framework/display_unit.h"
#include "tools/ksicache/diff/figure.h"
#include "tools/ksicache/diff/largest_growth.h"
#include "tools/ksicache/diff/measure.h"
#include "tools/ksicache/unit.h"

namespace ksicache {
namespace {

using tally::IsMemory;

// How much the amounts of a column say of who grew: memory more than what is counted, and what was
// counted for ever least.
int RankOf(const RowColumn& column) {
  if (!IsAmount(column.kind)) return 0;
  if (column.isCounter) return 1;
  return IsMemory(column.kind) ? 3 : 2;
}

int64_t SizeOf(int64_t growth) { return growth == INT64_MIN ? INT64_MAX : std::abs(growth); }

}  // namespace

ReportDiff::ReportDiff(const Rows& before, const Rows& after, const GroupPaths* pathsBefore,
                       const GroupPaths* pathsAfter, const Sides& sides, const std::string* by)
    : before_(before), after_(after), sides_(sides) {
  measure_ = MeasureOf(after.GetReport(), Columns(), by);
  const std::vector<std::string> earlier = IdentitiesOf(before, pathsBefore);
  const std::vector<std::string> later = IdentitiesOf(after, pathsAfter);
  const std::vector<std::string_view> from(earlier.begin(), earlier.end());
  const std::vector<std::string_view> to(later.begin(), later.end());
  for (const Match& match : MatchAll(from, to, pathsBefore == nullptr)) Compare(match);
  by_ = by != nullptr || HasChanged(measure_) ? measure_ : Best();
  std::ranges::stable_sort(changed_, std::ranges::greater(),
                           [this](const RowChange& row) { return SizeOf(GrowthOf(row, by_)); });
}

Change ReportDiff::ChangeOf(size_t column, const Match& match) const {
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
  change.growth = Less(NumberOf(match.IsGone() ? kZero : change.after),
                       NumberOf(match.IsNew() ? kZero : change.before));
  if (info.isCounter && change.growth && isThroughout) TakeRate(change);
  return change;
}

void ReportDiff::TakeRate(Change& change) const {
  const std::optional<double> seconds = sides_.Seconds();
  if (*change.growth != 0 && (*change.growth < 0) != sides_.IsBackward()) {
    change.isRestarted = true;
    change.growth.reset();
  } else if (seconds && *seconds != 0) {
    change.perSecond = static_cast<double>(*change.growth) / *seconds;
  }
}

void ReportDiff::Compare(const Match& match) {
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
    const Change change = ChangeOf(i, match);
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
  LargestGrowth largest;
  for (const RowChange& row : changed_) {
    const int64_t growth = GrowthOf(row, measure_);
    const std::string name = NameOf(row);
    if (name.empty() || !(row.match.IsNew() || row.match.IsGone())) {
      largest.Changed(growth);
    } else if (row.match.IsNew()) {
      largest.Came(name, growth);
    } else {
      largest.Gone(name, SizeOf(growth));
    }
  }
  const std::string_view unit = Columns()[*measure_].unit;
  const auto* found = std::ranges::find(tally::kUnitNames, unit, &tally::UnitName::title);
  return Times(largest.Find(), BytesIn(found->unit)).value_or(INT64_MAX);
}

// Empty if the row is known by numbers alone.
std::string ReportDiff::NameOf(const RowChange& row) const {
  std::string name;
  const std::span<const Value> values = RowOf(row);
  for (size_t i = 0; i < values.size(); ++i) {
    if (Columns()[i].isKey && values[i].type == ValueType::text) AddPart(values[i].text, name);
  }
  return name;
}

std::span<const Value> ReportDiff::RowOf(const RowChange& row) const {
  return row.match.IsGone() ? before_.At(row.match.before) : after_.At(row.match.after);
}

}  // namespace ksicache
