// What was wrong with what a page was made of: the page and the terminal both tell it.
#ifndef TOOLS_KSICACHE_PAGE_PROBLEMS_H_
#define TOOLS_KSICACHE_PAGE_PROBLEMS_H_

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "tools/ksicache/diagnostics.h"

namespace ksicache {

class Problems {
 public:
  // Those that are added from now on are of the moment that was taken then, or of none.
  void At(std::optional<int64_t> taken) { taken_ = taken; }

  // A text once, however often it happens.
  void Add(const std::string& text);

  // What the library has said meanwhile.
  void AddDiagnostics() {
    for (const std::string& text : diagnostics_.TakeKept()) Add(text);
  }

  const std::vector<std::string>& All() const { return all_; }

  // The same, each with how many moments it was of, and when these were.
  std::vector<std::string> WithTimes() const;

  // When the first moment of each was taken, of those that are of moments.
  std::vector<int64_t> FirstTimes() const;

 private:
  static constexpr size_t kMost = 100;
  static constexpr size_t kMostTimes = 1000;  // of one; more are not counted

  Diagnostics diagnostics_;
  std::optional<int64_t> taken_;
  std::map<std::string, std::set<int64_t>> times_;  // a moment may be read more than once
  std::vector<std::string> all_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_PROBLEMS_H_
