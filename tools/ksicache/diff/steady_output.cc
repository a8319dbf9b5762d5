#include "tools/ksicache/diff/steady_output.h"

#include <algorithm>
#include <cmath>
#include <span>
#include <string>

#include "knvlibs/times.h"
#include "tools/ksicache/diff/names.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/unit.h"

namespace ksicache {
namespace {

constexpr double kHour = 3600;

using Growths = std::vector<SteadyGrowth>;

std::optional<int64_t> In(tally::DisplayUnit unit, std::optional<double> bytes) {
  if (!bytes || !(std::fabs(*bytes) < 9e18)) return std::nullopt;
  return std::llround(*bytes / static_cast<double>(BytesIn(unit)));
}

std::optional<int64_t> In(tally::DisplayUnit unit, std::optional<int64_t> bytes) {
  if (!bytes) return bytes;
  return *bytes / BytesIn(unit);
}

std::optional<double> PerHour(const SteadyGrowth& growth) {
  if (!growth.perSecond) return std::nullopt;
  return *growth.perSecond * kHour;
}

// The unit that figures are counted in: those that are no memory are what they are.
tally::DisplayUnit UnitOf(const SteadyGrowths& growths, tally::DisplayUnit unit) {
  return growths.AreBytes() ? unit : tally::DisplayUnit::b;
}

const char* UnitTitle(const SteadyGrowths& growths, tally::DisplayUnit unit) {
  return growths.AreBytes() ? tally::UnitTitle(unit) : growths.column->unit;
}

class Screen {
 public:
  Screen(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top)
      : growths_(growths),
        title_(UnitTitle(growths, unit)),
        unit_(UnitOf(growths, unit)),
        top_(top) {}

  void Print() const {
    PrintTitle();
    growths_.report == nullptr ? PrintHost() : PrintColumn();
    PrintLine("");
    PrintAll("who grows steadily",
             growths_.groups.empty() ? "nobody grows steadily" : "nobody alone grows steadily",
             growths_.things);
    PrintMore("who grew late, or in steps", growths_.late);
    PrintMore("groups, which contain the above", growths_.groups);
  }

 private:
  static constexpr size_t kLeft = 34;

  static void Header(const std::string& what) {
    PrintLine(OnTheLeft(what, kLeft) + OnTheRight("now", 13) + OnTheRight("growth", 12) +
              OnTheRight("an hour", 11) + OnTheRight("full in", 10));
  }

  void PrintTitle() const {
    PrintLine(growths_.last.host + ", " + growths_.first.time + " to " + growths_.last.time + ": " +
              DurationText(growths_.seconds));
    PrintLine(std::to_string(growths_.samples) + " of " + std::to_string(growths_.moments) +
              " moments read" + (growths_.isSinceBoot ? ", since the host was started" : "") +
              (growths_.isShort ? "; the recording begins there" : ""));
  }

  void PrintHost() const {
    constexpr size_t kParts = 2;  // from there on they are parts of what is in use
    PrintLine("");
    Header(title_);
    for (size_t i = 0; i < growths_.host.size(); ++i) {
      const SteadyGrowth& growth = growths_.host[i];
      PrintGrowth(growth, OnTheLeft((i < kParts ? "" : "  ") + growth.name, kLeft));
    }
  }

  void PrintColumn() const {
    PrintLine(growths_.report->name + (title_.empty() ? "" : ", " + title_) + ", by " +
              growths_.column->name);
  }

  void PrintGrowth(const SteadyGrowth& growth, const std::string& name) const {
    const std::string full = growth.fullIn ? DurationText(*growth.fullIn) : "";
    std::string line = name + OnTheRight(NumberText(In(unit_, growth.now)), 13) +
                       OnTheRight(NumberText(In(unit_, growth.growth)), 12) +
                       OnTheRight(NumberText(In(unit_, PerHour(growth))), 11);
    if (!full.empty()) line += OnTheRight(full, 10);
    PrintLine(line);
    PrintTimes(growth);
  }

