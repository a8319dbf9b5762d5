#ifndef TOOLS_KSICACHE_EXPORT_ROW_SINK_H_
#define TOOLS_KSICACHE_EXPORT_ROW_SINK_H_

#include <cstddef>
#include <cstdint>
#include <deque>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "framework/report.h"
#include "tools/ksicache/export/row_format.h"

namespace ksicache {

// The columns of a report, those of the level that it goes down to by itself.
std::span<const tally::ColumnInfo> ColumnsOf(const tally::Report& report);

// The unit of a report if none is asked for.
tally::DisplayUnit OwnUnitOf(const tally::Report& report);

// A column as a format sees it that shows memory in this unit.
RowColumn RowColumnOf(const tally::ColumnInfo& column, tally::DisplayUnit unit);

// Gives a format the items of a report, and totals that the kernel counts itself. Other totals and
// the rows of tags say nothing that the items do not, and are left out; so are rules, notes and
// descriptions. Texts are as Escaped makes them, so that all of them are UTF-8.
class RowSink : public tally::Sink {
 public:
  // Memory is in `unit`; none: in that of the report. `columns`: the names of those to give,
  // whatever the case, beside those that tell rows apart; none: all.
  RowSink(RowFormat& format, std::optional<tally::DisplayUnit> unit,
          std::vector<std::string_view> columns = {})
      : format_(format), unit_(unit), wanted_(std::move(columns)) {}

  // What the next run is of. The format begins with its columns, even if no row follows.
  void Expect(const tally::Report& report, const Origin& origin);

  // What is wrong with the rows since the last call; empty: nothing.
  std::string TakeComplaint();

  void Begin(const tally::Heading& /*heading*/) override {}
  void Row(tally::RowKind kind, std::span<const tally::Cell> cells) override;
  void Rule() override {}
  void Note(std::string_view /*text*/) override {}
  void Describe() override {}

 private:
  // How the cells of a column become values.
  struct Place {
    tally::Figure figure;
    size_t cell;  // its place in the row
    bool isWide;  // it is shown in 64 bits
    int shift;    // from the kernel's measure to the unit, to the left
  };

  void TakeColumns(const tally::Report& report);
  bool IsWanted(const tally::ColumnInfo& column) const;
  Value ValueOf(size_t place, const tally::Cell& cell);
  Value NumberOf(size_t place, uint64_t number);
  std::string_view TextOf(std::string_view text);

  RowFormat& format_;
  std::optional<tally::DisplayUnit> unit_;
  std::vector<std::string_view> wanted_;
  const tally::Report* report_ = nullptr;
  tally::DisplayUnit shown_ = tally::DisplayUnit::kb;
  std::vector<Place> places_;
  std::vector<RowColumn> columns_;
  std::vector<Value> values_;
  Origin origin_;                    // with its host escaped
  std::deque<std::string> escaped_;  // texts of the row at hand
  std::string complaint_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_ROW_SINK_H_
