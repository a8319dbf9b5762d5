// The kernel's heaps: its slab caches and vmalloc, which is a single range of addresses.
#include <algorithm>
#include <cstring>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/handlers.h"
#include "knvlibs/linux/heaps/slab_cache.h"
#include "knvlibs/linux/host/figures.h"
#include "knvlibs/linux/host/recent.h"

namespace ksi {
namespace {

constexpr size_t kLongestName = sizeof KSI_HeapStats::name - 1;

// The heaps in the kernel's order, found by their names.
class Heaps {
 public:
  // Adds a heap under this name as far as it fits; a second heap of the same name gets "~2" at its
  // end, and so on.
  void Add(std::string_view fullName, KSI_HeapStats record) {
    std::string name(fullName.substr(0, kLongestName));
    for (size_t count = 2; !index_.emplace(name, records_.size()).second; ++count) {
      const std::string mark = '~' + std::to_string(count);
      name = std::string(fullName.substr(0, kLongestName - mark.size())) + mark;
    }
    std::memcpy(record.name, name.c_str(), name.size() + 1);
    records_.push_back(record);
  }

  const KSI_HeapStats* Find(std::string_view name) const {
    const auto found = index_.find(std::string(name));
    return found == index_.end() ? nullptr : &records_[found->second];
  }

  const std::vector<KSI_HeapStats>& Records() const { return records_; }

 private:
  std::vector<KSI_HeapStats> records_;
  std::unordered_map<std::string, size_t> index_;
};

// What is the same of all heaps: each grows when it has to and is not limited. The kernel does not
// keep how often it was asked for memory.
KSI_HeapStats NewRecord() {
  constexpr auto kUncounted = FigureOf<uint32_t>(kNoValue);
  KSI_HeapStats record = {};
  record.dynGrow = 1;
  record.numSuccAllocs = kUncounted;
  record.numFailAllocs = kUncounted;
  record.numReqsPerGrowth = kUncounted;
  record.numGrowthOps = kUncounted;
  record.numShrinkOps = kUncounted;
  return record;
}

KSI_HeapStats RecordOf(const SlabCache& cache, uint64_t pageKB) {
  const uint64_t size = cache.slabs * cache.pagesPerSlab * pageKB * 1024;
  const uint64_t objects = cache.objects * cache.objectSize;
  const uint64_t freeObjects = cache.objects - std::min(cache.objects, cache.activeObjects);
  const uint64_t available = freeObjects * cache.objectSize;

  KSI_HeapStats record = NewRecord();
  record.numRanges = FigureOf<uint32_t>(cache.slabs);
  record.dlMallocOvdh = FigureOf<uint32_t>(size - std::min(size, objects));
  record.size = FigureOf<uint32_t>(size);
  record.avail = FigureOf<uint32_t>(available);
  record.pctFreeOfCur = size == 0 ? 0 : FigureOf<uint32_t>(available * 100 / size);
  record.avgAllocSize = FigureOf<uint32_t>(cache.objectSize);
  return record;
}

Status AddVmalloc(const LinuxHost& host, Heaps* heaps) {
  Figures meminfo;
  uint64_t used = 0;
  Status status = meminfo.ReadMeminfo(host);
  if (status == kOk) status = meminfo.Require("VmallocUsed", &used);
  if (status != kOk) return status;

  KSI_HeapStats record = NewRecord();
  record.numRanges = 1;
  record.size = FigureOf<uint32_t>(used * 1024);
  record.avgAllocSize = FigureOf<uint32_t>(kNoValue);
  heaps->Add("vmalloc", record);
  return kOk;
}

Status ReadHeaps(const LinuxHost& host, Heaps* heaps) {
  std::vector<SlabCache> caches;
  Status status = ReadSlabinfo(host, &caches);
  if (status == KSI_STATUS_NOT_FOUND || status == KSI_STATUS_PERMISSION_DENIED) {
    const Status directoryStatus = ReadSlabDirectory(host, &caches);
    // A denial is the better news: there is something that another user may see.
    if (status == KSI_STATUS_NOT_FOUND || directoryStatus != KSI_STATUS_NOT_FOUND) {
      status = directoryStatus;
    }
  }
  // A kernel of the simplest allocator has no slab caches.
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;

  for (const SlabCache& cache : caches) heaps->Add(cache.name, RecordOf(cache, host.PageKB()));
  return AddVmalloc(host, heaps);
}

}  // namespace

Status ListHeaps(const LinuxHost& host, const Keys& /*keys*/, ParamList& instances) {
  const Heaps* heaps = nullptr;
  Status status = host.Keep<Recent<Heaps>>().GetNew(host, ReadHeaps, &heaps);
  if (status == KSI_STATUS_PERMISSION_DENIED) Warning("/proc/slabinfo: permission denied\n");
  if (status != kOk) return status;
  for (const KSI_HeapStats& record : heaps->Records()) {
    status = instances.AddText(record.name);
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadHeapStats(const LinuxHost& host, const Keys& keys, Buffer buffer) {
  const Heaps* heaps = nullptr;
  const Status status = host.Keep<Recent<Heaps>>().Get(host, ReadHeaps, &heaps);
  if (status != kOk) return status;
  const KSI_HeapStats* record = heaps->Find(keys[0].text);
  return record == nullptr ? KSI_STATUS_NOT_FOUND : Answer(buffer, *record);
}

}  // namespace ksi
