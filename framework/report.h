// What every report is made of.
//
// A report states its frame (ReportFrame) and a table of columns (Column), and hands its rows to a
// ReportContext, which turns them into what a Sink takes; the context's address is what the walk
// over the groups hands to a visitor. A Report is what others know of it.
#ifndef FRAMEWORK_REPORT_H_
#define FRAMEWORK_REPORT_H_

#include <cstdint>
#include <initializer_list>
#include <span>
#include <string_view>
#include <utility>
#include <vector>

#include "framework/column.h"
#include "framework/display_unit.h"
#include "framework/flag_filter.h"
#include "framework/report_options.h"
#include "framework/sink.h"
#include "framework/status.h"

namespace tally {

// What all reports do alike, whatever their rows. Every run has its own context, with its own copy
// of the columns.
class ReportContextBase {
 public:
  ReportContextBase(const ReportContextBase&) = delete;
  ReportContextBase& operator=(const ReportContextBase&) = delete;

  // Settles unit, filters and columns. On failure the report ends with the status; the sink has
  // been told nothing.
  [[nodiscard]] Status Settle(const ReportOptions& options);

  const ReportOptions& options() const { return options_; }
  const FlagFilter& filter() const { return filter_; }

  // Settles the columns.
  void SelectColumns() { ApplyColumnSelection(table_.data(), options_.columnMask); }

  // A figure of the host as a whole, for the title block.
  struct HostFigure {
    const char* label;
    uint64_t value;
  };

  // Tells the sink what is settled, a report's `own` figures among it; rows may follow.
  void Begin(std::initializer_list<HostFigure> own = {});

  void Rule() { sink_.Rule(); }
  void Note(std::string_view text) { sink_.Note(text); }

  // The Total row of the rows so far between two rules.
  void PrintTotal();

  // The descriptions of the columns, when they were asked for.
  void PrintDescriptions();

  // The sum of the column at `place` (PlaceOf) over the rows so far.
  uint64_t& total(size_t place) { return totals_[place]; }

 protected:
  ReportContextBase(const ReportFrame& frame, Sink& sink) : frame_(frame), sink_(sink) {}
  ~ReportContextBase() = default;

  void AddColumn(const ColumnInfo& column);

  // The cells of the row at hand, in table order.
  std::vector<Cell>& cells() { return cells_; }
  void AddUpCells();
  void PutCells(RowKind kind) { sink_.Row(kind, cells_); }

 private:
  const ReportFrame& frame_;
  Sink& sink_;
  ReportOptions options_;
  DisplayUnit unit_ = DisplayUnit::kb;
  FlagFilter filter_;
  std::vector<Setting> settings_;
  std::vector<ColumnDesc> table_{ColumnDesc{}};  // with the null name at its end
  std::vector<Figure> figures_;
  std::vector<uint64_t> totals_;
  std::vector<Cell> cells_;
  uint64_t rows_ = 0;  // added up so far
};

// One run of a report on `Row`s. A report that says more of a column than others do has a
// `ColumnOfRow` of its own, derived from Column.
template <class Row, class ColumnOfRow = Column<Row>>
class ReportContext : public ReportContextBase {
 public:
  // `frame`, `columns` and `sink` outlive the context.
  ReportContext(const ReportFrame& frame, std::span<const ColumnOfRow> columns, Sink& sink)
      : ReportContextBase(frame, sink), columns_(columns) {
    for (const ColumnInfo& column : columns_) AddColumn(column);
  }

  // Puts out a row and adds it to the Total row.
  void PrintRow(const Row& row) {
    FillCells(row);
    AddUpCells();
    PutCells(RowKind::item);
  }

  // Puts out a Total row that the kernel counts itself.
  void PrintTotalRow(const Row& row) {
    FillCells(row);
    PutCells(RowKind::counted);
  }

 private:
  void FillCells(const Row& row) {
    for (size_t i = 0; i < columns_.size(); ++i) cells()[i] = columns_[i].value(row);
  }

  std::span<const ColumnOfRow> columns_;
};

// The columns that a report has when it goes down so many levels.
struct ReportVariant {
  uint32_t levels;
  std::span<const ColumnInfo> columns;
};

// The one variant of a report with these columns.
template <const auto& kColumns>
constexpr ReportVariant kOnlyVariant[] = {{kMaxLevels, kColumnInfos<kColumns>}};

using ReportEntry = Status (*)(int argc, char** argv);

// A report as others see it. All of it is constant: a report can be run any number of times.
struct Report {
  const char* name;  // the word of -r
  const ReportFrame* frame;
  std::span<const ReportVariant> variants;

  // Reads the host and puts the report into the sink. A failure has been worded with Warning.
  Status (*run)(const ReportOptions& options, Sink& sink);

  // Goes on with the scan of the command line and prints the report to standard output.
  ReportEntry entry;
};

// What an entry does: runs the report with the options of the command line, as a table or as CSV.
[[nodiscard]] Status PrintReport(const Report& report, int argc, char** argv);

}  // namespace tally

#endif  // FRAMEWORK_REPORT_H_
