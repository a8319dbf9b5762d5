// libvirt, which holds the monitors of its machines: it is asked for what they would tell.
#ifndef KNVLIBS_LINUX_MACHINES_LIBVIRT_H_
#define KNVLIBS_LINUX_MACHINES_LIBVIRT_H_

#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/machines/libvirt_client.h"
#include "knvlibs/linux/machines/qmp.h"

namespace ksi {

// What all it is asked may take, of the time that monitors have.
constexpr std::chrono::milliseconds kLibvirtPatience{500};

// The domains by their processes.
using LibvirtDomains = std::map<int32_t, LibvirtDomain>;

// Asks the daemons that run, if they are root's or the user's own; none are started for it.
LibvirtDomains ReadLibvirt(const LinuxHost& host, const GroupTree& tree);

// A daemon's connection and what it keeps in files.
struct LibvirtDaemon {
  const char* uri;
  std::string directory;             // of its sockets
  std::vector<const char*> sockets;  // that a connection which can only read goes to
  std::string pidFiles;              // below it
  uint32_t owner;
};

// Whether a process of the daemon's name and owner listens at one of its sockets, in a directory
// that nobody else may write to.
bool IsThere(const LinuxHost& host, const GroupTree& tree, const LibvirtDaemon& daemon);

// The process of a domain, by the file in `directory` that the daemon of user `owner` keeps for it,
// if that is a QEMU that was started for this domain; 0 if not.
int32_t ProcessOfDomain(const LinuxHost& host, const GroupTree& tree, const std::string& directory,
                        uint32_t owner, const LibvirtDomain& domain);

// Fills in what libvirt tells. What a guest sent too long ago is not told.
void TakeDomain(const LibvirtDomain& domain, Figure now, GuestMemory& guest);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MACHINES_LIBVIRT_H_
