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

  // Names that look alike are told apart by their numbers.
  void PrintThings(const PartGrowth& part) const {
    std::map<std::string, int> known;
    const auto shown = [this](const ThingGrowth& thing, int64_t number) {
      return OnTheLeft("  " + NameText(thing.name, number), left_);
    };
    for (const ThingGrowth& thing : part.things) ++known[shown(thing, -1)];
    for (const ThingGrowth& thing : FirstOf(part, top_)) {
      Figures(shown(thing, known[shown(thing, -1)] > 1 ? thing.number : -1),
              thing.isNew ? "new" : NumberText(thing.growth.before),
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
