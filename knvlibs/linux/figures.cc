#include "knvlibs/linux/figures.h"

#include <algorithm>

#include "knvlibs/include/knvlibs/ksi.h"
#include "knvlibs/linux/text.h"

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

Status Figures::ReadVmstat(const LinuxHost& host) {
  file_ = "/proc/vmstat";
  const Status status = host.Read(file_, &content_);
  if (status != kOk) return status;

  figures_.clear();
  Lines lines(content_);
  std::string_view line;
  while (lines.Next(&line)) {
    Figure figure{TakeWord(&line), 0};
    if (!ParseNumber(TakeWord(&line), &figure.value) || !TakeWord(&line).empty()) {
      return NotUnderstood(file_, lines.Number());
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
    Warning("%.*s: %.*s is missing\n", static_cast<int>(file_.size()), file_.data(),
            static_cast<int>(name.size()), name.data());
    return KSI_STATUS_INVALID_METADATA;
  }
  *value = *found;
  return kOk;
}

}  // namespace ksi
