#include "knvlibs/linux/machines/listener.h"

#include <algorithm>
#include <string>
#include <vector>

#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

// "ffff8f00: 00000002 00000000 00010000 0001 01 23456 /run/web.qmp": the inode of the socket, if
// it listens at `path`.
Figure ListeningInode(std::string_view line, std::string_view path) {
  constexpr uint64_t kAcceptsConnections = 0x10000;
  for (int i = 0; i < 3; ++i) TakeWord(line);  // address, references, protocol
  uint64_t flags = 0;
  uint64_t inode = 0;
  if (!ParseHex(TakeWord(line), flags) || (flags & kAcceptsConnections) == 0) return std::nullopt;
  for (int i = 0; i < 2; ++i) TakeWord(line);  // type, state
  const bool isThere = ParseNumber(TakeWord(line), inode) && TakePrefix(line, " ") && line == path;
  return isThere ? Figure(inode) : std::nullopt;
}

}  // namespace

std::optional<bool> Listens(const LinuxHost& host, int32_t pid, std::string_view path) {
  std::string content;
  std::vector<LinuxHost::Entry> descriptors;
  if (host.Read(ProcessFile(pid, "net/unix"), content) != kOk ||
      host.List(ProcessFile(pid, "fd"), descriptors) != kOk) {
    return std::nullopt;
  }
  std::vector<std::string> sockets;
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    const Figure inode = ListeningInode(line, path);
    if (inode) sockets.push_back("socket:[" + std::to_string(*inode) + "]");
  }
  return std::ranges::any_of(descriptors, [&](const LinuxHost::Entry& descriptor) {
    std::string target;
    const std::string link = ProcessFile(pid, "fd/" + descriptor.name);
    return host.ReadLink(link, target) == kOk &&
           std::ranges::find(sockets, target) != sockets.end();
  });
}

}  // namespace ksi
