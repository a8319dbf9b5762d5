// The host's memory as a whole: how it is divided and how short it is. tally-linux(7) says
// where each figure comes from and why.
#include <algorithm>
#include <iterator>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/figure_file.h"
#include "knvlibs/linux/memory/iomem.h"
#include "knvlibs/linux/memory/kernel_memory.h"
#include "knvlibs/linux/memory/pressure.h"
#include "knvlibs/linux/memory/zoneinfo.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

// All zones together, in pages.
Zone TotalOf(const Zones& zones) {
  Zone sum;
  for (const Zone& zone : zones) {
    sum.free += zone.free;
    sum.min += zone.min;
    sum.low += zone.low;
    sum.high += zone.high;
    sum.present += zone.present;
    sum.managed += zone.managed;
  }
  return sum;
}

// The number of the memory state of a host with these sums: "high" while page reclaim has nothing
// to do, "clear" while it works up to the high watermark, "soft" and "hard" in the upper and lower
// half of what is left to it before allocations stall, "low" once they do.
uint32_t StateByFree(const Zone& sum) {
  const uint64_t floors[] = {sum.high, sum.low, sum.min + (sum.low - sum.min) / 2, sum.min};
  uint32_t state = KSI_MEMORY_STATE_HIGH;
  while (state < std::size(floors) && sum.free < floors[state]) ++state;
  return state;
}

// The same by what waiting for memory costs: page reclaim may keep some pages free at the price of
// others that are wanted again at once.
uint32_t StateByPressure(const Pressure& pressure) {
  constexpr uint64_t kTenth = 1000;  // of the time
  constexpr uint64_t kHalf = 5000;
  if (pressure.full >= kHalf) return KSI_MEMORY_STATE_LOW;
  if (pressure.full >= kTenth) return KSI_MEMORY_STATE_HARD;
  return pressure.some >= kTenth ? KSI_MEMORY_STATE_SOFT : KSI_MEMORY_STATE_HIGH;
}

// Reclaim stops a little above the high watermark. Where twice as much is free it takes nothing
// from the host: who waits then has come to the limit of a cgroup.
uint32_t StateOf(const Zone& sum, const Pressure& pressure) {
  const uint32_t state = StateByFree(sum);
  return sum.free < 2 * sum.high ? std::max(state, StateByPressure(pressure)) : state;
}

// Low memory that the kernel keeps from the page allocator, in pages.
uint64_t ReservedLowOf(const Zones& zones) {
  uint64_t reserved = 0;
  for (const Zone& zone : zones) {
    if (zone.IsLow()) reserved += Less(zone.present, zone.managed);
  }
  return reserved;
}

// All pages on the lists of page reclaim, those that it has taken off to look at too: pages of
// files and of processes. A kernel that has them tells of all; 0 where some are missing.
uint64_t LruOf(const FigureFile& meminfo, const FigureFile& vmstat, uint64_t pageKB) {
  const Figure isolated =
      SumOf({vmstat.FindOr("nr_isolated_anon", 0), vmstat.FindOr("nr_isolated_file", 0)});
  return SumOf({meminfo.Find("Active"), meminfo.Find("Inactive"), meminfo.Find("Unevictable"),
                ProductOf(isolated, pageKB)})
      .value_or(0);
}

// Huge pages of all sizes, free ones too: nothing else may have them.
uint64_t HugetlbOf(const FigureFile& meminfo) {
  return meminfo.FindOr("Hugetlb",
                        meminfo.FindOr("HugePages_Total", 0) * meminfo.FindOr("Hugepagesize", 0));
}

// What the kernel uses on behalf of files (`cache`) and what processes use (`processes`), in KB.
Status ReadConsumed(const LinuxHost& host, const FigureFile& meminfo, const FigureFile& vmstat,
                    uint64_t& cache, uint64_t& processes) {
  uint64_t buffers = 0;
  uint64_t cached = 0;
  uint64_t anonymous = 0;
  Status status = meminfo.Require("Buffers", buffers);
  if (status == kOk) status = meminfo.Require("Cached", cached);
  if (status == kOk) status = meminfo.Require("AnonPages", anonymous);
  if (status != kOk) return status;

  const uint64_t shmem = meminfo.FindOr("Shmem", 0);
  cache = buffers + Less(cached, shmem);
  // AnonPages are mapped: pages that wait in the swap cache for nobody are only on the lists. On
  // these, pages are missing that were just made.
  const uint64_t reclaimable = Less(LruOf(meminfo, vmstat, host.PageKB()), cache);
  processes = std::max(anonymous + shmem, reclaimable) + HugetlbOf(meminfo);
  return kOk;
}

