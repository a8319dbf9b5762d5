// A part of what is read of a host.
#ifndef KNVLIBS_LINUX_HOST_ONCE_H_
#define KNVLIBS_LINUX_HOST_ONCE_H_

#include <optional>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// Read by `kRead` when it is first asked for. A read that fails, or ends for want of memory, is
// tried again the next time.
template <class Part, Status (*kRead)(const LinuxHost&, Part&)>
class Once {
 public:
  // Points `part` at it; it stays until the next reading begins.
  [[nodiscard]] Status Get(const LinuxHost& host, const Part*& part) {
    if (!isRead_) {
      // Made in its place: what is read may point into itself.
      const Status status = kRead(host, part_.emplace());
      if (status != kOk) return status;
      isRead_ = true;
    }
    part = &*part_;
    return kOk;
  }

 private:
  std::optional<Part> part_;
  bool isRead_ = false;  // whole
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_ONCE_H_
