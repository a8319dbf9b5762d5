// The rows of a report, moment after moment, as the page unpacks them (web/tables.js).
//
// A moment's rows are, in numbers (packing.h):
//
//   0                        the report could not be read
//   1 + the number of rows   and then
//     for each row           what it is of, as a difference to the row before plus 1
//     for each column
//       for each row         its value
//
// What a row is of, its key columns say; each new one has the next number. A value is compared with
// that of the same thing before or, if that had none, with the value of the row above:
//
//   0       the same
//   1       no value
//   2       a number of eight bytes, the lowest first
//   2 + n   of a number: it differs by the folded number n
//           of a text: number n - 1 of the page's texts; of a flag: n - 1
#ifndef TOOLS_KSICACHE_PAGE_TABLE_STREAM_H_
#define TOOLS_KSICACHE_PAGE_TABLE_STREAM_H_

#include <cstddef>
#include <cstdint>
#include <deque>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "tools/ksicache/export/row_format.h"

namespace ksicache {

// All texts of a page, each once.
class PageTexts {
 public:
  PageTexts() = default;
  PageTexts(const PageTexts&) = delete;
  PageTexts& operator=(const PageTexts&) = delete;

  uint32_t NumberOf(std::string_view text);

  const std::deque<std::string>& All() const { return all_; }

 private:
  std::unordered_map<std::string_view, uint32_t> numbers_;
  std::deque<std::string> all_;
};

// A value that lives as long as the page's texts.
struct PageValue {
  ValueType type = ValueType::none;
  uint64_t number = 0;  // of a text: its number

  friend bool operator==(const PageValue&, const PageValue&) = default;
};

// What a row is of: its key values, and how many rows with the same were before it.
class RowIdentities {
 public:
  // `most` for a new one if there are as many already. REQUIRES: the same columns in every call.
  uint32_t NumberOf(std::span<const RowColumn> columns, std::span<const PageValue> row,
                    uint32_t most = UINT32_MAX);

  // A new moment: rows may repeat what an earlier one had.
  void Restart() { ++moment_; }

  size_t Count() const { return count_; }

 private:
  // The rows with the same key values.
  struct Namesakes {
    std::vector<uint32_t> numbers;
    size_t moment = 0;
    size_t seen = 0;  // in that moment
  };

  std::unordered_map<std::string, Namesakes> known_;
  std::string key_;
  size_t moment_ = 0;
  uint32_t count_ = 0;
};

class TableStream {
 public:
  explicit TableStream(PageTexts& texts) : texts_(texts) {}

  // What the columns are, known from the first moment on; the names live as long as the program.
  const std::vector<RowColumn>& Columns() const { return columns_; }

  // One moment: Begin, Row for each row, then End, which puts it behind `bytes`; a report that is
  // neither whole nor has rows could not be read.
  void Begin(std::span<const RowColumn> columns);
  void Row(std::span<const Value> values);
  void End(bool isWhole, std::string& bytes);

  // Keeps the rows of the moment that ended last, in place of those it has kept.
  void Keep() { kept_ = cells_; }

  // These rows, one after the other.
  size_t Rows() const { return columns_.empty() ? 0 : kept_.size() / columns_.size(); }
  std::span<const PageValue> RowAt(size_t row) const {
    return std::span(kept_).subspan(row * columns_.size(), columns_.size());
  }

 private:
  void PutColumn(size_t column, std::string& bytes);
  PageValue& Before(size_t row, size_t column) {
    return before_[ids_[row] * columns_.size() + column];
  }

  PageTexts& texts_;
  std::vector<RowColumn> columns_;
  RowIdentities identities_;
  std::vector<PageValue> cells_;  // of the moment at hand
  std::vector<PageValue> kept_;
  std::vector<uint32_t> ids_;
  std::vector<PageValue> before_;  // the last row of each thing that there has been
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_TABLE_STREAM_H_
