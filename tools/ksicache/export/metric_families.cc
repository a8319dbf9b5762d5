#include "tools/ksicache/export/metric_families.h"

#include <string_view>
#include <utility>

#include "tools/ksicache/export/metric_name.h"

namespace ksicache {
namespace {

using tally::Kind;

bool IsWord(const RowColumn& column) {
  return column.kind == Kind::text || column.kind == Kind::id;
}

const char* UnitOf(Kind kind) {
  if (tally::IsMemory(kind)) return "bytes";
  return kind == Kind::microseconds ? "seconds" : kind == Kind::percent ? "ratio" : "";
}

void Remove(std::string_view word, std::string& text) {
  const size_t at = text.find(word);
  if (at != std::string::npos) text.erase(at, word.size());
}

// The description, which may tell the unit that the report shows.
std::string HelpOf(const RowColumn& column) {
  const std::string_view description = column.description;
  std::string help(description.substr(0, description.find_last_not_of(' ') + 1));
  Remove(" (KB)", help);
  Remove(" in usec", help);
  if (column.kind == Kind::pages && help.find("pages") != std::string::npos) help += ", in bytes";
  return help;
}

// "tally_vm_" of vm-stats.
std::string StartOf(std::string_view report) {
  constexpr std::string_view kStats = "-stats";
  if (report.ends_with(kStats)) report.remove_suffix(kStats.size());
  return "tally_" + SnakeCase(report) + "_";
}

MetricFamily FigureFamily(const std::string& start, const RowColumn& column, size_t place) {
  constexpr std::string_view kTotal = "_total";
  MetricFamily family = {.name = start + SnakeCase(column.name),
                         .type = column.isCounter ? MetricType::counter : MetricType::gauge,
                         .unit = UnitOf(column.kind),
                         .help = HelpOf(column),
                         .columns = {place}};
  if (!family.unit.empty()) family.name += "_" + family.unit;
  // Only samples of counters end so.
  if (family.name.ends_with(kTotal)) {
    family.name.replace(family.name.size() - kTotal.size(), kTotal.size(), "_all");
  }
  return family;
}

void Explain(const RowColumn& column, const std::string& label, MetricFamily& family) {
  if (!family.help.empty()) family.help += "; ";
  family.help += label + ": " + HelpOf(column);
}

}  // namespace

ReportMetrics MetricsOf(const char* report, std::span<const RowColumn> columns) {
  const std::string start = StartOf(report);
  ReportMetrics metrics;
  MetricFamily flags = {
      .name = start + "flag", .type = MetricType::flags, .unit = "", .help = "", .columns = {}};
  MetricFamily info = {.name = start.substr(0, start.size() - 1),
                       .type = MetricType::info,
                       .unit = "",
                       .help = "",
                       .columns = {}};
  for (size_t place = 0; place < columns.size(); ++place) {
    const RowColumn& column = columns[place];
    const std::string& name = metrics.names.emplace_back(SnakeCase(column.name));
    if (column.isKey) {
      metrics.keys.push_back(place);
    } else if (IsWord(column)) {
      info.columns.push_back(place);
      Explain(column, name, info);
      if (column.states.empty()) continue;
      metrics.families.push_back({start + name, MetricType::states, "", HelpOf(column), {place}});
    } else if (column.kind == Kind::flag) {
      flags.columns.push_back(place);
      Explain(column, column.name, flags);
    } else {
      metrics.families.push_back(FigureFamily(start, column, place));
    }
  }
  for (MetricFamily* family : {&flags, &info}) {
    if (!family->columns.empty()) metrics.families.push_back(std::move(*family));
  }
  return metrics;
}

const char* SuffixOf(MetricType type) {
  return type == MetricType::counter ? "_total" : type == MetricType::info ? "_info" : "";
}

int DecimalsOf(const RowColumn& column) {
  return column.kind == Kind::microseconds ? 6 : column.kind == Kind::percent ? 2 : 0;
}

}  // namespace ksicache
