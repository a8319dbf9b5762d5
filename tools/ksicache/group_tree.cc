#include "tools/ksicache/group_tree.h"

#include <algorithm>

namespace ksicache {
namespace {

using Parents = std::unordered_map<int64_t, int64_t>;

int64_t LeastOfCircle(const Parents& parentOf, int64_t group) {
  int64_t least = group;
  for (int64_t at = parentOf.at(group); at != group; at = parentOf.at(at)) {
    least = std::min(least, at);
  }
  return least;
}

}  // namespace

std::optional<int64_t> GroupTree::Add(int64_t parent, int64_t child) {
  const auto [place, isNew] = parentOf_.emplace(child, parent);
  return isNew ? std::nullopt : std::optional(place->second);
}

// From each group up to one that was met before: if it was met on the same way, it is its own
// ancestor.
std::vector<int64_t> GroupTree::Circles() const {
  Parents metFrom;
  std::vector<int64_t> circles;
  for (const auto& [start, parent] : parentOf_) {
    int64_t group = start;
    while (metFrom.emplace(group, start).second) {
      const auto up = parentOf_.find(group);
      if (up == parentOf_.end()) break;
      group = up->second;
    }
    const bool isRoot = !parentOf_.contains(group);
    if (!isRoot && metFrom[group] == start) circles.push_back(LeastOfCircle(parentOf_, group));
  }
  std::ranges::sort(circles);
  return circles;
}

}  // namespace ksicache
