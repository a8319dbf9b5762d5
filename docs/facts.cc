// Prints what manual pages and completions tell of the reports. Everything comes from the tables
// that the programs are made of, so that pages and completions cannot say anything else. One fact
// a line, its parts separated by tabs:
//   report REPORT TITLE
//   option REPORT LETTER NAME DESCRIPTION   NAME is "-" where the long option means something else
//   unit   REPORT WORD
//   flag   REPORT WORD MEANING
//   column REPORT LEVEL NAME MARKS DESCRIPTION
//          MARKS are "-" and letters: u in the display unit, f always shown, b blank in the Total
//          row
//   metric REPORT NAME TYPE   as samples are called; TYPE as OpenMetrics has it
//   node   PATH

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

#include "frontend/usage.h"
#include "knvlibs/catalogue.h"
#include "reports/reports.h"
#include "tools/ksicache/export/metric_families.h"
#include "tools/ksicache/export/row_sink.h"

namespace {

using tally::ColumnInfo;
using tally::Report;

// The name of an option: what stands between "--" and a blank.
std::string LongName(const char* synopsis) {
  const std::string_view text(synopsis);
  const std::string_view name = text.substr(text.find("--") + 2);
  return std::string(name.substr(0, name.find(' ')));
}

void PrintOptions(const Report& report) {
  for (const tally::OptionUsage& option : tally::OptionUsages()) {
    if (!report.frame->Takes(option.letter)) continue;
    const bool isOther = option.letter == 'v' && report.frame->longVerbose != 'v';
    std::printf("option\t%s\t%c\t%s\t%s\n", report.name, option.letter,
                isOther ? "-" : LongName(option.synopsis).c_str(), option.description);
  }
}

void PrintUnits(const Report& report) {
  if (!report.frame->Takes('u')) return;
  for (const tally::UnitName& name : tally::kUnitNames) {
    if (name.unit == tally::DisplayUnit::b && !report.frame->allowBytes) continue;
    std::printf("unit\t%s\t%s\n", report.name, name.word);
  }
}

void PrintColumn(const Report& report, uint32_t levels, const ColumnInfo& column) {
  std::string marks = "-";
  if (column.figure.toUnit != nullptr) marks += 'u';
  if (column.desc.fixed != 0) marks += 'f';
  if (report.frame->totalRow && column.desc.summable == 0) marks += 'b';
  std::string_view description = column.desc.description;
  description = description.substr(0, description.find_last_not_of(' ') + 1);
  std::printf("column\t%s\t%u\t%s\t%s\t%.*s\n", report.name, levels, column.desc.name,
              marks.c_str(), static_cast<int>(description.size()), description.data());
}

const char* TypeOf(ksicache::MetricType type) {
  switch (type) {
    case ksicache::MetricType::counter:
      return "counter";
    case ksicache::MetricType::states:
      return "stateset";
    case ksicache::MetricType::info:
      return "info";
    case ksicache::MetricType::gauge:
    case ksicache::MetricType::flags:
      break;
  }
  return "gauge";
}

void PrintMetrics(const Report& report) {
  std::vector<ksicache::RowColumn> columns;
  for (const ColumnInfo& column : ksicache::ColumnsOf(report)) {
    columns.push_back(ksicache::RowColumnOf(column, tally::DisplayUnit::b));
  }
  for (const ksicache::MetricFamily& family : ksicache::MetricsOf(report.name, columns).families) {
    std::printf("metric\t%s\t%s%s\t%s\n", report.name, family.name.c_str(),
                ksicache::SuffixOf(family.type), TypeOf(family.type));
  }
}

void PrintReport(const tally::ReportUsage& usage) {
  const Report* const report = tally::FindReport(usage.name);
  if (report == nullptr) return;
  std::string title = report->frame->title;
  std::transform(title.begin(), title.end(), title.begin(),
                 [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
  std::printf("report\t%s\t%s\n", report->name, title.c_str());
  PrintOptions(*report);
  PrintUnits(*report);
  for (const tally::FlagUsage& flag : usage.flags) {
    std::printf("flag\t%s\t%s\t%s\n", report->name, flag.name, flag.meaning);
  }
  for (const tally::ReportVariant& variant : report->variants) {
    for (const ColumnInfo& column : variant.columns) PrintColumn(*report, variant.levels, column);
  }
  PrintMetrics(*report);
}

}  // namespace

int main() {
  for (const tally::ReportUsage& usage : tally::ReportUsages()) PrintReport(usage);
  for (const ksi::Node& node : ksi::Catalogue()) {
    std::printf("node\t%.*s\n", static_cast<int>(node.path.size()), node.path.data());
  }
  return std::fclose(stdout) == 0 ? 0 : 1;
}
