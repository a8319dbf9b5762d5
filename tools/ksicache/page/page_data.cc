#include "tools/ksicache/page/page_data.h"

#include <algorithm>

#include "reports/reports.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/page/memory_rows.h"
#include "tools/ksicache/page/roles.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

// So that a day of some hundred entities is a page of less than a megabyte, in base64.
constexpr size_t kRoomOfTables = 440'000;
constexpr size_t kRoomOfLines = 230'000;
constexpr size_t kMostMoments = 240;
constexpr size_t kFewestMoments = 8;
constexpr size_t kStretchesOfPoints = 500;

// The first moments of what could not be read.
std::vector<size_t> TroubledMoments(const PageData& data) {
  std::vector<size_t> moments;
  for (const int64_t taken : data.problems.FirstTimes()) {
    if (const auto place = data.survey.Find(taken, 0)) moments.push_back(*place);
  }
  return moments;
}

// The tightest moment, those of what could not be read, those after what is told of and those at
// which figures were the worst, in turn.
std::vector<size_t> TellingMoments(const PageData& data) {
  const std::vector<size_t> worst = data.lines.WorstMoments();
  const std::vector<Mark>& marks = data.marks.all;
  const std::vector<size_t> troubled = TroubledMoments(data);
  std::vector<size_t> moments = {TightestMoment(data.survey)};
  for (size_t i = 0; i < std::max({worst.size(), marks.size(), troubled.size()}); ++i) {
    if (i < troubled.size()) moments.push_back(troubled[i]);
    if (i < marks.size()) moments.push_back(marks[i].moment);
    if (i < worst.size()) moments.push_back(worst[i]);
  }
  return moments;
}

// As many moments in full as there is room for.
void ReadTablesOf(const std::string& name, PageData& data) {
  const Survey& survey = data.survey;
  WantedMoments wanted = {{}, ChoosePoints(survey, kStretchesOfPoints), TightestMoment(survey)};
  const std::vector<size_t> telling = TellingMoments(data);
  size_t most = std::min(kMostMoments, survey.moments.size());
  for (bool isLast = false; !isLast;) {
    wanted.full = ChooseMoments(survey, telling, most);
    data.tables = ReadTables(name, survey, wanted, kFewestMoments, kRoomOfTables, data.texts,
                             data.names, data.problems);
    const size_t held = data.tables.full.moments.size();
    isLast = !data.tables.isTooMuch || held == wanted.full.size() || most == kFewestMoments;
    // The first moment is larger than what later ones add to it.
    most = std::max(kFewestMoments, held * 9 / 10);
  }
}

std::string ToJson(const RowColumn& column) {
  return JsonWriter()
      .Text("name", column.name)
      .Text("description", column.description)
      .Number("kind", static_cast<int64_t>(column.kind))
      .Text("unit", column.unit)
      .Flag("isKey", column.isKey)
      .Flag("isCounter", column.isCounter)
      .Flag("isSigned", column.isSigned)
      .Object();
}

std::string ToJson(const char* name, const TableStream& stream) {
  JsonWriter columns;
  for (const RowColumn& column : stream.Columns()) columns.Json("", ToJson(column));
  return JsonWriter().Text("name", name).Json("columns", columns.Array()).Object();
}

std::string ReportsToJson(const MomentTables& tables) {
  JsonWriter reports;
  for (size_t i = 0; i < tally::Reports().size(); ++i) {
    reports.Json("", ToJson(tally::Reports()[i]->name, tables.streams[i]));
  }
  return reports.Array();
}

// How long the memory was in which state, as moments: from best to worst.
std::string StatesToJson(const Survey& survey) {
  JsonWriter states;
  for (const int64_t count : survey.StateCounts()) states.Number("", count);
  return states.Array();
}

std::string BootsToJson(const Survey& survey, const std::vector<size_t>& moments) {
  JsonWriter boots;
  for (const size_t moment : moments) boots.Number("", survey.moments[moment].boot);
  return boots.Array();
}

