// /sys/bus/nd/devices: persistent memory. A region of Linux, a range of memory in one or several
// modules, is a volume here; the namespaces into which it is divided are the volume's regions.
#include <algorithm>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/handlers.h"
#include "knvlibs/linux/host/recent.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

constexpr std::string_view kDevices = "/sys/bus/nd/devices";
// Where the memory of namespaces that is used as ordinary memory shows.
constexpr std::string_view kSystemRam = "/sys/bus/dax/drivers/kmem";

constexpr std::string_view kRegionPrefix = "region";
constexpr std::string_view kNamespacePrefix = "namespace";

constexpr uint64_t kBlock = uint64_t{2} << 20;

uint64_t BlocksOf(uint64_t bytes) { return bytes / kBlock; }

// "namespace1.0"
struct Namespace {
  uint64_t region;
  uint64_t number;

  // As the device and those made of it are numbered: "1.0"
  std::string Number() const { return std::to_string(region) + '.' + std::to_string(number); }
  std::string Name() const { return std::string(kNamespacePrefix) + Number(); }
};

struct Devices {
  std::vector<uint64_t> regions;
  std::vector<Namespace> namespaces;
};

bool ParseRegion(std::string_view name, uint64_t* region) {
  return TakePrefix(&name, kRegionPrefix) && ParseNumber(name, region);
}

bool ParseNamespace(std::string_view name, Namespace* result) {
  if (!TakePrefix(&name, kNamespacePrefix)) return false;
  const size_t dot = name.find('.');
  return dot != std::string_view::npos && ParseNumber(name.substr(0, dot), &result->region) &&
         ParseNumber(name.substr(dot + 1), &result->number);
}

Status ReadDevices(const LinuxHost& host, Devices* devices) {
  std::vector<std::string> names;
  const Status status = host.List(kDevices, LinuxHost::Entries::kAll, &names);
  // A kernel that knows no persistent memory has none.
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status != kOk) return status;
  for (const std::string& name : names) {
    uint64_t region = 0;
    Namespace space = {};
    if (ParseRegion(name, &region)) {
      devices->regions.push_back(region);
    } else if (ParseNamespace(name, &space)) {
      devices->namespaces.push_back(space);
    }
  }
  std::ranges::sort(devices->regions);
  std::ranges::sort(devices->namespaces, {},
                    [](const Namespace& space) { return std::pair(space.region, space.number); });
  return kOk;
}

std::string FileOf(std::string_view device, std::string_view file) {
  return std::string(kDevices) + '/' + std::string(device) + '/' + std::string(file);
}

