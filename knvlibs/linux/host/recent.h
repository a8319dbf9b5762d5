// A kernel file that tells of many instances is read once for all of them.
#ifndef KNVLIBS_LINUX_HOST_RECENT_H_
#define KNVLIBS_LINUX_HOST_RECENT_H_

#include <chrono>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// The latest reading of one thing. It answers for as long as a report takes to read its rows, so
// that the rows are of one moment; whoever comes later is given a new one.
template <class Reading>
class Recent {
 public:
  using Reader = Status (*)(const LinuxHost&, Reading*);

  // Points `reading` at a reading that is at most a second old.
  Status Get(const LinuxHost& host, Reader read, const Reading** reading) {
    constexpr std::chrono::seconds kLongest{1};
    if (!valid_ || std::chrono::steady_clock::now() - taken_ > kLongest) {
      return GetNew(host, read, reading);
    }
    *reading = &reading_;
    return kOk;
  }

  // Points `reading` at a reading made now. The one before is gone.
  Status GetNew(const LinuxHost& host, Reader read, const Reading** reading) {
    valid_ = false;
    reading_ = Reading();
    const Status status = read(host, &reading_);
    if (status != kOk) return status;
    taken_ = std::chrono::steady_clock::now();
    valid_ = true;
    *reading = &reading_;
    return kOk;
  }

 private:
  Reading reading_;
  bool valid_ = false;
  std::chrono::steady_clock::time_point taken_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_RECENT_H_
