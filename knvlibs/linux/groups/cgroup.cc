#include "knvlibs/linux/groups/cgroup.h"

#include <algorithm>
#include <initializer_list>
#include <iterator>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/memory/hugepages.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

// Reads a file that tells whether a hierarchy is there; notes the first that may not be read.
bool ReadSign(const LinuxHost& host, const std::string& file, std::string& content,
              std::string& denied) {
  const Status status = host.Read(file, content);
  if (status == KSI_STATUS_PERMISSION_DENIED && denied.empty()) denied = file;
  return status == kOk;
}

bool HasMemoryController(const LinuxHost& host, const std::string& mount, std::string& denied) {
  std::string content;
  if (!ReadSign(host, mount + "/cgroup.controllers", content, denied)) return false;
  if (content.ends_with('\n')) content.pop_back();
  std::string_view rest = content;
  for (std::string_view word = TakeWord(rest); !word.empty(); word = TakeWord(rest)) {
    if (word == "memory") return true;
  }
  return false;
}

// The sum of the figures of these names, in bytes, in KB.
Figure KBOf(const FigureFile& stat, std::initializer_list<std::string_view> names) {
  Figure bytes = 0;
  for (const std::string_view name : names) bytes = SumOf({bytes, stat.Find(name)});
  return QuotientOf(bytes, 1024);
}

// In KB. Version 1 writes the largest number of whole pages for none.
Figure LimitOf(uint64_t bytes) {
  constexpr uint64_t kNone = uint64_t{1} << 62;
  return bytes >= kNone ? std::nullopt : Figure(bytes / 1024);
}

// "hugetlb.2MB.current"
std::string HugetlbFile(uint64_t sizeKB) {
  constexpr const char* kUnits[] = {"KB", "MB", "GB"};
  size_t unit = 0;
  for (; sizeKB >= 1024 && unit + 1 < std::size(kUnits); ++unit) sizeKB /= 1024;
  return "hugetlb." + std::to_string(sizeKB) + kUnits[unit] + ".current";
}

}  // namespace

Status ReadHugetlbCharges(const LinuxHost& host, HugetlbCharges& charges) {
  std::string mounts;
  if (host.Read("/proc/self/mounts", mounts) == kOk &&
      mounts.find("memory_hugetlb_accounting") != std::string::npos) {
    return kOk;
  }
  std::vector<uint64_t> sizes;
  const Status status = ListHugePageSizes(host, kHugePagePools, sizes);
  for (const uint64_t size : sizes) charges.files.push_back(HugetlbFile(size));
  return status;
}

CgroupHierarchy CgroupHierarchy::Find(const LinuxHost& host) {
  CgroupHierarchy hierarchy;
  std::string denied;
  for (const char* mount : {"/sys/fs/cgroup", "/sys/fs/cgroup/unified"}) {
    if (!HasMemoryController(host, mount, denied)) continue;
    hierarchy.version_ = Version::k2;
    hierarchy.mount_ = mount;
    return hierarchy;
  }
  std::string content;
  if (ReadSign(host, "/sys/fs/cgroup/memory/cgroup.procs", content, denied)) {
    hierarchy.version_ = Version::k1;
    hierarchy.mount_ = "/sys/fs/cgroup/memory";
  } else if (!denied.empty() && host.First("cgroups denied")) {
    Warning("%s: not permitted: all cgroups are left out\n", denied.c_str());
  }
  return hierarchy;
}

std::string CgroupHierarchy::FileOf(std::string_view path, std::string_view name) const {
  std::string file = mount_;
  file += path;
  file += '/';
  file += name;
  return file;
}

Status CgroupHierarchy::List(const LinuxHost& host, std::string_view path, int64_t& id,
                             std::vector<Child>& children) const {
  std::vector<LinuxHost::Entry> entries;
  const std::string directory = mount_ + std::string(path);
  Status status = host.List(directory, entries);
  if (status != kOk) return status;

  children.clear();
  for (LinuxHost::Entry& entry : entries) {
    if (entry.isDirectory) {
      children.push_back({std::move(entry.name), entry.inode});
    } else if (entry.name == kRecordedCgroupId) {
      uint64_t recorded = 0;
      status = host.ReadNumber(FileOf(path, entry.name), recorded);
      if (status != kOk) return status;
      id = static_cast<int64_t>(recorded);
    } else {
      host.TellIfLeadsOut(directory, entry);
    }
  }
  std::ranges::sort(children, {}, &Child::name);
  return kOk;
}

