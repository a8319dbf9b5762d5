// A bar on standard error for work that takes longer than a second.
#ifndef TOOLS_KSICACHE_PROGRESS_H_
#define TOOLS_KSICACHE_PROGRESS_H_

#include <chrono>
#include <cstddef>

namespace ksicache {

// Shows nothing unless standard error is a terminal.
class Progress {
 public:
  using Clock = std::chrono::steady_clock;

  explicit Progress(const char* title, Clock::time_point (*now)() = Clock::now);
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  ~Progress();

  // `total` may grow.
  void Show(size_t done, size_t total);

 private:
  const char* title_;
  Clock::time_point (*now_)();
  bool terminal_;
  bool shown_ = false;
  Clock::time_point next_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PROGRESS_H_