std::string TimesToJson(const Survey& survey, const std::vector<size_t>& moments,
                        int64_t SurveyedMoment::*time) {
  JsonWriter times;
  for (const size_t moment : moments) times.Number("", survey.moments[moment].*time);
  return times.Array();
}

// When moments were taken, by the clock on the wall and by one that is never set.
std::string ToJson(const Survey& survey, const std::vector<size_t>& moments) {
  return JsonWriter()
      .Json("taken", TimesToJson(survey, moments, &SurveyedMoment::taken))
      .Json("steady", TimesToJson(survey, moments, &SurveyedMoment::steady))
      .Object();
}

std::string ToJson(const ReadFailures& reads, const Survey& survey) {
  return JsonWriter()
      .Number("most", reads.most)
      .Number("at", survey.moments[reads.moment].taken)
      .Number("moments", reads.moments)
      .Object();
}

std::string ToJson(const Marks& marks, const Survey& survey) {
  JsonWriter all;
  for (const Mark& mark : marks.all) {
    all.Json("", JsonWriter()
                     .Text("kind", mark.kind)
                     .Text("words", WordsOf(mark))
                     .Number("at", survey.moments[mark.moment].taken)
                     .Number("steady", survey.moments[mark.moment].steady)
                     .Number("time", mark.time)
                     .Object());
  }
  return JsonWriter()
      .Json("all", all.Array())
      .Number("leftOut", marks.leftOut)
      .Json("refused", ToJson(marks.refused, survey))
      .Json("failed", ToJson(marks.failed, survey))
      .Number("lossy", marks.lossy)
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
      .Number("stretches", lines.moments.size())
      .Flag("isCut", lines.isCut)
      .Json("reports", reports.Array())
      .Object();
}

std::string ToJson(const PageTexts& texts) {
  JsonWriter all;
  for (const std::string& text : texts.All()) all.Text("", text);
  return all.Array();
}

std::string ProblemsToJson(const PageData& data) {
  JsonWriter problems;
  for (const std::string& problem : ProblemsOf(data)) problems.Text("", Printable(problem));
  return problems.Array();
}

}  // namespace

std::vector<std::string> ProblemsOf(const PageData& data) {
  const bool isOne = data.survey.moments.size() == 1;
  return isOne ? data.problems.All() : data.problems.WithTimes();
}

void ReadPage(const std::string& name, PageData& data) {
  LinesReader lines(data.texts, data.names, data.problems);
  std::string problem;
  data.survey = MakeSurvey(
      name, [&](const Origin& origin) { lines.Read(origin); }, problem);
  data.problems.At(std::nullopt);
  data.problems.AddDiagnostics();
  if (!problem.empty()) data.problems.Add(problem);
  try {
    data.marks = MarksOf(name, data.survey, data.problems);
  } catch (const DataError& error) {
    data.problems.Add(error.what());
  }
  data.survey.Steady(data.marks.steps);
  data.lines = lines.Finish(data.survey, kRoomOfLines);
  ReadTablesOf(name, data);
  if (data.tables.full.moments.empty()) throw DataError("nothing of it could be read");
}

std::string HeadToJson(const PageData& data) {
  const Survey& survey = data.survey;
  const std::vector<size_t>& full = data.tables.full.moments;
  return JsonWriter()
      .Text("title", data.title)
      .Text("host", survey.host)
      .Text("zone", data.zone)
      .Number("moments", survey.moments.size())
      .Text("kernel", survey.kernel)
      .Json("states", StatesToJson(survey))
      .Json("points", ToJson(survey, data.tables.points.moments))
      .Json("full", ToJson(survey, full))
      .Json("boots", BootsToJson(survey, full))
      .Json("reports", ReportsToJson(data.tables.full))
      .Json("memory", ToJson("memory", data.tables.full.streams.back()))
      .Json("parts", PartsToJson())
      .Json("marks", ToJson(data.marks, survey))
      .Json("problems", ProblemsToJson(data))
      .Json("lines", ToJson(data.lines))
      .Json("roles", roles::ToJson())
      .Json("texts", ToJson(data.texts))
      .Object();
}

}  // namespace ksicache
