#include "knvlibs/linux/memory/kernel_memory.h"

#include <algorithm>

#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

// The pools of zram and zswap. Both take their pages of zsmalloc, which vmstat counts; zswap on
// older kernels may have another allocator, and then meminfo tells its size.
Status ReadCompressed(const LinuxHost& host, const FigureFile& meminfo, uint64_t& size) {
  const FigureFile* vmstat = nullptr;
  const Status status = host.Kept().vmstat.Get(host, vmstat);
  const uint64_t pages = status == kOk ? vmstat->FindOr("nr_zspages", 0) : 0;
  size = std::max(pages * host.PageKB(), meminfo.FindOr("Zswap", 0));
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

Status ReadPerCpuPages(const LinuxHost& host, uint64_t& size) {
  const Zones* zones = nullptr;
  const Status status = host.Kept().zones.Get(host, zones);
  size = 0;
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status != kOk) return status;
  for (const Zone& zone : *zones) size += zone.perCpu * host.PageKB();
  return kOk;
}

}  // namespace

Status ReadKernelMemory(const LinuxHost& host, uint64_t& size) {
  const FigureFile* meminfo = nullptr;
  uint64_t slab = 0;
  uint64_t pageTables = 0;
  uint64_t vmalloc = 0;
  uint64_t compressed = 0;
  uint64_t perCpuPages = 0;
  Status status = host.Kept().meminfo.Get(host, meminfo);
  if (status == kOk) status = meminfo->Require("Slab", slab);
  if (status == kOk) status = meminfo->Require("PageTables", pageTables);
  if (status == kOk) status = meminfo->Require("VmallocUsed", vmalloc);
  if (status == kOk) status = ReadCompressed(host, *meminfo, compressed);
  if (status == kOk) status = ReadPerCpuPages(host, perCpuPages);
  if (status != kOk) return status;
  size = slab + pageTables + vmalloc + meminfo->FindOr("SecPageTables", 0) +
         meminfo->FindOr("Percpu", 0) + meminfo->FindOr("Bounce", 0) + compressed + perCpuPages;
  return kOk;
}

}  // namespace ksi
