#include "tools/ksicache/page/page_data.h"

#include <algorithm>

#include "reports/reports.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/page/page_json.h"
#include "tools/ksicache/page/roles.h"

namespace ksicache {
namespace {

// So that a day of some hundred entities is a page of less than a megabyte, in base64.
constexpr size_t kRoomOfTables = 440'000;
constexpr size_t kRoomOfLines = 230'000;
constexpr size_t kMostMoments = 240;
constexpr size_t kFewestMoments = 8;
constexpr size_t kStretchesOfPoints = 500;

// The moments after what is told of.
std::vector<size_t> Marked(const Marks& marks) {
  std::vector<size_t> moments;
  for (const Mark& mark : marks.all) moments.push_back(mark.moment);
  return moments;
}

// As many moments in full as there is room for.
void ReadTablesOf(PageData& data) {
  const Survey& survey = data.source.survey;
  for (size_t most = std::min(kMostMoments, survey.moments.size());;) {
    const std::vector<size_t> wanted = ChooseMoments(survey, Marked(data.marks), most);
    data.tables = ReadTables(data.source, wanted, kFewestMoments, kRoomOfTables, data.texts);
    if (data.tables.moments.size() >= wanted.size()) return;
    if (most <= kFewestMoments) return;
    // The first moment is larger than what later ones add to it.
    most = std::max(kFewestMoments, data.tables.moments.size() * 9 / 10);
  }
}

std::string ToJson(const RowColumn& column, bool isSigned) {
  return JsonWriter()
      .Text("name", column.name)
      .Text("description", column.description)
      .Number("kind", static_cast<int64_t>(column.kind))
      .Text("unit", column.unit)
      .Flag("isKey", column.isKey)
      .Flag("isCounter", column.isCounter)
      .Flag("isSigned", isSigned)
      .Object();
}

std::string ToJson(const tally::Report& report, const TableStream& stream) {
  JsonWriter columns;
  for (size_t i = 0; i < stream.Columns().size(); ++i) {
    columns.Json("", ToJson(stream.Columns()[i], stream.IsSigned(i)));
  }
  return JsonWriter().Text("name", report.name).Json("columns", columns.Array()).Object();
}

std::string ReportsToJson(const MomentTables& tables) {
  JsonWriter reports;
  for (size_t i = 0; i < tables.streams.size(); ++i) {
    reports.Json("", ToJson(*tally::Reports()[i], tables.streams[i]));
  }
  return reports.Array();
}

std::string TimesToJson(const Survey& survey, const std::vector<size_t>& moments) {
  JsonWriter times;
  for (const size_t moment : moments) times.Number("", survey.moments[moment].taken);
  return times.Array();
}

std::string ToJson(const Marks& marks, const Survey& survey) {
  JsonWriter all;
  for (const Mark& mark : marks.all) {
    all.Json("", JsonWriter()
                     .Text("kind", mark.kind)
                     .Number("at", survey.moments[mark.moment].taken)
                     .Number("time", mark.time)
                     .Object());
  }
  return JsonWriter()
      .Json("all", all.Array())
      .Number("leftOut", static_cast<int64_t>(marks.leftOut))
      .Number("refused", static_cast<int64_t>(marks.refused))
      .Number("failed", static_cast<int64_t>(marks.failed))
      .Number("lossy", static_cast<int64_t>(marks.lossy))
      .Object();
}

std::string ToJson(const PageLines& lines) {
  JsonWriter reports;
  for (const PageLines::OfReport& each : lines.reports) {
    JsonWriter columns;
    for (const char* column : each.columns) columns.Text("", column);
    reports.Json("", JsonWriter()
                         .Text("report", each.report)
                         .Json("columns", columns.Array())
                         .Json("things", each.lines.ThingsToJson())
                         .Flag("leavesOut", each.lines.LeavesOut())
                         .Object());
  }
  return JsonWriter()
      .Number("stretches", static_cast<int64_t>(lines.times.size()))
      .Flag("isCut", lines.isCut)
      .Json("reports", reports.Array())
      .Object();
}

std::string TextsToJson(const std::vector<std::string>& texts) {
  JsonWriter all;
  for (const std::string& text : texts) all.Text("", text);
  return all.Array();
}

}  // namespace

void ReadPage(PageData& data) {
  std::string problem;
  data.source.survey = MakeSurvey(data.source.name, problem);
  data.problems.AddDiagnostics();
  if (!problem.empty()) data.problems.Add(problem);
  try {
    data.marks = MarksOf(data.source.name, data.source.survey);
  } catch (const DataError& error) {
    data.problems.Add(error.what());
  }
  data.points =
      ReadPoints(data.source, ChoosePoints(data.source.survey, kStretchesOfPoints), data.texts);
  ReadTablesOf(data);
  data.lines = ReadLines(data.source, kRoomOfLines, data.texts);
  if (data.tables.moments.empty()) throw DataError("nothing of it could be read");
}

std::string HeadToJson(const PageData& data) {
  const Survey& survey = data.source.survey;
  return JsonWriter()
      .Text("title", data.title)
      .Text("host", survey.host)
      .Number("moments", static_cast<int64_t>(survey.moments.size()))
      .Json("points", TimesToJson(survey, data.points.moments))
      .Json("full", TimesToJson(survey, data.tables.moments))
      .Json("reports", ReportsToJson(data.tables))
      .Json("marks", ToJson(data.marks, survey))
      .Json("problems", TextsToJson(data.problems.All()))
      .Json("lines", ToJson(data.lines))
      .Json("roles", roles::ToJson())
      .Json("texts", TextsToJson(data.texts.All()))
      .Object();
}

}  // namespace ksicache
