// What of a recording cannot be read: where a part of a chunk is damaged, what continues it is
// lost.
#ifndef TOOLS_KSICACHE_LOST_MOMENTS_H_
#define TOOLS_KSICACHE_LOST_MOMENTS_H_

#include <cstdint>
#include <string>
#include <utility>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"

namespace ksicache {

class LostMoments {
 public:
  using Part = ksi::RecordingFile::Part;

  // A part that is damaged, the first one of its chunk that is.
  void Begin(const Part& part, std::string why) {
    first_ = last_ = part;
    moments_ = part.moments;
    why_ = std::move(why);
  }

  // Whether a part continues what is lost, and is then lost with it.
  bool Take(const Part& part) {
    if (moments_ == 0 || part.chunk != first_.chunk) return false;
    last_ = part;
    moments_ += part.moments;
    return true;
  }

  bool IsEmpty() const { return moments_ == 0; }
  const Part& First() const { return first_; }

  // What is wrong, and up to where. Leaves nothing here.
  std::string TakeText() {
    const int64_t moments = std::exchange(moments_, 0);
    if (moments == 1) return why_;
    return why_ + ": " + std::to_string(moments) + " moments of " +
           ksi::TextOfSpan({first_.first, last_.last}) + " cannot be read";
  }

 private:
  Part first_;
  Part last_;
  int64_t moments_ = 0;
  std::string why_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_LOST_MOMENTS_H_
