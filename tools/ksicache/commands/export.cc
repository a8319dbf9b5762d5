// export: the rows of reports for programs.
#include <algorithm>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "framework/name_list.h"
#include "reports/reports.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/complaints.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/moment_report.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {
namespace {

constexpr Option kFormat = {"format", "FORMAT", "write another format than csv"};
constexpr Option kOutput = {"output", "OUT", "make the file OUT", 'o'};
constexpr Option kCluster = {"cluster", "NAME", "have tables over all servers of this cluster"};
constexpr const Option* kOptions[] = {&kFormat, &kUnit, &kOutput, &kCluster, &kForce, &kMode};

using Reports = std::vector<const tally::Report*>;

// "group-stats, vm-stats and pmem-stats"
std::string ReportNames() {
  std::string names;
  const auto reports = tally::Reports();
  for (const tally::Report* report : reports) {
    if (!names.empty()) names += report == reports.back() ? " and " : ", ";
    names += report->name;
  }
  return names;
}

const tally::Report* ReportCalled(const std::string& name) {
  if (tally::SameName(name, kMomentReport.name)) return &kMomentReport;
  const tally::Report* report = tally::FindReport(name.c_str());
  if (report == nullptr) {
    throw UsageError("there is no report " + name + ": there are " + ReportNames() +
                     ", or all of these, or moments");
  }
  return report;
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
  for (const FormatInfo& format : kFormats) {
    if (*name == format.name) return format;
  }
  throw UsageError("there is no format " + *name +
                   ": there are csv, json, sqlite, openmetrics, prometheus and clickhouse-schema");
}

// None: that of each report.
std::optional<tally::DisplayUnit> UnitOf(const CommandLine& line, const FormatInfo& format) {
  const std::string* word = line.ValueOf(kUnit);
  if (format.isInBaseUnits && word != nullptr) {
    throw UsageError(std::string(format.name) + " is in bytes and seconds, and takes no --unit");
  }
  if (format.isInBaseUnits) return tally::DisplayUnit::b;
  if (word == nullptr) return std::nullopt;
  for (const tally::UnitName& name : tally::kUnitNames) {
    if (tally::SameName(*word, name.word)) return name.unit;
  }
  throw UsageError("--unit is mb, kb, pg or b");
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

// None if the option is not there.
std::string ClusterOf(const CommandLine& line, const FormatInfo& format) {
  const std::string* name = line.ValueOf(kCluster);
  if (name != nullptr && !format.isSchema) {
    throw UsageError("--cluster is for the format clickhouse-schema");
  }
  return name == nullptr ? "" : *name;
}

// Puts reports into a format, of one file after the other.
class Exporter {
 public:
  Exporter(const FormatInfo& info, RowFormat& format, std::optional<tally::DisplayUnit> unit)
      : isByReport_(info.isByReport), format_(format), sink_(format, unit) {}

  // No files: this host.
  void Export(std::span<const tally::Report* const> reports, std::span<const std::string> files) {
    if (!isByReport_) return ExportTogether(reports, files);
    for (size_t i = 0; i < reports.size(); ++i) ExportTogether(reports.subspan(i, 1), files);
  }

  // What the reports have, without their rows.
  void Describe(std::span<const tally::Report* const> reports) {
    hasBegun_ = true;
    for (const tally::Report* report : reports) sink_.Expect(*report, {});
  }

  // Whether nothing was left out.
  bool IsWhole() const { return complaints_.IsEmpty(); }

  // Whether there is anything at all, be it only that there are no rows.
  bool HasBegun() const { return hasBegun_; }

 private:
  void ExportTogether(std::span<const tally::Report* const> reports,
                      std::span<const std::string> files) {
    do {
      if (files.empty()) ExportMoment(reports, LiveOrigin());
      for (const std::string& name : files) ExportFile(reports, name);
    } while (format_.EndReports());
  }

  void ExportFile(std::span<const tally::Report* const> reports, const std::string& name) {
    complaints_.BeginFile(name);
    Saying(
        [&] { ForEachMoment(name, [&](const Origin& origin) { ExportMoment(reports, origin); }); });
  }

  void ExportMoment(std::span<const tally::Report* const> reports, const Origin& origin) {
    for (const tally::Report* report : reports) {
      hasBegun_ = true;
      sink_.Expect(*report, origin);
      Saying([&] { RunReport(*report, sink_); });
      const std::string lost = sink_.TakeComplaint();
      if (!lost.empty()) complaints_.Say(report->name + (": " + lost));
    }
  }

  // Goes on after what cannot be read.
  template <class Action>
  void Saying(Action&& action) {
    std::string error;
    try {
      action();
    } catch (const DataError& caught) {
      error = caught.what();
    }
    complaints_.SayDiagnostics();
    if (!error.empty()) complaints_.Say(error);
  }

  bool isByReport_;
  RowFormat& format_;
  RowSink sink_;
  Complaints complaints_;
  bool hasBegun_ = false;
};

int Export(const CommandLine& line) {
  const Reports reports = ReportsOf(line.arguments[0]);
  const FormatInfo& info = FormatOf(line);
  const std::optional<tally::DisplayUnit> unit = UnitOf(line, info);
  std::optional<NewFile> file = FileOf(line, info);
  const std::span<const std::string> files = std::span(line.arguments).subspan(1);
  if (info.isSchema && !files.empty()) {
    throw UsageError(std::string(info.name) + " is the same for all files, and takes none");
  }
  for (const std::string& name : files) {
    if (file) file->RefuseInput(FileNameOf(name));
  }
  const std::unique_ptr<RowFormat> format =
      info.make({.file = file ? &*file : nullptr,
                 .hasManyReports = reports.size() > 1,
                 .hasSpans = std::ranges::any_of(files, IsSpan),
                 .cluster = ClusterOf(line, info)});
  Exporter exporter(info, *format, unit);
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
each FILE, of all moments of a recording from FROM to TO, or of this host. The
columns are host, time, report where there are several, and those of the report
under their names. A figure without a value is an empty field, or null. Formats
are csv, json, sqlite, openmetrics, prometheus and clickhouse-schema.
)",
    .options = kOptions,
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Export,
};

}  // namespace ksicache
