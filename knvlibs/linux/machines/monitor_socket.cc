#include "knvlibs/linux/machines/monitor_socket.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstdio>

#include "knvlibs/linux/host/file_descriptor.h"

namespace ksi {

MonitorSocket::~MonitorSocket() {
  if (fd_ >= 0) close(fd_);
}

bool MonitorSocket::Connect(const std::string& path, int32_t pid, uint64_t owner) {
  // Who owns a QEMU may name any socket for its monitor's, and some act on being connected to
  // alone. So it is one that belongs to the same user, and it is that one that is connected to.
  const FileDescriptor file(open(path.c_str(), O_PATH | O_CLOEXEC));
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !S_ISSOCK(status.st_mode) ||
      status.st_uid != owner) {
    return false;
  }
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  (void)std::snprintf(address.sun_path, sizeof address.sun_path, "/proc/self/fd/%d", file.Get());
  // It does not block: a listener whose queue is full refuses.
  fd_ = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
  if (fd_ < 0) return false;
  if (connect(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) return false;
  ucred listener = {};
  socklen_t size = sizeof listener;
  return getsockopt(fd_, SOL_SOCKET, SO_PEERCRED, &listener, &size) == 0 && listener.pid == pid;
}

bool MonitorSocket::Send(std::string_view line) {
  std::string text(line);
  text += '\n';
  // A line fits into the socket's buffer, unless nobody reads.
  return send(fd_, text.data(), text.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(text.size());
}

bool MonitorSocket::Receive(std::string& line) {
  for (;;) {
    const size_t end = received_.find('\n');
    if (end != std::string::npos) {
      if (++lines_ > kMostLines) return false;
      line = received_.substr(0, end);
      received_.erase(0, end + 1);
      return true;
    }
    if (bytes_ == kMostBytes || !ReceiveMore()) return false;
  }
}

// Waits until there is something to receive. The deadline holds for a peer that says a little all
// the time, too.
bool MonitorSocket::WaitForMore() const {
  for (;;) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline_ - clock_());
    if (left.count() <= 0) return false;
    pollfd wait = {fd_, POLLIN, 0};
    const int ready = poll(&wait, 1, static_cast<int>(left.count()));
    if (ready > 0) return true;
    if (ready == 0 || errno != EINTR) return false;
  }
}

bool MonitorSocket::ReceiveMore() {
  std::array<char, 4096> part;
  for (;;) {
    if (!WaitForMore()) return false;
    const ssize_t count =
        recv(fd_, part.data(), std::min(part.size(), kMostBytes - bytes_), MSG_DONTWAIT);
    if (count > 0) {
      received_.append(part.data(), static_cast<size_t>(count));
      bytes_ += static_cast<size_t>(count);
      return true;
    }
    if (count == 0 || (errno != EAGAIN && errno != EINTR)) return false;
  }
}

}  // namespace ksi
