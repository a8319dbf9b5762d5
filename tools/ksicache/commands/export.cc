// export: the rows of reports for programs.
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "framework/name_list.h"
#include "reports/reports.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/diagnostics.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/exporter.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/file_list.h"
#include "tools/ksicache/help.h"
#include "tools/ksicache/moment_report.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/quantity.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {
namespace {

constexpr Option kFormat = {"format", "FORMAT", "write another format than csv"};
constexpr Option kAppend = {"append", nullptr, "add to the database OUT what it has not"};
constexpr Option kColumns = {"columns", "NAMES",
                             "only these, such as used:free, and what rows are of", 's'};
constexpr Option kGroup = {"group", "GID", "only what is in this group", 'g'};
constexpr Option kLevels = {"levels", "N", "go down so many levels of groups", 'l'};
constexpr Option kInclude = {"include", "FLAGS", "only groups with one of these, such as vm:uw",
                             'i'};
constexpr Option kExclude = {"exclude", "FLAGS", "only groups with none of these", 'e'};
constexpr Option kFilesFrom = {"files-from", "LIST", "take also the files that LIST names"};
constexpr Option kCluster = {"cluster", "NAME", "have tables over all servers of this cluster"};
constexpr const Option* kOptions[] = {&kFormat,  &kUnit,    &kColumns, &kGroup,     &kLevels,
                                      &kInclude, &kExclude, &kEvery,   &kFilesFrom, &kOutput,
                                      &kAppend,  &kForce,   &kMode,    &kCluster};

using Reports = std::vector<const tally::Report*>;

const tally::Report* ReportCalled(const std::string& name) {
  if (tally::SameName(name, kMomentReport.name)) return &kMomentReport;
  const tally::Report* report = tally::FindReport(name.c_str());
  if (report != nullptr) return report;
  std::vector<std::string_view> names;
  for (const tally::Report* each : tally::Reports()) names.emplace_back(each->name);
  names.insert(names.end(), {"all", kMomentReport.name});
  throw UsageError("there is no report " + name, ListOf("There are ", names));
}

// Of "vm-stats,heap-stats".
Reports ReportsOf(const std::string& names) {
  if (tally::SameName(names, "all")) {
    const auto all = tally::Reports();
    return {all.begin(), all.end()};
  }
  Reports reports;
  for (size_t begin = 0, end = 0; end != std::string::npos; begin = end + 1) {
    end = names.find(',', begin);
    const tally::Report* report = ReportCalled(names.substr(begin, end - begin));
    if (std::ranges::find(reports, report) != reports.end()) {
      throw UsageError(std::string(report->name) + " is named twice");
    }
    reports.push_back(report);
  }
  return reports;
}

const FormatInfo& FormatOf(const CommandLine& line) {
  const std::string* name = line.ValueOf(kFormat);
  if (name == nullptr) return kFormats[0];
  std::vector<std::string_view> names;
  for (const FormatInfo& format : kFormats) {
    if (tally::SameName(*name, format.name)) return format;
    names.emplace_back(format.name);
  }
  throw UsageError("there is no format " + *name, ListOf("There are ", names));
}

// None: that of each report.
std::optional<tally::DisplayUnit> UnitOf(const CommandLine& line, const FormatInfo& format) {
  if (format.isInBaseUnits && line.Has(kUnit)) {
    throw UsageError(std::string(format.name) + " is in bytes and seconds, and takes no --unit");
  }
  return format.isInBaseUnits ? tally::DisplayUnit::b : UnitOf(line);
}

// The file to make; none for standard output.
std::optional<NewFile> FileOf(const CommandLine& line, const FormatInfo& format) {
  const std::string* name = line.ValueOf(kOutput);
  const bool isFile = name != nullptr && *name != "-";
  if (!isFile) CheckOptionsFor("-", line);
  if (name == nullptr && format.needsFile) {
    throw UsageError(std::string(format.name) + " takes a file: --output OUT");
  }
  if (!isFile && !format.needsFile) return std::nullopt;
  return std::make_optional<NewFile>(*name, line.Has(kForce), ModeOf(line));
}

// The database to add to; empty: there is none yet, or it is not asked for.
std::string DatabaseOf(const CommandLine& line, const FormatInfo& format) {
  if (!line.Has(kAppend)) return "";
  if (!format.isDatabase) throw UsageError("--append is for the format sqlite");
  if (line.Has(kForce)) throw UsageError("--append replaces nothing, and takes no --force");
  const std::string* name = line.ValueOf(kOutput);
  if (name == nullptr || *name == "-") throw UsageError("--append takes a file: --output OUT");
  return access(name->c_str(), F_OK) == 0 ? *name : "";
}

// None if the option is not there.
std::string ClusterOf(const CommandLine& line, const FormatInfo& format) {
  const std::string* name = line.ValueOf(kCluster);
  if (name != nullptr && !format.isSchema) {
    throw UsageError("--cluster is for the format clickhouse-schema");
  }
  return name == nullptr ? "" : *name;
}

// The names of --columns; none if it is not there.
std::vector<std::string_view> WantedColumns(const CommandLine& line, const Reports& reports) {
  std::vector<std::string_view> columns;
  const std::string* list = line.ValueOf(kColumns);
  if (list == nullptr) return columns;
  tally::NameReader names(*list);
  for (std::string_view name; names.Next(name);) {
    const bool isThere = std::ranges::any_of(reports, [&](const tally::Report* report) {
      return std::ranges::any_of(ColumnsOf(*report), [&](const tally::ColumnInfo& column) {
        return tally::SameName(column.desc.name, name);
      });
    });
    if (!isThere) {
      throw UsageError("no report that is exported has a column " + std::string(name));
    }
    columns.push_back(name);
  }
  if (columns.empty()) throw UsageError("--columns takes NAME[:NAME...]");
  return columns;
}

bool TakesGroup(const tally::Report& report) { return report.frame->Takes('g'); }
bool TakesFlags(const tally::Report& report) { return report.frame->filterNames != nullptr; }

// The value of an option that some reports take; null if it is not there.
const char* Selecting(const CommandLine& line, const Option& option, const Reports& reports,
                      bool (*takes)(const tally::Report&)) {
  const std::string* value = line.ValueOf(option);
  if (value == nullptr) return nullptr;
  const bool isTaken =
      std::ranges::any_of(reports, [takes](const tally::Report* report) { return takes(*report); });
  if (!isTaken) {
    throw UsageError(std::string("no report that is exported takes --") + option.name);
  }
  return value->c_str();
}

// Flags that all reports know that take any.
const char* FlagsOf(const CommandLine& line, const Option& option, const Reports& reports) {
  const char* text = Selecting(line, option, reports, TakesFlags);
  Diagnostics said;  // what is wrong stands in the error
  for (const tally::Report* report : reports) {
    if (text == nullptr || !TakesFlags(*report)) continue;
    uint32_t mask = 0;
    const tally::FlagName* flags = report->frame->filterNames;
    if (tally::ParseFlagFilter(text, flags, mask, false) == tally::kSuccess && mask != 0) continue;
    said.TakeKept();
    std::vector<std::string_view> names;
    for (; flags->name != nullptr; ++flags) names.emplace_back(flags->name);
    throw UsageError(
        std::string("--") + option.name + " takes flags of " + report->name + ": " + text,
        ListOf("There are ", names));
  }
  return text;
}

int64_t GroupOf(const char* text) {
  if (text == nullptr) return 0;
  int64_t group = 0;
  const char* end = text + std::strlen(text);
  const auto [stop, error] = std::from_chars(text, end, group);
  if (error != std::errc() || stop != end || group < 0) {
    throw UsageError(std::string("--group takes the number of a group: ") + text);
  }
  return group;
}

// Which rows are wanted.
tally::ReportOptions SelectionOf(const CommandLine& line, const Reports& reports) {
  tally::ReportOptions selection;
  selection.startGid = GroupOf(Selecting(line, kGroup, reports, TakesGroup));
  if (Selecting(line, kLevels, reports, GoesDownGroups) != nullptr) {
    const int64_t levels = CountOf(line, kLevels, tally::kMaxLevels);
    if (levels > tally::kMaxLevels) {
      throw UsageError("--levels takes a number up to " + std::to_string(tally::kMaxLevels));
    }
    selection.levels = static_cast<uint32_t>(levels);
  }
  selection.inclusionText = FlagsOf(line, kInclude, reports);
  selection.exclusionText = FlagsOf(line, kExclude, reports);
  return selection;
}

std::vector<std::string> FilesOf(const CommandLine& line) {
  std::vector<std::string> files(line.arguments.begin() + 1, line.arguments.end());
  if (const std::string* list = line.ValueOf(kFilesFrom)) {
    const std::vector<std::string> names = NamesIn(*list);
    files.insert(files.end(), names.begin(), names.end());
  }
  return files;
}

// Fails with a UsageError where options and files do not go together.
void CheckFiles(const CommandLine& line, const FormatInfo& format,
                const std::vector<std::string>& files, bool hasSpans) {
  if (format.isSchema && !files.empty()) {
    throw UsageError(std::string(format.name) + " is the same for all files, and takes none");
  }
  if (line.Has(kEvery) && !hasSpans) throw UsageError("--every is for FILE@FROM..TO");
}

int Export(const CommandLine& line) {
  const Reports reports = ReportsOf(line.arguments[0]);
  const FormatInfo& info = FormatOf(line);
  const std::optional<tally::DisplayUnit> unit = UnitOf(line, info);
  const std::vector<std::string_view> columns = WantedColumns(line, reports);
  const tally::ReportOptions selection = SelectionOf(line, reports);
  const int64_t every = DurationOf(line, kEvery, 0);
  const std::string database = DatabaseOf(line, info);
  std::optional<NewFile> file = database.empty() ? FileOf(line, info) : std::nullopt;
  const std::vector<std::string> files = FilesOf(line);
  const bool hasSpans = std::ranges::any_of(files, IsSpan);
  CheckFiles(line, info, files, hasSpans);
  for (const std::string& name : files) {
    if (file) file->RefuseInput(FileNameOf(name));
  }
  const std::unique_ptr<RowFormat> format = info.make({.file = file ? &*file : nullptr,
                                                       .hasManyReports = reports.size() > 1,
                                                       .hasSpans = hasSpans,
                                                       .cluster = ClusterOf(line, info),
                                                       .database = database});
  RowSink sink(*format, unit, columns);
  Exporter exporter(info, *format, sink, every, selection);
  info.isSchema ? exporter.Describe(reports) : exporter.Export(reports, files);
  if (exporter.HasBegun()) format->Finish();
  return exporter.IsWhole() ? 0 : 1;
}

}  // namespace

const Command kExport = {
    .name = "export",
    .arguments = "REPORT[,REPORT...]|all [FILE[@WHEN|@FROM..TO]...]",
    .summary = "write the rows of reports for programs",
    .help = R"(Writes the rows of reports of tally, or of all fifteen, without their totals: of
each FILE, of all moments of a recording from FROM to TO, of which --every takes
one in each TIME, or of this host. The columns are host, time, report where
there are several, and those of the report under their names. A figure without a
value is an empty field, or null. Formats are csv, json, sqlite, openmetrics,
prometheus and clickhouse-schema.
)",
    .options = kOptions,
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Export,
};

}  // namespace ksicache
