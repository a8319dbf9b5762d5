// What there is to say of a page's moments beside their figures.
#ifndef TOOLS_KSICACHE_PAGE_MARKS_H_
#define TOOLS_KSICACHE_PAGE_MARKS_H_

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/survey.h"

namespace ksicache {

// Something that happened between two moments.
struct Mark {
  const char* kind;  // "reboot", "clock", "gap", "skipped" or "lost"
  size_t moment;     // the place of the moment after it
  int64_t time;      // how much later that is, how far the clock was set; us
};

// What it says; "{}" stands for how long it took.
const char* WordsOf(const Mark& mark);

// Reads of moments that failed.
struct ReadFailures {
  uint64_t most = 0;   // of one moment
  size_t moment = 0;   // the first with so many
  size_t moments = 0;  // with any

  void Add(size_t at, uint64_t count);
};

struct Marks {
  // As many are told of a page.
  static constexpr size_t kMost = 500;

  std::vector<Mark> all;
  size_t leftOut = 0;
  ReadFailures refused;             // for want of rights
  ReadFailures failed;              // for other reasons
  size_t lossy = 0;                 // moments of which something was left out
  std::map<size_t, int64_t> steps;  // of the clock, before these moments: Survey::Steady
};

// Tells the survey which of its moments are of one boot.
Marks MarksOf(const std::string& name, Survey& survey, Problems& problems);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_MARKS_H_
