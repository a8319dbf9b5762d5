#include "knvlibs/linux/machines/listener.h"

#include <set>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

// A line of /proc/net/unix. What a listener has let in has its path.
struct UnixSocket {
  uint64_t flags = 0;
  uint64_t state = 0;
  uint64_t inode = 0;  // 0 if nobody has it open yet

  bool Accepts() const { return (flags & 0x10000) != 0; }
  // Whether it is a client's connection that waits to be let in.
  bool Waits() const { return state == 2; }
};

// "ffff8f00: 00000002 00000000 00010000 0001 01 23456 /run/web.qmp"; false if it is none of `path`.
bool ParseSocket(std::string_view line, std::string_view path, UnixSocket& socket) {
  for (int i = 0; i < 3; ++i) TakeWord(line);  // address, references, protocol
  if (!ParseHex(TakeWord(line), socket.flags)) return false;
  TakeWord(line);  // type
  return ParseHex(TakeWord(line), socket.state) && ParseNumber(TakeWord(line), socket.inode) &&
         TakePrefix(line, " ") && line == path;
}

// The sockets of this path.
std::vector<UnixSocket> SocketsOf(std::string_view content, std::string_view path) {
  std::vector<UnixSocket> sockets;
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    UnixSocket socket;
    if (ParseSocket(line, path, socket)) sockets.push_back(socket);
  }
  return sockets;
}

// What the descriptors of a process lead to.
std::set<std::string> TargetsOf(const LinuxHost& host, int32_t pid,
                                const std::vector<LinuxHost::Entry>& descriptors) {
  std::set<std::string> targets;
  for (const LinuxHost::Entry& descriptor : descriptors) {
    std::string target;
    const std::string link = ProcessFile(pid, "fd/" + descriptor.name);
    if (host.ReadLink(link, target) == kOk) targets.insert(std::move(target));
  }
  return targets;
}

}  // namespace

std::optional<Listening> FindListener(const LinuxHost& host, int32_t pid, std::string_view path) {
  std::string content;
  std::vector<LinuxHost::Entry> descriptors;
  if (host.Read(ProcessFile(pid, "net/unix"), content) != kOk ||
      host.List(ProcessFile(pid, "fd"), descriptors) != kOk) {
    return std::nullopt;
  }
  const std::vector<UnixSocket> sockets = SocketsOf(content, path);
  if (sockets.empty()) return Listening::kNot;
  const std::set<std::string> targets = TargetsOf(host, pid, descriptors);
  const auto isOwn = [&targets](const UnixSocket& socket) {
    return targets.contains("socket:[" + std::to_string(socket.inode) + "]");
  };
  bool listens = false;
  bool isHeld = false;
  for (const UnixSocket& socket : sockets) {
    if (socket.Accepts()) {
      listens = listens || isOwn(socket);
    } else {
      isHeld = isHeld || socket.Waits() || isOwn(socket);
    }
  }
  if (!listens) return Listening::kNot;
  return isHeld ? Listening::kHeld : Listening::kFree;
}

}  // namespace ksi
