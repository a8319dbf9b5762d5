// Finds what makes the groups of a cache file no tree, in which each stands in one place.
#ifndef TOOLS_KSICACHE_GROUP_TREE_H_
#define TOOLS_KSICACHE_GROUP_TREE_H_

#include <cstdint>
#include <optional>
#include <unordered_map>
#include <vector>

namespace ksicache {

class GroupTree {
 public:
  // Adds a group that another lists; gives the group that lists it already, if one does.
  std::optional<int64_t> Add(int64_t parent, int64_t child);

  // The least group of each circle of groups in which each lists the next.
  std::vector<int64_t> Circles() const;

 private:
  std::unordered_map<int64_t, int64_t> parentOf_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_GROUP_TREE_H_
