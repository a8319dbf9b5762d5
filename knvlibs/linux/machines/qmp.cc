#include "knvlibs/linux/machines/qmp.h"

#include <algorithm>
#include <cerrno>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include <knvlibs/ksi.h>
#include "knvlibs/json.h"
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/host/wall_clock.h"
#include "knvlibs/linux/machines/channel.h"
#include "knvlibs/linux/machines/conversation.h"
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

// The member of this name, in KB, of an object that may be missing.
Figure KBOf(const Json* object, std::string_view name) {
  const Figure bytes = NumberOf(FindMember(object, name));
  // QEMU too writes all ones for what the guest does not tell.
  return bytes == kNoValue ? std::nullopt : QuotientOf(bytes, 1024);
}

void AskForBalloon(Conversation& monitor, GuestMemory& memory) {
  const std::optional<Json> answer = monitor.Ask(R"({"execute":"query-balloon"})");
  if (!answer) return;
  if (const Json* result = FindMember(&*answer, "return")) {
    memory.balloon = GuestMemory::Balloon::kActive;
    memory.actual = KBOf(result, "actual");
    return;
  }
  const std::string* kind = TextOf(FindMember(FindMember(&*answer, "error"), "class"));
  if (kind != nullptr && *kind == "DeviceNotActive") memory.balloon = GuestMemory::Balloon::kNone;
}

// What a command answers; none if it fails.
std::optional<Json> AskFor(Conversation& monitor, std::string_view command) {
  std::optional<Json> answer = monitor.Ask(command);
  if (!answer || FindMember(&*answer, "return") == nullptr) return std::nullopt;
  return *FindMember(&*answer, "return");
}

std::optional<Json> AskDevice(Conversation& monitor, const std::string& id, const char* property) {
  return AskFor(monitor, R"({"execute":"qom-get","arguments":{"path":"/machine/peripheral/)" + id +
                             R"(","property":")" + property + R"("}})");
}

// Figures that the guest sends now and then, if somebody has asked it to.
void AskForStatistics(const LinuxHost& host, Conversation& monitor, const std::string& balloon,
                      GuestMemory& memory) {
  // An id of other characters would not stand in a path, and could end the text.
  constexpr std::string_view kIdCharacters =
      "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-._";
  if (balloon.empty() || balloon.find_first_not_of(kIdCharacters) != std::string::npos) return;
  const std::optional<Json> result = AskDevice(monitor, balloon, "guest-stats");
  if (!result) return;
  const Figure sent = NumberOf(FindMember(&*result, "last-update"));
  memory.hasDriver = sent.value_or(0) != 0;
  const std::optional<Json> interval = AskDevice(monitor, balloon, "guest-stats-polling-interval");
  if (!interval || !AreCurrent(sent, WallClock(host), NumberOf(&*interval))) return;
  const Json* statistics = FindMember(&*result, "stats");
  memory.total = KBOf(statistics, "stat-total-memory");
  memory.available = KBOf(statistics, "stat-available-memory");
}

// The last part of "/objects/mem1".
std::string_view IdOf(std::string_view path) { return path.substr(path.rfind('/') + 1); }

// The sizes of the backends by their ids.
using Backends = std::map<std::string, Figure, std::less<>>;

Backends BackendsOf(const Json& list) {
  Backends backends;
  for (const auto& [name, backend] : list.members) {
    const std::string* id = TextOf(FindMember(&backend, "id"));
    if (id != nullptr) backends.emplace(*id, KBOf(&backend, "size"));
  }
  return backends;
}

// The backend of a module, and where the guest has it.
struct Device {
  std::string_view backend;
  Figure guestAddress;
};

Device DeviceOf(const Json* data) {
  const std::string* path = TextOf(FindMember(data, "memdev"));
  const Figure address = NumberOf(FindMember(data, "addr"));
  return {path == nullptr ? std::string_view() : IdOf(*path),
          address ? address : NumberOf(FindMember(data, "memaddr"))};
}

MemoryModule ModuleOf(const Backends& backends, const Device& device, const Json& told) {
  const std::string* type = TextOf(FindMember(&told, "type"));
  const auto backend = backends.find(device.backend);
  MemoryModule module;
  module.size = KBOf(FindMember(&told, "data"), "size");
  if (backend != backends.end()) module.block.size = backend->second;
  module.isDimm = type != nullptr && *type == "dimm";
  return module;
}

// The backend that the guest has at an address, and where QEMU has it: "Host virtual address for
// 0x0 (pc.ram) is 0x7f34efe00000".
struct Place {
  std::string backend;
  Figure address;
};

Place AskForPlace(Conversation& monitor, Figure guestAddress) {
  constexpr std::string_view kIs = ") is 0x";
  if (!guestAddress) return {};
  const std::optional<Json> answer = AskFor(
      monitor, R"({"execute":"human-monitor-command","arguments":{"command-line":"gpa2hva )" +
                   std::to_string(*guestAddress) + R"("}})");
  const std::string* text = answer ? TextOf(&*answer) : nullptr;
  if (text == nullptr) return {};
  const size_t name = text->find('(');
  const size_t is = text->find(kIs);
  uint64_t address = 0;
  std::string_view rest = *text;
  if (name > is || is == std::string::npos) return {};
  rest.remove_prefix(is + kIs.size());
  if (!ParseHex(rest.substr(0, rest.find_first_of("\r\n")), address)) return {};
  return {std::string(IdOf(text->substr(name + 1, is - name - 1))), address};
}

