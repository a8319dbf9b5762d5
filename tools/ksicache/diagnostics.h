// What the library says of a host while it is captured.
#ifndef TOOLS_KSICACHE_DIAGNOSTICS_H_
#define TOOLS_KSICACHE_DIAGNOSTICS_H_

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace ksicache {

// Keeps them off a progress bar: they are said on standard error when there is none, at the end at
// the latest. One at a time.
class Diagnostics {
 public:
  Diagnostics();
  Diagnostics(const Diagnostics&) = delete;
  Diagnostics& operator=(const Diagnostics&) = delete;
  ~Diagnostics();

  // Says those that have not been said.
  void Say();

  // Takes them to say them elsewhere.
  std::vector<std::string> TakeKept() { return std::exchange(kept_, {}); }

  // All, said or not.
  size_t Count() const { return count_; }

  // Whether one of them tells that something may not be read.
  bool TellRefusals() const { return tellRefusals_; }

 private:
  static constexpr size_t kMostKept = 1000;

  static void Receive(void* context, const char* text);
  void Keep(const char* text);

  size_t count_ = 0;
  bool tellRefusals_ = false;
  size_t dropped_ = 0;  // of those to say
  std::vector<std::string> kept_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIAGNOSTICS_H_
