// Where a report's rows go.
#ifndef FRAMEWORK_SINK_H_
#define FRAMEWORK_SINK_H_

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "framework/column.h"
#include "framework/report_options.h"

namespace tally {

// A line of the title block: a setting of the run, or a figure of the host as a whole.
struct Setting {
  const char* label;
  std::string value;
};

// What is settled before the first row.
struct Heading {
  const ReportFrame* frame;
  DisplayUnit unit;
  std::span<const Setting> settings;
  std::span<const ColumnDesc> columns;  // those of the run; an entry with a null name follows them
  std::span<const Figure> figures;      // one for each column
};

enum class RowKind : uint8_t {
  item,     // one of what the report lists
  tag,      // the groups of one tag together
  total,    // all rows; the columns that are not summable have no figure
  counted,  // the same by the kernel's own count
};

// Takes what a report produces, in the order of its output. What it is given lives until the
// report's run ends; a row's cells and their texts until the call returns.
class Sink {
 public:
  virtual ~Sink() = default;

  // The report has its settings, and rows follow. Not called when the report fails before.
  virtual void Begin(const Heading& heading) = 0;

  // A row: one cell for each column, hidden ones too, with the figure as the kernel gives it.
  // Figure::Shown() turns it into the display unit.
  virtual void Row(RowKind kind, std::span<const Cell> cells) = 0;

  // A rule between parts of the table.
  virtual void Rule() = 0;

  // A remark on what follows or on the whole.
  virtual void Note(std::string_view text) = 0;

  // The columns are to be described.
  virtual void Describe() = 0;
};

}  // namespace tally

#endif  // FRAMEWORK_SINK_H_
