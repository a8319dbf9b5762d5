#include "knvlibs/linux/host/wall_clock.h"

#include <ctime>
#include <string>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

// "btime 1795258800"
Figure FindBootTime(std::string_view stat) {
  Lines lines(stat);
  std::string_view line;
  uint64_t seconds = 0;
  while (lines.Next(line)) {
    if (TakePrefix(line, "btime ")) return ParseNumber(line, seconds) ? Figure(seconds) : Figure();
  }
  return std::nullopt;
}

// "40000.12 310000.44": since it was started, and idle.
Figure ParseUptime(std::string_view uptime) {
  uint64_t seconds = 0;
  return ParseNumber(uptime.substr(0, uptime.find('.')), seconds) ? Figure(seconds) : Figure();
}

}  // namespace

Figure WallClock(const LinuxHost& host) {
  if (host.IsThisMachine()) return static_cast<uint64_t>(std::time(nullptr));
  std::string stat;
  std::string uptime;
  if (host.Read("/proc/stat", stat) != kOk || host.Read("/proc/uptime", uptime) != kOk) {
    return std::nullopt;
  }
  return SumOf({FindBootTime(stat), ParseUptime(uptime)});
}

}  // namespace ksi
