#include "tools/ksicache/progress.h"

#include <unistd.h>

#include <cstdio>
#include <string>

namespace ksicache {
namespace {

constexpr auto kFirst = std::chrono::seconds(1);
constexpr auto kBetween = std::chrono::milliseconds(100);
constexpr size_t kWidth = 30;

}  // namespace

Progress::Progress(const char* title, Clock::time_point (*now)())
    : title_(title), now_(now), terminal_(isatty(STDERR_FILENO) == 1), next_(now() + kFirst) {}

Progress::~Progress() {
  if (shown_) static_cast<void>(std::fputs("\r\x1b[K", stderr));
}

void Progress::Show(size_t done, size_t total) {
  if (!terminal_ || total == 0) return;
  const Clock::time_point now = now_();
  if (now < next_) return;
  next_ = now + kBetween;
  shown_ = true;
  std::string bar(done * kWidth / total, '#');
  bar.resize(kWidth, '.');
  static_cast<void>(
      std::fprintf(stderr, "\r%s [%s] %zu of %zu\x1b[K", title_, bar.c_str(), done, total));
}

}  // namespace ksicache
