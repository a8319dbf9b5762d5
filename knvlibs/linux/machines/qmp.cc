#include "knvlibs/linux/machines/qmp.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include <knvlibs/ksi.h>
#include "knvlibs/json.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/machines/channel.h"
#include "knvlibs/linux/machines/listener.h"
#include "knvlibs/linux/machines/monitor_socket.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

class RecordedChannel : public Channel {
 public:
  explicit RecordedChannel(std::string text) : text_(std::move(text)), lines_(text_) {}

  bool Send(std::string_view /*line*/) override { return true; }

  bool Receive(std::string& line) override {
    std::string_view next;
    if (!lines_.Next(next)) return false;
    line = next;
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
  while (channel.Receive(line)) {
    std::optional<Json> answer = ParseJson(line);
    if (!answer) return std::nullopt;
    if (FindMember(&*answer, "return") != nullptr || FindMember(&*answer, "error") != nullptr) {
      return answer;
    }
  }
  return std::nullopt;
}

// The member of this name, in KB, of an object that may be missing.
Figure KBOf(const Json* object, std::string_view name) {
  const Figure bytes = NumberOf(FindMember(object, name));
  // QEMU too writes all ones for what the guest does not tell.
  return bytes == kNoValue ? std::nullopt : QuotientOf(bytes, 1024);
}

void AskForBalloon(Channel& channel, GuestMemory& memory) {
  const std::optional<Json> answer = Ask(channel, R"({"execute":"query-balloon"})");
  if (!answer) return;
  if (const Json* result = FindMember(&*answer, "return")) {
    memory.balloon = GuestMemory::Balloon::kActive;
    memory.actual = KBOf(result, "actual");
    return;
  }
  const std::string* kind = TextOf(FindMember(FindMember(&*answer, "error"), "class"));
  if (kind != nullptr && *kind == "DeviceNotActive") memory.balloon = GuestMemory::Balloon::kNone;
}

// Figures that the guest sends now and then, if somebody has asked it to.
void AskForStatistics(Channel& channel, const std::string& balloon, GuestMemory& memory) {
  // An id of other characters would not stand in a path, and could end the text.
  constexpr std::string_view kIdCharacters =
      "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-._";
  if (balloon.empty() || balloon.find_first_not_of(kIdCharacters) != std::string::npos) return;
  const std::optional<Json> answer =
      Ask(channel, R"({"execute":"qom-get","arguments":{"path":"/machine/peripheral/)" + balloon +
                       R"(","property":"guest-stats"}})");
  const Json* result = answer ? FindMember(&*answer, "return") : nullptr;
  if (NumberOf(FindMember(result, "last-update")).value_or(0) == 0) return;
  const Json* statistics = FindMember(result, "stats");
  memory.total = KBOf(statistics, "stat-total-memory");
  memory.available = KBOf(statistics, "stat-available-memory");
}

// Whether a monitor greets and takes questions.
bool Greet(Channel& channel) {
  std::string greeting;
  if (!channel.Receive(greeting)) return false;
  const std::optional<Json> hello = ParseJson(greeting);
  return hello && FindMember(&*hello, "QMP") != nullptr &&
         Ask(channel, R"({"execute":"qmp_capabilities"})").has_value();
}

void Converse(Channel& channel, const QemuCommandLine& line, GuestMemory& memory) {
  if (!Greet(channel)) return;
  AskForBalloon(channel, memory);
  AskForStatistics(channel, line.balloon, memory);
}

void AskRecorded(const LinuxHost& host, const QemuCommandLine& line, GuestMemory& memory) {
  std::string text;
  if (host.Read(line.monitor, text) != kOk) return;
  RecordedChannel channel(std::move(text));
  Converse(channel, line, memory);
}

void AskLive(const LinuxHost& host, int32_t pid, const QemuCommandLine& line, GuestMemory& memory) {
  std::chrono::steady_clock::duration& left = host.Kept().monitorTime;
  if (left <= std::chrono::steady_clock::duration::zero()) {
    if (host.First("monitors")) {
      Warning("virtual machines: no time left to ask all of them: their balloons have no value\n");
    }
    return;
  }
  const LinuxHost::TimePoint start = host.Now();
  const auto patience = std::min<std::chrono::steady_clock::duration>(kMonitorPatience, left);
  MonitorSocket socket(host.TimeSource(), start + patience);
  // Where the listener cannot be looked up, the connection tells who it is.
  if (Listens(host, pid, line.monitor).value_or(true) && socket.Connect(line.monitor, pid)) {
    Converse(socket, line, memory);
  }
  left -= host.Now() - start;
}

}  // namespace

GuestMemory UnaskedGuest(const QemuCommandLine& line) {
  GuestMemory memory;
  if (!line.hasBalloon) memory.balloon = GuestMemory::Balloon::kNone;
  return memory;
}

GuestMemory ReadGuestMemory(const LinuxHost& host, int32_t pid, const QemuCommandLine& line) {
  GuestMemory memory = UnaskedGuest(line);
  if (line.monitor.empty()) return memory;
  if (host.IsThisMachine()) {
    AskLive(host, pid, line, memory);
  } else {
    AskRecorded(host, line, memory);
  }
  return memory;
}

}  // namespace ksi
