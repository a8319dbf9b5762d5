#include "tools/ksicache/page/summary.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <optional>
#include <vector>

#include "framework/display_unit.h"
#include "knvlibs/times.h"
#include "reports/reports.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/page/roles.h"
#include "tools/ksicache/printable.h"
#include "tools/ksicache/unit.h"

namespace ksicache {
namespace {

constexpr size_t kLargest = 10;
constexpr const char* kNoValue = "–";

// "1234", of MB
std::string MemoryText(std::optional<uint64_t> bytes) {
  return bytes ? std::to_string(*bytes >> 20) : kNoValue;
}

// That of a column of memory.
tally::DisplayUnit UnitOf(const RowColumn& column) {
  return std::ranges::find(tally::kUnitNames, std::string_view(column.unit),
                           &tally::UnitName::title)
      ->unit;
}

// The rows of a report at the moment that is told of, by the names of the columns.
class ToldRows {
 public:
  ToldRows(const PageData& data, std::string_view report) : data_(data) {
    const auto reports = tally::Reports();
    const auto found = std::ranges::find(reports, report, &tally::Report::name);
    stream_ = &data.tables.full.streams[static_cast<size_t>(found - reports.begin())];
  }

  size_t Count() const { return stream_->Rows(); }

  std::string TextAt(size_t row, std::string_view name) const {
    const PageValue* value = Find(row, name);
    const bool isText = value != nullptr && value->type == ValueType::text;
    return isText ? data_.texts.All()[value->number] : kNoValue;
  }

  // None if it has none.
  std::optional<int64_t> NumberAt(size_t row, std::string_view name) const {
    const PageValue* value = Find(row, name);
    if (value == nullptr || value->type == ValueType::none) return std::nullopt;
    return static_cast<int64_t>(value->number);
  }

  // Memory, in bytes; none if it has no value.
  std::optional<uint64_t> BytesAt(size_t row, std::string_view name) const {
    const PageValue* value = Find(row, name);
    if (value == nullptr || value->type != ValueType::unsignedNumber) return std::nullopt;
    uint64_t bytes = 0;
    const auto size = static_cast<uint64_t>(BytesIn(UnitOf(ColumnOf(name))));
    if (__builtin_mul_overflow(value->number, size, &bytes)) return std::nullopt;
    return bytes;
  }

  // A figure as a cell: memory in MB.
  std::string FigureAt(size_t row, std::string_view name) const {
    if (tally::IsMemory(ColumnOf(name).kind)) return MemoryText(BytesAt(row, name));
    const PageValue* value = Find(row, name);
    return value->type == ValueType::none ? kNoValue : std::to_string(value->number);
  }

  // "consumed (MB)"
  std::string HeadOf(std::string_view name) const {
    const RowColumn& column = ColumnOf(name);
    return std::string(name) + " (" + (tally::IsMemory(column.kind) ? "MB" : column.unit) + ")";
  }

 private:
  // REQUIRES: there is one of that name.
  const RowColumn& ColumnOf(std::string_view name) const {
    return stream_->Columns()[PlaceOf(stream_->Columns(), name)];
  }
  const PageValue* Find(size_t row, std::string_view name) const {
    const size_t place = PlaceOf(stream_->Columns(), name);
    return place == stream_->Columns().size() ? nullptr : &stream_->RowAt(row)[place];
  }

