#include "tools/ksicache/page/lines_reader.h"

#include <optional>
#include <span>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/report_rows.h"
#include "tools/ksicache/page/roles.h"

namespace ksicache {
namespace {

constexpr size_t kMostStretches = 720;
constexpr size_t kFewestStretches = 64;

// Hands rows on to the lines of the report at hand.
class Rows : public RowFormat {
 public:
  Rows(ReportLines& lines, size_t stretch) : lines_(lines), stretch_(stretch) {}

  void Begin(const RowTable& table) override { lines_.Begin(table.columns, stretch_); }
  void Row(std::span<const Value> values) override { lines_.Row(values); }
  void Finish() override {}

 private:
  ReportLines& lines_;
  size_t stretch_;
};

// The reports that have lines, with the columns of these.
std::vector<PageLines::OfReport> EmptyLines(PageTexts& texts) {
  std::vector<std::pair<std::string, std::vector<const char*>>> columns;
  for (const roles::Line& line : roles::kLines) {
    if (columns.empty() || columns.back().first != line.report) {
      columns.push_back({line.report, {}});
    }
    columns.back().second.push_back(line.column);
  }
  std::vector<PageLines::OfReport> lines;
  lines.reserve(columns.size());
  for (const auto& [report, names] : columns) {
    lines.push_back({report, names, ReportLines(texts, names)});
  }
  return lines;
}

}  // namespace

LinesReader::LinesReader(PageTexts& texts, Problems& problems) : problems_(problems) {
  lines_.reports = EmptyLines(texts);
}

void LinesReader::Read(const Origin& origin) {
  if (lines_.times.empty() || moments_ == capacity_) {
    if (lines_.times.size() == kMostStretches) {
      Thin();
      capacity_ *= 2;
    }
    lines_.times.emplace_back();
    moments_ = 0;
  }
  ++moments_;
  const size_t stretch = lines_.times.size() - 1;
  lines_.times[stretch].Add(origin.taken);
  for (PageLines::OfReport& each : lines_.reports) {
    Rows rows(each.lines, stretch);
    RowSink sink(rows, std::nullopt, {each.columns.begin(), each.columns.end()});
    RunForPage(*tally::FindReport(each.report.c_str()), origin, sink, problems_);
    each.lines.End();
  }
}

PageLines LinesReader::Finish(size_t room) {
  Pack(room);
  return std::move(lines_);
}

void LinesReader::Thin() {
  Halve(lines_.times);
  for (PageLines::OfReport& each : lines_.reports) each.lines.Thin();
}

// Cuts off what does not fit: first of the figures, then of the stretches.
void LinesReader::Pack(size_t room) {
  for (;;) {
    std::string bytes;
    PutLine(lines_.times, lines_.times.size(), 0, bytes);
    for (const PageLines::OfReport& each : lines_.reports) {
      each.lines.Put(lines_.times.size(), lines_.isCut, bytes);
    }
    lines_.bytes = Packed(bytes);
    const bool isThin = lines_.isCut && lines_.times.size() <= kFewestStretches;
    if (lines_.bytes.size() <= room || isThin) return;
    if (std::exchange(lines_.isCut, true)) Thin();
  }
}

}  // namespace ksicache
