// What of a recording cannot be read: where a part of a chunk is damaged, what continues it is
// lost.
#ifndef TOOLS_KSICACHE_LOST_MOMENTS_H_
#define TOOLS_KSICACHE_LOST_MOMENTS_H_

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"

namespace ksicache {

class LostMoments {
 public:
  using Part = ksi::RecordingFile::Part;

  // A part that is damaged, the first one of its chunk that is.
  void Begin(const Part& part, std::string why) {
    parts_ = {part};
    why_ = std::move(why);
  }

  // Whether a part continues what is lost, and is then lost with it.
  bool Take(const Part& part) {
    if (parts_.empty() || part.chunk != First().chunk) return false;
    parts_.push_back(part);
    return true;
  }

  bool IsEmpty() const { return parts_.empty(); }
  const Part& First() const { return parts_.front(); }

  // What is lost of those parts that are such.
  template <class Is>
  LostMoments Only(Is&& is) const {
    LostMoments lost;
    lost.why_ = why_;
    std::ranges::copy_if(parts_, std::back_inserter(lost.parts_), is);
    return lost;
  }

  // What is wrong, and up to where. REQUIRES: it is not empty.
  std::string Text() const {
    int64_t moments = 0;
    for (const Part& part : parts_) moments += part.moments;
    if (moments == 1) return why_;
    return why_ + ": " + std::to_string(moments) + " moments of " +
           ksi::TextOfSpan({First().first, parts_.back().last}) + " cannot be read";
  }

 private:
  std::vector<Part> parts_;
  std::string why_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_LOST_MOMENTS_H_
