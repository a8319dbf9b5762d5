#include "tools/ksicache/diff/balance.h"

#include <algorithm>
#include <cstdlib>
#include <functional>
#include <string_view>
#include <utility>

#include "tools/ksicache/diff/figure.h"
#include "tools/ksicache/diff/largest_growth.h"
#include "tools/ksicache/unit.h"

namespace ksicache {
namespace {

MaybeFigure Shown(MaybeFigure bytes, tally::DisplayUnit unit) {
  if (!bytes) return bytes;
  return *bytes / BytesIn(unit);
}

Growth Shown(const Growth& bytes, tally::DisplayUnit unit) {
  return {Shown(bytes.before, unit), Shown(bytes.after, unit)};
}

// What a part has at both moments, thing by thing, added up as it comes.
class PartComparison {
 public:
  PartComparison(const PartInfo& info, const Things& before, const Things& after,
                 tally::DisplayUnit unit)
      : before_(before), after_(after), unit_(unit) {
    part_.info = &info;
    part_.isKnown = IsTold(before) && IsTold(after);
    // What a thing has that is not there: it may be missing.
    if (before.isWhole && after.isWhole) ofNone_ = 0;
  }

  PartGrowth Run(bool mayRepeat) {
    if (!part_.isKnown) return std::move(part_);
    part_.before = before_.amounts.size();
    part_.after = after_.amounts.size();
    for (const Match& match :
         MatchAll(Identities(before_.amounts), Identities(after_.amounts), mayRepeat)) {
      Add(match);
    }
    part_.sum = Shown(sum_, unit_);
    part_.largest = largest_.Find();
    std::ranges::stable_sort(part_.things, std::ranges::greater(), [](const ThingGrowth& thing) {
      return std::abs(*thing.growth.Amount());
    });
    return std::move(part_);
  }

 private:
  // Whether anything is known of them.
  static bool IsTold(const Things& things) { return things.isWhole || !things.amounts.empty(); }

  static std::vector<std::string_view> Identities(const std::vector<Amount>& amounts) {
    std::vector<std::string_view> identities;
    identities.reserve(amounts.size());
    for (const Amount& amount : amounts) identities.push_back(amount.identity);
    return identities;
  }

  void Add(const Match& match) {
    const Amount& thing =
        match.IsGone() ? before_.amounts[match.before] : after_.amounts[match.after];
    const Growth bytes = {match.IsNew() ? ofNone_ : before_.amounts[match.before].bytes,
                          match.IsGone() ? ofNone_ : after_.amounts[match.after].bytes};
    if (!bytes.Amount()) {
      ++part_.unknown;
      return;
    }
    sum_ = {Sum(sum_.before, bytes.before), Sum(sum_.after, bytes.after)};
    Keep(match, thing.name, bytes);
    const Growth shown = Shown(bytes, unit_);
    if (shown.Amount() == 0) return;
    part_.things.push_back({thing.name, thing.number, match.IsNew(), match.IsGone(), shown});
  }

  void Keep(const Match& match, const std::string& name, const Growth& bytes) {
    if (match.IsNew()) return largest_.Came(name, *bytes.after);
    if (match.IsGone()) return largest_.Gone(name, *bytes.before);
    largest_.Changed(*bytes.Amount());
  }

  const Things& before_;
  const Things& after_;
  tally::DisplayUnit unit_;
  PartGrowth part_ = {};
  MaybeFigure ofNone_;
  Growth sum_ = {0, 0};
  LargestGrowth largest_;
};

// The host's own figures; what is in use is the difference of what stands beside it.
Balance HostBalance(const HostMemory& from, const HostMemory& to, tally::DisplayUnit unit) {
  Balance balance;
  balance.total = Shown({from.total, to.total}, unit);
  balance.free = Shown({from.free, to.free}, unit);
  balance.used = {Less(balance.total.before, balance.free.before),
                  Less(balance.total.after, balance.free.after)};
  balance.kernel = Shown({from.kernel, to.kernel}, unit);
  balance.caches = Shown({from.caches, to.caches}, unit);
  balance.others = Shown({from.others, to.others}, unit);
  const Growth bytes = {Less(from.total, from.free), Less(to.total, to.free)};
  balance.largest = std::max<int64_t>(bytes.Amount().value_or(0), 0);
  return balance;
}

}  // namespace

std::optional<int64_t> Growth::Amount() const { return Less(after, before); }

Balance Compare(const Memory& before, const Memory& after, tally::DisplayUnit unit,
                bool mayRepeat) {
  Balance balance = HostBalance(before.host, after.host, unit);
  balance.unexplained = balance.used.Amount();
  const auto compare = [&](const PartInfo& info) {
    PartGrowth part =
        PartComparison(info, before.Of(info.part), after.Of(info.part), unit).Run(mayRepeat);
    balance.largest = std::max(balance.largest, part.largest);
    return part;
  };
  for (const PartInfo& info : kParts) {
    if (!info.isAdded) continue;
    const PartGrowth& part = balance.parts.emplace_back(compare(info));
    if (part.isKnown) balance.unexplained = Less(balance.unexplained, part.sum.Amount());
  }
  balance.groups = compare(InfoOf(Part::groups));
  return balance;
}

}  // namespace ksicache
