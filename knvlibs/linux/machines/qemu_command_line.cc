#include "knvlibs/linux/machines/qemu_command_line.h"

#include <algorithm>
#include <optional>
#include <string_view>

#include "knvlibs/linux/host/json.h"
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
      if (c == ',' && !TakePrefix(&text, ",")) break;
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
  if (!json) return properties;
  const auto* object = std::get_if<Json::Object>(&json->value);
  if (object == nullptr) return properties;
  for (size_t i = 0; i < object->names.size(); ++i) {
    const Json& member = object->values[i];
    if (const std::string* word = member.Text()) {
      properties.push_back({object->names[i], *word});
    } else if (const auto* number = std::get_if<Json::Number>(&member.value)) {
      properties.push_back({object->names[i], number->text});
    }
  }
  return properties;
}

Properties ParseEither(std::string_view text, std::string_view implied) {
  return text.starts_with('{') ? ParseJsonProperties(text) : ParseProperties(text, implied);
}

// "4096", "4G", "4194304k" in KB; without a suffix in units of `plainShift` bits. All ones if it is
// not understood.
uint64_t ParseSize(std::string_view text, int plainShift) {
  constexpr std::string_view kSuffixes = "BKMGTPE";
  int shift = plainShift;
  if (!text.empty() && (text.back() < '0' || text.back() > '9')) {
    const char letter = text.back();
    const size_t power = kSuffixes.find(
        letter >= 'a' && letter <= 'z' ? static_cast<char>(letter - 'a' + 'A') : letter);
    if (power == std::string_view::npos) return kNoValue;
    shift = static_cast<int>(power) * 10;
    text.remove_suffix(1);
  }
  uint64_t number = 0;
  if (!ParseNumber(text, &number)) return kNoValue;
  if (shift < 10) return number >> 10;
  shift -= 10;
  return number > (kNoValue >> shift) ? kNoValue : number << shift;
}

constexpr int kMegabytes = 20;
constexpr int kBytes = 0;

struct Backend {
  std::string id;
  uint64_t size;
};

// The parts of a command line that have to do with one another.
struct Parts {
  Properties memory;
  std::vector<Backend> backends;
  std::vector<Properties> devices;
  std::vector<Properties> sockets;
  std::vector<std::string> monitors;  // ids of character devices
};

// "unix:/run/web.qmp,server=on"
std::string SocketOf(std::string_view address) {
  if (!TakePrefix(&address, "unix:")) return {};
  return FindOrEmpty(ParseProperties(address, "path"), "path");
}

void Take(std::string_view option, const std::string& value, Parts* parts, QemuCommandLine* line) {
  if (option == "name") {
    const Properties name = ParseProperties(value, "guest");
    line->name = FindOrEmpty(name, "guest");
  } else if (option == "m") {
    parts->memory = ParseProperties(value, "size");
  } else if (option == "object") {
    const Properties object = ParseEither(value, "qom-type");
    if (FindOrEmpty(object, "qom-type").starts_with("memory-backend-")) {
      parts->backends.push_back(
          {FindOrEmpty(object, "id"), ParseSize(FindOrEmpty(object, "size"), kBytes)});
    }
  } else if (option == "device") {
    parts->devices.push_back(ParseEither(value, "driver"));
  } else if (option == "chardev") {
    parts->sockets.push_back(ParseProperties(value, "backend"));
  } else if (option == "mon") {
    const Properties monitor = ParseProperties(value, "chardev");
    if (FindOrEmpty(monitor, "mode") == "control") {
      parts->monitors.push_back(FindOrEmpty(monitor, "chardev"));
    }
  } else if (option == "qmp" || option == "qmp-pretty") {
    if (line->monitor.empty()) line->monitor = SocketOf(value);
    parts->monitors.push_back(value);  // or the id of a character device
  }
}

void FindMemory(const Parts& parts, QemuCommandLine* line) {
  line->memory = ParseSize(FindOrEmpty(parts.memory, "size"), kMegabytes);
  if (line->memory == kNoValue) return;
  line->blocks.push_back(line->memory);
  const uint64_t start = line->memory;
  // Memory of the machine itself may be cut into backends, one for each of its NUMA nodes.
  std::vector<uint64_t> nodes;
  uint64_t nodesSize = 0;
  for (const Backend& backend : parts.backends) {
    const auto isOurs = [&](const Properties& device) {
      return FindOrEmpty(device, "memdev") == backend.id;
    };
    const auto device = std::ranges::find_if(parts.devices, isOurs);
    if (device == parts.devices.end()) {
      nodes.push_back(backend.size);
      nodesSize = SumOf(nodesSize, backend.size);
    } else if (FindOrEmpty(*device, "driver") == "pc-dimm") {
      line->memory = SumOf(line->memory, backend.size);
      line->blocks.push_back(backend.size);
    }
  }
  if (nodesSize == start) {
    line->blocks.erase(line->blocks.begin());
    line->blocks.insert(line->blocks.begin(), nodes.begin(), nodes.end());
  }
  const std::string* maximum = Find(parts.memory, "maxmem");
  line->maxMemory = maximum == nullptr ? line->memory : ParseSize(*maximum, kMegabytes);
}

void FindMonitor(const Parts& parts, QemuCommandLine* line) {
  for (const Properties& socket : parts.sockets) {
    const std::string id = FindOrEmpty(socket, "id");
    if (line->monitor.empty() && FindOrEmpty(socket, "backend") == "socket" &&
        std::ranges::find(parts.monitors, id) != parts.monitors.end()) {
      line->monitor = FindOrEmpty(socket, "path");
    }
  }
  // A path that is relative is so to a directory that only QEMU knows.
  if (!line->monitor.starts_with('/')) line->monitor.clear();
}

}  // namespace

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
    if (!TakePrefix(&option, "-")) continue;
    TakePrefix(&option, "-");
    Take(option, words[i + 1], &parts, &line);
  }
  FindMemory(parts, &line);
  FindMonitor(parts, &line);
  for (const Properties& device : parts.devices) {
    if (!FindOrEmpty(device, "driver").starts_with("virtio-balloon")) continue;
    line.hasBalloon = true;
    line.balloon = FindOrEmpty(device, "id");
  }
  return line;
}

}  // namespace ksi
