#ifndef TOOLS_KSICACHE_EXPORT_ROW_SINK_H_
#define TOOLS_KSICACHE_EXPORT_ROW_SINK_H_

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "framework/report.h"
#include "tools/ksicache/export/row_format.h"

namespace ksicache {

// Gives a format the items of a report. Totals and the rows of tags say nothing that their items do
// not, and are left out; so are rules, notes and descriptions.
class RowSink : public tally::Sink {
 public:
  // Memory is in `unit`; none: in that of the report.
  RowSink(RowFormat& format, std::optional<tally::DisplayUnit> unit)
      : format_(format), unit_(unit) {}

  // What the next run is of. The format begins with its columns, even if no row follows.
  void Expect(const tally::Report& report, const Origin& origin);

  // Of the format.
  std::string TakeComplaint() { return format_.TakeComplaint(); }

  void Begin(const tally::Heading& /*heading*/) override {}
  void Row(tally::RowKind kind, std::span<const tally::Cell> cells) override;
  void Rule() override {}
  void Note(std::string_view /*text*/) override {}
  void Describe() override {}

 private:
  // How the cells of a column become values.
  struct Place {
    tally::Figure figure;
    bool isWide;         // it is shown in 64 bits
    uint8_t bytesShift;  // from the kernel's measure to bytes
    bool isAsItIs;       // or that measure is what is shown
  };

  void TakeColumns(const tally::Report& report);
  Value ValueOf(const Place& place, const tally::Cell& cell) const;

  RowFormat& format_;
  std::optional<tally::DisplayUnit> unit_;
  const tally::Report* report_ = nullptr;
  tally::DisplayUnit shown_ = tally::DisplayUnit::kb;
  std::vector<Place> places_;
  std::vector<RowColumn> columns_;
  std::vector<Value> values_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_ROW_SINK_H_
