#include "tools/ksicache/diff/balance_output.h"

#include <algorithm>
#include <span>
#include <string>
#include <utility>

#include "tools/ksicache/diff/names.h"
#include "tools/ksicache/diff/sides_json.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

class Screen {
 public:
  Screen(const Sides& sides, const Balance& balance, size_t top)
      : sides_(sides), balance_(balance), top_(top), whole_(balance.used.Amount()) {
    // The host's own figures are the largest.
    for (const auto& figure : {balance.total.before, balance.total.after}) {
      width_ = std::max(width_, NumberText(figure).size() + 2);
    }
    left_ = kLine - std::min(kLine - kLeastLeft, 3 * width_ + kPart);
  }

  void Print(tally::DisplayUnit unit) {
    PrintLine(sides_.Title());
    if (!sides_.HaveSameNumbers()) PrintLine(kOtherNumbers);
    PrintLine("");
    Header(tally::UnitTitle(unit));
    Line("total", balance_.total, false);
    Line("free", balance_.free, false);
    Line("in use", balance_.used, true);
    Line("  kernel", balance_.kernel, true);
    Line("  caches", balance_.caches, true);
    Line("  others", balance_.others, true);
    PrintLine("");
    Header("who explains it");
    for (const PartGrowth& part : balance_.parts) PrintPart(part);
    Figures("nobody", "", "", balance_.unexplained, true);
    Figures("in use", "", "", whole_, true);
    if (balance_.groups.isKnown && balance_.groups.things.empty()) return;
    PrintLine("");
    Header("groups, which contain the above");
    PrintThings(balance_.groups);
    if (!balance_.groups.isKnown) PrintLine("  not known");
  }

 private:
  static constexpr size_t kLine = 80;
  static constexpr size_t kPart = 7;
  static constexpr size_t kLeastLeft = 20;

  // What stands on the right of a line: three figures, and the part of the growth of what is in
  // use.
  void Figures(const std::string& name, const std::string& before, const std::string& after,
               std::optional<int64_t> growth, bool hasPart) const {
    PrintLine(OnTheLeft(name, left_) + OnTheRight(before, width_) + OnTheRight(after, width_) +
              OnTheRight(NumberText(growth), width_) +
              (hasPart ? OnTheRight(PartText(growth, whole_), kPart) : ""));
  }

  void Header(const std::string& what) const {
    PrintLine(OnTheLeft(what, left_) + OnTheRight("before", width_) + OnTheRight("after", width_) +
              OnTheRight("growth", width_) + OnTheRight("part", kPart));
  }

  void Line(const std::string& name, const Growth& growth, bool hasPart) const {
    Figures(name, NumberText(growth.before), NumberText(growth.after), growth.Amount(), hasPart);
  }

  void PrintPart(const PartGrowth& part) const {
    const bool isNothing = part.sum.before == 0 && part.sum.after == 0 && part.unknown == 0;
    if (part.isKnown && isNothing && part.things.empty()) return;
    const std::string name = part.isKnown ? std::to_string(part.after) + " " +
                                                (part.after == 1 ? part.info->one : part.info->name)
                                          : part.info->name;
    Line(name, part.sum, true);
    PrintThings(part);
    if (part.unknown == 0) return;
    PrintLine("  " + std::to_string(part.unknown) + " more without a figure, not added");
  }

  void PrintThings(const PartGrowth& part) const {
    NameColumn names(left_);
    for (const ThingGrowth& thing : part.things) names.Add("  ", thing.name);
    for (const ThingGrowth& thing : FirstOf(part.things, top_)) {
      const NameColumn::Cell name = names.CellOf("  ", thing.name, thing.number);
      if (!name.above.empty()) PrintLine(name.above);
      Figures(name.text, thing.isNew ? "new" : NumberText(thing.growth.before),
              thing.isGone ? "gone" : NumberText(thing.growth.after), thing.growth.Amount(), true);
    }
  }

  const Sides& sides_;
  const Balance& balance_;
  size_t top_;
  std::optional<int64_t> whole_;
  size_t width_ = 13;  // of a figure
  size_t left_ = 0;    // of a name
};

void PutGrowth(const Growth& growth, JsonWriter& json) {
  json.Number("before", growth.before)
      .Number("after", growth.after)
      .Number("growth", growth.Amount());
}

std::string ToJson(const Growth& growth) {
  JsonWriter json;
  PutGrowth(growth, json);
  return json.Object();
}

std::string ToJson(const ThingGrowth& thing) {
  JsonWriter json;
  json.Text("name", thing.name);
  if (thing.number >= 0) json.Number("group", thing.number);
  json.Text("state", thing.isNew ? "new" : thing.isGone ? "gone" : "changed");
  PutGrowth(thing.growth, json);
  return json.Object();
}

std::string ToJson(const PartGrowth& part, size_t top) {
  JsonWriter rows;
  for (const ThingGrowth& thing : FirstOf(part.things, top)) rows.NewLine().Json("", ToJson(thing));
  JsonWriter json;
  json.Text("what", part.info->name)
      .Text("source", part.info->source)
      .Flag("added", part.info->isAdded)
      .Flag("known", part.isKnown)
      .Number("count", part.after)
      .Number("withoutFigure", part.unknown);
  if (part.info->isAdded) PutGrowth(part.sum, json);
  return json.Json("rows", rows.Array()).Object();
}

std::string HostToJson(const Balance& balance) {
  const std::pair<const char*, const Growth&> figures[] = {
      {"total", balance.total},   {"free", balance.free},     {"used", balance.used},
      {"kernel", balance.kernel}, {"caches", balance.caches}, {"others", balance.others}};
  JsonWriter json;
  for (const auto& [name, growth] : figures) json.NewLine().Json(name, ToJson(growth));
  return json.Object();
}

}  // namespace

void PrintBalance(const Sides& sides, const Balance& balance, tally::DisplayUnit unit, size_t top) {
  Screen(sides, balance, top).Print(unit);
}

void PrintBalanceJson(const Sides& sides, const Balance& balance, tally::DisplayUnit unit,
                      size_t top) {
  JsonWriter parts;
  for (const PartGrowth& part : balance.parts) parts.NewLine().Json("", ToJson(part, top));
  parts.NewLine().Json("", ToJson(balance.groups, top));
  JsonWriter json;
  PutSides(sides, json);
  json.Text("unit", tally::UnitTitle(unit))
      .Json("host", HostToJson(balance))
      .Json("parts", parts.Array())
      .Number("nobody", balance.unexplained);
  Print(json.Object() + "\n");
}

}  // namespace ksicache
