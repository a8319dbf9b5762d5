#include "framework/column_table.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <string>

namespace tally {
namespace {

// sic: C4
constexpr size_t kMaskLimit = 128;

// The line being made: its memory is used again for the next one.
std::string lineBuffer;

// Makes one line out of cells and writes it to standard output in one piece.
class Line {
 public:
  explicit Line(bool csvMode) : csvMode_(csvMode) {}

  // Append a cell of a column of `width` characters.
  void Put(std::string_view text, uint8_t width) {
    Begin(text.size());
    text.copy(end_, text.size());
    Finish(text.size(), width);
  }
  template <std::integral Number>
  void Put(Number number, uint8_t width) {
    Begin(kBlock);
    const auto result = std::to_chars(end_, end_ + kBlock, number);
    Finish(static_cast<size_t>(result.ptr - end_), width);
  }

  void Write() {
    Reserve(0);
    *end_++ = '\n';
    // An error stays with the stream until the program closes it.
    const auto size = static_cast<size_t>(end_ - lineBuffer.data());
    static_cast<void>(std::fwrite(lineBuffer.data(), 1, size, stdout));
  }

 private:
  // More characters than any number takes.
  static constexpr size_t kBlock = 32;

  // Makes room for a separator and a cell of `size` characters, padded.
  void Reserve(size_t size) {
    constexpr size_t kWidest = size_t{2} * UINT8_MAX;
    const auto used = static_cast<size_t>(end_ - lineBuffer.data());
    const size_t needed = used + 1 + size + kWidest + 2 * kBlock;
    if (needed <= lineBuffer.size()) return;
    lineBuffer.resize(2 * needed);
    end_ = lineBuffer.data() + used;
  }

  // Makes ready for a cell of `size` characters, to be put at the end.
  void Begin(size_t size) {
    Reserve(size);
    if (!first_) *end_++ = csvMode_ ? ',' : ' ';
    first_ = false;
  }

  // Takes in the `size` characters at the end as a cell.
  void Finish(size_t size, uint8_t width) {
    // sic: C50
    if (csvMode_) {
      end_ += size;
      return;
    }
    // sic: C5
    const int field = width - carry_;
    const auto wanted = static_cast<size_t>(field < 0 ? -field : field);
    const size_t padding = wanted > size ? wanted - size : 0;
    if (field < 0) {
      std::memset(end_ + size, ' ', padding);
    } else {
      JustifyRight(size, padding);
    }
    end_ += size + padding;
    carry_ = static_cast<uint8_t>(carry_ + padding + size - width);
  }

  // Moves the cell of `size` characters at the end behind `padding` spaces.
  void JustifyRight(size_t size, size_t padding) {
    if (size > kBlock || padding > kBlock) {
      std::memmove(end_ + padding, end_, size);
      std::memset(end_, ' ', padding);
      return;
    }
    // Nearly every cell: whole blocks instead of counted bytes save a third of a row's time.
    char block[kBlock];
    std::memcpy(block, end_, kBlock);
    std::memset(end_, ' ', kBlock);
    std::memcpy(end_ + padding, block, kBlock);
  }

  bool csvMode_;
  bool first_ = true;
  char* end_ = lineBuffer.data();
  uint8_t carry_ = 0;  // how far the line stands to the right of its columns, modulo 256
};

// Appends a cell as its column's conversion shows it.
void PutCell(Line& line, const Cell& cell, const ColumnDesc& column) {
  const bool wide = column.conversion[0] == 'L';
  switch (column.conversion[wide ? 1 : 0]) {
    case 'u':
      wide ? line.Put(cell.number(), column.width)
           : line.Put(static_cast<uint32_t>(cell.number()), column.width);
      break;
    case 'd':
      wide ? line.Put(static_cast<int64_t>(cell.number()), column.width)
           : line.Put(static_cast<int32_t>(cell.number()), column.width);
      break;
    case 'c': {
      const char letter = static_cast<char>(cell.number());
      line.Put(cell.text().empty() ? std::string_view(&letter, 1) : cell.text(), column.width);
      break;
    }
    default:
      line.Put(cell.text(), column.width);
      break;
  }
}

}  // namespace

void ApplyColumnSelection(ColumnDesc* table, const char* mask) {
  for (ColumnDesc* column = table; column->name != nullptr; ++column) {
    if (mask != nullptr && !column->fixed && !MaskContains(mask, column->name)) {
      column->selected = 0;
    }
    // sic: C6
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
    if (table->selected) line.Put(std::string_view(table->name), table->width);
  }
  line.Write();
}

void PrintRow(const ColumnDesc* table, bool csvMode, bool totalRow, std::span<const Cell> cells) {
  Line line(csvMode);
  for (const Cell& cell : cells) {
    const ColumnDesc& column = *table++;
    if (!column.selected) continue;
    if (totalRow && !column.summable) {
      line.Put(std::string_view{}, column.width);
    } else {
      PutCell(line, cell, column);
    }
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
