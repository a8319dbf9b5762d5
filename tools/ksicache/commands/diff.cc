// diff: what changed from one moment to another, and who grew.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "reports/reports.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/complaints.h"
#include "tools/ksicache/diff/balance.h"
#include "tools/ksicache/diff/balance_output.h"
#include "tools/ksicache/diff/match.h"
#include "tools/ksicache/diff/memory.h"
#include "tools/ksicache/diff/moments.h"
#include "tools/ksicache/diff/report_diff.h"
#include "tools/ksicache/diff/report_output.h"
#include "tools/ksicache/diff/rows.h"
#include "tools/ksicache/diff/steady.h"
#include "tools/ksicache/diff/steady_memory.h"
#include "tools/ksicache/diff/steady_output.h"
#include "tools/ksicache/diff/steady_rows.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/quantity.h"

namespace ksicache {
namespace {

constexpr Option kReport = {"report", "REPORT", "compare the rows of this report", 'r'};
constexpr Option kBy = {"by", "COLUMN", "rank by this column of the report"};
constexpr Option kTop = {"top", "N", "show the first N: of each kind 3, with --since 10"};
constexpr Option kAcrossHosts = {"across-hosts", nullptr, "compare moments of two hosts"};
constexpr Option kFailAbove = {"fail-above", "SIZE", "end with status 3 if any grew by more"};
constexpr Option kSince = {"since", "TIME", "say who grew steadily for so long, such as 6h"};
constexpr const Option* kOptions[] = {&kReport, &kBy,   &kTop,       &kSince,
                                      &kUnit,   &kJson, &kFailAbove, &kAcrossHosts};

// So many things of each kind leave two moments on one screen, and so many those of --since.
constexpr int64_t kFewThings = 3;
constexpr int64_t kSomeThings = 10;

const tally::Report& ReportOf(const CommandLine& line) {
  const std::string& name = *line.ValueOf(kReport);
  const tally::Report* report = tally::FindReport(name.c_str());
  if (report == nullptr) throw UsageError("there is no report " + name);
  return *report;
}

// 3 if something grew by more than may be, whatever else could not be read.
int StatusOf(const CommandLine& line, int64_t growth, bool isWhole) {
  constexpr int kTooMuch = 3;
  if (line.Has(kFailAbove) && growth > SizeOf(line, kFailAbove, 0)) return kTooMuch;
  return isWhole ? 0 : 1;
}

// Whoever asks what grew by too much has to name the earlier moment first.
Sides SidesOf(const CommandLine& line) {
  Sides sides = SidesOf(NamesOf(line.arguments), line.Has(kAcrossHosts));
  if (line.Has(kFailAbove) && sides.IsBackward()) {
    throw Error("--fail-above takes the earlier moment first");
  }
  return sides;
}

// Two moments of a host's memory.
int DiffHost(const CommandLine& line) {
  const tally::DisplayUnit unit = UnitOf(line).value_or(tally::DisplayUnit::kb);
  const auto top = static_cast<size_t>(CountOf(line, kTop, kFewThings));
  const Sides sides = SidesOf(line);
  Memory memory[2];
  Complaints complaints;
  ReadBoth(sides, [&](const Origin& origin, bool isAfter) {
    complaints.BeginFile(isAfter ? sides.names.after : sides.names.before);
    memory[isAfter] = ReadMemory(origin, {.byPath = !sides.HaveSameNumbers()});
    complaints.SayDiagnostics();
    for (const std::string& complaint : memory[isAfter].complaints) complaints.Say(complaint);
  });
  const Balance balance = Compare(memory[0], memory[1], unit, sides.HaveSameNumbers());
  line.Has(kJson) ? PrintBalanceJson(sides, balance, unit, top)
                  : PrintBalance(sides, balance, unit, top);
  if (line.Has(kFailAbove) && complaints.IsEmpty() && !balance.used.Amount()) {
    complaints.Say("by how much the host grew is not known");
  }
  return StatusOf(line, balance.largest, complaints.IsEmpty());
}

[[noreturn]] void RefuseToFail(const char* column) {
  throw UsageError(std::string("--fail-above takes memory, and ") + column +
                   " is none: --by names another column");
}

// All moments of a recording for a time: the rows of a report, or all memory.
int DiffSince(const CommandLine& line, const tally::Report* report) {
  const tally::DisplayUnit own = report == nullptr ? tally::DisplayUnit::kb : OwnUnitOf(*report);
  const tally::DisplayUnit unit = UnitOf(line).value_or(own);
  const auto top = static_cast<size_t>(CountOf(line, kTop, kSomeThings));
  std::unique_ptr<Sampler> sampler = std::make_unique<MemorySampler>();
  if (report != nullptr) sampler = std::make_unique<RowSampler>(*report, line.ValueOf(kBy));
  bool isWhole = true;
  const SteadyGrowths growths =
      FindSteady(line.arguments[0], DurationOf(line, kSince, 0), *sampler, isWhole);
  if (line.Has(kFailAbove) && !growths.AreBytes()) RefuseToFail(growths.column->name);
  line.Has(kJson) ? PrintSteadyJson(growths, unit, top) : PrintSteady(growths, unit, top);
  constexpr double kMost = 9e18;
  const auto largest = static_cast<int64_t>(std::min(growths.Largest(), kMost));
  return StatusOf(line, largest, isWhole);
}

// Whether it can be told if a row grew by more than may be.
void CheckCanFail(const ReportDiff& diff) {
  if (diff.Columns().empty()) return;
  if (!diff.Measure()) {
    throw UsageError(std::string("--fail-above takes memory: --by names the column of ") +
                     diff.After().GetReport().name);
  }
  if (diff.LargestBytes()) return;
  RefuseToFail(diff.Columns()[*diff.Measure()].name);
}

// Two moments of one report.
int DiffReport(const CommandLine& line) {
  const tally::Report& report = ReportOf(line);
  const std::optional<tally::DisplayUnit> unit = UnitOf(line);
  const auto top = static_cast<size_t>(CountOf(line, kTop, INT64_MAX));
  const Sides sides = SidesOf(line);
  std::optional<Rows> rows[2];
  std::optional<GroupPaths> paths[2];
  Complaints complaints;
  ReadBoth(sides, [&](const Origin& origin, bool isAfter) {
    complaints.BeginFile(isAfter ? sides.names.after : sides.names.before);
    rows[isAfter].emplace(report, origin, unit);
    complaints.SayDiagnostics();
    if (!rows[isAfter]->IsWhole()) complaints.Say(rows[isAfter]->Complaint());
    if (!sides.HaveSameNumbers()) paths[isAfter].emplace(origin);
  });
  const ReportDiff diff(*rows[0], *rows[1], paths[0] ? &*paths[0] : nullptr,
                        paths[1] ? &*paths[1] : nullptr, sides, line.ValueOf(kBy));
  if (line.Has(kFailAbove)) CheckCanFail(diff);
  line.Has(kJson) ? PrintReportDiffJson(sides, diff, top) : PrintReportDiff(sides, diff, top);
  return StatusOf(line, diff.LargestBytes().value_or(0), complaints.IsEmpty());
}

int Diff(const CommandLine& line) {
  const bool isOfReport = line.Has(kReport);
  SizeOf(line, kFailAbove, 0);  // one that is none fails at once
  if (line.Has(kBy) && !isOfReport) throw UsageError("--by goes with --report");
  if (!line.Has(kSince)) return isOfReport ? DiffReport(line) : DiffHost(line);
  if (line.arguments.size() > 1) throw UsageError("--since takes one FILE");
  return DiffSince(line, isOfReport ? &ReportOf(line) : nullptr);
}

}  // namespace

const Command kDiff = {
    .name = "diff",
    .arguments = "FILE[@WHEN] [FILE[@WHEN]]",
    .summary = "say what changed between two moments, and who grew",
    .help = R"(Compares two moments: the memory of the host and who explains its growth, or the
rows of one report. A recording alone is its first and its last moment, one of
its moments that and the last; a capture alone is compared with this host.
With --since it looks at all moments for so long before the one named, and tells
who grew steadily, of all memory or of a report, and what is full when.
)",
    .options = kOptions,
    .fewest = 1,
    .most = 2,
    .run = Diff,
};

}  // namespace ksicache
