#include "tools/ksicache/diff/steady_output.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <span>
#include <string>

#include "knvlibs/times.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/diff/unit.h"
#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

constexpr double kHour = 3600;

using Growths = std::vector<SteadyGrowth>;

std::span<const SteadyGrowth> FirstOf(const Growths& growths, size_t top) {
  return std::span(growths).first(std::min(top, growths.size()));
}

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

class Screen {
 public:
  Screen(tally::DisplayUnit unit, size_t top) : unit_(unit), top_(top) {}

  void Print(const SteadyGrowths& growths) const {
    PrintLine(growths.last.host + ", " + growths.first.time + " to " + growths.last.time + ": " +
              DurationText(growths.seconds));
    PrintLine(std::to_string(growths.samples) + " of " + std::to_string(growths.moments) +
              " moments read" + (growths.isSinceBoot ? ", since the host was started" : "") +
              (growths.isShort ? "; the recording begins there" : ""));
    PrintLine("");
    Header(tally::UnitTitle(unit_));
    for (const SteadyGrowth& growth : growths.host) PrintGrowth(growth, growth.name);
    PrintLine("");
    PrintAll("who grows steadily",
             growths.groups.empty() ? "nobody grows steadily" : "nobody alone grows steadily",
             growths.things);
    if (growths.groups.empty()) return;
    PrintLine("");
    PrintAll("groups, which contain the above", "", growths.groups);
  }

 private:
  static constexpr size_t kLeft = 34;

  static void Header(const std::string& what) {
    PrintLine(OnTheLeft(what, kLeft) + OnTheRight("now", 13) + OnTheRight("growth", 12) +
              OnTheRight("an hour", 11) + OnTheRight("full in", 10));
  }

  void PrintGrowth(const SteadyGrowth& growth, const std::string& name) const {
    const std::string full = growth.fullIn ? DurationText(*growth.fullIn) : "";
    std::string line = OnTheLeft(name, kLeft) + OnTheRight(NumberText(In(unit_, growth.now)), 13) +
                       OnTheRight(NumberText(In(unit_, growth.growth)), 12) +
                       OnTheRight(NumberText(In(unit_, PerHour(growth))), 11);
    if (!full.empty()) line += OnTheRight(full, 10);
    PrintLine(line);
    PrintTimes(growth);
  }

  // When it grew, if not all the time.
  static void PrintTimes(const SteadyGrowth& growth) {
    if (!growth.begun && !growth.stopped) return;
    std::string line = "    it";
    if (growth.begun) line += " began at " + ksi::TextOfTime(*growth.begun);
    if (growth.begun && growth.stopped) line += " and";
    if (growth.stopped) line += " stopped at " + ksi::TextOfTime(*growth.stopped);
    PrintLine(line);
  }

  void PrintAll(const char* title, const char* none, const Growths& growths) const {
    if (growths.empty()) return PrintLine(none);
    Header(title);
    std::map<std::string, int> known;
    const auto shown = [](const SteadyGrowth& growth, int64_t number) {
      return OnTheLeft(growth.info->of + NameText(growth.name, number), kLeft);
    };
    for (const SteadyGrowth& growth : growths) ++known[shown(growth, -1)];
    for (const SteadyGrowth& growth : FirstOf(growths, top_)) {
      PrintGrowth(growth, shown(growth, known[shown(growth, -1)] > 1 ? growth.number : -1));
    }
    const size_t more = growths.size() - FirstOf(growths, top_).size();
    if (more != 0) PrintLine("and " + std::to_string(more) + " more");
  }

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
  json.Text("name", std::string_view(growth.name).substr(growth.name.find_first_not_of(' ')));
  if (growth.number >= 0) json.Number("group", growth.number);
  json.Number("now", In(unit, growth.now))
      .Number("growth", In(unit, growth.growth))
      .Number("perHour", In(unit, PerHour(growth)))
      .Real("fullInSeconds", growth.fullIn);
  PutTime("begun", growth.begun, json);
  PutTime("stopped", growth.stopped, json);
  return json.Object();
}

std::string ToJson(std::span<const SteadyGrowth> growths, tally::DisplayUnit unit) {
  JsonWriter json;
  for (const SteadyGrowth& growth : growths) json.NewLine().Json("", ToJson(growth, unit));
  return json.Array();
}

}  // namespace

void PrintSteady(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top) {
  Screen(unit, top).Print(growths);
}

void PrintSteadyJson(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top) {
  JsonWriter json;
  json.Text("host", growths.last.host)
      .Text("from", growths.first.time)
      .Text("to", growths.last.time)
      .Flag("sinceBoot", growths.isSinceBoot)
      .Number("moments", growths.moments)
      .Number("read", growths.samples)
      .Text("unit", tally::UnitTitle(unit))
      .Json("memory", ToJson(growths.host, unit))
      .Json("things", ToJson(FirstOf(growths.things, top), unit))
      .Json("groups", ToJson(FirstOf(growths.groups, top), unit));
  Print(json.Object() + "\n");
}

}  // namespace ksicache
