// Waits for times of the clock on the wall, and for signals that end a program in order.
#ifndef TOOLS_KSICACHE_ALARM_H_
#define TOOLS_KSICACHE_ALARM_H_

#include <cstdint>

#include "tools/ksicache/new_file.h"

namespace ksicache {

class Alarm {
 public:
  enum class Event : uint8_t {
    kDue,
    kStopped,   // by SIGINT, SIGTERM or SIGHUP
    kClockSet,  // so the time may be near or far now
  };

  // From now on those signals are noticed by WaitUntil, and by nothing else. Fails with an Error.
  Alarm();

  // `time`: us since 1970. Fails with an Error.
  Event WaitUntil(int64_t time);

 private:
  Descriptor signals_;
  Descriptor timer_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_ALARM_H_