// A figure that not every device has, 0 where it does not.
Status ReadNumberIfAny(const LinuxHost& host, const std::string& file, uint64_t* number) {
  *number = 0;
  const Status status = host.ReadNumber(file, number);
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

// The one line of a file, empty where the device does not have it.
Status ReadTextIfAny(const LinuxHost& host, const std::string& file, std::string* text) {
  text->clear();
  const Status status = host.Read(file, text);
  while (!text->empty() && text->back() == '\n') text->pop_back();
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

// The devices, as lately read, and the region that the first key names.
Status FindVolume(const LinuxHost& host, const Keys& keys, const Devices** devices,
                  uint64_t* region) {
  const Status status = host.Keep<Recent<Devices>>().Get(host, ReadDevices, devices);
  if (status != kOk) return status;
  const bool found =
      ParseRegion(keys[0].text, region) && std::ranges::binary_search((*devices)->regions, *region);
  return found ? kOk : KSI_STATUS_NOT_FOUND;
}

// Whether a directory is there with something in it.
bool HasEntries(const LinuxHost& host, const std::string& directory) {
  std::vector<std::string> names;
  return host.List(directory, LinuxHost::Entries::kAll, &names) == kOk && !names.empty();
}

// Whether the namespace, or what holds it, is a block device.
bool HasBlockDevice(const LinuxHost& host, std::string_view space, std::string_view holder) {
  return HasEntries(host, FileOf(space, "block")) ||
         (!holder.empty() && HasEntries(host, FileOf(holder, "block")));
}

bool IsSystemRam(const LinuxHost& host, const Namespace& space) {
  std::vector<std::string> names;
  return host.List(kSystemRam, LinuxHost::Entries::kAll, &names) == kOk &&
         std::ranges::find(names, "dax" + space.Number()) != names.end();
}

}  // namespace

Status ListVolumes(const LinuxHost& host, const Keys& /*keys*/, ParamList& instances) {
  const Devices* devices = nullptr;
  Status status = host.Keep<Recent<Devices>>().GetNew(host, ReadDevices, &devices);
  if (status != kOk) return status;
  for (const uint64_t region : devices->regions) {
    status = instances.AddText(std::string(kRegionPrefix) + std::to_string(region));
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadVolume(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const Devices* devices = nullptr;
  uint64_t region = 0;
  const Status status = FindVolume(host, keys, &devices, &region);
  return status == kOk ? Answer(buffer, KSI_PmemVolume{}) : status;
}

Status ReadRegionStore(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const Devices* devices = nullptr;
  uint64_t region = 0;
  Status status = FindVolume(host, keys, &devices, &region);
  if (status != kOk) return status;

  uint64_t size = 0;
  uint64_t available = 0;
  status = host.ReadNumber(FileOf(keys[0].text, "size"), &size);
  // Memory without labels is one namespace, and nothing of it is left to give.
  if (status == kOk) {
    status = ReadNumberIfAny(host, FileOf(keys[0].text, "available_size"), &available);
  }
  uint64_t allocated = 0;
  uint32_t total = 0;
  uint32_t free = 0;
  for (const Namespace& space : devices->namespaces) {
    if (status != kOk) return status;
    if (space.region != region) continue;
    uint64_t spaceSize = 0;
    status = host.ReadNumber(FileOf(space.Name(), "size"), &spaceSize);
    // A namespace may go between the two reads.
    if (status == KSI_STATUS_NOT_FOUND) {
      status = kOk;
      continue;
    }
    allocated += spaceSize;
    ++total;
    if (spaceSize == 0) ++free;
  }
  if (status != kOk) return status;

  KSI_PmemRegionStore record = {};
  record.alloc2MBlocks = BlocksOf(allocated);
  record.resvd2MBlocks = BlocksOf(size - std::min(size, available));
  record.avail2MBlocks = BlocksOf(available);
  record.totalRegions = total;
  record.freeRegions = free;
  record.total2MBlocks = BlocksOf(size);
  return Answer(buffer, record);
}

Status ReadIsClean(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const Devices* devices = nullptr;
  uint64_t region = 0;
  std::string badBlocks;
  Status status = FindVolume(host, keys, &devices, &region);
  if (status == kOk) {
    status = ReadTextIfAny(host, FileOf(keys[0].text, "badblocks"), &badBlocks);
  }
  if (status != kOk) return status;
  return Answer(buffer, static_cast<uint8_t>(badBlocks.empty() ? 1 : 0));
}

Status ListRegions(const LinuxHost& host, const Keys& keys, ParamList& instances) {
  const Devices* devices = nullptr;
  uint64_t region = 0;
  Status status = FindVolume(host, keys, &devices, &region);
  if (status != kOk) return status;
  for (const Namespace& space : devices->namespaces) {
    if (space.region != region) continue;
    status = instances.AddText(space.Name());
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadRegion(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const Devices* devices = nullptr;
  uint64_t region = 0;
  Namespace space = {};
  Status status = FindVolume(host, keys, &devices, &region);
  if (status != kOk) return status;
  if (!ParseNamespace(keys[1].text, &space) || space.region != region) return KSI_STATUS_NOT_FOUND;

  uint64_t size = 0;
  uint64_t readOnly = 0;
  std::string holder;
  std::string uuid;
  const std::string name = space.Name();
  status = host.ReadNumber(FileOf(name, "size"), &size);
  if (status == kOk) status = ReadTextIfAny(host, FileOf(name, "holder"), &holder);
  if (holder.find('/') != std::string::npos) return NotUnderstood(FileOf(name, "holder"), 1);
  if (status == kOk) status = ReadTextIfAny(host, FileOf(name, "uuid"), &uuid);
  if (status == kOk) {
    status = ReadNumberIfAny(host, FileOf(keys[0].text, "read_only"), &readOnly);
  }
  if (status != kOk) return status;

  KSI_PmemRegion record = {};
  record.size = size;
  record.reserved = BlocksOf(size + kBlock - 1);
  if (size != 0) record.flags |= KSI_PMEM_ALLOCATED;
  if (!holder.empty()) record.flags |= KSI_PMEM_LOCKED;
  if (readOnly != 0) record.flags |= KSI_PMEM_READ_ONLY;
  if (HasBlockDevice(host, name, holder)) record.flags |= KSI_PMEM_BLOCK_DEVICE;
  if (!uuid.empty()) record.flags |= KSI_PMEM_PERSISTENT_RESERVATION;
  if (IsSystemRam(host, space)) record.flags |= KSI_PMEM_SYSTEM;
  return Answer(buffer, record);
}

}  // namespace ksi
