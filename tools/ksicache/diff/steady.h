// Who grows steadily over all moments of a recording between two times.
#ifndef TOOLS_KSICACHE_DIFF_STEADY_H_
#define TOOLS_KSICACHE_DIFF_STEADY_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "tools/ksicache/diff/memory.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// A figure that grew, or fell, all the time; in bytes.
struct SteadyGrowth {
  std::string name;
  int64_t number = -1;              // the kernel's, of a group; -1: it has none
  const PartInfo* info = nullptr;   // null of the host's own figures
  std::optional<int64_t> now;       // at the last moment that tells it
  std::optional<double> growth;     // over its moments; none if it is not steady
  std::optional<double> perSecond;  // likewise
  std::optional<double> fullIn;     // so many seconds after the last moment it is at its limit, or
                                    // the host has no free memory
  // When it began to grow, and when it stopped, us since 1970; none if not within the time.
  std::optional<int64_t> begun;
  std::optional<int64_t> stopped;
};

struct SteadyGrowths {
  Origin first;
  Origin last;
  double seconds = 0;                // from the first to the last, whatever the clock was set to
  bool isSinceBoot = false;          // what was before the host was started anew is left out
  bool isShort = false;              // the recording begins later than what was asked for
  size_t moments = 0;                // there are
  size_t samples = 0;                // of them were read
  std::vector<SteadyGrowth> host;    // free, in use, kernel, caches and others
  std::vector<SteadyGrowth> things;  // who grew most first
  std::vector<SteadyGrowth> groups;  // likewise

  // The most bytes that anything grew by.
  double Largest() const;
};

// Of FILE or FILE@WHEN, from `since` us before that moment on. Of many moments some hundred are
// read, at times that no other rhythm keeps step with. Clears `isWhole` if a report fails, which is
// said, or moments cannot be read. Fails with an Error that names the file.
SteadyGrowths FindSteady(const std::string& name, int64_t since, bool& isWhole);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_STEADY_H_
