#include "tools/ksicache/diff/balance.h"

#include <algorithm>
#include <cstdlib>
#include <functional>

#include "tools/ksicache/diff/unit.h"

namespace ksicache {
namespace {

using Figure = std::optional<int64_t>;

Figure Less(Figure a, Figure b) {
  int64_t difference = 0;
  if (!a || !b || __builtin_sub_overflow(*a, *b, &difference)) return std::nullopt;
  return difference;
}

Figure Sum(Figure a, Figure b) {
  int64_t sum = 0;
  if (!a || !b || __builtin_add_overflow(*a, *b, &sum)) return std::nullopt;
  return sum;
}

class Comparison {
 public:
  Comparison(const Memory& before, const Memory& after, tally::DisplayUnit unit, bool mayRepeat)
      : before_(before), after_(after), unit_(unit), mayRepeat_(mayRepeat) {}

  Balance Run() {
    Balance balance;
    const HostMemory& from = before_.host;
    const HostMemory& to = after_.host;
    const Growth bytes = {Less(from.total, from.free), Less(to.total, to.free)};
    Keep(bytes);
    balance.total = Shown({from.total, to.total});
    balance.free = Shown({from.free, to.free});
    balance.used = {Less(balance.total.before, balance.free.before),
                    Less(balance.total.after, balance.free.after)};
    balance.kernel = Shown({from.kernel, to.kernel});
    balance.caches = Shown({from.caches, to.caches});
    balance.others = Shown({from.others, to.others});
    balance.unexplained = balance.used.Amount();
    for (const PartInfo& info : kParts) {
      if (!info.isAdded) continue;
      balance.parts.push_back(PartOf(info));
      const PartGrowth& part = balance.parts.back();
      if (part.isKnown) balance.unexplained = Less(balance.unexplained, part.sum.Amount());
    }
    balance.groups = PartOf(InfoOf(Part::groups));
    balance.largest = largest_;
    return balance;
  }

 private:
  Figure Shown(Figure bytes) const {
    if (!bytes) return bytes;
    return *bytes / BytesIn(unit_);
  }

  Growth Shown(const Growth& bytes) const { return {Shown(bytes.before), Shown(bytes.after)}; }

  void Keep(const Growth& bytes) { largest_ = std::max(largest_, bytes.Amount().value_or(0)); }

  // Whether anything is known of them.
  static bool IsTold(const Things& things) { return things.isWhole || !things.amounts.empty(); }

  static std::vector<std::string> Identities(const std::vector<Amount>& amounts) {
    std::vector<std::string> identities;
    identities.reserve(amounts.size());
    for (const Amount& amount : amounts) identities.push_back(amount.identity);
    return identities;
  }

  PartGrowth PartOf(const PartInfo& info) {
    const Things& before = before_.Of(info.part);
    const Things& after = after_.Of(info.part);
    PartGrowth part = {&info, IsTold(before) && IsTold(after), 0, 0, 0, {}, {}};
    if (!part.isKnown) return part;
    part.before = before.amounts.size();
    part.after = after.amounts.size();
    // What a thing has that is not there: it may be missing.
    const Figure ofNone = before.isWhole && after.isWhole ? Figure(0) : std::nullopt;
    Growth sum = {0, 0};
    for (const Match& match :
         MatchAll(Identities(before.amounts), Identities(after.amounts), mayRepeat_)) {
      const Amount& thing =
          match.IsGone() ? before.amounts[match.before] : after.amounts[match.after];
      const Growth bytes = {match.IsNew() ? ofNone : before.amounts[match.before].bytes,
                            match.IsGone() ? ofNone : after.amounts[match.after].bytes};
      if (!bytes.Amount()) {
        ++part.unknown;
        continue;
      }
      sum = {Sum(sum.before, bytes.before), Sum(sum.after, bytes.after)};
      Keep(bytes);
      const Growth shown = Shown(bytes);
      if (shown.Amount() == 0) continue;
      part.things.push_back({thing.name, thing.number, match.IsNew(), match.IsGone(), shown});
    }
    part.sum = Shown(sum);
    std::ranges::stable_sort(part.things, std::ranges::greater(), [](const ThingGrowth& thing) {
      return std::abs(*thing.growth.Amount());
    });
    return part;
  }

  const Memory& before_;
  const Memory& after_;
  tally::DisplayUnit unit_;
  bool mayRepeat_;
  int64_t largest_ = 0;
};

}  // namespace

std::optional<int64_t> Growth::Amount() const { return Less(after, before); }

Balance Compare(const Memory& before, const Memory& after, tally::DisplayUnit unit,
                bool mayRepeat) {
  return Comparison(before, after, unit, mayRepeat).Run();
}

}  // namespace ksicache
