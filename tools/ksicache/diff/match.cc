#include "tools/ksicache/diff/match.h"

#include <cstring>
#include <string_view>

#include "reports/reports.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// The kernel has no more levels of groups than this.
constexpr int kMostLevels = 256;

// Whether the numbers of a report's keys are those of groups and processes: its rows are found by
// a walk over the groups then, which can be told where to start.
bool GoesByGroups(const tally::Report& report) {
  return std::strchr(report.frame->options, 'g') != nullptr;
}

// Adds a part of an identity, so that none can be taken for two.
void AddPart(std::string_view part, std::string& identity) {
  identity += std::to_string(part.size()) + ":";
  identity += part;
}

size_t PlaceOf(const Rows& rows, std::string_view name) {
  size_t place = 0;
  while (place < rows.Columns().size() && rows.Columns()[place].name != name) ++place;
  return place;
}

// Where an identity is, and how many of these places have been matched.
struct Places {
  std::vector<size_t> at;
  size_t used = 0;
};

using PlacesOf = std::unordered_map<std::string_view, Places>;

PlacesOf Find(const std::vector<std::string>& identities) {
  PlacesOf found;
  found.reserve(identities.size());
  for (size_t i = 0; i < identities.size(); ++i) found[identities[i]].at.push_back(i);
  return found;
}

}  // namespace

GroupPaths::GroupPaths(const Origin& origin) {
  const Rows groups(tally::groupStats, origin, std::nullopt, {"gid", "name", "parGid"});
  if (!groups.IsWhole()) throw DataError(groups.Complaint());
  const size_t gid = PlaceOf(groups, "gid");
  const size_t name = PlaceOf(groups, "name");
  const size_t parent = PlaceOf(groups, "parGid");
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

std::vector<Match> MatchAll(const std::vector<std::string>& before,
                            const std::vector<std::string>& after, bool mayRepeat) {
  PlacesOf earlier = Find(before);
  const PlacesOf later = mayRepeat ? PlacesOf() : Find(after);
  std::vector<bool> isMatched(before.size());
  std::vector<Match> matches;
  matches.reserve(after.size());
  for (size_t i = 0; i < after.size(); ++i) {
    Match& match = matches.emplace_back(Match{Match::kNone, i});
    const auto found = earlier.find(after[i]);
    if (found == earlier.end()) continue;
    Places& places = found->second;
    if (!mayRepeat && (places.at.size() > 1 || later.at(after[i]).at.size() > 1)) continue;
    if (places.used == places.at.size()) continue;
    match.before = places.at[places.used++];
    isMatched[match.before] = true;
  }
  for (size_t i = 0; i < before.size(); ++i) {
    if (!isMatched[i]) matches.push_back({i, Match::kNone});
  }
  return matches;
}

}  // namespace ksicache
