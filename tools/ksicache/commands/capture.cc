// capture: records every node and instance of a Linux host.
//
// The host is walked object by object, an object being what a path of keys selects: the host
// itself, a group, a client, a remap type of a client. Of each, every node that takes such keys is
// read and listed, and the instances so found are the objects to come. A read that fails is
// recorded with its status, so that nothing stops a capture and a captured host answers as it did.
#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <set>
#include <string>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/catalogue.h"
#include "knvlibs/linux/linux_source.h"
#include "knvlibs/node_table.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/progress.h"

namespace ksicache {
namespace {

constexpr int64_t kRootGroup = 0;

// More memory nodes than any machine has.
constexpr uint32_t kMostMemNodes = 1024;

// A key of an object, with what it names.
struct ObjectKey {
  ksi::Instance instance = ksi::Instance::kNone;
  int64_t number = 0;
  std::string text;

  friend auto operator<=>(const ObjectKey&, const ObjectKey&) = default;
};

using Object = std::array<ObjectKey, ksi::kMaxKeys>;

ObjectKey NumberKey(ksi::Instance instance, int64_t number) { return {instance, number, {}}; }
ObjectKey TextKey(ksi::Instance instance, std::string_view text) {
  return {instance, 0, std::string(text)};
}

ksi::Keying KeyingOf(const Object& object) {
  ksi::Keying keying;
  for (size_t i = 0; i < object.size(); ++i) keying.at[i] = object[i].instance;
  return keying;
}

ksi::Keys KeysOf(const Object& object) {
  ksi::Keys keys;
  for (const ObjectKey& key : object) {
    if (key.instance == ksi::Instance::kNone) break;
    keys.at[keys.count++] = {ksi::KindOf(key.instance), key.number, key.text};
  }
  return keys;
}

// Whether some node takes such keys.
bool IsKeying(const ksi::Keying& keying) {
  return std::ranges::any_of(ksi::Catalogue(), [&](const ksi::Node& node) {
    return node.HasValue() && node.valueKeys == keying;
  });
}

class Walk {
 public:
  Walk(ksi::Source& source, CacheWriter& writer) : source_(source), writer_(writer) {}

  void Run() {
    Find({});
    for (const std::string_view state : ksi::kMemoryStates) {
      Find({TextKey(ksi::Instance::kState, state)});
    }
    Find({NumberKey(ksi::Instance::kGroup, kRootGroup)});
    Progress progress("capturing");
    size_t done = 0;
    while (!toRead_.empty()) {
      progress.Show(done, done + toRead_.size());
      const Object object = std::move(toRead_.back());
      toRead_.pop_back();
      Read(object);
      ++done;
    }
  }

 private:
  void Find(const Object& object) {
    if (found_.insert(object).second) toRead_.push_back(object);
  }

  void Read(const Object& object) {
    const ksi::Keying keying = KeyingOf(object);
    const ksi::Keys keys = KeysOf(object);
    for (const ksi::Node& node : ksi::Catalogue()) {
      if (node.HasValue() && node.valueKeys == keying) ReadValue(node, keys);
      if (node.HasList() && node.listKeys == keying) ReadList(node, keys, object);
    }
  }

  void ReadValue(const ksi::Node& node, const ksi::Keys& keys) {
    std::array<std::byte, ksi::kMaxRecordSize> buffer = {};
    const ksi::Buffer record = ksi::Buffer(buffer).first(node.recordSize);
    const ksi::Status status = source_.Value(node, keys, record);
    if (status != ksi::kOk) {
      writer_.AddFailure(node, ksi::Kind::kValue, keys, status);
      return;
    }
    writer_.AddValue(node, keys, record);
    FindInValue(node, record);
  }

  // Objects that a value, and no list, leads to.
  void FindInValue(const ksi::Node& node, ksi::Buffer record) {
    switch (ksi::IdOf(node)) {
      case ksi::node::sched_groups_groupLeaderID:
      case ksi::node::worldGroups_vmmLeaderID: {
        int32_t client = 0;
        std::memcpy(&client, record.data(), sizeof client);
        Find({NumberKey(ksi::Instance::kClient, client)});
        break;
      }
      case ksi::node::memory_memInfo: {
        KSI_MemInfo info;
        std::memcpy(&info, record.data(), sizeof info);
        for (uint32_t i = 0; i < info.numNodes && i < kMostMemNodes; ++i) {
          Find({NumberKey(ksi::Instance::kMemNode, i)});
        }
        break;
      }
      default:
        break;
    }
  }

