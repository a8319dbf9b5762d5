#include "knvlibs/linux/machines/qmp.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <memory>
#include <optional>
#include <string_view>

#include "knvlibs/linux/host/json.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kPatience{250};

// What all monitors together may keep a report waiting for nothing.
struct PatienceLeft {
  Clock::duration value = 4 * kPatience;
};

// The other side of a conversation in lines.
class Channel {
 public:
  Channel() = default;
  Channel(const Channel&) = delete;
  Channel& operator=(const Channel&) = delete;
  virtual ~Channel() = default;

  virtual bool Send(std::string_view line) = 0;
  virtual bool Receive(std::string* line) = 0;
};

class SocketChannel : public Channel {
 public:
  explicit SocketChannel(Clock::duration patience) : deadline_(Clock::now() + patience) {}
  ~SocketChannel() override {
    if (fd_ >= 0) close(fd_);
  }

  // Connects if it is process `pid` that listens there: a command line may name any socket.
  bool Connect(const std::string& path, int32_t pid) {
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) return false;
    std::memcpy(address.sun_path, path.data(), path.size());
    fd_ = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    if (fd_ < 0) return false;
    if (connect(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
      return false;
    }
    ucred listener = {};
    socklen_t size = sizeof listener;
    return getsockopt(fd_, SOL_SOCKET, SO_PEERCRED, &listener, &size) == 0 && listener.pid == pid;
  }

  bool Send(std::string_view line) override {
    std::string text(line);
    text += '\n';
    // A line fits into the socket's buffer, unless nobody reads.
    return send(fd_, text.data(), text.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(text.size());
  }

  bool Receive(std::string* line) override {
    for (;;) {
      const size_t end = received_.find('\n');
      if (end != std::string::npos) {
        *line = received_.substr(0, end);
        received_.erase(0, end + 1);
        return true;
      }
      constexpr size_t kLongest = size_t{1} << 20;
      if (received_.size() > kLongest || !WaitForMore()) return false;
    }
  }

 private:
  bool WaitForMore() {
    for (;;) {
      char buffer[4096];
      const ssize_t count = recv(fd_, buffer, sizeof buffer, 0);
      if (count > 0) {
        received_.append(buffer, static_cast<size_t>(count));
        return true;
      }
      if (count == 0 || (errno != EAGAIN && errno != EINTR)) return false;
      const auto left =
          std::chrono::duration_cast<std::chrono::milliseconds>(deadline_ - Clock::now());
      if (left.count() <= 0) return false;
      pollfd wait = {fd_, POLLIN, 0};
      poll(&wait, 1, static_cast<int>(left.count()));
    }
  }

  int fd_ = -1;
  Clock::time_point deadline_;
  std::string received_;
};

class RecordedChannel : public Channel {
 public:
  explicit RecordedChannel(std::string text) : text_(std::move(text)), lines_(text_) {}

  bool Send(std::string_view /*line*/) override { return true; }

  bool Receive(std::string* line) override {
    std::string_view next;
    if (!lines_.Next(&next)) return false;
    *line = next;
    return true;
  }

 private:
  std::string text_;
  Lines lines_;
};

// Sends a command; the answer is what comes back that is no event.
std::optional<Json> Ask(Channel& channel, std::string_view command) {
  if (!channel.Send(command)) return std::nullopt;
  std::string line;
  while (channel.Receive(&line)) {
    std::optional<Json> answer = ParseJson(line);
    if (!answer) return std::nullopt;
    if (answer->Find("return") != nullptr || answer->Find("error") != nullptr) return answer;
  }
  return std::nullopt;
}

// The member of this name, in KB, of an object that may be missing.
uint64_t KBOf(const Json* object, std::string_view name) {
  const Json* member = object == nullptr ? nullptr : object->Find(name);
  const std::optional<uint64_t> bytes = member == nullptr ? std::nullopt : member->Unsigned();
  // QEMU too writes all ones for what the guest does not tell.
  return bytes && *bytes != kNoValue ? *bytes / 1024 : kNoValue;
}

void AskForBalloon(Channel& channel, GuestMemory* memory) {
  const std::optional<Json> answer = Ask(channel, R"({"execute":"query-balloon"})");
  if (!answer) return;
  if (const Json* result = answer->Find("return")) {
    memory->balloon = GuestMemory::Balloon::kActive;
    memory->actual = KBOf(result, "actual");
  } else if (const Json* error = answer->Find("error")) {
    const Json* kind = error->Find("class");
    if (kind != nullptr && kind->Text() != nullptr && *kind->Text() == "DeviceNotActive") {
      memory->balloon = GuestMemory::Balloon::kNone;
    }
  }
}

// Figures that the guest sends now and then, if somebody has asked it to.
void AskForStatistics(Channel& channel, const std::string& balloon, GuestMemory* memory) {
  // An id of other characters would not stand in a path, and could end the text.
  constexpr std::string_view kIdCharacters =
      "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-._";
  if (balloon.empty() || balloon.find_first_not_of(kIdCharacters) != std::string::npos) return;
  const std::optional<Json> answer =
      Ask(channel, R"({"execute":"qom-get","arguments":{"path":"/machine/peripheral/)" + balloon +
                       R"(","property":"guest-stats"}})");
  const Json* result = answer ? answer->Find("return") : nullptr;
  const Json* update = result == nullptr ? nullptr : result->Find("last-update");
  if (update == nullptr || update->Unsigned().value_or(0) == 0) return;
  const Json* statistics = result->Find("stats");
  memory->total = KBOf(statistics, "stat-total-memory");
  memory->available = KBOf(statistics, "stat-available-memory");
}

std::unique_ptr<Channel> Open(const LinuxHost& host, int32_t pid, const std::string& path) {
  if (!host.IsThisMachine()) {
    std::string text;
    if (host.Read(path, &text) != kOk) return nullptr;
    return std::make_unique<RecordedChannel>(std::move(text));
  }
  const Clock::duration patience =
      std::min<Clock::duration>(kPatience, host.Keep<PatienceLeft>().value);
  auto channel = std::make_unique<SocketChannel>(patience);
  if (patience <= Clock::duration::zero() || !channel->Connect(path, pid)) return nullptr;
  return channel;
}

// Whether a monitor greets and takes questions.
bool Greet(const LinuxHost& host, Channel& channel) {
  const Clock::time_point start = Clock::now();
  std::string greeting;
  if (!channel.Receive(&greeting)) {
    host.Keep<PatienceLeft>().value -= Clock::now() - start;
    return false;
  }
  const std::optional<Json> hello = ParseJson(greeting);
  return hello && hello->Find("QMP") != nullptr &&
         Ask(channel, R"({"execute":"qmp_capabilities"})").has_value();
}

}  // namespace

GuestMemory ReadGuestMemory(const LinuxHost& host, int32_t pid, const QemuCommandLine& line) {
  GuestMemory memory;
  if (!line.hasBalloon) memory.balloon = GuestMemory::Balloon::kNone;
  if (line.monitor.empty()) return memory;
  const std::unique_ptr<Channel> channel = Open(host, pid, line.monitor);
  if (channel == nullptr || !Greet(host, *channel)) return memory;
  AskForBalloon(*channel, &memory);
  AskForStatistics(*channel, line.balloon, &memory);
  return memory;
}

}  // namespace ksi
