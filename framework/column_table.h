// Column tables and the lines that are printed from them.
//
// A table is an array of ColumnDesc that ends with a null name. Its widths and its selection are
// settled once, by ApplyColumnSelection, before anything is printed.
#ifndef FRAMEWORK_COLUMN_TABLE_H_
#define FRAMEWORK_COLUMN_TABLE_H_

#include <concepts>
#include <cstdint>
#include <span>
#include <string_view>

#include "framework/name_list.h"

namespace tally {

// One column of a report.
struct ColumnDesc {
  const char* name;         // label in the header; the word that -s selects it by
  const char* description;  // label printed by -v
  uint8_t width;            // characters in a table; at least the name's length once selected
  const char* conversion;   // the value's kind: "Lu", "Ld" (64 bits), "u", "d" (32 bits), "c", "s"
  uint8_t summable;         // has a cell in a Total row
  uint8_t fixed;            // -s cannot hide it
  uint8_t selected;         // is shown
};

// One value of a row: a number, signed ones widened with their sign, or a text. The column's
// conversion says how much of a number is shown.
class Cell {
 public:
  Cell() = default;
  template <std::integral T>
  constexpr Cell(T number) : number_(static_cast<uint64_t>(number)) {}
  constexpr Cell(std::string_view text) : text_(text) {}
  constexpr Cell(const char* text) : text_(text) {}

  // A flag: 1 or 0, and the letter that is shown for it.
  static constexpr Cell YesNo(bool flag) {
    Cell cell(flag ? "y" : "n");
    cell.number_ = flag;
    return cell;
  }

  // The same value, known or not. What prints a table shows it in either case.
  constexpr Cell KnownIf(bool isKnown) const {
    Cell cell = *this;
    cell.isKnown_ = isKnown;
    return cell;
  }

  constexpr uint64_t number() const { return number_; }
  constexpr std::string_view text() const { return text_; }
  constexpr bool isKnown() const { return isKnown_; }

 private:
  uint64_t number_ = 0;
  std::string_view text_;
  bool isKnown_ = true;
};

// Hides the selectable columns that `mask`, a ':'-separated list of names, does not hold (null:
// hides none) and raises every width to the length of its name.
void ApplyColumnSelection(ColumnDesc* table, const char* mask);

// Whether `name` is one of the ':'-separated words of `mask`, whatever the case. Only the first
// 128 characters of the mask count.
bool MaskContains(std::string_view mask, std::string_view name);

// The names of the shown columns, "(all)" or "(none)".
NameWriter FormatSelectedColumns(const ColumnDesc* table);

// A line of dashes as wide as the table; nothing in CSV.
void PrintDashes(const ColumnDesc* table, bool csvMode);

// The line of labels.
void PrintHeader(const ColumnDesc* table, bool csvMode);

// One line of values: one cell for each column of the table, hidden ones too. In a Total row
// (`totalRow`) the columns that are not summable are left blank. A table's value that is wider than
// its column takes the room from the next ones, so that later columns stand under their labels.
void PrintRow(const ColumnDesc* table, bool csvMode, bool totalRow, std::span<const Cell> cells);

// One line for each shown column with its description.
void PrintColumnDescriptions(const ColumnDesc* table);

}  // namespace tally

#endif  // FRAMEWORK_COLUMN_TABLE_H_
