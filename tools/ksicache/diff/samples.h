// Figures of many things at the same times.
#ifndef TOOLS_KSICACHE_DIFF_SAMPLES_H_
#define TOOLS_KSICACHE_DIFF_SAMPLES_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "tools/ksicache/diff/slope.h"

namespace ksicache {

// A figure of a thing, at each sample from its first on.
struct Series {
  std::string name;
  int64_t number = -1;  // the kernel's, of a group; -1: it has none
  std::optional<int64_t> limit;
  size_t first = 0;
  std::vector<double> figures;  // NaN: not known

  // The last figure that is known.
  std::optional<int64_t> Last() const;
  // The same, if it is known at the last sample that has the series.
  std::optional<int64_t> Now() const;
};

using SeriesByIdentity = std::unordered_map<std::string, Series>;

class Samples {
 public:
  // The sample at hand is of this time from now on, s since 1970.
  void Begin(double time) { times_.push_back(time); }

  size_t Count() const { return times_.size(); }

  // A series of the sample at hand that has this identity.
  Series& At(const std::string& identity, SeriesByIdentity& all) const;

  // Its figure at the sample at hand; the first one of two counts. Fails with a DataError if all
  // figures take too much memory.
  void Put(std::optional<int64_t> figure, Series& series);

  // The known figures, or less than 0, by their times, of a series that has been there for half of
  // the samples and until the one before `end`, which are so many; else none.
  std::vector<Point> PointsOf(const Series& series, double sign, size_t end) const;

 private:
  std::vector<double> times_;
  size_t figures_ = 0;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_SAMPLES_H_
