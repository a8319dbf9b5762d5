#include "tools/ksicache/diff/match.h"

#include <string_view>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// The kernel has no more levels of groups than this.
constexpr int kMostLevels = 256;

// Where identities are: those of one in a chain, in their order.
class Places {
 public:
  explicit Places(std::span<const std::string_view> identities)
      : next_(identities.size(), Match::kNone) {
    first_.reserve(identities.size());
    for (size_t i = identities.size(); i-- > 0;) {
      const auto [found, isOnly] = first_.try_emplace(identities[i], i);
      if (!isOnly) next_[i] = std::exchange(found->second, i);
    }
  }

  bool HasOne(std::string_view identity) const {
    const auto found = first_.find(identity);
    return found != first_.end() && next_[found->second] == Match::kNone;
  }

  // The first place that has not been taken; kNone if there is none.
  size_t Take(std::string_view identity) {
    const auto found = first_.find(identity);
    if (found == first_.end() || found->second == Match::kNone) return Match::kNone;
    return std::exchange(found->second, next_[found->second]);
  }

 private:
  std::unordered_map<std::string_view, size_t> first_;
  std::vector<size_t> next_;
};

}  // namespace

// The walk over the groups, by which rows are found, can be told where to start then.
bool GoesByGroups(const tally::Report& report) { return report.frame->Takes('g'); }

GroupPaths::GroupPaths(const Origin& origin) {
  const Rows groups(tally::groupStats, origin, std::nullopt, {"gid", "name", "parGid"});
  if (!groups.IsWhole()) throw DataError(groups.Complaint());
  const size_t gid = PlaceOf(groups.Columns(), "gid");
  const size_t name = PlaceOf(groups.Columns(), "name");
  const size_t parent = PlaceOf(groups.Columns(), "parGid");
  for (size_t i = 0; i < groups.Count(); ++i) {
    const auto row = groups.At(i);
    groups_.emplace(NumberOf(row[gid]).value_or(-1),
                    Group{std::string(row[name].text), NumberOf(row[parent]).value_or(-1)});
  }
}

std::optional<std::string> GroupPaths::Of(int64_t group) const {
  auto found = groups_.find(group);
  if (found == groups_.end()) return std::nullopt;
  std::string path = found->second.name;
  for (int level = 0; level < kMostLevels; ++level) {
    // The root of Linux is its own parent.
    if (found->first == 0 || found->second.parent == found->first) return path;
    found = groups_.find(found->second.parent);
    if (found == groups_.end()) return path;
    path.insert(0, found->second.name + "/");
  }
  return std::nullopt;
}

void AddPart(std::string_view part, std::string& identity) {
  identity += std::to_string(part.size()) + ":";
  identity += part;
}

std::vector<std::string> IdentitiesOf(const Rows& rows, const GroupPaths* paths) {
  const bool hasNumbers = paths == nullptr || !GoesByGroups(rows.GetReport());
  std::vector<std::string> identities(rows.Count());
  for (size_t i = 0; i < rows.Count(); ++i) {
    for (size_t column = 0; column < rows.Columns().size(); ++column) {
      const Value& value = rows.At(i)[column];
      if (!rows.Columns()[column].isKey) continue;
      if (value.type == ValueType::text) {
        AddPart(value.text, identities[i]);
      } else if (hasNumbers) {
        AddPart(std::to_string(value.number), identities[i]);
      } else {
        AddPart(paths->Of(NumberOf(value).value_or(-1)).value_or(""), identities[i]);
      }
    }
  }
  return identities;
}

std::vector<Match> MatchAll(std::span<const std::string_view> before,
                            std::span<const std::string_view> after, bool mayRepeat) {
  Places earlier(before);
  const std::optional<Places> later = mayRepeat ? std::nullopt : std::make_optional<Places>(after);
  const auto isMatchable = [&](std::string_view identity) {
    return !later || (earlier.HasOne(identity) && later->HasOne(identity));
  };
  std::vector<bool> isMatched(before.size());
  std::vector<Match> matches;
  matches.reserve(after.size());
  for (size_t i = 0; i < after.size(); ++i) {
    const size_t place = isMatchable(after[i]) ? earlier.Take(after[i]) : Match::kNone;
    matches.push_back({place, i});
    if (place != Match::kNone) isMatched[place] = true;
  }
  for (size_t i = 0; i < before.size(); ++i) {
    if (!isMatched[i]) matches.push_back({i, Match::kNone});
  }
  return matches;
}

}  // namespace ksicache
