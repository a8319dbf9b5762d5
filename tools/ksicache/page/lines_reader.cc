#include "tools/ksicache/page/lines_reader.h"

#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/report_rows.h"
#include "tools/ksicache/page/roles.h"

namespace ksicache {
namespace {

constexpr size_t kMostStretches = 720;
constexpr size_t kFewestStretches = 64;

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

Line TimesOf(const Line& moments, const Survey& survey) {
  Line times;
  times.reserve(moments.size());
  for (const Extent& places : moments) {
    times.push_back({survey.moments[static_cast<size_t>(places.least)].steady,
                     survey.moments[static_cast<size_t>(places.greatest)].steady});
  }
  return times;
}

}  // namespace

LinesReader::LinesReader(PageTexts& texts, Problems& problems) : problems_(problems) {
  lines_.reports = EmptyLines(texts);
}

void LinesReader::Read(const Origin& origin) {
  const size_t stretch = NextStretch();
  lines_.moments[stretch].Add(count_++);
  for (PageLines::OfReport& each : lines_.reports) {
    each.lines.BeginMoment(stretch);
    const bool isWhole =
        GiveRows(*tally::FindReport(each.report.c_str()), origin,
                 {each.columns.begin(), each.columns.end()}, each.lines, problems_);
    each.lines.End(isWhole);
  }
}

// That of the moment at hand.
size_t LinesReader::NextStretch() {
  if (lines_.moments.empty() || inStretch_ == capacity_) {
    if (lines_.moments.size() == kMostStretches) {
      Thin();
      capacity_ *= 2;
    }
    lines_.moments.emplace_back();
    inStretch_ = 0;
  }
  ++inStretch_;
  return lines_.moments.size() - 1;
}

PageLines LinesReader::Finish(const Survey& survey, size_t room) {
  Pack(survey, room);
  return std::move(lines_);
}

void LinesReader::Thin() {
  Halve(lines_.moments);
  for (PageLines::OfReport& each : lines_.reports) each.lines.Thin();
}

// Cuts off what does not fit: first of the figures, then of the stretches.
void LinesReader::Pack(const Survey& survey, size_t room) {
  for (;;) {
    std::string bytes;
    const size_t stretches = lines_.moments.size();
    PutLine(TimesOf(lines_.moments, survey), stretches, 0, bytes);
    for (const PageLines::OfReport& each : lines_.reports) {
      each.lines.Put(stretches, lines_.isCut, bytes);
    }
    lines_.bytes = Packed(bytes);
    const bool isThin = lines_.isCut && stretches <= kFewestStretches;
    if (lines_.bytes.size() <= room || isThin) return;
    if (std::exchange(lines_.isCut, true)) Thin();
  }
}

}  // namespace ksicache
