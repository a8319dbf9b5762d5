#include "tools/ksicache/diff/report_output.h"

#include <algorithm>
#include <span>
#include <string>

#include "tools/ksicache/diff/json_text.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

std::span<const RowChange> FirstOf(const ReportDiff& diff, size_t top) {
  return std::span(diff.Changed()).first(std::min(top, diff.Changed().size()));
}

std::string TextOf(const Value& value) {
  switch (value.type) {
    case ValueType::none:
      return kNoFigure;
    case ValueType::signedNumber:
      return std::to_string(static_cast<int64_t>(value.number));
    case ValueType::unsignedNumber:
      return std::to_string(value.number);
    case ValueType::flag:
      return value.number != 0 ? "y" : "n";
    case ValueType::text:
      break;
  }
  return std::string(value.text);
}

// "mail, schedGrp 1050"; a report of one row has no names.
std::string NameOfRow(const ReportDiff& diff, const RowChange& row) {
  std::string name;
  const auto values = diff.RowOf(row);
  for (size_t i = 0; i < values.size(); ++i) {
    const RowColumn& column = diff.Columns()[i];
    if (!column.isKey) continue;
    if (!name.empty()) name += ", ";
    if (values[i].type != ValueType::text) name += std::string(column.name) + " ";
    name += TextOf(values[i]);
  }
  if (name.empty()) name = "host";
  return name + (row.match.IsNew() ? ": new" : row.match.IsGone() ? ": gone" : "");
}

void PrintChange(const ReportDiff& diff, const Change& change) {
  const std::string growth = change.isRestarted ? "restarted" : NumberText(change.growth);
  std::string line = "  " + OnTheLeft(diff.Columns()[change.column].name, 20) +
                     OnTheRight(TextOf(change.before), 15) + OnTheRight(TextOf(change.after), 16) +
                     OnTheRight(growth, 15);
  if (change.perSecond) line += OnTheRight(RateText(change.perSecond), 12);
  PrintLine(line);
}

// "12 rows changed, 2 of them new and 1 gone; 30 did not"
std::string CountText(const ReportDiff& diff) {
  const auto& rows = diff.Changed();
  const auto isNew = [](const RowChange& row) { return row.match.IsNew(); };
  const auto isGone = [](const RowChange& row) { return row.match.IsGone(); };
  return std::to_string(rows.size()) + (rows.size() == 1 ? " row" : " rows") + " changed, " +
         std::to_string(std::ranges::count_if(rows, isNew)) + " of them new and " +
         std::to_string(std::ranges::count_if(rows, isGone)) + " gone; " +
         std::to_string(diff.Unchanged()) + " did not" +
         (diff.Unknown() == 0 ? "" : ", of " + std::to_string(diff.Unknown()) + " nobody knows");
}

bool HasRates(const ReportDiff& diff, size_t top) {
  return std::ranges::any_of(FirstOf(diff, top), [](const RowChange& row) {
    return std::ranges::any_of(row.changes,
                               [](const Change& change) { return change.perSecond.has_value(); });
  });
}

// The unit of memory in the report; empty if it has no memory.
const char* UnitOf(const ReportDiff& diff) {
  const auto found = std::ranges::find_if(diff.Columns(), tally::IsMemory, &RowColumn::kind);
  return found == diff.Columns().end() ? "" : found->unit;
}

void PutValue(const Value& value, JsonText& json) {
  switch (value.type) {
    case ValueType::none:
      return json.PutNone();
    case ValueType::signedNumber:
      return json.PutNumber(static_cast<int64_t>(value.number));
    case ValueType::unsignedNumber:
      return json.PutUnsigned(value.number);
    case ValueType::flag:
      return json.PutFlag(value.number != 0);
    case ValueType::text:
      return json.PutText(value.text);
  }
}

void PutChange(const ReportDiff& diff, const Change& change, JsonText& json) {
  json.Name(diff.Columns()[change.column].name);
  json.Begin('{');
  json.Name("before");
  PutValue(change.before, json);
  json.Name("after");
  PutValue(change.after, json);
  json.Name("growth");
  json.PutNumber(change.growth);
  if (diff.Columns()[change.column].isCounter) {
    json.Name("perSecond");
    json.PutReal(change.perSecond);
    json.Name("restarted");
    json.PutFlag(change.isRestarted);
  }
  json.End('}');
}

void PutRow(const ReportDiff& diff, const RowChange& row, JsonText& json) {
  json.Begin('{');
  const auto values = diff.RowOf(row);
  json.Name("row");
  json.Begin('{');
  for (size_t i = 0; i < values.size(); ++i) {
    if (!diff.Columns()[i].isKey) continue;
    json.Name(diff.Columns()[i].name);
    PutValue(values[i], json);
  }
  json.End('}');
  json.Name("state");
  json.PutText(row.match.IsNew() ? "new" : row.match.IsGone() ? "gone" : "changed");
  json.Name("columns");
  json.Begin('{');
  for (const Change& change : row.changes) PutChange(diff, change, json);
  json.End('}');
  json.End('}');
}

}  // namespace

void PrintReportDiff(const Sides& sides, const ReportDiff& diff, size_t top) {
  PrintLine(sides.Title());
  if (!sides.HaveSameNumbers()) PrintLine(kOtherNumbers);
  std::string title = diff.After().GetReport().name;
  const std::string unit = UnitOf(diff);
  if (!unit.empty()) title += ", " + unit;
  if (diff.By()) title += std::string(", by ") + diff.Columns()[*diff.By()].name;
  PrintLine(title);
  Print("\n" + OnTheLeft("", 22) + OnTheRight("before", 15) + OnTheRight("after", 16) +
        OnTheRight("growth", 15) + (HasRates(diff, top) ? OnTheRight("a second", 12) : "") + "\n");
  for (const RowChange& row : FirstOf(diff, top)) {
    PrintLine(NameOfRow(diff, row));
    for (const Change& change : row.changes) PrintChange(diff, change);
  }
  const size_t more = diff.Changed().size() - FirstOf(diff, top).size();
  Print("\n" + CountText(diff) + (more == 0 ? "" : "; " + std::to_string(more) + " not shown") +
        "\n");
}

void PrintReportDiffJson(const Sides& sides, const ReportDiff& diff, size_t top) {
  JsonText json;
  json.Begin('{');
  PutSides(sides, json);
  json.Name("report");
  json.PutText(diff.After().GetReport().name);
  json.Name("unit");
  json.PutText(UnitOf(diff));
  json.Name("by");
  if (diff.By()) {
    json.PutText(diff.Columns()[*diff.By()].name);
  } else {
    json.PutNone();
  }
  json.Name("unchanged");
  json.PutNumber(static_cast<int64_t>(diff.Unchanged()));
  json.Name("unknown");
  json.PutNumber(static_cast<int64_t>(diff.Unknown()));
  json.Name("changed");
  json.PutNumber(static_cast<int64_t>(diff.Changed().size()));
  json.Name("rows");
  json.Begin('[');
  for (const RowChange& row : FirstOf(diff, top)) {
    json.NewLine();
    PutRow(diff, row, json);
    json.Flush();
  }
  json.NewLine();
  json.End(']');
  json.End('}');
  json.NewLine();
  json.Flush();
}

}  // namespace ksicache
