#include "tools/ksicache/diff/steady_rows.h"

#include <optional>
#include <vector>

#include "tools/ksicache/diff/match.h"
#include "tools/ksicache/diff/measure.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/row_sink.h"

namespace ksicache {

RowSampler::RowSampler(const tally::Report& report, const std::string* by) : report_(report) {
  std::vector<RowColumn> columns;
  for (const tally::ColumnInfo& column : ColumnsOf(report)) {
    columns.push_back(RowColumnOf(column, tally::DisplayUnit::b));
    if (columns.back().isKey) kept_.emplace_back(columns.back().name);
  }
  const std::optional<size_t> measure = MeasureOf(report, columns, by);
  if (!measure) {
    throw UsageError(std::string("--since takes a column of ") + report.name + ": --by names it");
  }
  column_ = columns[*measure];
  kept_.emplace_back(column_.name);
}

void RowSampler::Take(const Origin& origin, Samples& samples, Complaints& complaints) {
  const Rows rows(report_, origin, tally::DisplayUnit::b, kept_);
  complaints.SayDiagnostics();
  if (rows.IsWhole()) {
    end_ = samples.Count();
  } else {
    complaints.Say(rows.Complaint());
  }
  const size_t place = PlaceOf(rows.Columns(), column_.name);
  const std::vector<std::string> identities = IdentitiesOf(rows, nullptr);
  for (size_t i = 0; i < rows.Count(); ++i) {
    Series& series = samples.At(identities[i], all_);
    if (series.figures.empty()) SetName(rows, i, series);
    samples.Put(NumberOf(rows.At(i)[place]), series);
  }
}

void RowSampler::SetName(const Rows& rows, size_t row, Series& series) const {
  for (size_t i = 0; i < rows.Columns().size(); ++i) {
    const Value& value = rows.At(row)[i];
    if (!rows.Columns()[i].isKey) continue;
    if (value.type != ValueType::text && GoesByGroups(report_)) {
      series.number = NumberOf(value).value_or(-1);
      continue;
    }
    if (!series.name.empty()) series.name += ", ";
    series.name += value.type == ValueType::text
                       ? std::string(value.text)
                       : rows.Columns()[i].name + (" " + std::to_string(value.number));
  }
  if (rows.Columns().size() == 1) series.name = "host";
}

void RowSampler::Finish(const Samples& samples, SteadyGrowths& growths) {
  growths.report = &report_;
  growths.column = column_;
  for (const auto& [identity, series] : all_) {
    AddIfGrown(samples, series, nullptr, end_, growths.things, &growths.late);
  }
}

}  // namespace ksicache
