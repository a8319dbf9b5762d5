// Which moments of a recording are older than they may be.
//
// A moment's age is the time that really passed since. Within one run of the host, its clock that
// nobody sets tells it. Of an earlier run the clock on the wall does, as that run had it last; but
// what the recording saw pass since then has passed at least. Where that clock was just set, or the
// host just started, this alone counts, until the clock has gone on evenly for an hour: it may be
// wrong, and what was removed does not come back.
#ifndef TOOLS_KSICACHE_RETENTION_H_
#define TOOLS_KSICACHE_RETENTION_H_

#include <cstddef>
#include <cstdint>
#include <deque>
#include <string>
#include <vector>

#include "knvlibs/times.h"

namespace ksicache {

// All times are in us.
class Retention {
 public:
  // How long the clock on the wall has to go on evenly, and by how much it may differ meanwhile.
  static constexpr int64_t kTrusted = ksi::kHour;
  static constexpr int64_t kEven = ksi::kMinute;

  // When a moment was.
  struct Stamp {
    std::string boot;    // which run of the host
    int64_t uptime = 0;  // since the host started; 0: not known
    int64_t taken = 0;   // since 1970, by the clock on the wall
  };

  // Moments may be so old.
  explicit Retention(int64_t keep);

  // A moment of the chunk whose first one has this number, in the order in which they were
  // recorded. The last one of each chunk is enough.
  void Add(int64_t chunk, Stamp stamp);

  // The number of the first chunk that has a moment which is not too old; the last chunk stays in
  // any case. `first`: that of the first chunk that there is.
  int64_t FirstKept(int64_t first);

  // Whether chunks stay only because the clock is not trusted.
  bool HoldsBack() const;

 private:
  // A run of the host, as far as it was recorded.
  struct Boot {
    std::string name;
    int64_t first;  // uptimes
    int64_t last;
    int64_t offset;  // from the uptime to the clock on the wall, at last
  };
  struct Chunk {
    int64_t number;
    size_t boot;
    int64_t uptime;  // of its last moment
  };

  bool IsOfLastBoot(const Stamp& stamp) const;
  bool IsClockTrusted() const { return boots_.back().last - evenFrom_ >= kTrusted; }
  int64_t SeenToPass(const Chunk& chunk) const;
  int64_t PassedByWall(const Chunk& chunk) const;
  bool IsTooOld(const Chunk& chunk) const;

  int64_t keep_;
  std::vector<Boot> boots_;
  std::deque<Chunk> chunks_;
  int64_t evenOffset_ = 0;  // that of the last run has been about this one
  int64_t evenFrom_ = 0;    // since this uptime
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_RETENTION_H_
