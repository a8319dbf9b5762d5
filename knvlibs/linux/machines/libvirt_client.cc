#include "knvlibs/linux/machines/libvirt_client.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <string_view>

#include "knvlibs/linux/host/file_descriptor.h"
#include "knvlibs/linux/machines/domain_xml.h"

namespace ksi {
namespace {

constexpr size_t kMostModules = 256;
constexpr size_t kMostDomains = 4096;

// What the child says: one message for each domain, and one at the end. Both ends are this file.
struct Message {
  struct Module {
    uint64_t size;
    uint64_t block;
    uint64_t isDimm;
  };

  uint64_t isDomain;
  uint64_t end;  // LibvirtAnswer::End
  std::array<char, 256> name;
  std::array<char, 40> uuid;
  uint64_t actual;
  uint64_t available;
  uint64_t usable;
  uint64_t lastUpdate;
  uint64_t period;
  uint64_t moduleCount;  // all ones if they are not known
  std::array<Module, kMostModules> modules;
};

// What is used of libvirt's documented interface, by its names there.
struct Library {
  struct Stat {
    int tag;
    unsigned long long value;
  };
  // Tags of virDomainMemoryStats.
  enum : int { kAvailable = 5, kActualBalloon = 6, kUsable = 8, kLastUpdate = 9 };
  static constexpr unsigned kActive = 1;  // of virConnectListAllDomains

  void (*virSetErrorFunc)(void* data, void (*handler)(void* data, void* error));
  void* (*virConnectOpenReadOnly)(const char* uri);
  int (*virConnectListAllDomains)(void* connection, void*** domains, unsigned flags);
  const char* (*virDomainGetName)(void* domain);
  int (*virDomainGetUUIDString)(void* domain, char* text);
  int (*virDomainMemoryStats)(void* domain, Stat* stats, unsigned count, unsigned flags);
  char* (*virDomainGetXMLDesc)(void* domain, unsigned flags);

  // False if it is not installed, or lacks something.
  bool Load(const char* name) {
    void* library = dlopen(name, RTLD_NOW | RTLD_LOCAL);
    return library != nullptr && Find(library, "virSetErrorFunc", virSetErrorFunc) &&
           Find(library, "virConnectOpenReadOnly", virConnectOpenReadOnly) &&
           Find(library, "virConnectListAllDomains", virConnectListAllDomains) &&
           Find(library, "virDomainGetName", virDomainGetName) &&
           Find(library, "virDomainGetUUIDString", virDomainGetUUIDString) &&
           Find(library, "virDomainMemoryStats", virDomainMemoryStats) &&
           Find(library, "virDomainGetXMLDesc", virDomainGetXMLDesc);
  }

  template <class Function>
  static bool Find(void* library, const char* name, Function& function) {
    function = reinterpret_cast<Function>(dlsym(library, name));
    return function != nullptr;
  }
};

// The child.

void Say(int out, const Message& message) {
  const char* at = reinterpret_cast<const char*>(&message);
  for (size_t left = sizeof message; left > 0;) {
    const ssize_t count = write(out, at, left);
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) _exit(1);
    at += count;
    left -= static_cast<size_t>(count);
  }
}

void SayEnd(int out, LibvirtAnswer::End end) {
  Message message = {};
  message.end = static_cast<uint64_t>(end);
  Say(out, message);
}

void FillStats(const Library& library, void* domain, Message& message) {
  std::array<Library::Stat, 32> stats = {};
  const int count =
      library.virDomainMemoryStats(domain, stats.data(), static_cast<unsigned>(stats.size()), 0);
  for (size_t i = 0; i < stats.size() && static_cast<int>(i) < count; ++i) {
    const uint64_t value = stats[i].value;
    if (stats[i].tag == Library::kActualBalloon) message.actual = value;
    if (stats[i].tag == Library::kAvailable) message.available = value;
    if (stats[i].tag == Library::kUsable) message.usable = value;
    if (stats[i].tag == Library::kLastUpdate) message.lastUpdate = value;
  }
}

void FillXml(const Library& library, void* domain, Message& message) {
  const char* text = library.virDomainGetXMLDesc(domain, 0);
  const DomainXml xml = ParseDomainXml(text == nullptr ? "" : text);
  message.period = FieldOf(xml.period);
  if (!xml.modules || xml.modules->size() > kMostModules) return;
  message.moduleCount = xml.modules->size();
  std::ranges::transform(*xml.modules, message.modules.begin(), [](const MemoryModule& module) {
    return Message::Module{FieldOf(module.size), FieldOf(module.block.size),
                           module.isDimm ? 1u : 0u};
  });
}

void SayDomain(const Library& library, void* domain, int out) {
  Message message = {};
  message.isDomain = 1;
  message.actual = message.available = message.usable = kNoValue;
  message.lastUpdate = message.period = message.moduleCount = kNoValue;
  const char* name = library.virDomainGetName(domain);
  std::array<char, 64> uuid = {};
  if (name == nullptr || std::strlen(name) >= message.name.size() ||
      library.virDomainGetUUIDString(domain, uuid.data()) != 0) {
    return;
  }
  std::memcpy(message.name.data(), name, std::strlen(name));
  std::memcpy(message.uuid.data(), uuid.data(), message.uuid.size() - 1);
  FillStats(library, domain, message);
  FillXml(library, domain, message);
  Say(out, message);
}

LibvirtAnswer::End SayDomains(const char* name, const char* uri, int out) {
  Library library = {};
  if (!library.Load(name)) return LibvirtAnswer::End::kNoLibrary;
  library.virSetErrorFunc(nullptr, [](void*, void*) {});
  void* connection = library.virConnectOpenReadOnly(uri);
  if (connection == nullptr) return LibvirtAnswer::End::kNoConnection;
  void** domains = nullptr;
  const int count = library.virConnectListAllDomains(connection, &domains, Library::kActive);
  if (count < 0) return LibvirtAnswer::End::kNoConnection;
  for (int i = 0; i < count; ++i) SayDomain(library, domains[i], out);
  return LibvirtAnswer::End::kWhole;
}

// All that it has goes with the process.
[[noreturn]] void RunChild(const char* library, const char* uri, int out, pid_t parent) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (getppid() != parent) _exit(1);
  const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
  for (int standard = 0; standard <= 2; ++standard) {
    if (standard != out) dup2(null, standard);
  }
  try {
    SayEnd(out, SayDomains(library, uri, out));
  } catch (...) {
    _exit(1);
  }
  _exit(0);
}