  const PageData& data_;
  const TableStream* stream_;
};

std::string Tagged(const char* tag, const std::string& html) {
  return std::string("<") + tag + ">" + html + "</" + tag + ">";
}

std::string ShareText(std::optional<uint64_t> part, std::optional<uint64_t> whole) {
  if (!part || !whole || *whole == 0) return kNoValue;
  char text[32];
  const double percent = 100 * static_cast<double>(*part) / static_cast<double>(*whole);
  const int size = std::snprintf(text, sizeof text, "%.1f", percent);
  return {text, static_cast<size_t>(size)};
}

std::string NumberCells(const std::vector<std::string>& texts) {
  std::string cells;
  for (const std::string& text : texts) cells += Tagged("td", text);
  return cells;
}

std::string HeadRow(const std::vector<std::string>& names) {
  std::string cells;
  for (const std::string& name : names) cells += "<th scope=\"col\">" + name + "</th>";
  return Tagged("tr", cells);
}

std::string RowOf(const std::string& name, const std::vector<std::string>& numbers) {
  return Tagged("tr", "<th scope=\"row\">" + HtmlText(name) + "</th>" + NumberCells(numbers));
}

std::string Table(const std::string& caption, const std::string& rows) {
  return R"(<div class="scroller">)" + Tagged("table", Tagged("caption", caption) + rows) +
         "</div>\n";
}

// None if one is not known, or the second is more.
std::optional<uint64_t> Less(std::optional<uint64_t> a, std::optional<uint64_t> b) {
  return a && b && *a >= *b ? std::make_optional(*a - *b) : std::nullopt;
}

std::string BalanceToHtml(const PageData& data) {
  const ToldRows host(data, roles::kHostReport);
  if (host.Count() == 0) return Tagged("p", "How the memory divides could not be read.");
  const std::optional<uint64_t> total = host.BytesAt(0, roles::kTotal);
  const std::optional<uint64_t> managed = host.BytesAt(0, roles::kManaged);
  const std::optional<uint64_t> start = Less(total, managed);
  std::optional<uint64_t> rest = Less(total, start.value_or(0));
  std::string rows = HeadRow({"Part", "MB", "%"});
  const auto add = [&](const char* title, std::optional<uint64_t> bytes) {
    rows += RowOf(title, {MemoryText(bytes), ShareText(bytes, total)});
  };
  for (const roles::Part& part : roles::kParts) {
    const std::optional<uint64_t> bytes = host.BytesAt(0, part.column);
    add(part.title, bytes);
    rest = Less(rest, bytes.value_or(0));
  }
  add(roles::kRest, rest);
  add(roles::kStart, start);
  add("Total", total);
  return Table("Where the memory is", rows) +
         Tagged("p", "Memory state " + HtmlText(host.TextAt(0, roles::kState)) + ".") + "\n";
}

// The columns of lines of a report, as they are called there.
std::vector<const char*> ColumnsOf(std::string_view report) {
  std::vector<const char*> columns;
  for (const roles::Line& line : roles::kLines) {
    if (line.report == report) columns.push_back(line.column);
  }
  return columns;
}

std::string LargestToHtml(const PageData& data, const roles::Things& things) {
  const ToldRows rows(data, things.report);
  if (rows.Count() == 0) return {};
  std::vector<size_t> order(rows.Count());
  for (size_t i = 0; i < order.size(); ++i) order[i] = i;
  const auto sizeOf = [&](size_t row) { return rows.BytesAt(row, things.size).value_or(0); };
  std::ranges::stable_sort(order, std::ranges::greater(), sizeOf);
  order.resize(std::min(order.size(), kLargest));

  const std::vector<const char*> columns = ColumnsOf(things.report);
  std::vector<std::string> names = {things.name};
  names.reserve(1 + columns.size());
  for (const char* column : columns) names.push_back(rows.HeadOf(column));
  std::string body = HeadRow(names);
  for (const size_t row : order) {
    std::vector<std::string> numbers;
    numbers.reserve(columns.size());
    for (const char* column : columns) numbers.push_back(rows.FigureAt(row, column));
    body += RowOf(
        data.names.at(things.report)
            .Of(rows.TextAt(row, things.name), rows.NumberAt(row, things.number).value_or(-1)),
        numbers);
  }
  return Table(things.title + std::string(": the largest of ") + std::to_string(rows.Count()),
               body);
}

std::string MarksToHtml(const PageData& data) {
  std::string items;
  for (const Mark& mark : data.marks.all) {
    std::string words = WordsOf(mark);
    const size_t at = words.find("{}");
    const double seconds = std::fabs(static_cast<double>(mark.time)) / 1e6;
    if (at != std::string::npos) words.replace(at, 2, DurationText(seconds));
    items += Tagged("li", ksi::TextOfTime(data.survey.moments[mark.moment].taken) + ": " + words);
  }
  if (data.marks.leftOut > 0) {
    items += Tagged("li", "and " + std::to_string(data.marks.leftOut) + " more of these");
  }
  if (items.empty()) return {};
  return Tagged("h3", "What happened between moments") + Tagged("ul", items) + "\n";
}

std::string FailuresToHtml(const PageData& data, const ReadFailures& reads, const char* what) {
  if (reads.most == 0) return {};
  std::string text =
      std::string("reads of a moment that ") + what + ": " + std::to_string(reads.most);
  const std::vector<SurveyedMoment>& moments = data.survey.moments;
  if (moments.size() > 1) {
    text += " at " + ksi::TextOfTime(moments[reads.moment].taken) + ", some at " +
            std::to_string(reads.moments) + " of " + std::to_string(moments.size()) + " moments";
  }
  return Tagged("li", text);
}

std::string ProblemsToHtml(const PageData& data) {
  std::string items = FailuresToHtml(data, data.marks.refused, "were refused for want of rights") +
                      FailuresToHtml(data, data.marks.failed, "failed");
  for (const std::string& problem : ProblemsOf(data)) items += Tagged("li", HtmlText(problem));
  if (items.empty()) return {};
  return Tagged("h3", "What could not be read") + Tagged("ul", items) + "\n";
}

// "High 95.0 %, Soft 5.0 %", from best to worst.
std::string StatesText(const Survey& survey) {
  const auto states = roles::States();
  const std::vector<int64_t> counts = survey.StateCounts();
  std::string text;
  for (size_t state = 0; state < counts.size(); ++state) {
    if (counts[state] == 0) continue;
    const char* name = state < states.size() ? states[state] : "not known";
    text += (text.empty() ? "" : ", ") + std::string(name) + " " +
            ShareText(static_cast<uint64_t>(counts[state]), survey.moments.size()) + " %";
  }
  return text;
}

// When the moment was that is told of, and why it is that one.
std::string ToldText(const PageData& data) {
  const Survey& survey = data.survey;
  const size_t told = data.tables.told;
  const bool isLeast = survey.moments.size() > 1 && told == TightestMoment(survey) &&
                       survey.moments[told].free != UINT64_MAX;
  return ksi::TextOfTime(survey.moments[told].taken) + (isLeast ? ", the least free memory" : "");
}

}  // namespace

std::string HtmlText(std::string_view text) {
  std::string html;
  for (const char c : Printable(text)) {
    switch (c) {
      case '&':
        html += "&amp;";
        break;
      case '<':
        html += "&lt;";
        break;
      case '>':
        html += "&gt;";
        break;
      case '"':
        html += "&quot;";
        break;
      case '\'':
        html += "&#39;";
        break;
      default:
        html += c;
    }
  }
  return html;
}

std::string SummaryToHtml(const PageData& data) {
  const Survey& survey = data.survey;
  const std::string first = ksi::TextOfTime(survey.moments.front().taken);
  const std::string last = ksi::TextOfTime(survey.moments.back().taken);
  const size_t count = survey.moments.size();
  std::string html = Tagged("h1", HtmlText(data.title)) + "\n";
  html +=
      Tagged("p", HtmlText(survey.host) + ", " +
                      (count == 1 ? last
                                  : first + " to " + last + ", " + std::to_string(count) +
                                        " moments; with scripts it shows what happened over time"));
  html += Tagged("p", "Kernel's definitions built " + HtmlText(survey.kernel) + ".") + "\n";
  if (count > 1) {
    html += Tagged("p", "Memory state " + HtmlText(StatesText(survey)) + " of the moments.") + "\n";
  }
  html += Tagged("h2", "At " + ToldText(data)) + "\n" + BalanceToHtml(data);
  for (const roles::Things& things : roles::kThings) html += LargestToHtml(data, things);
  return html + MarksToHtml(data) + ProblemsToHtml(data);
}

}  // namespace ksicache
