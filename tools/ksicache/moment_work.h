// What looking into the moments of a recording may take, as bytes.
//
// What is the same in many moments takes no room in its file, so a small one may hold more than
// anybody waits for.
#ifndef TOOLS_KSICACHE_MOMENT_WORK_H_
#define TOOLS_KSICACHE_MOMENT_WORK_H_

#include <cstdint>

#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/recording_file.h"

namespace ksicache {

class MomentWork {
 public:
  // `moments`: how many of each part are looked at, of the most that are packed together. A host on
  // which nothing happens comes to some hundred for a byte and one of them.
  MomentWork(const ksi::RecordingFile& file, uint64_t moments)
      : file_(file), most_((uint64_t{16} << 20) + 512 * moments * file.Size()) {}

  void Add(const ksi::Moment& moment);

  // Whether the file holds more than one of its size does.
  bool IsTooMuch() const;

  // That it does.
  static constexpr const char* kTooMuch = "its moments hold more than a file of its size does";

 private:
  const ksi::RecordingFile& file_;
  uint64_t most_;
  uint64_t work_ = 0;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MOMENT_WORK_H_