Status CgroupHierarchy::ReadProcesses(const LinuxHost& host, std::string_view path,
                                      std::vector<int32_t>& pids) const {
  const std::string file = FileOf(path, "cgroup.procs");
  std::string content;
  const Status status = host.Read(file, content);
  if (status != kOk) return status;

  pids.clear();
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    uint64_t pid = 0;
    if (!ParseNumber(line, pid) || pid > INT32_MAX) {
      return host.NotUnderstoodOnce("cgroup.procs", file, lines.Number());
    }
    if (pid != 0) {
      pids.push_back(static_cast<int32_t>(pid));
    } else if (host.First("unseen processes")) {
      // Of another PID namespace.
      Warning("%s: lists processes that are not visible from here: such are left out\n",
              Printable(file).c_str());
    }
  }
  return kOk;
}

Status CgroupHierarchy::ReadAmount(const LinuxHost& host, std::string_view path,
                                   std::string_view name, Figure missing, Figure& amount) const {
  const std::string file = FileOf(path, name);
  std::string content;
  const Status status = host.ReadPiece(file, content);
  amount = missing;
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status != kOk) return status;

  if (content.ends_with('\n')) content.pop_back();
  uint64_t bytes = 0;
  if (content != "max" && !ParseNumber(content, bytes)) {
    return host.NotUnderstoodOnce(name, file, 1);
  }
  amount = content == "max" ? std::nullopt : LimitOf(bytes);
  return kOk;
}

Status CgroupHierarchy::ReadStat(const LinuxHost& host, std::string_view path,
                                 FigureFile& stat) const {
  return FigureFile::ReadMemoryStat(host, FileOf(path, "memory.stat"), stat);
}

Status CgroupHierarchy::ReadReservation(const LinuxHost& host, std::string_view path,
                                        Figure& reserved) const {
  reserved = 0;
  if (version_ != Version::k2) return kOk;
  return ReadAmount(host, path, "memory.min", 0, reserved);
}

Status CgroupHierarchy::ReadLow(const LinuxHost& host, std::string_view path, Figure& low) const {
  low = 0;
  return version_ == Version::k2 ? ReadAmount(host, path, "memory.low", 0, low) : kOk;
}

Status CgroupHierarchy::ReadLimit(const LinuxHost& host, std::string_view path,
                                  Figure& limit) const {
  const std::string_view name = version_ == Version::k2 ? "memory.max" : "memory.limit_in_bytes";
  return ReadAmount(host, path, name, std::nullopt, limit);
}