  void ReadList(const ksi::Node& node, const ksi::Keys& keys, const Object& object) {
    ksi::ParamList instances(ksi::ParamList::kNoLimit);
    const ksi::Status status = source_.Instances(node, keys, instances);
    if (status != ksi::kOk) {
      writer_.AddFailure(node, ksi::Kind::kList, keys, status);
      return;
    }
    std::vector<ksi::Key> entries(instances.Count());
    for (size_t i = 0; i < entries.size(); ++i) {
      entries[i].kind = instances.Kind(i);
      if (entries[i].kind == ksi::KeyKind::kNumber) {
        entries[i].number = static_cast<int64_t>(instances.Number(i));
      } else {
        entries[i].text = instances.Text(i);
      }
    }
    writer_.AddList(node, keys, entries);

    // An instance stands below the object that lists it, such as a client's remap type, or for
    // itself, such as a group's child group.
    ksi::Keying below = node.listKeys;
    if (below.Count() < ksi::kMaxKeys) below.at[below.Count()] = node.entries;
    const bool isBelow = !(below == node.listKeys) && IsKeying(below);
    // The last one found is read next, so the order is kept by going backwards.
    for (size_t i = instances.Count(); i-- > 0;) {
      const ObjectKey key = ksi::KindOf(node.entries) == ksi::KeyKind::kNumber
                                ? NumberKey(node.entries, static_cast<int64_t>(instances.Number(i)))
                                : TextKey(node.entries, instances.Text(i));
      Object found;
      if (isBelow) found = object;
      found[isBelow ? node.listKeys.Count() : 0] = key;
      Find(found);
      if (node.entries == ksi::Instance::kBuddy) FindMemNodeOf(key.text);
    }
  }

  // A buddy's name holds the number of its memory node: "memmap-00-lo".
  void FindMemNodeOf(const std::string& buddy) {
    constexpr std::string_view kPrefix = "memmap-";
    if (!buddy.starts_with(kPrefix)) return;
    const int64_t number = std::strtol(buddy.c_str() + kPrefix.size(), nullptr, 10);
    Find({NumberKey(ksi::Instance::kMemNode, number)});
  }

  ksi::Source& source_;
  CacheWriter& writer_;
  std::vector<Object> toRead_;
  std::set<Object> found_;
};

std::string Now() {
  const time_t now = time(nullptr);
  struct tm parts;
  gmtime_r(&now, &parts);
  std::array<char, 32> text;
  return {text.data(), strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts)};
}

std::string HostName(const ksi::LinuxHost& host) {
  std::string name;
  if (host.Read("/proc/sys/kernel/hostname", &name) != ksi::kOk) return "unknown";
  while (!name.empty() && name.back() == '\n') name.pop_back();
  return name;
}

void CheckRoot(const std::string& root) {
  ksi::LinuxHost host(root);
  std::string content;
  const ksi::Status status = host.Read("/proc/meminfo", &content);
  if (status == KSI_STATUS_NOT_FOUND) {
    throw Error(root + ": is not the root of a Linux host: it has no proc/meminfo");
  }
}

constexpr Option kRoot = {"root", "DIR", "capture the host whose files are recorded below DIR"};
constexpr const Option* kOptions[] = {&kForce, &kMode, &kRoot};

int Capture(const CommandLine& line) {
  const std::string& fileName = line.arguments[0];
  const std::string* given = line.ValueOf(kRoot);
  const std::string root = given == nullptr ? "/" : *given;
  CheckRoot(root);
  CacheWriter writer(fileName, line.Has(kForce), ModeOf(line));
  ksi::LinuxSource source(root);
  const std::string taken = Now();
  Walk(source, writer).Run();
  const ksi::Definitions definitions = source.KernelDefinitions();
  const std::string host = HostName(source.Host());
  writer.Commit({std::string(definitions.signature), std::string(definitions.built), host, taken});
  PrintLine(fileName + ": " + std::to_string(writer.Values()) + " values and " +
            std::to_string(writer.Lists()) + " lists of " + host);
  return 0;
}

}  // namespace

const Command kCapture = {
    .name = "capture",
    .arguments = "FILE",
    .summary = "record every node and instance of this Linux host in FILE",
    .help = R"(Records every node and every instance of this Linux host in FILE. What a user may
not read fails with its status, and so it does in the file; the superuser sees
most.
)",
    .options = kOptions,
    .fewest = 1,
    .most = 1,
    .run = Capture,
};

}  // namespace ksicache
