#include "tools/ksicache/alarm.h"

#include <poll.h>
#include <sys/signalfd.h>
#include <sys/timerfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>

#include "knvlibs/times.h"
#include "tools/ksicache/error.h"

namespace ksicache {

Alarm::Alarm() {
  sigset_t set;
  sigemptyset(&set);
  for (const int each : {SIGINT, SIGTERM, SIGHUP}) sigaddset(&set, each);
  signals_.Reset(signalfd(-1, &set, SFD_CLOEXEC | SFD_NONBLOCK));
  timer_.Reset(timerfd_create(CLOCK_REALTIME, TFD_CLOEXEC | TFD_NONBLOCK));
  if (!signals_ || !timer_ || sigprocmask(SIG_BLOCK, &set, nullptr) != 0) {
    throw SystemError("a timer", errno);
  }
}

Alarm::Event Alarm::WaitUntil(int64_t time) {
  const struct itimerspec due = {{0, 0}, {time / ksi::kSecond, time % ksi::kSecond * 1000}};
  if (timerfd_settime(timer_.Get(), TFD_TIMER_ABSTIME | TFD_TIMER_CANCEL_ON_SET, &due, nullptr) !=
      0) {
    throw SystemError("a timer", errno);
  }
  std::array<struct pollfd, 2> waited = {{{signals_.Get(), POLLIN, 0}, {timer_.Get(), POLLIN, 0}}};
  for (;;) {
    if (poll(waited.data(), waited.size(), -1) < 0 && errno != EINTR) {
      throw SystemError("a timer", errno);
    }
    if (waited[0].revents != 0) return Event::kStopped;
    uint64_t times = 0;
    if (read(timer_.Get(), &times, sizeof times) > 0) return Event::kDue;
    if (errno == ECANCELED) return Event::kClockSet;
  }
}

}  // namespace ksicache
