#include "framework/column_table.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <string>

namespace tally {
namespace {

// Longest mask that -s looks at.
constexpr size_t kMaskLimit = 128;

// The line being made: its memory is used again for the next one.
std::string lineBuffer;

// Makes one line out of cells and writes it to standard output in one piece.
class Line {
 public:
  explicit Line(bool csvMode) : csvMode_(csvMode) { lineBuffer.clear(); }

  // Appends a cell of a column of `width` characters.
  void Put(std::string_view text, uint8_t width) {
    if (!first_) lineBuffer += csvMode_ ? ',' : ' ';
    first_ = false;
    if (csvMode_) {
      lineBuffer += text;
      return;
    }
    // printf's rule for a negative field width: the absolute value, left-justified.
    const int field = width - carry_;
    const auto wanted = static_cast<size_t>(field < 0 ? -field : field);
    const size_t padding = wanted > text.size() ? wanted - text.size() : 0;
    if (field >= 0) lineBuffer.append(padding, ' ');
    lineBuffer += text;
    if (field < 0) lineBuffer.append(padding, ' ');
    carry_ = static_cast<uint8_t>(carry_ + padding + text.size() - width);
  }

  void Write() {
    lineBuffer += '\n';
    std::fwrite(lineBuffer.data(), 1, lineBuffer.size(), stdout);
  }

 private:
  bool csvMode_;
  bool first_ = true;
  uint8_t carry_ = 0;  // how far the line stands to the right of its columns, modulo 256
};

// The text of a cell, in `digits` when it is a number's.
std::string_view CellText(const Cell& cell, const char* conversion, std::span<char> digits) {
  const auto number = [&](auto value) -> std::string_view {
    const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), value);
    return {digits.data(), result.ptr};
  };
  const bool wide = conversion[0] == 'L';
  switch (conversion[wide ? 1 : 0]) {
    case 'u':
      return wide ? number(cell.number()) : number(static_cast<uint32_t>(cell.number()));
    case 'd':
      return wide ? number(static_cast<int64_t>(cell.number()))
                  : number(static_cast<int32_t>(cell.number()));
    case 'c':
      digits[0] = static_cast<char>(cell.number());
      return {digits.data(), 1};
    default:
      return cell.text();
  }
}

}  // namespace

void ApplyColumnSelection(ColumnDesc* table, const char* mask) {
  for (ColumnDesc* column = table; column->name != nullptr; ++column) {
    if (mask != nullptr && !column->fixed && !MaskContains(mask, column->name)) {
      column->selected = 0;
    }
    column->width =
        static_cast<uint8_t>(std::max<size_t>(std::strlen(column->name), column->width));
  }
}

bool MaskContains(std::string_view mask, std::string_view name) {
  NameReader words(mask.substr(0, kMaskLimit));
  for (std::string_view word; words.Next(word);) {
    if (SameName(word, name)) return true;
  }
  return false;
}

NameWriter FormatSelectedColumns(const ColumnDesc* table) {
  NameWriter names;
  for (; table->name != nullptr; ++table) names.Put(table->name, table->selected);
  return names;
}

void PrintDashes(const ColumnDesc* table, bool csvMode) {
  if (csvMode) return;
  std::string dashes;
  for (; table->name != nullptr; ++table) {
    if (!table->selected) continue;
    if (!dashes.empty()) dashes += '-';
    dashes.append(table->width, '-');
  }
  std::puts(dashes.c_str());
}

void PrintHeader(const ColumnDesc* table, bool csvMode) {
  Line line(csvMode);
  for (; table->name != nullptr; ++table) {
    if (table->selected) line.Put(table->name, table->width);
  }
  line.Write();
}

void PrintRow(const ColumnDesc* table, bool csvMode, bool totalRow, std::span<const Cell> cells) {
  char digits[32];
  Line line(csvMode);
  for (const Cell& cell : cells) {
    const ColumnDesc& column = *table++;
    if (!column.selected) continue;
    const bool blank = totalRow && !column.summable;
    line.Put(blank ? "" : CellText(cell, column.conversion, digits), column.width);
  }
  line.Write();
}

void PrintColumnDescriptions(const ColumnDesc* table) {
  std::puts("Description of report header labels:");
  for (; table->name != nullptr; ++table) {
    if (table->selected) std::printf("%20s: %s\n", table->name, table->description);
  }
}

}  // namespace tally