// The parent.

// The child, which has ended when this goes.
class Child {
 public:
  explicit Child(pid_t pid) : pid_(pid) {}
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;
  ~Child() {
    kill(pid_, SIGKILL);
    while (waitpid(pid_, nullptr, 0) < 0 && errno == EINTR) {
    }
  }

 private:
  pid_t pid_;
};

bool Receive(int in, LinuxHost::Clock clock, LinuxHost::TimePoint deadline, Message& message) {
  char* at = reinterpret_cast<char*>(&message);
  for (size_t left = sizeof message; left > 0;) {
    const auto time = std::chrono::ceil<std::chrono::milliseconds>(deadline - clock());
    pollfd wait = {in, POLLIN, 0};
    if (time.count() <= 0) return false;
    const int ready = poll(&wait, 1, static_cast<int>(time.count()));
    if (ready < 0 && errno == EINTR) continue;
    const ssize_t count = ready > 0 ? read(in, at, left) : 0;
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) return false;
    at += count;
    left -= static_cast<size_t>(count);
  }
  return true;
}

Figure FigureOf(uint64_t field) { return field == kNoValue ? Figure() : Figure(field); }

template <size_t size>
std::string TextOf(const std::array<char, size>& field) {
  return {field.data(), strnlen(field.data(), size)};
}

LibvirtDomain DomainOf(const Message& message) {
  LibvirtDomain domain;
  domain.name = TextOf(message.name);
  domain.uuid = TextOf(message.uuid);
  domain.actual = FigureOf(message.actual);
  domain.available = FigureOf(message.available);
  domain.usable = FigureOf(message.usable);
  domain.lastUpdate = FigureOf(message.lastUpdate);
  domain.period = FigureOf(message.period);
  if (message.moduleCount > kMostModules) return domain;
  domain.modules.emplace();
  for (size_t i = 0; i < message.moduleCount; ++i) {
    const Message::Module& module = message.modules[i];
    domain.modules->push_back(
        {FigureOf(module.size), {FigureOf(module.block), {}}, module.isDimm == 1});
  }
  return domain;
}

}  // namespace

LibvirtAnswer AskLibvirt(const char* library, const char* uri, LinuxHost::Clock clock,
                         LinuxHost::TimePoint deadline) {
  LibvirtAnswer answer;
  std::array<int, 2> ends = {};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) return answer;
  const FileDescriptor in(ends[0]);
  FileDescriptor out(ends[1]);
  const pid_t parent = getpid();
  const pid_t pid = fork();
  if (pid < 0) return answer;
  if (pid == 0) RunChild(library, uri, out.Get(), parent);
  const Child child(pid);
  out = FileDescriptor();
  Message message = {};
  while (answer.domains.size() < kMostDomains && Receive(in.Get(), clock, deadline, message)) {
    if (message.isDomain == 1) {
      answer.domains.push_back(DomainOf(message));
    } else {
      answer.end = static_cast<LibvirtAnswer::End>(std::min<uint64_t>(message.end, 3));
      break;
    }
  }
  return answer;
}

}  // namespace ksi
