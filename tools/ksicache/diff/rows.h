#ifndef TOOLS_KSICACHE_DIFF_ROWS_H_
#define TOOLS_KSICACHE_DIFF_ROWS_H_

#include <cstddef>
#include <cstdint>
#include <deque>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "framework/report.h"
#include "tools/ksicache/export/row_format.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// The rows of one report on one moment, kept beyond it.
class Rows {
 public:
  using Names = std::vector<std::string_view>;

  // Runs the report on what the library answers from, and keeps the columns of these names, or all.
  // Memory is in `unit`; none: in that of the report.
  Rows(const tally::Report& report, const Origin& origin, std::optional<tally::DisplayUnit> unit,
       const Names& kept = {});

  const tally::Report& GetReport() const { return *report_; }

  // Whether no row is missing; else why.
  bool IsWhole() const { return complaint_.empty(); }
  const std::string& Complaint() const { return complaint_; }

  const std::vector<RowColumn>& Columns() const { return columns_; }

  size_t Count() const { return columns_.empty() ? 0 : values_.size() / columns_.size(); }

  // One value for each column.
  std::span<const Value> At(size_t row) const {
    return std::span(values_).subspan(row * columns_.size(), columns_.size());
  }

 private:
  class Keeper;

  const tally::Report* report_;
  std::vector<RowColumn> columns_;
  std::vector<Value> values_;
  std::deque<std::string> texts_;  // of the values, and the units of the columns
  std::string complaint_;
};

// A value as a number; none if it is a text or has no value, or one that no int64_t holds.
std::optional<int64_t> NumberOf(const Value& value);

// Whether two values are of one kind and the same.
bool IsSame(const Value& a, const Value& b);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_ROWS_H_