Status CgroupHierarchy::ReadHierarchicalLimit(const LinuxHost& host, std::string_view path,
                                              std::optional<Figure>& limit) const {
  limit.reset();
  if (version_ != Version::k1) return kOk;
  FigureFile stat;
  const Status status = ReadStat(host, path, stat);
  if (const Figure bytes = stat.Find("hierarchical_memory_limit")) limit = LimitOf(*bytes);
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

Status CgroupHierarchy::ReadHigh(const LinuxHost& host, std::string_view path, Figure& high) const {
  high.reset();
  if (version_ != Version::k2) return kOk;
  return ReadAmount(host, path, "memory.high", std::nullopt, high);
}

Status CgroupHierarchy::ReadPressure(const LinuxHost& host, std::string_view path,
                                     Pressure& pressure) const {
  pressure = {};
  if (version_ != Version::k2) return kOk;
  return ReadPressureFile(host, FileOf(path, "memory.pressure"), pressure);
}

Status CgroupHierarchy::ReadUsage(const LinuxHost& host, std::string_view path,
                                  MemcgUsage& usage) const {
  usage = MemcgUsage();
  const Status status =
      version_ == Version::k2 ? ReadUsage2(host, path, usage) : ReadUsage1(host, path, usage);
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

Status CgroupHierarchy::ReadUsage2(const LinuxHost& host, std::string_view path,
                                   MemcgUsage& usage) const {
  Figure peakSwap;
  FigureFile stat;
  Status status = ReadStat(host, path, stat);
  const auto read = [&](std::string_view name, Figure& amount) {
    if (status == kOk) status = ReadAmount(host, path, name, std::nullopt, amount);
  };
  read("memory.current", usage.current);
  read("memory.peak", usage.peak);
  read("memory.swap.current", usage.swap);
  read("memory.swap.peak", peakSwap);
  if (status != kOk) return status;

  // The two peaks may have been at different times.
  if (peakSwap == 0u) usage.peakWithSwap = usage.peak;
  usage.kernel = KBOf(stat, {"kernel"});
  if (!usage.kernel) {  // kernels before 5.18
    usage.kernel = KBOf(stat, {"kernel_stack", "pagetables", "percpu", "slab"});
  }
  usage.active = KBOf(stat, {"active_anon", "active_file"});
  return kOk;
}

Status CgroupHierarchy::ReadUsage1(const LinuxHost& host, std::string_view path,
                                   MemcgUsage& usage) const {
  Figure withSwap;
  FigureFile stat;
  Status status = ReadStat(host, path, stat);
  const auto read = [&](std::string_view name, Figure& amount) {
    if (status == kOk) status = ReadAmount(host, path, name, std::nullopt, amount);
  };
  read("memory.usage_in_bytes", usage.current);
  read("memory.max_usage_in_bytes", usage.peak);
  read("memory.memsw.usage_in_bytes", withSwap);
  read("memory.memsw.max_usage_in_bytes", usage.peakWithSwap);
  read("memory.kmem.usage_in_bytes", usage.kernel);
  if (status != kOk) return status;

  usage.swap = KBOf(stat, {"total_swap"});
  if (!usage.swap) usage.swap = DifferenceOf(withSwap, usage.current);
  usage.active = KBOf(stat, {"total_active_anon", "total_active_file"});
  return kOk;
}

Status CgroupHierarchy::ReadSwap(const LinuxHost& host, std::string_view path,
                                 MemcgSwap& swap) const {
  swap = MemcgSwap();
  const bool is1 = version_ == Version::k1;
  const char* const limit = is1 ? "memory.memsw.limit_in_bytes" : "memory.swap.max";
  const char* const usage = is1 ? "memory.memsw.usage_in_bytes" : "memory.swap.current";
  Figure used;
  Status status = ReadAmount(host, path, limit, std::nullopt, swap.max);
  if (status == kOk) status = ReadAmount(host, path, usage, std::nullopt, used);
  swap.left = DifferenceOf(swap.max, used);
  if (!is1) swap.current = used;
  return status;
}

Status CgroupHierarchy::ReadHugetlb(const LinuxHost& host, std::string_view path,
                                    Figure& hugetlb) const {
  hugetlb.reset();
  if (version_ != Version::k2) return kOk;
  const HugetlbCharges* charges = nullptr;
  Status status = host.Kept().hugetlbCharges.Get(host, charges);
  if (status != kOk) return status;
  hugetlb = 0;
  for (const std::string& file : charges->files) {
    Figure part;
    if (status == kOk) status = ReadAmount(host, path, file, std::nullopt, part);
    hugetlb = SumOf({hugetlb, part});
  }
  return status;
}

Status CgroupHierarchy::ReadEvents(const LinuxHost& host, std::string_view path,
                                   MemcgEvents& events) const {
  events = MemcgEvents();
  if (version_ != Version::k2) return kOk;
  FigureFile stat;
  Status status = ReadStat(host, path, stat);
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status == kOk) {
    status = ReadAmount(host, path, "memory.zswap.max", std::nullopt, events.zswapMax);
  }
  if (status != kOk) return status;

  const auto pages = [&](std::string_view name) {
    return ProductOf(stat.Find(name), host.PageKB());
  };
  events.swapcached = KBOf(stat, {"swapcached"});
  events.swpin = pages("pswpin");
  events.swpout = pages("pswpout");
  events.zswapPool = KBOf(stat, {"zswap"});
  events.zswapped = KBOf(stat, {"zswapped"});
  events.zswpin = pages("zswpin");
  events.zswpout = pages("zswpout");
  events.active = KBOf(stat, {"active_anon", "active_file"});
  events.secPageTables = KBOf(stat, {"sec_pagetables"});
  events.thpAlloc = SumOf({stat.Find("thp_fault_alloc"), stat.Find("thp_collapse_alloc")});
  return kOk;
}

}  // namespace ksi
