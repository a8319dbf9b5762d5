#include "knvlibs/linux/host/figure_file.h"

#include <algorithm>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"

namespace ksi {

Status FigureFile::ReadMeminfo(const LinuxHost& host, FigureFile& meminfo) {
  meminfo.file_ = "/proc/meminfo";
  const Status status = host.ReadPiece(meminfo.file_, meminfo.content_);
  if (status != kOk) return status;

  // "MemTotal:       24684092 kB", "HugePages_Free:        0"
  meminfo.lines_.clear();
  Lines lines(meminfo.content_);
  std::string_view text;
  while (lines.Next(text)) {
    Line line{TakeWord(text), 0};
    const std::string_view value = TakeWord(text);
    const std::string_view unit = TakeWord(text);
    if (!line.name.ends_with(':') || !ParseNumber(value, line.value) ||
        (unit != "kB" && !unit.empty()) || !TakeWord(text).empty()) {
      return NotUnderstood(meminfo.file_, lines.Number());
    }
    line.name.remove_suffix(1);
    meminfo.lines_.push_back(line);
  }
  return kOk;
}

Status FigureFile::ReadVmstat(const LinuxHost& host, FigureFile& vmstat) {
  vmstat.file_ = "/proc/vmstat";
  const Status status = host.Read(vmstat.file_, vmstat.content_);
  return status == kOk ? vmstat.ParsePairs(host) : status;
}

Status FigureFile::ReadMemoryStat(const LinuxHost& host, std::string file, FigureFile& stat) {
  stat.file_ = std::move(file);
  const Status status = host.ReadPiece(stat.file_, stat.content_);
  return status == kOk ? stat.ParsePairs(host) : status;
}

Status FigureFile::ParsePairs(const LinuxHost& host) {
  const std::string_view file = file_;
  lines_.clear();
  Lines lines(content_);
  std::string_view text;
  while (lines.Next(text)) {
    Line line{TakeWord(text), 0};
    if (!ParseNumber(TakeWord(text), line.value) || !TakeWord(text).empty()) {
      return host.NotUnderstoodOnce(file.substr(file.rfind('/') + 1), file_, lines.Number());
    }
    lines_.push_back(line);
  }
  return kOk;
}

Figure FigureFile::Find(std::string_view name) const {
  const auto found = std::ranges::find(lines_, name, &Line::name);
  if (found == lines_.end()) return std::nullopt;
  return found->value;
}

Status FigureFile::Require(std::string_view name, uint64_t& value) const {
  const Figure found = Find(name);
  if (!found) {
    Warning("%s: %s is missing\n", Printable(file_).c_str(), Printable(name).c_str());
    return KSI_STATUS_INVALID_METADATA;
  }
  value = *found;
  return kOk;
}

}  // namespace ksi
