// Who grows over all moments of a recording between two times.
#ifndef TOOLS_KSICACHE_DIFF_STEADY_H_
#define TOOLS_KSICACHE_DIFF_STEADY_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "framework/report.h"
#include "tools/ksicache/complaints.h"
#include "tools/ksicache/diff/course.h"
#include "tools/ksicache/diff/memory.h"
#include "tools/ksicache/diff/samples.h"
#include "tools/ksicache/export/row_format.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// A figure that grew, or fell.
struct SteadyGrowth {
  std::string name;
  int64_t number = -1;              // the kernel's, of a group; -1: it has none
  const PartInfo* info = nullptr;   // null of the host's own figures, and of rows of a report
  std::optional<int64_t> now;       // at the last moment that tells it
  std::optional<double> growth;     // over its moments; none if it is not steady
  std::optional<double> perSecond;  // likewise
  std::optional<double> fullIn;     // so many seconds after the last moment it is at its limit, or
                                    // the host has no free memory
  // When it began to grow, and when it stopped, us since 1970; none if not within the time.
  std::optional<int64_t> begun;
  std::optional<int64_t> stopped;
  // In how many steps it grew, and when the last of them was; 0 and none if not in steps.
  size_t steps = 0;
  std::optional<int64_t> lastStep;
};

struct SteadyGrowths {
  Origin first;
  Origin last;
  double seconds = 0;        // from the first to the last, whatever the clock was set to
  bool isSinceBoot = false;  // what was before the host was started anew is left out
  bool isShort = false;      // the recording begins later than what was asked for
  size_t moments = 0;        // there are
  size_t samples = 0;        // of them were read
  // The rows and the column of a report that were looked at, instead of all memory in bytes.
  const tally::Report* report = nullptr;
  std::optional<RowColumn> column;   // of memory it is in bytes, too
  std::vector<SteadyGrowth> host;    // free, in use, kernel, caches and others
  std::vector<SteadyGrowth> things;  // who grew steadily, most first
  std::vector<SteadyGrowth> late;    // who began to late, or grew in steps
  std::vector<SteadyGrowth> groups;  // as `things`

  // Whether it is memory that was looked at.
  bool AreBytes() const { return report == nullptr || tally::IsMemory(column->kind); }

  // The most that anything grew by steadily.
  double Largest() const;
};

// A series that went like this; `sign`: less than 0 if what it lost is its growth.
SteadyGrowth GrowthOf(const Series& series, const Course& course, double sign);

// Tells when it is full, if so much more fits in.
void TellWhenFull(double room, double perSecond, SteadyGrowth& growth);

// Adds to `steady` a series that grew steadily, and to `late`, unless that is null, one that began
// to late, or grew in steps. `end`: as of Samples::PointsOf.
void AddIfGrown(const Samples& samples, const Series& series, const PartInfo* info, size_t end,
                std::vector<SteadyGrowth>& steady, std::vector<SteadyGrowth>* late);

// What is looked at of each moment that is read.
class Sampler {
 public:
  Sampler() = default;
  Sampler(const Sampler&) = delete;
  Sampler& operator=(const Sampler&) = delete;
  virtual ~Sampler() = default;

  // Puts figures of the moment that the library answers from into the sample at hand. What is wrong
  // is said.
  virtual void Take(const Origin& origin, Samples& samples, Complaints& complaints) = 0;

  // Who grew, in any order.
  virtual void Finish(const Samples& samples, SteadyGrowths& growths) = 0;
};

// Of FILE or FILE@WHEN, from `since` us before that moment on. Of many moments some hundred are
// read, at times that no other rhythm keeps step with. Clears `isWhole` if a report fails, which is
// said, or moments cannot be read. Fails with an Error that names the file.
SteadyGrowths FindSteady(const std::string& name, int64_t since, Sampler& sampler, bool& isWhole);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_STEADY_H_
