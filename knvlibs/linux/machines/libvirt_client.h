// libvirt's client library, loaded where it is installed, in a process of its own: whatever the
// library or the daemon does, it ends when the time is up.
#ifndef KNVLIBS_LINUX_MACHINES_LIBVIRT_CLIENT_H_
#define KNVLIBS_LINUX_MACHINES_LIBVIRT_CLIENT_H_

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/machine_memory.h"

namespace ksi {

constexpr const char* kLibvirtLibrary = "libvirt.so.0";

// A running domain. KB and seconds.
struct LibvirtDomain {
  std::string name;
  std::string uuid;
  Figure actual;      // what the balloon leaves to the guest
  Figure available;   // as the guest counts
  Figure usable;      // of it, without its having to swap
  Figure lastUpdate;  // when the guest has counted
  Figure period;      // between the questions for it
  std::optional<std::vector<MemoryModule>> modules;
};

struct LibvirtAnswer {
  enum class End : uint8_t { kWhole, kNoLibrary, kNoConnection, kTooLate };

  End end = End::kTooLate;
  std::vector<LibvirtDomain> domains;  // those of which it has told
};

// Asks by a connection that can only read for all running domains.
LibvirtAnswer AskLibvirt(const char* library, const char* uri, LinuxHost::Clock clock,
                         LinuxHost::TimePoint deadline);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_LIBVIRT_CLIENT_H_
