// The socket of a monitor, whoever may be at its other end: what it says is bounded in time, bytes
// and lines.
#ifndef KNVLIBS_LINUX_MACHINES_MONITOR_SOCKET_H_
#define KNVLIBS_LINUX_MACHINES_MONITOR_SOCKET_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/channel.h"

namespace ksi {

class MonitorSocket : public Channel {
 public:
  // Answers take some hundred bytes each, those of all memory modules a hundred kilobytes, on one
  // line or on one for each value; events of a busy guest may stand between them.
  static constexpr size_t kMostBytes = size_t{256} << 10;
  static constexpr size_t kMostLines = 8192;

  // The conversation is over when `clock` comes to `deadline`.
  MonitorSocket(LinuxHost::Clock clock, LinuxHost::TimePoint deadline)
      : clock_(clock), deadline_(deadline) {}
  ~MonitorSocket() override;

  // Connects to the socket at `path`; false if it does not belong to the user `owner`, or it is not
  // process `pid` that listens there.
  bool Connect(const std::string& path, int32_t pid, uint64_t owner);

  bool Send(std::string_view line) override;
  bool Receive(std::string& line) override;

 private:
  bool WaitForMore() const;
  bool ReceiveMore();

  LinuxHost::Clock clock_;
  LinuxHost::TimePoint deadline_;
  int fd_ = -1;
  std::string received_;  // and not handed out yet
  size_t bytes_ = 0;
  size_t lines_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_MONITOR_SOCKET_H_
