#include "tools/ksicache/diff/balance_output.h"

#include <algorithm>
#include <map>
#include <span>
#include <string>

#include "tools/ksicache/diff/json_text.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

std::span<const ThingGrowth> FirstOf(const PartGrowth& part, size_t top) {
  return std::span(part.things).first(std::min(top, part.things.size()));
}

class Screen {
 public:
  Screen(const Sides& sides, const Balance& balance, size_t top)
      : sides_(sides), balance_(balance), top_(top), whole_(balance.used.Amount()) {}

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
    PrintLine("");
    Header("groups, which contain the above");
    PrintThings(balance_.groups);
    if (!balance_.groups.isKnown) PrintLine("  not known");
  }

 private:
  // What stands on the right of a line: three figures, and the part of the growth of what is in
  // use.
  void Figures(const std::string& name, const std::string& before, const std::string& after,
               std::optional<int64_t> growth, bool hasPart) const {
    PrintLine(OnTheLeft(name, 34) + OnTheRight(before, 13) + OnTheRight(after, 13) +
              OnTheRight(NumberText(growth), 13) +
              (hasPart ? OnTheRight(PartText(growth, whole_), 7) : ""));
  }

  static void Header(const std::string& what) {
    PrintLine(OnTheLeft(what, 34) + OnTheRight("before", 13) + OnTheRight("after", 13) +
              OnTheRight("growth", 13) + OnTheRight("part", 7));
  }

  void Line(const std::string& name, const Growth& growth, bool hasPart) const {
    Figures(name, NumberText(growth.before), NumberText(growth.after), growth.Amount(), hasPart);
  }

  void PrintPart(const PartGrowth& part) const {
    const bool isNothing = part.sum.before == 0 && part.sum.after == 0 && part.unknown == 0;
    if (part.isKnown && isNothing && part.things.empty()) return;
    const std::string name =
        part.isKnown ? std::to_string(part.after) + " " + part.info->name : part.info->name;
    Line(name, part.sum, true);
    PrintThings(part);
    if (part.unknown == 0) return;
    PrintLine("  " + std::to_string(part.unknown) + " more without a figure, not added");
  }

  // Names that several have are told apart by their numbers.
  void PrintThings(const PartGrowth& part) const {
    std::map<std::string, int> known;
    for (const ThingGrowth& thing : part.things) ++known[thing.name];
    for (const ThingGrowth& thing : FirstOf(part, top_)) {
      const bool isNumbered = known[thing.name] > 1 && thing.number >= 0;
      Figures("  " + thing.name + (isNumbered ? " " + std::to_string(thing.number) : ""),
              thing.isNew ? "new" : NumberText(thing.growth.before),
              thing.isGone ? "gone" : NumberText(thing.growth.after), thing.growth.Amount(), true);
    }
  }

  const Sides& sides_;
  const Balance& balance_;
  size_t top_;
  std::optional<int64_t> whole_;
};

void PutGrowth(const Growth& growth, JsonText& json) {
  json.Name("before");
  json.PutNumber(growth.before);
  json.Name("after");
  json.PutNumber(growth.after);
  json.Name("growth");
  json.PutNumber(growth.Amount());
}

void PutFigure(const char* name, const Growth& growth, JsonText& json) {
  json.NewLine();
  json.Name(name);
  json.Begin('{');
  PutGrowth(growth, json);
  json.End('}');
}

void PutThing(const ThingGrowth& thing, JsonText& json) {
  json.NewLine();
  json.Begin('{');
  json.Name("name");
  json.PutText(thing.name);
  if (thing.number >= 0) {
    json.Name("group");
    json.PutNumber(thing.number);
  }
  json.Name("state");
  json.PutText(thing.isNew ? "new" : thing.isGone ? "gone" : "changed");
  PutGrowth(thing.growth, json);
  json.End('}');
}

void PutPart(const PartGrowth& part, size_t top, JsonText& json) {
  json.NewLine();
  json.Begin('{');
  json.Name("what");
  json.PutText(part.info->name);
  json.Name("source");
  json.PutText(part.info->source);
  json.Name("added");
  json.PutFlag(part.info->isAdded);
  json.Name("known");
  json.PutFlag(part.isKnown);
  json.Name("count");
  json.PutNumber(static_cast<int64_t>(part.after));
  json.Name("withoutFigure");
  json.PutNumber(static_cast<int64_t>(part.unknown));
  if (part.info->isAdded) PutGrowth(part.sum, json);
  json.Name("rows");
  json.Begin('[');
  for (const ThingGrowth& thing : FirstOf(part, top)) PutThing(thing, json);
  json.End(']');
  json.End('}');
}

}  // namespace

void PrintBalance(const Sides& sides, const Balance& balance, tally::DisplayUnit unit, size_t top) {
  Screen(sides, balance, top).Print(unit);
}

void PrintBalanceJson(const Sides& sides, const Balance& balance, tally::DisplayUnit unit,
                      size_t top) {
  JsonText json;
  json.Begin('{');
  PutSides(sides, json);
  json.Name("unit");
  json.PutText(tally::UnitTitle(unit));
  json.Name("host");
  json.Begin('{');
  PutFigure("total", balance.total, json);
  PutFigure("free", balance.free, json);
  PutFigure("used", balance.used, json);
  PutFigure("kernel", balance.kernel, json);
  PutFigure("caches", balance.caches, json);
  PutFigure("others", balance.others, json);
  json.End('}');
  json.Name("parts");
  json.Begin('[');
  for (const PartGrowth& part : balance.parts) PutPart(part, top, json);
  PutPart(balance.groups, top, json);
  json.End(']');
  json.Name("nobody");
  json.PutNumber(balance.unexplained);
  json.End('}');
  json.NewLine();
  json.Flush();
}

}  // namespace ksicache
