// Who listens at a Unix socket, without knocking there.
#ifndef KNVLIBS_LINUX_MACHINES_LISTENER_H_
#define KNVLIBS_LINUX_MACHINES_LISTENER_H_

#include <cstdint>
#include <optional>
#include <string_view>

#include "knvlibs/linux/host/host.h"

namespace ksi {

// How a process stands to a socket. One that is held has a client, or one that waits to be let in:
// a further one would have to wait, too, and would stay in the queue as long.
enum class Listening : uint8_t { kNot, kFree, kHeld };

// How process `pid` stands to the socket that it calls `path`, by /proc/PID/net/unix and
// /proc/PID/fd; none if these may not be read.
std::optional<Listening> FindListener(const LinuxHost& host, int32_t pid, std::string_view path);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_LISTENER_H_
