// /sys/kernel/slab: one directory for each slab cache.
#include <algorithm>
#include <string>
#include <string_view>

#include "knvlibs/linux/heaps/slab_cache.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

constexpr std::string_view kDirectory = "/sys/kernel/slab";

// A count that may be followed by its parts on each node: "1374 N0=700 N1=674".
Status ReadCount(const LinuxHost& host, const std::string& file, uint64_t& count) {
  std::string content;
  const Status status = host.Read(file, content);
  if (status != kOk) return status;
  Lines lines(content);
  std::string_view line;
  if (!lines.Next(line) || !ParseNumber(TakeWord(line), count)) return NotUnderstood(file, 1);
  return kOk;
}

Status ReadCache(const LinuxHost& host, SlabCache& cache) {
  const std::string directory = std::string(kDirectory) + '/' + cache.name + '/';
  uint64_t order = 0;
  Status status = host.ReadNumber(directory + "order", order);
  if (status == kOk) status = host.ReadNumber(directory + "slab_size", cache.objectSize);
  if (status == kOk) status = ReadCount(host, directory + "slabs", cache.slabs);
  if (status == kOk) status = ReadCount(host, directory + "total_objects", cache.objects);
  if (status == kOk) status = ReadCount(host, directory + "objects", cache.activeObjects);
  if (status != kOk) return status;
  if (order >= 32) return NotUnderstood(directory + "order", 1);
  cache.pagesPerSlab = uint64_t{1} << order;
  return kOk;
}

}  // namespace

Status ReadSlabDirectory(const LinuxHost& host, std::vector<SlabCache>& caches) {
  std::vector<std::string> names;
  // A cache that others share has their names as links to its directory.
  Status status = host.List(kDirectory, LinuxHost::Entries::kDirectories, names);
  if (status != kOk) return status;

  std::ranges::sort(names);
  caches.clear();
  for (std::string& name : names) {
    SlabCache cache;
    cache.name = std::move(name);
    status = ReadCache(host, cache);
    // A cache may go between the two reads.
    if (status == KSI_STATUS_NOT_FOUND) continue;
    if (status != kOk) return status;
    caches.push_back(std::move(cache));
  }
  return kOk;
}

}  // namespace ksi
