#include "knvlibs/linux/host/walk_time.h"

#include <ctime>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

std::chrono::nanoseconds ProcessorTime() {
  timespec time = {};
  (void)clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
  return std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
}

}  // namespace

bool MayWalk(const LinuxHost& host) {
  if (host.Kept().walkTime > std::chrono::nanoseconds::zero()) return true;
  if (host.First("walks")) {
    Warning(
        "virtual machines: no time left to look at the memory of all of them: what that would "
        "tell has no value\n");
  }
  host.Lose(KSI_STATUS_TIMEOUT);
  return false;
}

Walk::Walk(const LinuxHost& host) : host_(host), began_(ProcessorTime()) {}

Walk::~Walk() { host_.Kept().walkTime -= ProcessorTime() - began_; }

}  // namespace ksi
