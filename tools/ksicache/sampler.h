// Reads a host again and again.
#ifndef TOOLS_KSICACHE_SAMPLER_H_
#define TOOLS_KSICACHE_SAMPLER_H_

#include <cstddef>
#include <string>

#include "knvlibs/recording/moment.h"

namespace ksicache {

class Sampler {
 public:
  // `root` as for a HostLibrary; must live as long.
  explicit Sampler(const std::string* root);

  // A moment of the host. Fails with an Error if nothing of it can be read.
  ksi::Moment Take();

 private:
  const std::string* root_;
  size_t count_ = 0;  // of the readings of the last moment
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_SAMPLER_H_