// Where machines begin to have their own memory.
constexpr uint64_t kMemoryStarts[] = {0, uint64_t{1} << 30, uint64_t{2} << 30};

// Where QEMU has the machine's own memory, if another backend that is no module's has its size.
Figure AskForBase(Conversation& monitor, const Backends& others, Figure size) {
  const auto isLike = [size](const auto& other) { return other.second == size; };
  if (std::ranges::count_if(others, isLike) < 2) return std::nullopt;
  for (const uint64_t start : kMemoryStarts) {
    const Place place = AskForPlace(monitor, start);
    const auto found = others.find(place.backend);
    if (found != others.end() && isLike(*found)) return place.address;
  }
  return std::nullopt;
}

// Where QEMU has what could be taken for another backend by its size.
void AskForAddresses(Conversation& monitor, Backends backends, const std::vector<Device>& devices,
                     GuestMemory& memory) {
  for (const Device& device : devices) backends.erase(std::string(device.backend));
  for (size_t i = 0; i < devices.size(); ++i) {
    MemoryBlock& block = (*memory.modules)[i].block;
    const auto isLike = [&block](const auto& other) { return other.second == block.size; };
    if (std::ranges::none_of(backends, isLike)) continue;
    const Place place = AskForPlace(monitor, devices[i].guestAddress);
    if (place.backend == devices[i].backend) block.address = place.address;
  }
  memory.baseAddress = AskForBase(monitor, backends, memory.base);
}

// Nothing is told of modules that do not add up to what there is: one may have come in between.
void AskForModules(Conversation& monitor, GuestMemory& memory) {
  // A machine has 256 slots at most.
  constexpr size_t kMostModules = 256;
  const auto summary = AskFor(monitor, R"({"execute":"query-memory-size-summary"})");
  if (!summary) return;
  memory.base = KBOf(&*summary, "base-memory");
  const auto list = AskFor(monitor, R"({"execute":"query-memory-devices"})");
  const auto objects = AskFor(monitor, R"({"execute":"query-memdev"})");
  if (!list || !objects || list->members.size() > kMostModules) return;
  const Backends backends = BackendsOf(*objects);
  std::vector<Device> devices;
  MachineMemory machine = {.base = 0, .blocks = {}, .modules = {{}}};
  for (const auto& [name, told] : list->members) {
    devices.push_back(DeviceOf(FindMember(&told, "data")));
    machine.modules->push_back(ModuleOf(backends, devices.back(), told));
  }
  const Figure plugged = KBOf(&*summary, "plugged-memory");
  if (!plugged || machine.Size() != plugged) return;
  memory.modules = std::move(machine.modules);
  AskForAddresses(monitor, backends, devices, memory);
}

void Converse(const LinuxHost& host, Channel& channel, const QemuCommandLine& line,
              GuestMemory& memory) {
  Conversation monitor(channel);
  if (!monitor.Begin()) return;
  AskForBalloon(monitor, memory);
  AskForStatistics(host, monitor, line.balloon, memory);
  if (!line.TellsMemory()) AskForModules(monitor, memory);
}

void AskRecorded(const LinuxHost& host, const QemuCommandLine& line, GuestMemory& memory) {
  std::string text;
  if (host.Read(line.monitor, text) != kOk) return;
  RecordedChannel channel(std::move(text));
  Converse(host, channel, line, memory);
}

// Whether a process listens and nobody holds its monitor: who connects to one that is held stays in
// its queue, gone or not, and takes the place of others. Where it cannot be looked up, the
// connection tells who listens.
bool IsFree(const LinuxHost& host, int32_t pid, const std::string& path) {
  int& looks = host.Kept().heldLooks;
  for (;;) {
    const Listening found = FindListener(host, pid, path).value_or(Listening::kFree);
    if (found != Listening::kHeld || looks == 0) return found == Listening::kFree;
    --looks;
    std::this_thread::sleep_for(kHeldWait);
  }
}

void AskLive(const LinuxHost& host, int32_t pid, const QemuCommandLine& line, GuestMemory& memory) {
  std::chrono::steady_clock::duration& left = host.Kept().monitorTime;
  if (left <= std::chrono::steady_clock::duration::zero()) {
    if (host.First("monitors")) {
      Warning("virtual machines: no time left to ask all of them: their balloons have no value\n");
    }
    host.Lose(KSI_STATUS_TIMEOUT);
    return;
  }
  const LinuxHost::TimePoint start = host.Now();
  const auto patience = std::min<std::chrono::steady_clock::duration>(kMonitorPatience, left);
  MonitorSocket socket(host.TimeSource(), start + patience);
  Process process;
  if (ReadProcess(host, pid, process) == kOk && process.user && IsFree(host, pid, line.monitor)) {
    errno = 0;
    if (socket.Connect(line.monitor, pid, *process.user)) Converse(host, socket, line, memory);
    host.TellShortage(line.monitor, errno);
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

bool AreCurrent(Figure sent, Figure now, Figure interval) {
  if (!sent || !now || !interval) return false;
  const uint64_t age = Less(*now, *sent) + Less(*sent, *now);  // clocks may be set
  const uint64_t most = std::min(ProductOf(interval, 2).value_or(0), kMostStatisticsAge);
  return age <= most && interval != 0u;
}

}  // namespace ksi
