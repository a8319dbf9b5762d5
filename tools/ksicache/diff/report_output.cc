#include "tools/ksicache/diff/report_output.h"

#include <algorithm>
#include <span>
#include <string>

#include "tools/ksicache/diff/sides_json.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

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
  return std::ranges::any_of(FirstOf(diff.Changed(), top), [](const RowChange& row) {
    return std::ranges::any_of(row.changes,
                               [](const Change& change) { return change.perSecond.has_value(); });
  });
}

// The unit of memory in the report; empty if it has no memory.
const char* UnitOf(const ReportDiff& diff) {
  const auto found = std::ranges::find_if(diff.Columns(), tally::IsMemory, &RowColumn::kind);
  return found == diff.Columns().end() ? "" : found->unit;
}

void PutValue(const char* name, const Value& value, JsonWriter& json) {
  switch (value.type) {
    case ValueType::none:
      json.None(name);
      break;
    case ValueType::signedNumber:
      json.Number(name, static_cast<int64_t>(value.number));
      break;
    case ValueType::unsignedNumber:
      json.Number(name, value.number);
      break;
    case ValueType::flag:
      json.Flag(name, value.number != 0);
      break;
    case ValueType::text:
      json.Text(name, value.text);
      break;
  }
}

std::string ToJson(const Change& change, bool isCounter) {
  JsonWriter json;
  PutValue("before", change.before, json);
  PutValue("after", change.after, json);
  json.Number("growth", change.growth);
  if (isCounter) json.Real("perSecond", change.perSecond).Flag("restarted", change.isRestarted);
  return json.Object();
}

std::string ToJson(const ReportDiff& diff, const RowChange& row) {
  JsonWriter keys;
  const auto values = diff.RowOf(row);
  for (size_t i = 0; i < values.size(); ++i) {
    const RowColumn& column = diff.Columns()[i];
    if (column.isKey) PutValue(column.name, values[i], keys);
  }
  JsonWriter columns;
  for (const Change& change : row.changes) {
    const RowColumn& column = diff.Columns()[change.column];
    columns.Json(column.name, ToJson(change, column.isCounter));
  }
  return JsonWriter()
      .Json("row", keys.Object())
      .Text("state", row.match.IsNew()    ? "new"
                     : row.match.IsGone() ? "gone"
                                          : "changed")
      .Json("columns", columns.Object())
      .Object();
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
  for (const RowChange& row : FirstOf(diff.Changed(), top)) {
    PrintLine(NameOfRow(diff, row));
    for (const Change& change : row.changes) PrintChange(diff, change);
  }
  const size_t more = diff.Changed().size() - FirstOf(diff.Changed(), top).size();
  Print("\n" + CountText(diff) + (more == 0 ? "" : "; " + std::to_string(more) + " not shown") +
        "\n");
}

void PrintReportDiffJson(const Sides& sides, const ReportDiff& diff, size_t top) {
  JsonWriter rows;
  for (const RowChange& row : FirstOf(diff.Changed(), top))
    rows.NewLine().Json("", ToJson(diff, row));
  JsonWriter json;
  PutSides(sides, json);
  json.Text("report", diff.After().GetReport().name)
      .Text("unit", UnitOf(diff))
      .Text("by", diff.By() ? diff.Columns()[*diff.By()].name : nullptr)
      .Number("unchanged", diff.Unchanged())
      .Number("unknown", diff.Unknown())
      .Number("changed", diff.Changed().size())
      .Json("rows", rows.NewLine().Array());
  Print(json.Object() + "\n");
}

}  // namespace ksicache
