#include "knvlibs/linux/heaps/heaps.h"

#include <cstring>

#include "knvlibs/characters.h"
#include "knvlibs/linux/heaps/slab_cache.h"
#include "knvlibs/linux/host/figure_file.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

constexpr size_t kLongestName = sizeof KSI_HeapStats::name - 1;

// What is the same of all heaps: each grows when it has to and is not limited. The kernel does not
// keep how often it was asked for memory.
KSI_HeapStats NewRecord() {
  constexpr auto kUncounted = FieldOf<uint32_t>(std::nullopt);
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
  const uint64_t available = Less(cache.objects, cache.activeObjects) * cache.objectSize;

  KSI_HeapStats record = NewRecord();
  record.numRanges = FieldOf<uint32_t>(cache.slabs);
  record.dlMallocOvdh = FieldOf<uint32_t>(Less(size, objects));
  record.size = FieldOf<uint32_t>(size);
  record.avail = FieldOf<uint32_t>(available);
  record.pctFreeOfCur = size == 0 ? 0 : FieldOf<uint32_t>(available * 100 / size);
  record.avgAllocSize = FieldOf<uint32_t>(cache.objectSize);
  return record;
}

Status AddVmalloc(const LinuxHost& host, Heaps& heaps) {
  const FigureFile* meminfo = nullptr;
  uint64_t used = 0;
  Status status = host.Kept().meminfo.Get(host, meminfo);
  if (status == kOk) status = meminfo->Require("VmallocUsed", used);
  if (status != kOk) return status;

  KSI_HeapStats record = NewRecord();
  record.numRanges = 1;
  record.size = FieldOf<uint32_t>(used * 1024);
  record.avgAllocSize = FieldOf<uint32_t>(std::nullopt);
  heaps.Add("vmalloc", record);
  return kOk;
}

Status ListHeaps(const LinuxHost& host, const Keys& /*keys*/, ParamList& instances) {
  const Heaps* heaps = nullptr;
  Status status = host.Kept().heaps.Get(host, heaps);
  if (status != kOk) return status;
  for (const KSI_HeapStats& record : heaps->Records()) {
    status = instances.AddText(record.name);
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadHeapStats(const LinuxHost& host, const Keys& keys, KSI_HeapStats& record) {
  const Heaps* heaps = nullptr;
  const Status status = host.Kept().heaps.Get(host, heaps);
  if (status != kOk) return status;
  const KSI_HeapStats* found = heaps->Find(keys[0].text);
  if (found == nullptr) return KSI_STATUS_NOT_FOUND;
  record = *found;
  return kOk;
}

constexpr Reader kReaders[] = {
    ListOf<node::system_heaps>(ListHeaps),
    ValueOf<node::system_heaps_stats, ReadHeapStats>(),
};

}  // namespace

constinit const ReaderTable kHeapReaders = kReaders;

void Heaps::Add(std::string_view givenName, KSI_HeapStats record) {
  const std::string fullName = Printable(givenName);
  std::string name(CutAtCharacter(fullName, kLongestName));
  for (size_t count = 2; !index_.emplace(name, records_.size()).second; ++count) {
    const std::string mark = '~' + std::to_string(count);
    name = std::string(CutAtCharacter(fullName, kLongestName - mark.size())) + mark;
  }
  std::memcpy(record.name, name.c_str(), name.size() + 1);
  records_.push_back(record);
}

const KSI_HeapStats* Heaps::Find(std::string_view name) const {
  const auto found = index_.find(std::string(name));
  return found == index_.end() ? nullptr : &records_[found->second];
}

Status ReadHeaps(const LinuxHost& host, Heaps& heaps) {
  std::vector<SlabCache> caches;
  Status status = ReadSlabinfo(host, caches);
  if (status == KSI_STATUS_NOT_FOUND || status == KSI_STATUS_PERMISSION_DENIED) {
    const Status directoryStatus = ReadSlabDirectory(host, caches);
    // A denial is the better news: there is something that another user may see.
    if (status == KSI_STATUS_NOT_FOUND || directoryStatus != KSI_STATUS_NOT_FOUND) {
      status = directoryStatus;
    }
  }
  // A kernel of the simplest allocator has no slab caches.
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;

  for (const SlabCache& cache : caches) heaps.Add(cache.name, RecordOf(cache, host.PageKB()));
  return AddVmalloc(host, heaps);
}

}  // namespace ksi
