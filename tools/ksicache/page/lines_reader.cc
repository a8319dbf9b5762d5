#include "tools/ksicache/page/lines_reader.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/report_rows.h"
#include "tools/ksicache/page/roles.h"

namespace ksicache {
namespace {

constexpr size_t kMostStretches = 720;
constexpr size_t kFewestStretches = 64;

// As many things of a line have their worst moment in full, if there is room.
constexpr size_t kThingsToldOf = 3;

// The reports that have lines, with the columns of these.
std::vector<PageLines::OfReport> EmptyLines(PageTexts& texts, Names& names) {
  std::vector<std::pair<const char*, std::vector<const char*>>> columns;
  for (const roles::Line& line : roles::kLines) {
    if (columns.empty() || std::string_view(columns.back().first) != line.report) {
      columns.push_back({line.report, {}});
    }
    columns.back().second.push_back(line.column);
  }
  std::vector<PageLines::OfReport> lines;
  lines.reserve(columns.size());
  for (const auto& [report, ofReport] : columns) {
    lines.push_back({report, ofReport, ReportLines(texts, report, ofReport, names[report])});
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

std::vector<size_t> PageLines::WorstMoments() const {
  std::vector<std::vector<size_t>> ofLines;
  for (const roles::Line& line : roles::kLines) {
    const OfReport& each = *std::ranges::find(reports, line.report, &OfReport::report);
    const auto column = std::ranges::find(each.columns, std::string_view(line.column));
    ofLines.push_back(each.lines.WorstMoments(static_cast<size_t>(column - each.columns.begin()),
                                              line.isLessWorse, kThingsToldOf));
  }
  std::vector<size_t> worst;
  for (size_t rank = 0; rank <= kThingsToldOf; ++rank) {
    for (const std::vector<size_t>& ofLine : ofLines) {
      if (rank < ofLine.size()) worst.push_back(ofLine[rank]);
    }
  }
  return worst;
}

LinesReader::LinesReader(PageTexts& texts, Names& names, Problems& problems) : problems_(problems) {
  lines_.reports = EmptyLines(texts, names);
}

void LinesReader::Read(const Origin& origin) {
  problems_.At(origin.taken);
  const size_t stretch = NextStretch();
  const int64_t moment = count_++;
  lines_.moments[stretch].Add(moment);
  for (PageLines::OfReport& each : lines_.reports) {
    each.lines.BeginMoment(static_cast<size_t>(moment), stretch);
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
