// What every report is made of.
//
// A report states its frame (ReportFrame) and one table of columns (Column): of each its label, its
// place in the Total row, its unit and the figure of a row that it shows. ReportContext turns these
// and the rows into output; its address is what the walk over the groups hands to a visitor.
#ifndef FRAMEWORK_REPORT_H_
#define FRAMEWORK_REPORT_H_

#include <cstdint>
#include <initializer_list>
#include <span>
#include <string_view>
#include <vector>

#include "framework/column_table.h"
#include "framework/display_unit.h"
#include "framework/flag_filter.h"
#include "framework/report_options.h"
#include "framework/status.h"

namespace tally {

// What a column shows in the Total row.
enum class InTotal : uint8_t {
  blank,
  sum,       // of the rows' figures, 64 bits wrapping; in a text column the label "Total"
  knownSum,  // of those figures that are not kNoValue
  mean,      // the sum divided by the number of rows
};

constexpr InTotal kBlank = InTotal::blank;
constexpr InTotal kSum = InTotal::sum;

// Whether -s can hide a column.
enum class Fixed : uint8_t { no, yes };

// One column of a report on `Row`s.
template <class Row>
struct Column {
  const char* name;
  const char* description;
  uint8_t width;
  const char* conversion;  // as in ColumnDesc
  InTotal inTotal;
  Conversion toUnit;  // null for what is no amount of memory: it is shown as it is
  Cell (*value)(const Row& row);
  Fixed fixed = Fixed::no;
};

// What all reports do alike, whatever their rows.
class ReportContextBase {
 public:
  // Settles unit, filters and columns. On failure the report ends with the status; nothing has been
  // printed to standard output.
  Status Begin(const ReportOptions& options);

  // The same after reading the command line.
  Status Begin(int argc, char** argv);

  const ReportOptions& options() const { return options_; }
  DisplayUnit unit() const { return unit_; }
  const FlagFilter& filter() const { return filter_; }

  // Settles the columns.
  void SelectColumns() { ApplyColumnSelection(table_.data(), options_.columnMask); }

  // A line of the title block of a report's own.
  struct Setting {
    const char* label;
    uint64_t value;
  };

  // The title block, a report's `own` settings just before the selected columns; nothing in CSV.
  void PrintTitleBlock(std::initializer_list<Setting> own = {}) const;

  // The labels between two lines of dashes.
  void PrintHead() const;

  void PrintDashes() const { tally::PrintDashes(table_.data(), options_.csvMode); }

  // The Total row of the rows so far between two lines of dashes.
  void PrintTotal();

  // The descriptions of the columns, when they were asked for.
  void PrintDescriptions() const;

  // The sum of the column called `name` over the rows so far.
  // REQUIRES: there is such a column.
  uint64_t& total(std::string_view name);

 protected:
  explicit ReportContextBase(const ReportFrame& frame) : frame_(frame) {}

  void AddColumn(const ColumnDesc& desc, InTotal inTotal, Conversion toUnit);

  // The cells of the row at hand, in table order.
  std::vector<Cell>& cells() { return cells_; }
  void AddUpCells();
  void PrintCells(bool totalRow);

 private:
  // What a column needs besides its description.
  struct Treatment {
    InTotal inTotal;
    Conversion toUnit;
    uint64_t total = 0;
  };

  const ReportFrame& frame_;
  ReportOptions options_;
  DisplayUnit unit_ = DisplayUnit::kb;
  FlagFilter filter_;
  std::vector<ColumnDesc> table_{ColumnDesc{}};  // with the null name at its end
  std::vector<Treatment> treatments_;
  std::vector<Cell> cells_;
  uint64_t rows_ = 0;  // added up so far
};

// One run of a report on `Row`s. A report that says more of a column than others do has a
// `ColumnOfRow` of its own, derived from Column.
template <class Row, class ColumnOfRow = Column<Row>>
class ReportContext : public ReportContextBase {
 public:
  // `frame` and `columns` outlive the context.
  ReportContext(const ReportFrame& frame, std::span<const ColumnOfRow> columns)
      : ReportContextBase(frame), columns_(columns) {
    for (const Column<Row>& column : columns_) {
      AddColumn({.name = column.name,
                 .description = column.description,
                 .width = column.width,
                 .conversion = column.conversion,
                 .summable = column.inTotal != InTotal::blank,
                 .fixed = column.fixed == Fixed::yes,
                 .selected = true},
                column.inTotal, column.toUnit);
    }
  }

  // Prints a row and adds it to the Total row.
  void PrintRow(const Row& row) {
    FillCells(row);
    AddUpCells();
    PrintCells(false);
  }

  // Prints a Total row that the kernel counts itself.
  void PrintTotalRow(const Row& row) {
    FillCells(row);
    PrintCells(true);
  }

 private:
  void FillCells(const Row& row) {
    for (size_t i = 0; i < columns_.size(); ++i) cells()[i] = columns_[i].value(row);
  }

  std::span<const ColumnOfRow> columns_;
};

}  // namespace tally

#endif  // FRAMEWORK_REPORT_H_
