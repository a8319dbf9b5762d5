#ifndef TOOLS_KSICACHE_DIFF_BALANCE_H_
#define TOOLS_KSICACHE_DIFF_BALANCE_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "framework/display_unit.h"
#include "tools/ksicache/diff/match.h"
#include "tools/ksicache/diff/memory.h"

namespace ksicache {

// A figure at both moments and its growth, all in the unit that is shown: what is printed adds up.
struct Growth {
  std::optional<int64_t> before;
  std::optional<int64_t> after;

  // None unless both are known.
  std::optional<int64_t> Amount() const;
};

// What became of one thing.
struct ThingGrowth {
  std::string name;
  int64_t number;  // the kernel's, of a group; -1: it has none
  bool isNew;
  bool isGone;
  Growth growth;  // 0 before of what is new, and after of what has gone
};

// What became of a part. Things of which one of the two amounts is not known are in none of its
// sums.
struct PartGrowth {
  const PartInfo* info;
  bool isKnown;  // it could be told at both moments who they are, of some at least
  size_t before = 0;
  size_t after = 0;    // how many there are
  size_t unknown = 0;  // left out
  Growth sum;
  std::vector<ThingGrowth> things;  // that changed, those that did most first
  // The most bytes that any of them grew by; what came under a name in place of what has gone under
  // it grew by the difference.
  int64_t largest = 0;
};

// How a host's memory went from one moment to another, and who explains it.
struct Balance {
  Growth total;
  Growth free;
  Growth used;  // total less free
  Growth kernel;
  Growth caches;
  Growth others;
  std::vector<PartGrowth> parts;       // that are added
  PartGrowth groups;                   // which are not
  std::optional<int64_t> unexplained;  // used less all that are added

  // The most bytes that the host or anything in a part grew by.
  int64_t largest = 0;
};

// `mayRepeat`: as of MatchAll.
Balance Compare(const Memory& before, const Memory& after, tally::DisplayUnit unit, bool mayRepeat);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_BALANCE_H_
