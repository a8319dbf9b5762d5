// The moments of a recording that lie so long before one of them.
#ifndef TOOLS_KSICACHE_DIFF_STRETCH_H_
#define TOOLS_KSICACHE_DIFF_STRETCH_H_

#include <cstdint>
#include <random>
#include <string>
#include <vector>

namespace ksicache {

// When a moment was taken, us since 1970: as the clock said, and as it would have said had it been
// set all the time as at the last moment.
struct MomentTime {
  int64_t taken;
  int64_t even;
};

// Moments of one boot, in the order in which they were recorded.
struct Stretch {
  std::string fileName;
  std::vector<MomentTime> times;
  bool isSinceBoot = false;  // what was before the host was started anew is left out
  bool isShort = false;      // the recording begins much later than what was asked for
};

// Of FILE or FILE@WHEN, from `since` us before that moment on. Fails with a DataError.
Stretch FindStretch(const std::string& name, int64_t since);

// What these moments are called, and maybe others between them.
std::string NameOf(const Stretch& stretch);

// Which moments are read: all of a few, or one in each of many intervals of the same length,
// anywhere in it. So what goes up and down does not look as if it went slowly up.
class Choice {
 public:
  explicit Choice(const std::vector<MomentTime>& times);

  // `even`: of a moment, each time a later one.
  bool Takes(int64_t even);

 private:
  double from_;
  double step_;  // 0: all are taken
  double place_ = 0;
  double due_ = 0;
  std::mt19937 random_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_STRETCH_H_
