#include "knvlibs/linux/groups/smaps.h"

#include <algorithm>
#include <string_view>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

struct SmapsField {
  std::string_view name;
  Figure Smaps::*figure;
};

constexpr SmapsField kFields[] = {
    {"Rss", &Smaps::rss},
    {"Referenced", &Smaps::referenced},
    {"AnonHugePages", &Smaps::anonHugePages},
    {"ShmemPmdMapped", &Smaps::shmemPmdMapped},
    {"Shared_Hugetlb", &Smaps::hugetlb},
    {"Private_Hugetlb", &Smaps::hugetlb},
    {"Swap", &Smaps::swap},
    {"KSM", &Smaps::ksm},
};

// "Rss:                1688 kB". A field that is not of the table is none of ours.
bool TakeField(std::string_view line, Smaps& smaps) {
  const size_t colon = line.find(':');
  if (colon == std::string_view::npos) return false;
  const auto* const field = std::ranges::find(kFields, line.substr(0, colon), &SmapsField::name);
  if (field == std::end(kFields)) return true;
  std::string_view value = line.substr(colon + 1);
  uint64_t kilobytes = 0;
  if (!ParseNumber(TakeWord(value), kilobytes) || TakeWord(value) != "kB") return false;
  Figure& figure = smaps.*field->figure;
  figure = SumOf({figure.value_or(0), kilobytes});
  return true;
}

// "7f2c00000000-7f2c40000000 rw-p 00000000 00:00 0      /memory name"; false if it is none.
bool ParseHeader(std::string_view line, Mapping& mapping) {
  const std::string_view range = TakeWord(line);
  const size_t dash = range.find('-');
  if (dash == std::string_view::npos || !ParseHex(range.substr(0, dash), mapping.start) ||
      !ParseHex(range.substr(dash + 1), mapping.end) || mapping.end < mapping.start) {
    return false;
  }
  const std::string_view permissions = TakeWord(line);
  mapping.isWritable = permissions.starts_with("rw-");
  for (int i = 0; i < 3; ++i) TakeWord(line);  // offset, device, inode
  line.remove_prefix(std::min(line.find_first_not_of(' '), line.size()));
  mapping.name = line;
  return permissions.size() == 4;
}

bool HasWord(std::string_view line, std::string_view word) {
  for (std::string_view at = TakeWord(line); !at.empty(); at = TakeWord(line)) {
    if (at == word) return true;
  }
  return false;
}

// Takes a line of smaps: a header begins a mapping, all others tell of the latest.
bool TakeLine(std::string_view line, std::vector<Mapping>& mappings) {
  Mapping next;
  if (ParseHeader(line, next)) {
    mappings.push_back(std::move(next));
    return true;
  }
  if (mappings.empty()) return false;
  if (!TakePrefix(line, "VmFlags:")) return TakeField(line, mappings.back().smaps);
  mappings.back().isDontCopy = HasWord(line, "dc");
  return true;
}

// Reads a file that only the owner of a process may read; empty if it may not be or is not offered.
Status ReadOwn(const LinuxHost& host, int32_t pid, const std::string& file, std::string& content) {
  Status status = host.Read(file, content);
  if (status == KSI_STATUS_PERMISSION_DENIED) {
    if (host.First("smaps denied")) {
      Warning(
          "%s: not permitted: figures of a virtual machine's memory have no value where it is "
          "not\n",
          file.c_str());
    }
  } else if (status == KSI_STATUS_NOT_FOUND) {
    Process process;
    status = ReadProcess(host, pid, process);
    if (status != kOk || process.isZombie) return KSI_STATUS_NOT_FOUND;
  } else {
    return status;
  }
  content.clear();
  return kOk;
}

}  // namespace

void Smaps::Add(const Smaps& other) {
  for (Figure Smaps::*figure :
       {&Smaps::rss, &Smaps::referenced, &Smaps::anonHugePages, &Smaps::shmemPmdMapped,
        &Smaps::hugetlb, &Smaps::swap, &Smaps::ksm}) {
    this->*figure = SumOf({this->*figure, other.*figure});
  }
}

Status ReadMappings(const LinuxHost& host, int32_t pid, MappingsFile which,
                    std::vector<Mapping>& mappings) {
  const std::string name = which == MappingsFile::kMaps ? "maps" : "smaps";
  const std::string file = ProcessFile(pid, name);
  std::string content;
  const Status status = ReadOwn(host, pid, file, content);
  if (status != kOk) return status;

  mappings.clear();
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    if (!TakeLine(line, mappings)) {
      return host.NotUnderstoodOnce(name, file, lines.Number());
    }
  }
  return kOk;
}

}  // namespace ksi
