// What of a span of moments could not be read, in one line.
#ifndef TOOLS_KSICACHE_MISSING_MOMENTS_H_
#define TOOLS_KSICACHE_MISSING_MOMENTS_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/recording/when.h"

namespace ksicache {

class MissingMoments {
 public:
  // A part whose moments nobody can have. Parts come in their order, one perhaps again.
  void Add(const ksi::RecordingFile::Part& part);

  bool IsEmpty() const { return stretches_.empty(); }

  // "3 moments of 2026-11-21T10:00:00Z to 2026-11-21T10:00:10Z cannot be read", of the first few
  // stretches of them.
  std::string Text() const;

 private:
  // Moments of one chunk.
  struct Stretch {
    int64_t chunk;
    int64_t moments;
    ksi::Span times;

    std::string Text() const;
  };

  std::vector<Stretch> stretches_;
  int64_t end_ = 0;  // of the last part, behind its last number
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MISSING_MOMENTS_H_
