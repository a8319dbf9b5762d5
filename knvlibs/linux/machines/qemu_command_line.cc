#include "knvlibs/linux/machines/qemu_command_line.h"

#include <algorithm>
#include <optional>
#include <string_view>
#include <unordered_map>
#include <unordered_set>

#include "knvlibs/json.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

struct Property {
  std::string name;
  std::string value;
};
using Properties = std::vector<Property>;

// Null if there is no such property.
const std::string* Find(const Properties& properties, std::string_view name) {
  const auto found = std::ranges::find(properties, name, &Property::name);
  return found == properties.end() ? nullptr : &found->value;
}

std::string FindOrEmpty(const Properties& properties, std::string_view name) {
  const std::string* value = Find(properties, name);
  return value == nullptr ? std::string() : *value;
}

// "socket,id=monitor,path=/run/web,server=on": a first part without '=' is the value of `implied`.
// A comma within a value is written twice.
Properties ParseProperties(std::string_view text, std::string_view implied) {
  Properties properties;
  for (bool first = true; !text.empty(); first = false) {
    std::string part;
    while (!text.empty()) {
      const char c = text.front();
      text.remove_prefix(1);
      if (c == ',' && !TakePrefix(text, ",")) break;
      part.push_back(c);
    }
    const size_t equals = part.find('=');
    if (equals != std::string::npos) {
      properties.push_back({part.substr(0, equals), part.substr(equals + 1)});
    } else if (first) {
      properties.push_back({std::string(implied), part});
    } else {
      properties.push_back({part, "on"});
    }
  }
  return properties;
}

// The same written as JSON.
Properties ParseJsonProperties(std::string_view text) {
  Properties properties;
  const std::optional<Json> json = ParseJson(text);
  if (!json || json->kind != Json::Kind::kObject) return properties;
  for (const auto& [name, value] : json->members) properties.push_back({name, value.text});
  return properties;
}

Properties ParseEither(std::string_view text, std::string_view implied) {
  return text.starts_with('{') ? ParseJsonProperties(text) : ParseProperties(text, implied);
}

// "4096", "4G", "4194304k" in KB; without a suffix in units of `plainShift` bits.
Figure ParseSize(std::string_view text, int plainShift) {
  constexpr std::string_view kSuffixes = "BKMGTPE";
  int shift = plainShift;
  if (!text.empty() && (text.back() < '0' || text.back() > '9')) {
    const char letter = text.back();
    const size_t power = kSuffixes.find(
        letter >= 'a' && letter <= 'z' ? static_cast<char>(letter - 'a' + 'A') : letter);
    if (power == std::string_view::npos) return std::nullopt;
    shift = static_cast<int>(power) * 10;
    text.remove_suffix(1);
  }
  uint64_t number = 0;
  if (!ParseNumber(text, number)) return std::nullopt;
  return shift < 10 ? Figure(number >> 10) : ProductOf(number, uint64_t{1} << (shift - 10));
}

constexpr int kMegabytes = 20;
constexpr int kBytes = 0;

struct Backend {
  std::string id;
  Figure size;
};

// A socket that may answer QMP.
struct Monitor {
  std::string path;
  bool waitsForClient = false;
};

// The parts of a command line that have to do with one another.
struct Parts {
  Properties memory;
  std::vector<Backend> backends;
  std::unordered_set<std::string> nodes;  // ids of backends that are memory of the machine itself
  std::vector<Properties> devices;
  std::vector<Properties> sockets;
  std::vector<std::string> monitors;  // ids of character devices
  Monitor monitor;                    // named by -qmp itself
  std::string accelerators;           // "kvm:tcg", the first that works is taken
  bool hasConfig = false;             // there are options in a file
};

bool IsOn(const Properties& properties, std::string_view name) {
  const std::string value = FindOrEmpty(properties, name);
  return value == "on" || value == "yes" || value == "true" || value == "y";
}

bool IsOff(const Properties& properties, std::string_view name) {
  const std::string value = FindOrEmpty(properties, name);
  return value == "off" || value == "no" || value == "false" || value == "n";
}

