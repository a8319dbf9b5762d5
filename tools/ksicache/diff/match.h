#ifndef TOOLS_KSICACHE_DIFF_MATCH_H_
#define TOOLS_KSICACHE_DIFF_MATCH_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "tools/ksicache/diff/rows.h"

namespace ksicache {

// Whether the numbers of a report's keys are those of groups and processes.
bool GoesByGroups(const tally::Report& report);

// The names of groups from the root down, "host/services/sshd", by their numbers.
class GroupPaths {
 public:
  // Of what the library answers from. Fails as RunReport.
  explicit GroupPaths(const Origin& origin);

  // None of a group that there is not, or that stands below itself.
  std::optional<std::string> Of(int64_t group) const;

 private:
  struct Group {
    std::string name;
    int64_t parent;
  };
  std::unordered_map<int64_t, Group> groups_;
};

// Adds a part of an identity, so that none can be taken for two.
void AddPart(std::string_view part, std::string& identity);

// What each row is of, as far as its report tells: its name, and the number that the kernel gave
// it, for a number alone may have been taken again by something else. After a reboot numbers of
// groups and processes mean nothing: the names on the way to them stand in their place then, which
// `paths` has; null: they mean the same.
std::vector<std::string> IdentitiesOf(const Rows& rows, const GroupPaths* paths);

// Two things of which one became the other; what has none before is new, what has none after gone.
struct Match {
  static constexpr size_t kNone = SIZE_MAX;

  size_t before = kNone;
  size_t after = kNone;

  bool IsNew() const { return before == kNone; }
  bool IsGone() const { return after == kNone; }
};

// Those of the moment after in their order, then those that have gone. Where several have one
// identity they are matched in their order if `mayRepeat`; otherwise none of them is.
std::vector<Match> MatchAll(std::span<const std::string_view> before,
                            std::span<const std::string_view> after, bool mayRepeat);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_MATCH_H_
