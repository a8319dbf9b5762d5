// What a page calls the machines, groups, processes and heaps of its host.
#ifndef TOOLS_KSICACHE_PAGE_NAMES_H_
#define TOOLS_KSICACHE_PAGE_NAMES_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>

namespace ksicache {

// The names of one report's things at all moments.
class ThingNames {
 public:
  // `number`: the kernel's; -1 if it has none.
  void Add(std::string_view name, int64_t number);

  // As `ksicache diff` tells it from others of its name, if there are any.
  std::string Of(std::string_view name, int64_t number) const;

 private:
  struct Bearer {
    int64_t first;  // the number of the one that was met first
    bool isOneOfSeveral;
  };

  std::unordered_map<std::string, Bearer> bearers_;
};

// By the names of the reports.
using Names = std::unordered_map<std::string_view, ThingNames>;

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_NAMES_H_