  // When it grew, if not all the time.
  static void PrintTimes(const SteadyGrowth& growth) {
    if (growth.steps != 0) {
      PrintLine("    it grew in " + std::to_string(growth.steps) + " steps, the last one at " +
                ksi::TextOfTime(*growth.lastStep));
    }
    if (!growth.begun && !growth.stopped) return;
    std::string line = "    it";
    if (growth.begun) line += " began at " + ksi::TextOfTime(*growth.begun);
    if (growth.begun && growth.stopped) line += " and";
    if (growth.stopped) line += " stopped at " + ksi::TextOfTime(*growth.stopped);
    PrintLine(line);
  }

  // A table that is there only if it has rows.
  void PrintMore(const char* title, const Growths& growths) const {
    if (growths.empty()) return;
    PrintLine("");
    PrintAll(title, "", growths);
  }

  void PrintAll(const char* title, const char* none, const Growths& growths) const {
    if (growths.empty()) return PrintLine(none);
    Header(title);
    NameColumn names(kLeft);
    for (const SteadyGrowth& growth : growths) names.Add(StartOf(growth), growth.name);
    for (const SteadyGrowth& growth : FirstOf(growths, top_)) {
      const NameColumn::Cell name = names.CellOf(StartOf(growth), growth.name, growth.number);
      if (!name.above.empty()) PrintLine(name.above);
      PrintGrowth(growth, name.text);
    }
    const size_t more = growths.size() - FirstOf(growths, top_).size();
    if (more != 0) PrintLine("and " + std::to_string(more) + " more");
  }

  static const char* StartOf(const SteadyGrowth& growth) {
    return growth.info == nullptr ? "" : growth.info->of;
  }

  const SteadyGrowths& growths_;
  std::string title_;  // of the unit
  tally::DisplayUnit unit_;
  size_t top_;
};

void PutTime(const char* name, std::optional<int64_t> time, JsonWriter& json) {
  time ? json.Text(name, ksi::TextOfTime(*time)) : json.None(name);
}

std::string ToJson(const SteadyGrowth& growth, tally::DisplayUnit unit) {
  JsonWriter json;
  if (growth.info != nullptr) {
    json.Text("what", growth.info->name).Text("source", growth.info->source);
  }
  json.Text("name", growth.name);
  if (growth.number >= 0) json.Number("group", growth.number);
  json.Number("now", In(unit, growth.now))
      .Number("growth", In(unit, growth.growth))
      .Number("perHour", In(unit, PerHour(growth)))
      .Real("fullInSeconds", growth.fullIn);
  PutTime("begun", growth.begun, json);
  PutTime("stopped", growth.stopped, json);
  if (growth.steps != 0) {
    json.Number("steps", growth.steps);
    PutTime("lastStep", growth.lastStep, json);
  }
  return json.Object();
}

std::string ToJson(std::span<const SteadyGrowth> growths, tally::DisplayUnit unit) {
  JsonWriter json;
  for (const SteadyGrowth& growth : growths) json.NewLine().Json("", ToJson(growth, unit));
  return json.Array();
}

}  // namespace

void PrintSteady(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top) {
  Screen(growths, unit, top).Print();
}

void PrintSteadyJson(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top) {
  const tally::DisplayUnit counted = UnitOf(growths, unit);
  const auto first = [&](const Growths& all) { return ToJson(FirstOf(all, top), counted); };
  JsonWriter json;
  json.Text("host", growths.last.host)
      .Text("from", growths.first.time)
      .Text("to", growths.last.time)
      .Flag("sinceBoot", growths.isSinceBoot)
      .Number("moments", growths.moments)
      .Number("read", growths.samples);
  if (growths.report != nullptr) {
    json.Text("report", growths.report->name).Text("by", growths.column->name);
  }
  json.Text("unit", UnitTitle(growths, unit));
  if (growths.report == nullptr) json.Json("memory", ToJson(growths.host, counted));
  json.Json("things", first(growths.things)).Json("late", first(growths.late));
  if (growths.report == nullptr) json.Json("groups", first(growths.groups));
  Print(json.Object() + "\n");
}

}  // namespace ksicache
