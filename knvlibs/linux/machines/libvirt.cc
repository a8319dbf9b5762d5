#include "knvlibs/linux/machines/libvirt.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <optional>
#include <string_view>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/machines/listener.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

bool IsOwn(const std::string& path, uint32_t owner, mode_t kind) {
  constexpr mode_t kOthersWrite = S_IWGRP | S_IWOTH;
  struct stat status = {};
  return lstat(path.c_str(), &status) == 0 && (status.st_mode & S_IFMT) == kind &&
         status.st_uid == owner && (kind != S_IFDIR || (status.st_mode & kOthersWrite) == 0);
}

std::vector<LibvirtDaemon> AllDaemons() {
  std::vector<LibvirtDaemon> daemons;
  for (const char* directory : {"/run/libvirt/", "/var/run/libvirt/"}) {
    daemons.push_back(
        {"qemu:///system", directory, {"libvirt-sock-ro", "virtqemud-sock-ro"}, "qemu/", 0});
  }
  const char* runtime = std::getenv("XDG_RUNTIME_DIR");
  if (geteuid() != 0 && runtime != nullptr && *runtime == '/') {
    daemons.push_back({"qemu:///session",
                       std::string(runtime) + "/libvirt/",
                       {"libvirt-sock", "virtqemud-sock"},
                       "qemu/run/",
                       geteuid()});
  }
  return daemons;
}

void TellEnd(const LinuxHost& host, LibvirtAnswer::End end) {
  const char* reason = nullptr;
  if (end == LibvirtAnswer::End::kNoLibrary) reason = "its library cannot be loaded";
  if (end == LibvirtAnswer::End::kNoConnection) reason = "it lets nobody in";
  if (end == LibvirtAnswer::End::kTooLate) reason = "it has not told all in time";
  if (end == LibvirtAnswer::End::kTooLate) host.Lose(KSI_STATUS_TIMEOUT);
  if (reason == nullptr || !host.First("libvirt")) return;
  Warning("libvirt: %s: balloons and guests of its machines may have no value\n", reason);
}

LibvirtAnswer Ask(const LinuxHost& host, const LibvirtDaemon& daemon) {
  std::chrono::steady_clock::duration& left = host.Kept().monitorTime;
  const LinuxHost::TimePoint start = host.Now();
  const auto patience = std::min<std::chrono::steady_clock::duration>(kLibvirtPatience, left);
  LibvirtAnswer answer =
      AskLibvirt(kLibvirtLibrary, daemon.uri, host.TimeSource(), start + patience);
  left -= host.Now() - start;
  return answer;
}

}  // namespace

// Whose descriptors may not be read is believed: nobody else could have put the socket there.
bool IsThere(const LinuxHost& host, const GroupTree& tree, const LibvirtDaemon& daemon) {
  if (!IsOwn(daemon.directory.substr(0, daemon.directory.size() - 1), daemon.owner, S_IFDIR)) {
    return false;
  }
  return std::ranges::any_of(tree.Processes(), [&](const Process& process) {
    if (process.name != "libvirtd" && process.name != "virtqemud") return false;
    if (!IsOwn("/proc/" + std::to_string(process.pid), daemon.owner, S_IFDIR)) return false;
    return std::ranges::any_of(daemon.sockets, [&](const char* name) {
      const std::string socket = daemon.directory + name;
      return IsOwn(socket, daemon.owner, S_IFSOCK) &&
             FindListener(host, process.pid, socket) != Listening::kNot;
    });
  });
}

int32_t ProcessOfDomain(const LinuxHost& host, const GroupTree& tree, const std::string& directory,
                        uint32_t owner, const LibvirtDomain& domain) {
  const std::string file = directory + domain.name + ".pid";
  std::string content;
  uint64_t pid = 0;
  if (domain.name.find('/') != std::string::npos || !IsOwn(file, owner, S_IFREG) ||
      host.ReadPiece(file, content) != kOk ||
      !ParseNumber(std::string_view(content).substr(0, content.find('\n')), pid) ||
      pid > INT32_MAX) {
    return 0;
  }
  const VirtualMachine* machine = tree.FindVirtualMachine(static_cast<int64_t>(pid));
  const bool isStartedForIt =
      machine != nullptr && !domain.uuid.empty() && machine->commandLine.uuid == domain.uuid;
  return isStartedForIt ? machine->pid : 0;
}

LibvirtDomains ReadLibvirt(const LinuxHost& host, const GroupTree& tree) {
  LibvirtDomains domains;
  if (!host.IsThisMachine()) return domains;
  for (const LibvirtDaemon& daemon : AllDaemons()) {
    if (!IsThere(host, tree, daemon)) continue;
    const LibvirtAnswer answer = Ask(host, daemon);
    TellEnd(host, answer.end);
    for (const LibvirtDomain& domain : answer.domains) {
      const std::string directory = daemon.directory + daemon.pidFiles;
      const int32_t pid = ProcessOfDomain(host, tree, directory, daemon.owner, domain);
      if (pid != 0) domains.emplace(pid, domain);
    }
  }
  return domains;
}

void TakeDomain(const LibvirtDomain& domain, Figure now, GuestMemory& guest) {
  if (domain.actual) {
    guest.balloon = GuestMemory::Balloon::kActive;
    guest.actual = domain.actual;
    guest.hasDriver = domain.lastUpdate.value_or(0) != 0;
  }
  guest.modules = domain.modules;
  if (!AreCurrent(domain.lastUpdate, now, domain.period)) return;
  guest.total = domain.available;
  guest.available = domain.usable;
}

}  // namespace ksi