// "path=/run/web.qmp,server=on": a server waits for its first client unless it is told not to.
Monitor MonitorOf(const Properties& socket) {
  const bool isToldNotTo = IsOff(socket, "wait") || IsOn(socket, "nowait");
  return {FindOrEmpty(socket, "path"), IsOn(socket, "server") && !isToldNotTo};
}

// "unix:/run/web.qmp,server=on"
Monitor MonitorAt(std::string_view address) {
  if (!TakePrefix(address, "unix:")) return {};
  return MonitorOf(ParseProperties(address, "path"));
}

void Take(std::string_view option, const std::string& value, Parts& parts, QemuCommandLine& line) {
  if (option == "name") {
    const Properties name = ParseProperties(value, "guest");
    line.name = FindOrEmpty(name, "guest");
  } else if (option == "uuid") {
    line.uuid = value;
  } else if (option == "m") {
    parts.memory = ParseProperties(value, "size");
  } else if (option == "object") {
    const Properties object = ParseEither(value, "qom-type");
    if (FindOrEmpty(object, "qom-type").starts_with("memory-backend-")) {
      parts.backends.push_back(
          {FindOrEmpty(object, "id"), ParseSize(FindOrEmpty(object, "size"), kBytes)});
    }
  } else if (option == "device") {
    parts.devices.push_back(ParseEither(value, "driver"));
  } else if (option == "chardev") {
    parts.sockets.push_back(ParseProperties(value, "backend"));
  } else if (option == "mon") {
    const Properties monitor = ParseProperties(value, "chardev");
    if (FindOrEmpty(monitor, "mode") == "control") {
      parts.monitors.push_back(FindOrEmpty(monitor, "chardev"));
    }
  } else if (option == "accel") {
    parts.accelerators += FindOrEmpty(ParseProperties(value, "accel"), "accel") + ':';
  } else if (option == "machine" || option == "M") {
    const Properties machine = ParseProperties(value, "type");
    parts.accelerators += FindOrEmpty(machine, "accel") + ':';
    parts.nodes.insert(FindOrEmpty(machine, "memory-backend"));
  } else if (option == "numa") {
    parts.nodes.insert(FindOrEmpty(ParseEither(value, "type"), "memdev"));
  } else if (option == "readconfig") {
    parts.hasConfig = true;
  } else if (option == "qmp" || option == "qmp-pretty") {
    if (parts.monitor.path.empty()) parts.monitor = MonitorAt(value);
    parts.monitors.push_back(value);  // or the id of a character device
  }
}

// The driver of a device for plugged memory; "virtio-mem-pci" and "-ccw" are both virtio-mem.
bool IsModule(const std::string& driver) {
  return driver == "pc-dimm" || driver == "nvdimm" || driver.starts_with("virtio-mem-") ||
         driver.starts_with("virtio-pmem-");
}

MemoryModule ModuleOf(const Properties& device, Figure block) {
  const std::string driver = FindOrEmpty(device, "driver");
  MemoryModule module = {.size = block, .block = {block, {}}, .isDimm = driver == "pc-dimm"};
  // How much of it the guest has is agreed upon while it runs.
  if (driver.starts_with("virtio-mem-")) module.size.reset();
  const std::string* label = Find(device, "label-size");
  if (driver == "nvdimm" && label != nullptr) {
    module.size = DifferenceOf(block, ParseSize(*label, kBytes));
  }
  return module;
}

// More than QEMU has nodes and slots for.
constexpr size_t kMostBackends = 512;

// The first device of each backend.
std::unordered_map<std::string, const Properties*> DevicesByBackend(const Parts& parts) {
  std::unordered_map<std::string, const Properties*> devices;
  for (const Properties& device : parts.devices) {
    if (const std::string* backend = Find(device, "memdev")) devices.emplace(*backend, &device);
  }
  return devices;
}

// Whether a backend that no device has is memory of the machine itself. What a file says of that is
// not known.
bool IsNode(const Parts& parts, const Backend& backend) {
  return parts.hasConfig || parts.nodes.contains(backend.id);
}

