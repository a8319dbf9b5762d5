#include "knvlibs/linux/pmem/nvdimm.h"

#include <algorithm>
#include <string_view>
#include <utility>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

constexpr std::string_view kDevices = "/sys/bus/nd/devices";
// Where the memory of namespaces that is used as ordinary memory shows.
constexpr std::string_view kSystemRam = "/sys/bus/dax/drivers/kmem";

constexpr uint64_t kBlock = uint64_t{2} << 20;

uint64_t BlocksOf(uint64_t bytes) { return bytes / kBlock; }

std::string RegionName(uint64_t region) { return "region" + std::to_string(region); }

bool ParseRegion(std::string_view name, uint64_t& region) {
  return TakePrefix(name, "region") && ParseNumber(name, region);
}

bool ParseNamespace(std::string_view name, NvdimmNamespace& space) {
  if (!TakePrefix(name, "namespace")) return false;
  const size_t dot = name.find('.');
  return dot != std::string_view::npos && ParseNumber(name.substr(0, dot), space.region) &&
         ParseNumber(name.substr(dot + 1), space.number);
}

std::string FileOf(std::string_view device, std::string_view file) {
  return std::string(kDevices) + '/' + std::string(device) + '/' + std::string(file);
}

// The one line of a file, empty where the device does not have it.
Status ReadTextIfAny(const LinuxHost& host, const std::string& file, std::string& text) {
  text.clear();
  const Status status = host.Read(file, text);
  while (!text.empty() && text.back() == '\n') text.pop_back();
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

// The devices, and the region that the first key names.
Status FindVolume(const LinuxHost& host, const Keys& keys, const NvdimmDevices*& devices,
                  uint64_t& region) {
  const Status status = host.Kept().nvdimms.Get(host, devices);
  if (status != kOk) return status;
  const bool isThere =
      ParseRegion(keys[0].text, region) && std::ranges::binary_search(devices->regions, region);
  return isThere ? kOk : KSI_STATUS_NOT_FOUND;
}

// Whether a directory is there with something in it.
bool HasEntries(const LinuxHost& host, const std::string& directory) {
  std::vector<std::string> names;
  return host.List(directory, LinuxHost::Entries::kAll, names) == kOk && !names.empty();
}

// Whether the namespace, or what holds it, is a block device.
bool HasBlockDevice(const LinuxHost& host, std::string_view space, std::string_view holder) {
  return HasEntries(host, FileOf(space, "block")) ||
         (!holder.empty() && HasEntries(host, FileOf(holder, "block")));
}

bool IsSystemRam(const LinuxHost& host, const NvdimmNamespace& space) {
  std::vector<std::string> names;
  return host.List(kSystemRam, LinuxHost::Entries::kAll, names) == kOk &&
         std::ranges::find(names, "dax" + space.Number()) != names.end();
}

// What the namespaces of a region take together.
struct Allocation {
  uint64_t bytes = 0;
  uint32_t namespaces = 0;
  uint32_t empty = 0;
};

Status ReadAllocation(const LinuxHost& host, const NvdimmDevices& devices, uint64_t region,
                      Allocation& allocation) {
  for (const NvdimmNamespace& space : devices.namespaces) {
    if (space.region != region) continue;
    uint64_t size = 0;
    const Status status = host.ReadNumber(FileOf(space.Name(), "size"), size);
    // A namespace may go between the two reads.
    if (status == KSI_STATUS_NOT_FOUND) continue;
    if (status != kOk) return status;
    allocation.bytes += size;
    ++allocation.namespaces;
    if (size == 0) ++allocation.empty;
  }
  return kOk;
}

Status ListVolumes(const LinuxHost& host, const Keys& /*keys*/, ParamList& instances) {
  const NvdimmDevices* devices = nullptr;
  Status status = host.Kept().nvdimms.Get(host, devices);
  if (status != kOk) return status;
  for (const uint64_t region : devices->regions) {
    status = instances.AddText(RegionName(region));
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadVolume(const LinuxHost& host, const Keys& keys, KSI_PmemVolume& /*record*/) {
  const NvdimmDevices* devices = nullptr;
  uint64_t region = 0;
  return FindVolume(host, keys, devices, region);
}

Status ReadRegionStore(const LinuxHost& host, const Keys& keys, KSI_PmemRegionStore& record) {
  const NvdimmDevices* devices = nullptr;
  uint64_t region = 0;
  uint64_t size = 0;
  Figure labelled;
  Allocation allocation;
  Status status = FindVolume(host, keys, devices, region);
  if (status == kOk) status = host.ReadNumber(FileOf(keys[0].text, "size"), size);
  if (status == kOk) {
    status = host.ReadNumberIfAny(FileOf(keys[0].text, "available_size"), labelled);
  }
  if (status == kOk) status = ReadAllocation(host, *devices, region, allocation);
  if (status != kOk) return status;

  // Memory without labels is one namespace, and nothing of it is left to give, though the kernel
  // may call all of it available: no label has any.
  const uint64_t available = std::min(labelled.value_or(0), Less(size, allocation.bytes));
  record.alloc2MBlocks = BlocksOf(allocation.bytes);
  record.resvd2MBlocks = BlocksOf(Less(size, available));
  record.avail2MBlocks = BlocksOf(available);
  record.totalRegions = allocation.namespaces;
  record.freeRegions = allocation.empty;
  record.total2MBlocks = BlocksOf(size);
  return kOk;
}

Status ReadIsClean(const LinuxHost& host, const Keys& keys, uint8_t& isClean) {
  const NvdimmDevices* devices = nullptr;
  uint64_t region = 0;
  std::string badBlocks;
  Status status = FindVolume(host, keys, devices, region);
  if (status == kOk) status = ReadTextIfAny(host, FileOf(keys[0].text, "badblocks"), badBlocks);
  isClean = badBlocks.empty() ? 1 : 0;
  return status;
}

Status ListRegions(const LinuxHost& host, const Keys& keys, ParamList& instances) {
  const NvdimmDevices* devices = nullptr;
  uint64_t region = 0;
  Status status = FindVolume(host, keys, devices, region);
  if (status != kOk) return status;
  for (const NvdimmNamespace& space : devices->namespaces) {
    if (space.region != region) continue;
    status = instances.AddText(space.Name());
    if (status != kOk) return status;
  }
  return kOk;
}

// The namespace that the keys name.
Status FindNamespace(const LinuxHost& host, const Keys& keys, NvdimmNamespace& space) {
  const NvdimmDevices* devices = nullptr;
  uint64_t region = 0;
  const Status status = FindVolume(host, keys, devices, region);
  if (status != kOk) return status;
  const bool isThere = ParseNamespace(keys[1].text, space) && space.region == region;
  return isThere ? kOk : KSI_STATUS_NOT_FOUND;
}

// The device that is made of a namespace, empty if none is. Its name is a step in paths.
Status ReadHolder(const LinuxHost& host, std::string_view space, std::string& holder) {
  const std::string file = FileOf(space, "holder");
  const Status status = ReadTextIfAny(host, file, holder);
  return holder.find('/') == std::string::npos ? status : NotUnderstood(file, 1);
}

Status ReadRegion(const LinuxHost& host, const Keys& keys, KSI_PmemRegion& record) {
  NvdimmNamespace space = {};
  uint64_t size = 0;
  Figure readOnly;
  std::string holder;
  std::string uuid;
  Status status = FindNamespace(host, keys, space);
  const std::string name = space.Name();
  if (status == kOk) status = host.ReadNumber(FileOf(name, "size"), size);
  if (status == kOk) status = ReadHolder(host, name, holder);
  if (status == kOk) status = ReadTextIfAny(host, FileOf(name, "uuid"), uuid);
  if (status == kOk) {
    status = host.ReadNumberIfAny(FileOf(keys[0].text, "read_only"), readOnly);
  }
  if (status != kOk) return status;

  record.size = size;
  record.reserved = BlocksOf(size + kBlock - 1);
  if (size != 0) record.flags |= KSI_PMEM_ALLOCATED;
  if (!holder.empty()) record.flags |= KSI_PMEM_LOCKED;
  if (readOnly.value_or(0) != 0) record.flags |= KSI_PMEM_READ_ONLY;
  if (HasBlockDevice(host, name, holder)) record.flags |= KSI_PMEM_BLOCK_DEVICE;
  if (!uuid.empty()) record.flags |= KSI_PMEM_PERSISTENT_RESERVATION;
  if (IsSystemRam(host, space)) record.flags |= KSI_PMEM_SYSTEM;
  return kOk;
}

constexpr Reader kReaders[] = {
    ListOf<node::memory_pmem_volumes>(ListVolumes),
    ValueOf<node::memory_pmem_volumes_info, ReadVolume>(),
    ValueOf<node::memory_pmem_volumes_regionStore_info, ReadRegionStore>(),
    ValueOf<node::memory_pmem_volumes_regionStore_isClean, ReadIsClean>(),
    ListOf<node::memory_pmem_volumes_regionStore_regions>(ListRegions),
    ValueOf<node::memory_pmem_volumes_regionStore_regions_info, ReadRegion>(),
};

}  // namespace

constinit const ReaderTable kNvdimmReaders = kReaders;

Status ReadNvdimmDevices(const LinuxHost& host, NvdimmDevices& devices) {
  std::vector<std::string> names;
  const Status status = host.List(kDevices, LinuxHost::Entries::kAll, names);
  // A kernel that knows no persistent memory has none.
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status != kOk) return status;
  for (const std::string& name : names) {
    uint64_t region = 0;
    NvdimmNamespace space = {};
    if (ParseRegion(name, region)) {
      devices.regions.push_back(region);
    } else if (ParseNamespace(name, space)) {
      devices.namespaces.push_back(space);
    }
  }
  std::ranges::sort(devices.regions);
  std::ranges::sort(devices.namespaces, {}, [](const NvdimmNamespace& space) {
    return std::pair(space.region, space.number);
  });
  return kOk;
}

}  // namespace ksi
