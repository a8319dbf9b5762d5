// Reads that failed when a host was captured, and what they mean to whoever captured it.
#ifndef TOOLS_KSICACHE_FAILURES_H_
#define TOOLS_KSICACHE_FAILURES_H_

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace ksicache {

// The reads that failed in one way: how many, and the names of the first few.
class FailedReads {
 public:
  // The others' names are not asked for: most things have no value for some node, thousands of
  // them.
  void Add(int64_t status, const std::function<std::string()>& name);

  size_t Count() const { return count_; }

  // "12: sched/groups/groupName [5] (0xbad005a Permission denied), ... and 9 more", or "0"
  std::string Text() const;

 private:
  static constexpr size_t kMostNamed = 3;

  size_t count_ = 0;
  std::vector<std::string> first_;
};

struct Failures {
  // Of what that host, or that group or client, does not have: not every thing has every node.
  FailedReads absent;
  // Of what whoever captured the host may not read.
  FailedReads refused;
  // All others.
  FailedReads failed;

  void Add(int64_t status, const std::function<std::string()>& name);
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_FAILURES_H_
