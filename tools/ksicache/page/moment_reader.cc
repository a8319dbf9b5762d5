#include "tools/ksicache/page/moment_reader.h"

#include <algorithm>
#include <functional>
#include <string_view>
#include <type_traits>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/roles.h"
#include "tools/ksicache/progress.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {
namespace {

// As many points in time as a screen has.
constexpr size_t kStretches = 512;
constexpr size_t kFewestStretches = 64;

// Hands rows on to whoever is to have those of the report at hand.
template <class Taker>
class Rows : public RowFormat {
 public:
  Taker* taker = nullptr;
  size_t stretch = 0;  // of lines

  void Begin(const RowTable& table) override {
    if constexpr (std::is_same_v<Taker, ReportLines>) {
      taker->Begin(table.columns, stretch);
    } else {
      taker->Begin(table.columns);
    }
  }
  void Row(std::span<const Value> values) override { taker->Row(values); }
  void Finish() override {}
};

// Runs a report; what is wrong with it is added to the problems. False if it failed.
bool Run(const tally::Report& report, const Origin& origin, RowSink& sink, Problems& problems) {
  sink.Expect(report, origin);
  std::string error;
  try {
    RunReport(report, sink);
    error = sink.TakeComplaint();
  } catch (const DataError& caught) {
    error = caught.what();
  }
  problems.AddDiagnostics();
  if (!error.empty()) problems.Add(error);
  return error.empty();
}

// Ends the reading of moments when all that is wanted has been read.
struct Enough {};

// Calls with each moment of the source that is in the survey, and its place there; the library
// answers from it.
void ForEachSurveyed(const PageSource& source,
                     const std::function<void(size_t place, const Origin& origin)>& visit) {
  Progress progress("reading");
  size_t next = 0;
  try {
    ForEachMoment(source.name, [&](const Origin& origin) {
      const std::optional<size_t> place = source.survey.Find(origin.taken, next);
      if (!place) return;
      next = *place + 1;
      progress.Show(next, source.survey.moments.size());
      visit(*place, origin);
      if (next == source.survey.moments.size()) throw Enough();
    });
  } catch (const Enough&) {
    // Moments that were added meanwhile are not the page's.
  } catch (const DataError& error) {
    source.problems.Add(error.what());
  }
}

MomentTables Read(const PageSource& source, std::span<const tally::Report* const> reports,
                  const std::vector<size_t>& wanted, size_t fewest, size_t room, PageTexts& texts) {
  MomentTables tables{{}, std::vector<TableStream>(reports.size(), TableStream(texts)), {}};
  Rows<TableStream> rows;
  RowSink sink(rows, std::nullopt);
  Packer packer;
  ForEachSurveyed(source, [&](size_t place, const Origin& origin) {
    if (!std::ranges::binary_search(wanted, place)) return;
    std::string bytes;
    for (size_t i = 0; i < reports.size(); ++i) {
      rows.taker = &tables.streams[i];
      const bool isWhole = Run(*reports[i], origin, sink, source.problems);
      tables.streams[i].End(isWhole, bytes);
    }
    packer.Put(bytes);
    tables.moments.push_back(place);
    const bool isFull = packer.Size() > room && tables.moments.size() >= fewest;
    if (isFull || place == wanted.back()) throw Enough();
  });
  tables.bytes = packer.Finish();
  return tables;
}

// The reports that have lines, with the columns of these.
std::vector<PageLines::OfReport> EmptyLines(PageTexts& texts, size_t stretches) {
  std::vector<std::pair<std::string, std::vector<const char*>>> columns;
  for (const roles::Line& line : roles::kLines) {
    if (columns.empty() || columns.back().first != line.report)
      columns.push_back({line.report, {}});
    columns.back().second.push_back(line.column);
  }
  std::vector<PageLines::OfReport> lines;
  lines.reserve(columns.size());
  for (const auto& [report, names] : columns) {
    lines.push_back({report, names, ReportLines(texts, names, stretches)});
  }
  return lines;
}

void Thin(PageLines& lines) {
  Halve(lines.times);
  for (PageLines::OfReport& each : lines.reports) each.lines.Thin();
}

// Cuts off what does not fit: first of the figures, then of the stretches.
void Pack(size_t room, PageLines& lines) {
  for (;;) {
    std::string bytes;
    PutLine(lines.times, 0, bytes);
    for (const PageLines::OfReport& each : lines.reports) each.lines.Put(lines.isCut, bytes);
    lines.bytes = Packed(bytes);
    const bool isThin = lines.isCut && lines.times.size() <= kFewestStretches;
    if (lines.bytes.size() <= room || isThin) return;
    if (std::exchange(lines.isCut, true)) Thin(lines);
  }
}

}  // namespace

MomentTables ReadTables(const PageSource& source, const std::vector<size_t>& wanted, size_t fewest,
                        size_t room, PageTexts& texts) {
  return Read(source, tally::Reports(), wanted, fewest, room, texts);
}

MomentTables ReadPoints(const PageSource& source, const std::vector<size_t>& wanted,
                        PageTexts& texts) {
  const tally::Report* const report = tally::FindReport(roles::kHostReport);
  return Read(source, {&report, 1}, wanted, 0, SIZE_MAX, texts);
}

PageLines ReadLines(const PageSource& source, size_t room, PageTexts& texts) {
  const size_t moments = source.survey.moments.size();
  const size_t stretches = std::min(moments, kStretches);
  PageLines lines;
  lines.times.resize(stretches);
  lines.reports = EmptyLines(texts, stretches);
  Rows<ReportLines> rows;
  RowSink sink(rows, std::nullopt);
  ForEachSurveyed(source, [&](size_t place, const Origin& origin) {
    rows.stretch = StretchOf(place, stretches, moments);
    lines.times[rows.stretch].Add(origin.taken);
    for (PageLines::OfReport& each : lines.reports) {
      rows.taker = &each.lines;
      Run(*tally::FindReport(each.report.c_str()), origin, sink, source.problems);
      each.lines.End();
    }
  });
  Pack(room, lines);
  return lines;
}

}  // namespace ksicache
