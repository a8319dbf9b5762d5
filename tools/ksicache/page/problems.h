// What was wrong with what a page was made of: the page and the terminal both tell it.
#ifndef TOOLS_KSICACHE_PAGE_PROBLEMS_H_
#define TOOLS_KSICACHE_PAGE_PROBLEMS_H_

#include <set>
#include <string>
#include <vector>

#include "tools/ksicache/diagnostics.h"

namespace ksicache {

class Problems {
 public:
  // Once, however often it happens.
  void Add(const std::string& text) {
    if (seen_.size() < kMost && seen_.insert(text).second) all_.push_back(text);
  }

  // What the library has said meanwhile.
  void AddDiagnostics() {
    for (const std::string& text : diagnostics_.TakeKept()) Add(text);
  }

  const std::vector<std::string>& All() const { return all_; }

 private:
  static constexpr size_t kMost = 100;

  Diagnostics diagnostics_;
  std::set<std::string> seen_;
  std::vector<std::string> all_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_PROBLEMS_H_
