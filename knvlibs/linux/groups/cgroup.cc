#include "knvlibs/linux/groups/cgroup.h"

#include <algorithm>
#include <initializer_list>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

bool HasMemoryController(const LinuxHost& host, std::string_view mount) {
  std::string file(mount);
  file += "/cgroup.controllers";
  std::string content;
  if (host.Read(file, &content) != kOk) return false;
  if (content.ends_with('\n')) content.pop_back();
  std::string_view rest = content;
  for (std::string_view word = TakeWord(&rest); !word.empty(); word = TakeWord(&rest)) {
    if (word == "memory") return true;
  }
  return false;
}

uint64_t KBOfBytes(std::optional<uint64_t> bytes) { return bytes ? *bytes / 1024 : kNoValue; }

// The sum of the figures of these names in KB; it cannot be told unless all of them can.
uint64_t SumOfBytes(const Figures& figures, std::initializer_list<std::string_view> names) {
  uint64_t bytes = 0;
  for (const std::string_view name : names) bytes = SumOf(bytes, figures.FindOr(name, kNoValue));
  return bytes == kNoValue ? bytes : bytes / 1024;
}

}  // namespace

CgroupHierarchy CgroupHierarchy::Find(const LinuxHost& host) {
  CgroupHierarchy hierarchy;
  for (const std::string_view mount : {"/sys/fs/cgroup", "/sys/fs/cgroup/unified"}) {
    if (!HasMemoryController(host, mount)) continue;
    hierarchy.version_ = Version::k2;
    hierarchy.mount_ = mount;
    return hierarchy;
  }
  std::string content;
  if (host.Read("/sys/fs/cgroup/memory/cgroup.procs", &content) == kOk) {
    hierarchy.version_ = Version::k1;
    hierarchy.mount_ = "/sys/fs/cgroup/memory";
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

Status CgroupHierarchy::List(const LinuxHost& host, std::string_view path, int64_t* id,
                             std::vector<Child>* children) const {
  std::vector<LinuxHost::Entry> entries;
  const std::string directory = mount_ + std::string(path);
  Status status = host.List(directory, &entries);
  if (status != kOk) return status;

  children->clear();
  for (LinuxHost::Entry& entry : entries) {
    if (entry.isDirectory) {
      children->push_back({std::move(entry.name), entry.inode});
    } else if (entry.name == kRecordedCgroupId) {
      uint64_t recorded = 0;
      status = host.ReadNumber(FileOf(path, entry.name), &recorded);
      if (status != kOk) return status;
      *id = static_cast<int64_t>(recorded);
    }
  }
  std::ranges::sort(*children, {}, &Child::name);
  return kOk;
}

Status CgroupHierarchy::ReadProcesses(const LinuxHost& host, std::string_view path,
                                      std::vector<int32_t>* pids) const {
  const std::string file = FileOf(path, "cgroup.procs");
  std::string content;
  const Status status = host.Read(file, &content);
  if (status != kOk) return status;

  pids->clear();
  Lines lines(content);
  std::string_view line;
  while (lines.Next(&line)) {
    uint64_t pid = 0;
    if (!ParseNumber(line, &pid) || pid > INT32_MAX) {
      return host.NotUnderstoodOnce("cgroup.procs", file, lines.Number());
    }
    // 0 is a process that is not visible from here.
    if (pid != 0) pids->push_back(static_cast<int32_t>(pid));
  }
  return kOk;
}

Status CgroupHierarchy::ReadAmount(const LinuxHost& host, std::string_view path,
                                   std::string_view name, uint64_t missing,
                                   uint64_t* amount) const {
  // Version 1 writes the largest number of whole pages for "max".
  constexpr uint64_t kVersion1Max = uint64_t{1} << 62;
  const std::string file = FileOf(path, name);
  std::string content;
  const Status status = host.Read(file, &content);
  *amount = missing;
  if (status == KSI_STATUS_NOT_FOUND) return kOk;
  if (status != kOk) return status;

  if (content.ends_with('\n')) content.pop_back();
  uint64_t bytes = 0;
  if (content != "max" && !ParseNumber(content, &bytes)) {
    return host.NotUnderstoodOnce(name, file, 1);
  }
  *amount = content == "max" || bytes >= kVersion1Max ? kNoLimit : bytes / 1024;
  return kOk;
}

Status CgroupHierarchy::ReadStatistics(const LinuxHost& host, std::string_view path,
                                       Figures* figures) const {
  return figures->ReadPairs(host, FileOf(path, "memory.stat"));
}

Status CgroupHierarchy::CheckExists(const LinuxHost& host, std::string_view path) const {
  std::string content;
  const Status status = host.Read(FileOf(path, "cgroup.procs"), &content);
  return status == KSI_STATUS_NOT_FOUND ? status : kOk;
}

Status CgroupHierarchy::ReadReservation(const LinuxHost& host, std::string_view path,
                                        uint64_t* reserved) const {
  *reserved = 0;
  if (version_ != Version::k2) return kOk;
  return ReadAmount(host, path, "memory.min", 0, reserved);
}

Status CgroupHierarchy::ReadLimit(const LinuxHost& host, std::string_view path,
                                  uint64_t* limit) const {
  const std::string_view name = version_ == Version::k2 ? "memory.max" : "memory.limit_in_bytes";
  return ReadAmount(host, path, name, kNoLimit, limit);
}

Status CgroupHierarchy::ReadMemory(const LinuxHost& host, std::string_view path,
                                   CgroupMemory* memory) const {
  *memory = CgroupMemory();
  const Status status =
      version_ == Version::k2 ? ReadMemory2(host, path, memory) : ReadMemory1(host, path, memory);
  return status == KSI_STATUS_NOT_FOUND ? CheckExists(host, path) : status;
}

Status CgroupHierarchy::ReadMemory2(const LinuxHost& host, std::string_view path,
                                    CgroupMemory* memory) const {
  uint64_t peakSwapped = kNoValue;
  Figures statistics;
  Status status = ReadStatistics(host, path, &statistics);
  const auto read = [&](std::string_view name, uint64_t* amount) {
    if (status == kOk) status = ReadAmount(host, path, name, kNoValue, amount);
  };
  read("memory.current", &memory->current);
  read("memory.peak", &memory->peak);
  read("memory.swap.current", &memory->swapped);
  read("memory.swap.peak", &peakSwapped);
  if (status != kOk) return status;

  // The two peaks may have been at different times.
  if (peakSwapped == 0) memory->peakWithSwap = memory->peak;
  memory->kernel = KBOfBytes(statistics.Find("kernel"));
  if (memory->kernel == kNoValue) {  // kernels before 5.18
    memory->kernel = SumOfBytes(statistics, {"kernel_stack", "pagetables", "percpu", "slab"});
  }
  memory->active = SumOfBytes(statistics, {"active_anon", "active_file"});
  return kOk;
}

Status CgroupHierarchy::ReadMemory1(const LinuxHost& host, std::string_view path,
                                    CgroupMemory* memory) const {
  uint64_t withSwap = kNoValue;
  Figures statistics;
  Status status = ReadStatistics(host, path, &statistics);
  const auto read = [&](std::string_view name, uint64_t* amount) {
    if (status == kOk) status = ReadAmount(host, path, name, kNoValue, amount);
  };
  read("memory.usage_in_bytes", &memory->current);
  read("memory.max_usage_in_bytes", &memory->peak);
  read("memory.memsw.usage_in_bytes", &withSwap);
  read("memory.memsw.max_usage_in_bytes", &memory->peakWithSwap);
  read("memory.kmem.usage_in_bytes", &memory->kernel);
  if (status != kOk) return status;

  memory->swapped = KBOfBytes(statistics.Find("total_swap"));
  if (memory->swapped == kNoValue) memory->swapped = DifferenceOf(withSwap, memory->current);
  memory->active = SumOfBytes(statistics, {"total_active_anon", "total_active_file"});
  return kOk;
}

Status CgroupHierarchy::ReadEvents(const LinuxHost& host, std::string_view path,
                                   CgroupEvents* events) const {
  *events = CgroupEvents();
  if (version_ != Version::k2) return kOk;
  Figures statistics;
  Status status = ReadStatistics(host, path, &statistics);
  if (status == KSI_STATUS_NOT_FOUND) return CheckExists(host, path);
  if (status == kOk) {
    status = ReadAmount(host, path, "memory.zswap.max", kNoLimit, &events->zswapLimit);
  }
  if (status != kOk) return status;

  const auto pages = [&](std::string_view name) {
    const std::optional<uint64_t> count = statistics.Find(name);
    return count ? *count * host.PageKB() : kNoValue;
  };
  events->swapCached = KBOfBytes(statistics.Find("swapcached"));
  events->swappedIn = pages("pswpin");
  events->swappedOut = pages("pswpout");
  events->zswapPool = KBOfBytes(statistics.Find("zswap"));
  events->zswapped = KBOfBytes(statistics.Find("zswapped"));
  events->zswapIn = pages("zswpin");
  events->zswapOut = pages("zswpout");
  events->hugePagesMade = SumOf(statistics.FindOr("thp_fault_alloc", kNoValue),
                                statistics.FindOr("thp_collapse_alloc", kNoValue));
  return kOk;
}

}  // namespace ksi