void FindMemory(const Parts& parts, QemuCommandLine& line) {
  MachineMemory& memory = line.memory;
  if (parts.backends.size() > kMostBackends) {
    memory.modules.reset();
    return;
  }
  memory.base = ParseSize(FindOrEmpty(parts.memory, "size"), kMegabytes);
  // Memory of the machine itself may be cut into backends, one for each of its NUMA nodes.
  std::vector<MemoryBlock> nodes;
  Figure nodesSize = 0;
  const auto devices = DevicesByBackend(parts);
  for (const Backend& backend : parts.backends) {
    const auto device = devices.find(backend.id);
    if (device != devices.end()) {
      if (!IsModule(FindOrEmpty(*device->second, "driver"))) continue;
      memory.modules->push_back(ModuleOf(*device->second, backend.size));
    } else if (IsNode(parts, backend)) {
      nodes.push_back({backend.size, {}});
      nodesSize = SumOf({nodesSize, backend.size});
    } else {
      line.hasSpares = true;
    }
  }
  if (memory.base) {
    memory.blocks = nodesSize == memory.base ? nodes : std::vector<MemoryBlock>{{memory.base, {}}};
  }
  const std::string* maximum = Find(parts.memory, "maxmem");
  line.maxMemory = maximum == nullptr ? memory.Size() : ParseSize(*maximum, kMegabytes);
}

void FindMonitor(const Parts& parts, QemuCommandLine& line) {
  // The name that libvirt gives it.
  line.isOfLibvirt = std::ranges::find(parts.monitors, "charmonitor") != parts.monitors.end();
  Monitor monitor = parts.monitor;
  for (const Properties& socket : parts.sockets) {
    const std::string id = FindOrEmpty(socket, "id");
    if (monitor.path.empty() && FindOrEmpty(socket, "backend") == "socket" &&
        std::ranges::find(parts.monitors, id) != parts.monitors.end()) {
      monitor = MonitorOf(socket);
    }
  }
  // A path that is relative is so to a directory that only QEMU knows.
  if (!monitor.path.starts_with('/')) return;
  line.monitor = monitor.path;
  line.waitsForClient = monitor.waitsForClient;
}

// Where KVM is one of several, whether it works settles it.
std::optional<bool> FindKvm(const std::vector<std::string>& words, const Parts& parts) {
  const auto isWord = [&](std::string_view word) {
    return std::ranges::find(words, word) != words.end();
  };
  if (isWord("-enable-kvm") || isWord("--enable-kvm")) return true;
  std::string accelerators = parts.accelerators;
  std::erase(accelerators, ':');
  if (accelerators == "kvm") return true;
  // By another name it may stand for a program with other defaults.
  const bool isPlain = words[0].find("qemu-system-") != std::string::npos && !parts.hasConfig;
  if (!isPlain || accelerators.find("kvm") != std::string::npos) return std::nullopt;
  return false;
}

}  // namespace

bool QemuCommandLine::MayChange() const {
  return !memory.modules->empty() || maxMemory != memory.base;
}

bool IsQemu(const std::vector<std::string>& words) {
  if (words.empty()) return false;
  const std::string_view program = std::string_view(words[0]).substr(words[0].rfind('/') + 1);
  return program.starts_with("qemu-system-") || program == "qemu-kvm" || program == "kvm";
}

QemuCommandLine ParseQemuCommandLine(const std::vector<std::string>& words) {
  QemuCommandLine line;
  Parts parts;
  for (size_t i = 1; i + 1 < words.size(); ++i) {
    std::string_view option = words[i];
    if (!TakePrefix(option, "-")) continue;
    TakePrefix(option, "-");
    Take(option, words[i + 1], parts, line);
  }
  FindMemory(parts, line);
  FindMonitor(parts, line);
  line.usesKvm = FindKvm(words, parts);
  for (const Properties& device : parts.devices) {
    if (!FindOrEmpty(device, "driver").starts_with("virtio-balloon")) continue;
    line.hasBalloon = true;
    line.balloon = FindOrEmpty(device, "id");
  }
  return line;
}

}  // namespace ksi
