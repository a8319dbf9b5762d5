#include "framework/report.h"

#include <string>

#include "framework/csv_sink.h"
#include "framework/table_sink.h"

namespace tally {

Status ReportContextBase::Settle(const ReportOptions& options) {
  if (options.levels == 0) return kBadParameter;  // the walk would have no end
  options_ = options;
  const auto selectColumnsAt = [this](SelectColumnsAt point) {
    if (frame_.selectColumnsAt == point) SelectColumns();
  };
  selectColumnsAt(SelectColumnsAt::beforeUnit);
  if (options.unitText == nullptr && frame_.allowBytes) {
    unit_ = DisplayUnit::b;
  } else if (Status status = ParseDisplayUnit(options.unitText, frame_.allowBytes, unit_)) {
    return status;
  }
  selectColumnsAt(SelectColumnsAt::afterUnit);
  if (frame_.filterNames != nullptr) {
    if (Status status = ParseFlagFilter(options.inclusionText, frame_.filterNames,
                                        filter_.inclusionMask, false)) {
      return status;
    }
    if (Status status = ParseFlagFilter(options.exclusionText, frame_.filterNames,
                                        filter_.exclusionMask, true)) {
      return status;
    }
  }
  selectColumnsAt(SelectColumnsAt::afterFilters);
  return kSuccess;
}

void ReportContextBase::Begin(std::initializer_list<HostFigure> own) {
  const auto add = [this](const char* label, std::string_view value) {
    settings_.push_back({label, std::string(value)});
  };
  const auto addNumber = [&](const char* label, uint64_t value) {
    add(label, std::to_string(value));
  };
  const auto addMask = [&](const char* label, uint32_t mask) {
    add(label, FormatFlagMask(mask, frame_.filterNames).text());
  };
  // sic: C48
  if (frame_.Takes('g')) addNumber("Start Group ID", static_cast<uint64_t>(options_.startGid));
  if (frame_.Takes('l')) addNumber("No. of levels", options_.levels);
  if (frame_.Takes('u')) add("Unit", UnitTitle(unit_));
  for (const HostFigure& figure : own) addNumber(figure.label, figure.value);
  if (frame_.filterNames != nullptr) {
    addMask("Inclusion filter", filter_.inclusionMask);
    addMask("Exclusion filter", filter_.exclusionMask);
  }
  sink_.Begin({.frame = &frame_,
               .unit = unit_,
               .settings = settings_,
               .columns = std::span(table_).first(figures_.size()),
               .figures = figures_});
}

void ReportContextBase::PrintTotal() {
  for (size_t i = 0; i < cells_.size(); ++i) {
    const InTotal inTotal = figures_[i].inTotal;
    const uint64_t divisor = inTotal == InTotal::mean && rows_ > 0 ? rows_ : 1;
    cells_[i] = inTotal == InTotal::label ? Cell("Total") : Cell(totals_[i] / divisor);
  }
  Rule();
  PutCells(RowKind::total);
  Rule();
}

void ReportContextBase::PrintDescriptions() {
  if (options_.verbose) sink_.Describe();
}

void ReportContextBase::AddColumn(const ColumnInfo& column) {
  table_.insert(table_.end() - 1, column.desc);
  figures_.push_back(column.figure);
  totals_.push_back(0);
  cells_.emplace_back();
}

void ReportContextBase::AddUpCells() {
  if (!frame_.totalRow) return;
  ++rows_;
  for (size_t i = 0; i < cells_.size(); ++i) {
    // sic: C7
    const bool known = figures_[i].inTotal != InTotal::knownSum || !figures_[i].IsNone(cells_[i]);
    if (known) totals_[i] += cells_[i].number();
  }
}

Status PrintReport(const Report& report, int argc, char** argv) {
  ReportOptions options;
  if (Status status = ParseReportOptions(*report.frame, argc, argv, options)) return status;
  if (options.csvMode) {
    CsvSink sink;
    return report.run(options, sink);
  }
  TableSink sink;
  return report.run(options, sink);
}

}  // namespace tally
