#ifndef TOOLS_KSICACHE_DIFF_REPORT_DIFF_H_
#define TOOLS_KSICACHE_DIFF_REPORT_DIFF_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tools/ksicache/diff/match.h"
#include "tools/ksicache/diff/moments.h"
#include "tools/ksicache/diff/rows.h"

namespace ksicache {

// What became of one figure.
struct Change {
  size_t column;
  Value before;  // `none` of what is new
  Value after;   // `none` of what has gone
  std::optional<int64_t> growth;
  std::optional<double> perSecond;  // of what is counted for ever
  bool isRestarted = false;         // it fell: it was counted from the start again
};

// What became of a row.
struct RowChange {
  Match match;
  std::vector<Change> changes;
};

// Two moments of one report.
class ReportDiff {
 public:
  // `paths`: of each moment, if the kernel's numbers are not the same in both; else null.
  // `by`: the column to rank by; null: that of what the report's things have taken, or if it did
  // not change the one that changed most, of the memory, else of what is counted now. Fails with a
  // UsageError if there is none of that name.
  ReportDiff(const Rows& before, const Rows& after, const GroupPaths* pathsBefore,
             const GroupPaths* pathsAfter, const Sides& sides, const std::string* by);

  const Rows& Before() const { return before_; }
  const Rows& After() const { return after_; }
  const std::vector<RowColumn>& Columns() const {
    return after_.Columns().empty() ? before_.Columns() : after_.Columns();
  }

  // Rows that changed, those that grew or shrank most in the column first.
  const std::vector<RowChange>& Changed() const { return changed_; }
  size_t Unchanged() const { return unchanged_; }
  // Those that one moment has and that may be missing at the other, of which not all could be read.
  size_t Unknown() const { return unknown_; }
  // The column that ranks; none if nothing changed that could.
  std::optional<size_t> By() const { return by_; }

  // The column that says who grew, whatever changed: that asked for, or of what the report's things
  // have taken.
  std::optional<size_t> Measure() const { return measure_; }

  // The most bytes that a row grew by in that column; none if it is not one of memory. What came
  // under a name in place of what has gone under it grew by the difference.
  std::optional<int64_t> LargestBytes() const;

  // The row with its values, of the moment in which it was last.
  std::span<const Value> RowOf(const RowChange& row) const;

 private:
  Change ChangeOf(size_t column, const Match& match) const;
  void TakeRate(Change& change) const;
  void Compare(const Match& match);
  std::string NameOf(const RowChange& row) const;
  std::optional<size_t> Best() const;
  static int64_t GrowthOf(const RowChange& row, std::optional<size_t> column);
  bool HasChanged(std::optional<size_t> column) const;

  const Rows& before_;
  const Rows& after_;
  const Sides& sides_;
  std::vector<RowChange> changed_;
  size_t unchanged_ = 0;
  size_t unknown_ = 0;
  std::optional<size_t> by_;
  std::optional<size_t> measure_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_REPORT_DIFF_H_
