// Runs reports for a page.
#ifndef TOOLS_KSICACHE_PAGE_REPORT_ROWS_H_
#define TOOLS_KSICACHE_PAGE_REPORT_ROWS_H_

#include <optional>
#include <span>
#include <string_view>
#include <utility>
#include <vector>

#include "framework/report.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// Hands the rows of a report on to what takes them, which has Begin and Row as TableStream has.
template <class Taker>
class RowsTo : public RowFormat {
 public:
  explicit RowsTo(Taker& taker) : taker_(taker) {}

  void Begin(const RowTable& table) override { taker_.Begin(table.columns); }
  void Row(std::span<const Value> values) override { taker_.Row(values); }
  void Finish() override {}

 private:
  Taker& taker_;
};

// Runs a report on the moment that the library answers from; what is wrong with it is added to the
// problems. False if rows may be missing.
bool RunForPage(const tally::Report& report, const Origin& origin, RowSink& sink,
                Problems& problems);

// The same for what takes rows: with memory in the unit of the report, and with the columns of
// these names beside those that tell rows apart, or all.
template <class Taker>
bool GiveRows(const tally::Report& report, const Origin& origin,
              std::vector<std::string_view> columns, Taker& taker, Problems& problems) {
  RowsTo<Taker> rows(taker);
  RowSink sink(rows, std::nullopt, std::move(columns));
  return RunForPage(report, origin, sink, problems);
}

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_REPORT_ROWS_H_
