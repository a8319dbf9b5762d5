// Who listens at a Unix socket, without knocking there.
#ifndef KNVLIBS_LINUX_MACHINES_LISTENER_H_
#define KNVLIBS_LINUX_MACHINES_LISTENER_H_

#include <cstdint>
#include <optional>
#include <string_view>

#include "knvlibs/linux/host/host.h"

namespace ksi {

// Whether process `pid` listens at the socket that it calls `path`, by /proc/PID/net/unix and
// /proc/PID/fd; none if these may not be read.
std::optional<bool> Listens(const LinuxHost& host, int32_t pid, std::string_view path);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_LISTENER_H_