Status ReadComprehensive(const LinuxHost& host, const Keys& /*keys*/, KSI_Comprehensive& record) {
  const FigureFile* meminfo = nullptr;
  const Zones* zones = nullptr;
  const FigureFile* vmstat = nullptr;
  Status status = host.Kept().meminfo.Get(host, meminfo);
  if (status == kOk) status = host.Kept().vmstat.Get(host, vmstat);
  if (status == kOk) status = host.Kept().zones.Get(host, zones);
  uint64_t total = 0;
  uint64_t free = 0;
  uint64_t heap = 0;
  uint64_t cache = 0;
  uint64_t processes = 0;
  if (status == kOk) status = meminfo->Require("MemTotal", total);
  if (status == kOk) status = meminfo->Require("MemFree", free);
  if (status == kOk) status = ReadKernelMemory(host, heap);
  if (status == kOk) status = ReadConsumed(host, *meminfo, *vmstat, cache, processes);
  if (status != kOk) return status;

  const Zone sum = TotalOf(*zones);
  const Figure memmap =
      SumOf({vmstat->Find("nr_memmap_pages"), vmstat->FindOr("nr_memmap_boot_pages", 0)});
  record.total = sum.present * host.PageKB();
  record.managedByMemMap = total;
  record.reliableMem = 0;
  record.discarded = meminfo->FindOr("HardwareCorrupted", 0);
  record.critical = sum.min * host.PageKB();
  record.buddyOvhd = FieldOf(ProductOf(memmap, host.PageKB()));
  record.kernelCode = FieldOf(QuotientOf(IomemSize(host, "Kernel code"), 1024));
  record.dataAndHeap = heap;
  record.knvClientConsumed = cache;
  record.otherConsumed = processes;
  record.rsvdLow = ReservedLowOf(*zones) * host.PageKB();
  record.free = free;
  return kOk;
}

Status ReadGlobalTally(const LinuxHost& host, const Keys& /*keys*/, KSI_GlobalTally& record) {
  const FigureFile* meminfo = nullptr;
  const Zones* zones = nullptr;
  const Pressure* pressure = nullptr;
  uint64_t total = 0;
  uint64_t heap = 0;
  Status status = host.Kept().meminfo.Get(host, meminfo);
  if (status == kOk) status = host.Kept().zones.Get(host, zones);
  if (status == kOk) status = host.Kept().pressure.Get(host, pressure);
  if (status == kOk) status = meminfo->Require("MemTotal", total);
  if (status == kOk) status = ReadKernelMemory(host, heap);
  if (status != kOk) return status;

  const Zone sum = TotalOf(*zones);
  record.managedByMemSched = Less(total, heap);
  record.minFree = sum.high * host.PageKB();
  record.memState = StateOf(sum, *pressure);
  return kOk;
}

Status ReadStateTransitions(const LinuxHost& /*host*/, const Keys& keys,
                            KSI_StateTransitions& /*record*/) {
  const bool isState = std::ranges::find(kMemoryStates, keys[0].text) != std::end(kMemoryStates);
  // Linux has no memory states and so never left one.
  return isState ? kOk : KSI_STATUS_NOT_FOUND;
}

constexpr Reader kReaders[] = {
    ValueOf<node::memory_comprehensive, ReadComprehensive>(),
    ValueOf<node::sched_globalStats_memory_tally, ReadGlobalTally>(),
    ValueOf<node::sched_globalStats_memory_stateTransitions, ReadStateTransitions>(),
};

}  // namespace

constinit const ReaderTable kMemoryReaders = kReaders;

}  // namespace ksi
