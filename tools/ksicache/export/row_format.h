// Rows of reports as what programs read: typed values below columns with names and units.
#ifndef TOOLS_KSICACHE_EXPORT_ROW_FORMAT_H_
#define TOOLS_KSICACHE_EXPORT_ROW_FORMAT_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "framework/column.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// A column as a format sees it.
struct RowColumn {
  const char* name;
  const char* description;
  tally::Kind kind;
  bool isKey;
  bool isCounter;
  bool isSigned;                        // its numbers are
  const char* unit;                     // that its numbers are in; empty: they have none
  std::span<const char* const> states;  // all that its texts may be; none: anything
};

// The place of the column of a name; behind all of them if there is none.
inline size_t PlaceOf(std::span<const RowColumn> columns, std::string_view name) {
  size_t place = 0;
  while (place < columns.size() && columns[place].name != name) ++place;
  return place;
}

enum class ValueType : uint8_t { none, text, flag, signedNumber, unsignedNumber };

struct Value {
  ValueType type;
  uint64_t number;  // of a flag or a number
  std::string_view text;
};

// The rows of one report on one moment.
struct RowTable {
  const tally::Report* report;
  std::span<const RowColumn> columns;
  const Origin* origin;
};

// Writes rows. The host and the moment of a table live until the next call, its report and its
// columns until EndReports. It fails with an Error or an OutputError.
class RowFormat {
 public:
  virtual ~RowFormat() = default;

  virtual void Begin(const RowTable& table) = 0;

  // REQUIRES: one value for each column of the table that was begun last.
  virtual void Row(std::span<const Value> values) = 0;

  // What is wrong with rows that the format has left out since the last call; empty: nothing.
  virtual std::string TakeComplaint() { return {}; }

  // All rows of the reports that were begun since the last call have been given. Whether they are
  // to be given again, all of them.
  virtual bool EndReports() { return false; }

  // No more rows follow.
  virtual void Finish() = 0;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_ROW_FORMAT_H_
