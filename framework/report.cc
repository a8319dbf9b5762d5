#include "framework/report.h"

#include <algorithm>
#include <cassert>
#include <cstdio>
#include <ctime>
#include <string>

namespace tally {
namespace {

bool IsText(const ColumnDesc& column) { return column.conversion[0] == 's'; }

}  // namespace

Status ReportContextBase::Begin(int argc, char** argv) {
  ReportOptions options;
  if (Status status = ParseReportOptions(frame_, argc, argv, options)) return status;
  return Begin(options);
}

Status ReportContextBase::Begin(const ReportOptions& options) {
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

void ReportContextBase::PrintTitleBlock(std::initializer_list<Setting> own) const {
  if (options_.csvMode) return;
  const auto print = [this](const char* label, std::string_view value) {
    std::printf("   %-*s : %.*s\n", frame_.labelWidth, label, static_cast<int>(value.size()),
                value.data());
  };
  const auto printNumber = [&](const char* label, uint64_t value) {
    print(label, std::to_string(value));
  };

  const std::time_t now = std::time(nullptr);
  std::printf("\n %s: %s", frame_.title, std::ctime(&now));
  std::printf(" %s\n", std::string(static_cast<size_t>(frame_.ruleLength), '-').c_str());
  if (frame_.Takes('g')) printNumber("Start Group ID", static_cast<uint64_t>(options_.startGid));
  if (frame_.Takes('l')) printNumber("No. of levels", options_.levels);
  if (frame_.Takes('u')) print("Unit", UnitTitle(unit_));
  for (const Setting& setting : own) printNumber(setting.label, setting.value);
  if (frame_.filterNames != nullptr) {
    print("Inclusion filter", FormatFlagMask(filter_.inclusionMask, frame_.filterNames).text());
    print("Exclusion filter", FormatFlagMask(filter_.exclusionMask, frame_.filterNames).text());
  }
  print("Selected columns", FormatSelectedColumns(table_.data()).text());
  std::putchar('\n');
}

void ReportContextBase::PrintHead() const {
  PrintDashes();
  PrintHeader(table_.data(), options_.csvMode);
  PrintDashes();
}

void ReportContextBase::PrintTotal() {
  for (size_t i = 0; i < cells_.size(); ++i) {
    const uint64_t divisor = treatments_[i].inTotal == InTotal::mean && rows_ > 0 ? rows_ : 1;
    cells_[i] = IsText(table_[i]) ? Cell("Total") : Cell(treatments_[i].total / divisor);
  }
  PrintDashes();
  PrintCells(true);
  PrintDashes();
}

void ReportContextBase::PrintDescriptions() const {
  if (options_.verbose) PrintColumnDescriptions(table_.data());
}

uint64_t& ReportContextBase::total(std::string_view name) {
  const auto column = std::find_if(table_.begin(), table_.end() - 1,
                                   [name](const ColumnDesc& desc) { return name == desc.name; });
  assert(column != table_.end() - 1);
  return treatments_[static_cast<size_t>(column - table_.begin())].total;
}

void ReportContextBase::AddColumn(const ColumnDesc& desc, InTotal inTotal, Conversion toUnit) {
  table_.insert(table_.end() - 1, desc);
  treatments_.push_back({inTotal, toUnit});
  cells_.emplace_back();
}

void ReportContextBase::AddUpCells() {
  ++rows_;
  for (size_t i = 0; i < cells_.size(); ++i) {
    const uint64_t value = cells_[i].number();
    const bool known = treatments_[i].inTotal != InTotal::knownSum || value != kNoValue;
    if (known) treatments_[i].total += value;
  }
}

void ReportContextBase::PrintCells(bool totalRow) {
  for (size_t i = 0; i < cells_.size(); ++i) {
    if (treatments_[i].toUnit != nullptr) {
      cells_[i] = treatments_[i].toUnit(cells_[i].number(), unit_);
    }
  }
  tally::PrintRow(table_.data(), options_.csvMode, totalRow, cells_);
}

}  // namespace tally
