// The host's memory as a whole: how it is divided and how short it is. docs/linux-host.md says
// where each figure comes from and why.
#include <algorithm>
#include <array>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/handlers.h"
#include "knvlibs/linux/host/figures.h"
#include "knvlibs/linux/memory/iomem.h"
#include "knvlibs/linux/memory/zoneinfo.h"

namespace ksi {
namespace {

// All zones together, in pages.
Zone SumOf(const std::vector<Zone>& zones) {
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
uint32_t StateOf(const Zone& sum) {
  const uint64_t floors[] = {sum.high, sum.low, sum.min + (sum.low - sum.min) / 2, sum.min};
  uint32_t state = 0;
  while (state < std::size(floors) && sum.free < floors[state]) ++state;
  return state;
}

uint64_t Less(uint64_t value, uint64_t part) { return value - std::min(value, part); }

// What the kernel uses on behalf of files (`cache`) and what processes use (`processes`), in KB.
Status ReadConsumed(const Figures& meminfo, uint64_t* cache, uint64_t* processes) {
  uint64_t buffers = 0;
  uint64_t cached = 0;
  uint64_t anonymous = 0;
  Status status = meminfo.Require("Buffers", &buffers);
  if (status == kOk) status = meminfo.Require("Cached", &cached);
  if (status == kOk) status = meminfo.Require("AnonPages", &anonymous);
  if (status != kOk) return status;

  const uint64_t shared = meminfo.FindOr("Shmem", 0);
  const uint64_t hugeKB = meminfo.FindOr("Hugepagesize", 0);
  const uint64_t hugeUsed =
      Less(meminfo.FindOr("HugePages_Total", 0), meminfo.FindOr("HugePages_Free", 0));
  *cache = buffers + Less(cached, shared);
  *processes = anonymous + shared + hugeUsed * hugeKB;
  return kOk;
}

}  // namespace

Status ReadComprehensive(const LinuxHost& host, const Keys& /*keys*/, Buffer buffer) {
  Figures meminfo;
  Figures vmstat;
  std::vector<Zone> zones;
  Status status = meminfo.ReadMeminfo(host);
  if (status == kOk) status = vmstat.ReadVmstat(host);
  if (status == kOk) status = ReadZones(host, &zones);
  if (status != kOk) return status;

  uint64_t total = 0;
  uint64_t free = 0;
  uint64_t heap = 0;
  uint64_t cache = 0;
  uint64_t processes = 0;
  status = meminfo.Require("MemTotal", &total);
  if (status == kOk) status = meminfo.Require("MemFree", &free);
  if (status == kOk) status = ReadKernelHeap(meminfo, &heap);
  if (status == kOk) status = ReadConsumed(meminfo, &cache, &processes);
  if (status != kOk) return status;

  const Zone sum = SumOf(zones);
  uint64_t reservedLow = 0;
  for (const Zone& zone : zones) {
    if (zone.IsLow()) reservedLow += Less(zone.present, zone.managed);
  }
  const std::optional<uint64_t> code = IomemSize(host, "Kernel code");
  const std::optional<uint64_t> memmap = vmstat.Find("nr_memmap_pages");

  KSI_Comprehensive record = {};
  record.total = sum.present * host.PageKB();
  record.managedByMemMap = total;
  record.reliableMem = 0;
  record.discarded = meminfo.FindOr("HardwareCorrupted", 0);
  record.critical = sum.min * host.PageKB();
  record.buddyOvhd =
      memmap ? (*memmap + vmstat.FindOr("nr_memmap_boot_pages", 0)) * host.PageKB() : kNoValue;
  record.kernelCode = code ? *code / 1024 : kNoValue;
  record.dataAndHeap = heap;
  record.knvClientConsumed = cache;
  record.otherConsumed = processes;
  record.rsvdLow = reservedLow * host.PageKB();
  record.free = free;
  return Answer(buffer, record);
}

Status ReadGlobalTally(const LinuxHost& host, const Keys& /*keys*/, Buffer buffer) {
  Figures meminfo;
  std::vector<Zone> zones;
  Status status = meminfo.ReadMeminfo(host);
  if (status == kOk) status = ReadZones(host, &zones);
  uint64_t total = 0;
  uint64_t heap = 0;
  if (status == kOk) status = meminfo.Require("MemTotal", &total);
  if (status == kOk) status = ReadKernelHeap(meminfo, &heap);
  if (status != kOk) return status;

  const Zone sum = SumOf(zones);
  KSI_GlobalTally record = {};
  record.managedByMemSched = Less(total, heap);
  record.minFree = sum.high * host.PageKB();
  record.memState = StateOf(sum);
  return Answer(buffer, record);
}

Status ReadStateTransitions(const LinuxHost& /*host*/, const Keys& keys, Buffer buffer) {
  if (std::ranges::find(kMemoryStates, keys[0].text) == std::end(kMemoryStates)) {
    return KSI_STATUS_NOT_FOUND;
  }
  // Linux has no memory states and so never left one.
  return Answer(buffer, KSI_StateTransitions{});
}

}  // namespace ksi
