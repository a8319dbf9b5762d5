// The pools of each memory node.
#include "knvlibs/linux/memory/hugepages.h"

#include <algorithm>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/memory/memory_nodes.h"
#include "knvlibs/linux/reader_tables.h"

namespace ksi {
namespace {

constexpr std::string_view kDirectoryPrefix = "hugepages-";
constexpr std::string_view kPoolPrefix = "huge-";

// Where the pools of a memory node lie.
Status FindPools(const LinuxHost& host, int64_t key, std::string& directory) {
  const MemoryNodes* nodes = nullptr;
  size_t node = 0;
  Status status = FindMemoryNodes(host, nodes);
  if (status == kOk) status = FindMemoryNode(*nodes, key, node);
  if (status != kOk) return status;
  directory = nodes->numa ? "/sys/devices/system/node/node" +
                                std::to_string(nodes->numaNodes[node]) + "/hugepages"
                          : std::string(kHugePagePools);
  return kOk;
}

// The page size in "hugepages-2048kB" or "huge-2048kB".
bool ParseSize(std::string_view name, std::string_view prefix, uint64_t& sizeKB) {
  if (!TakePrefix(name, prefix) || !name.ends_with("kB")) return false;
  name.remove_suffix(2);
  return ParseNumber(name, sizeKB);
}

Status ReadPsharePool(const LinuxHost& host, const Keys& keys, KSI_LargePagePool& /*record*/) {
  const MemoryNodes* nodes = nullptr;
  size_t node = 0;
  Status status = FindMemoryNodes(host, nodes);
  if (status == kOk) status = FindMemoryNode(*nodes, keys[0].number, node);
  // Linux shares pages wherever they lie and keeps no large pages for it.
  return status;
}

Status ListPools(const LinuxHost& host, const Keys& keys, ParamList& instances) {
  std::string directory;
  std::vector<uint64_t> sizes;
  Status status = FindPools(host, keys[0].number, directory);
  if (status == kOk) status = ListHugePageSizes(host, directory, sizes);
  if (status != kOk) return status;
  for (const uint64_t sizeKB : sizes) {
    status = instances.AddText(std::string(kPoolPrefix) + std::to_string(sizeKB) + "kB");
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadPool(const LinuxHost& host, const Keys& keys, KSI_LargePagePool& record) {
  std::string directory;
  uint64_t sizeKB = 0;
  Status status = FindPools(host, keys[0].number, directory);
  if (status != kOk) return status;
  if (!ParseSize(keys[1].text, kPoolPrefix, sizeKB)) return KSI_STATUS_NOT_FOUND;

  directory += '/';
  directory += kDirectoryPrefix;
  directory += std::to_string(sizeKB) + "kB/";
  uint64_t pages = 0;
  uint64_t free = 0;
  status = host.ReadNumber(directory + "nr_hugepages", pages);
  if (status == kOk) status = host.ReadNumber(directory + "free_hugepages", free);
  if (status != kOk) return status;

  // A huge page is handed out whole, never in small pages, so none of the counters moves.
  record.nrLPages = FieldOf<uint32_t>(pages * sizeKB / 2048);
  record.nrFreeSPages = FieldOf<uint32_t>(free * (sizeKB / 4));
  return kOk;
}

constexpr Reader kReaders[] = {
    ValueOf<node::memory_lpage_nodeList_psharePool, ReadPsharePool>(),
    ListOf<node::memory_lpage_nodeList_vmPools>(ListPools),
    ValueOf<node::memory_lpage_nodeList_vmPools, ReadPool>(),
};

}  // namespace

constinit const ReaderTable kHugePageReaders = kReaders;

Status ListHugePageSizes(const LinuxHost& host, std::string_view directory,
                         std::vector<uint64_t>& sizesKB) {
  std::vector<std::string> names;
  const Status status = host.List(directory, LinuxHost::Entries::kDirectories, names);
  sizesKB.clear();
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status != kOk) return status;
  for (const std::string& name : names) {
    if (!ParseSize(name, kDirectoryPrefix, sizesKB.emplace_back())) {
      return NameNotUnderstood(directory, name);
    }
  }
  std::ranges::sort(sizesKB);
  return kOk;
}

}  // namespace ksi
