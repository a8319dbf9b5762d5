#include "knvlibs/linux/host/figures.h"

#include <algorithm>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"

namespace ksi {

Status Figures::ReadMeminfo(const LinuxHost& host) {
  file_ = "/proc/meminfo";
  const Status status = host.Read(file_, &content_);
  if (status != kOk) return status;

  // "MemTotal:       24684092 kB", "HugePages_Free:        0"
  figures_.clear();
  Lines lines(content_);
  std::string_view line;
  while (lines.Next(&line)) {
    Figure figure{TakeWord(&line), 0};
    const std::string_view value = TakeWord(&line);
    const std::string_view unit = TakeWord(&line);
    if (!figure.name.ends_with(':') || !ParseNumber(value, &figure.value) ||
        (unit != "kB" && !unit.empty()) || !TakeWord(&line).empty()) {
      return NotUnderstood(file_, lines.Number());
    }
    figure.name.remove_suffix(1);
    figures_.push_back(figure);
  }
  return kOk;
}

Status Figures::ReadVmstat(const LinuxHost& host) { return ReadPairs(host, "/proc/vmstat"); }

Status Figures::ReadPairs(const LinuxHost& host, std::string_view file) {
  file_ = file;
  const Status status = host.Read(file_, &content_);
  if (status != kOk) return status;

  figures_.clear();
  Lines lines(content_);
  std::string_view line;
  while (lines.Next(&line)) {
    Figure figure{TakeWord(&line), 0};
    if (!ParseNumber(TakeWord(&line), &figure.value) || !TakeWord(&line).empty()) {
      return host.NotUnderstoodOnce(file.substr(file.rfind('/') + 1), file_, lines.Number());
    }
    figures_.push_back(figure);
  }
  return kOk;
}

std::optional<uint64_t> Figures::Find(std::string_view name) const {
  const auto found = std::ranges::find(figures_, name, &Figure::name);
  if (found == figures_.end()) return std::nullopt;
  return found->value;
}

Status Figures::Require(std::string_view name, uint64_t* value) const {
  const std::optional<uint64_t> found = Find(name);
  if (!found) {
    Warning("%s: %.*s is missing\n", file_.c_str(), static_cast<int>(name.size()), name.data());
    return KSI_STATUS_INVALID_METADATA;
  }
  *value = *found;
  return kOk;
}

Status ReadKernelHeap(const Figures& meminfo, uint64_t* heap) {
  uint64_t slab = 0;
  uint64_t pageTables = 0;
  uint64_t vmalloc = 0;
  Status status = meminfo.Require("Slab", &slab);
  if (status == kOk) status = meminfo.Require("PageTables", &pageTables);
  if (status == kOk) status = meminfo.Require("VmallocUsed", &vmalloc);
  *heap = slab + pageTables + vmalloc + meminfo.FindOr("SecPageTables", 0) +
          meminfo.FindOr("Percpu", 0);
  return status;
}

}  // namespace ksi
