#include "knvlibs/linux/groups/process.h"

#include <algorithm>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

struct StatusField {
  std::string_view name;
  uint64_t Process::*figure;
};

constexpr StatusField kFields[] = {
    {"VmPeak", &Process::peakAddressSpace}, {"VmSize", &Process::addressSpace},
    {"VmHWM", &Process::peakResident},      {"VmRSS", &Process::resident},
    {"RssAnon", &Process::anonymous},       {"RssFile", &Process::file},
    {"RssShmem", &Process::shared},         {"VmPTE", &Process::pageTables},
    {"VmSwap", &Process::swapped},          {"HugetlbPages", &Process::hugePages},
};

constexpr std::string_view kBlanks = " \t";

std::string_view Trimmed(std::string_view text) {
  text.remove_prefix(std::min(text.find_first_not_of(kBlanks), text.size()));
  return text.substr(0, text.find_last_not_of(kBlanks) + 1);
}

// "   18872 kB"
bool ParseKB(std::string_view text, uint64_t* figure) {
  return ParseNumber(TakeWord(&text), figure) && TakeWord(&text) == "kB" && TakeWord(&text).empty();
}

bool ParsePid(std::string_view text, int32_t* pid) {
  uint64_t number = 0;
  if (!ParseNumber(text, &number) || number == 0 || number > INT32_MAX) return false;
  *pid = static_cast<int32_t>(number);
  return true;
}

}  // namespace

Status ListProcesses(const LinuxHost& host, std::vector<int32_t>* pids) {
  std::vector<LinuxHost::Entry> entries;
  const Status status = host.List("/proc", &entries);
  if (status != kOk) return status;

  pids->clear();
  for (const LinuxHost::Entry& entry : entries) {
    int32_t pid = 0;
    if (entry.isDirectory && ParsePid(entry.name, &pid)) pids->push_back(pid);
  }
  std::ranges::sort(*pids);
  return kOk;
}

Status ReadProcess(const LinuxHost& host, int32_t pid, Process* process) {
  const std::string file = ProcessFile(pid, "status");
  std::string content;
  const Status status = host.Read(file, &content);
  if (status != kOk) return status;

  *process = Process();
  process->pid = pid;
  uint64_t parent = 0;
  uint64_t kernelThread = 0;
  bool tellsKernelThreads = false;
  std::string_view state;

  Lines lines(content);
  std::string_view line;
  while (lines.Next(&line)) {
    const size_t colon = line.find(':');
    if (colon == std::string_view::npos) {
      return host.NotUnderstoodOnce("status", file, lines.Number());
    }
    const std::string_view name = line.substr(0, colon);
    const std::string_view value = line.substr(colon + 1);
    bool understood = true;
    if (name == "Name") {
      // A name is up to 15 bytes of anything; only newlines and backslashes come escaped.
      process->name = Printable(value.empty() ? value : value.substr(1));
    } else if (name == "State") {
      state = Trimmed(value).substr(0, 1);
    } else if (name == "PPid") {
      understood = ParseNumber(Trimmed(value), &parent);
    } else if (name == "Threads") {
      understood = ParseNumber(Trimmed(value), &process->threads);
    } else if (name == "Kthread") {
      tellsKernelThreads = true;
      understood = ParseNumber(Trimmed(value), &kernelThread);
    } else {
      const auto* const field = std::ranges::find(kFields, name, &StatusField::name);
      if (field != std::end(kFields)) understood = ParseKB(value, &(process->*field->figure));
    }
    if (!understood) return host.NotUnderstoodOnce("status", file, lines.Number());
  }

  const bool hasMemory = process->addressSpace != kNoValue;
  // Kernels before 6.8 do not say; there they are the children of process 2.
  constexpr uint64_t kKernelThreadDaemon = 2;
  process->isKernelThread = tellsKernelThreads ? kernelThread != 0
                                               : !hasMemory && (pid == kKernelThreadDaemon ||
                                                                parent == kKernelThreadDaemon);
  process->hasEnded = !process->isKernelThread && (!hasMemory || state == "Z" || state == "X");
  return kOk;
}

Status ReadCommandLine(const LinuxHost& host, int32_t pid, std::vector<std::string>* words) {
  std::string content;
  const Status status = host.Read(ProcessFile(pid, "cmdline"), &content);
  if (status != kOk) return status;

  words->clear();
  for (std::string_view rest = content; !rest.empty();) {
    const size_t end = std::min(rest.find('\0'), rest.size());
    words->emplace_back(rest.substr(0, end));
    rest.remove_prefix(std::min(end + 1, rest.size()));
  }
  return kOk;
}

Status ReadCgroupPath(const LinuxHost& host, int32_t pid, std::string_view controller,
                      std::string* path) {
  const std::string file = ProcessFile(pid, "cgroup");
  std::string content;
  const Status status = host.Read(file, &content);
  if (status != kOk) return status;

  // "4:memory:/a/b", "1:cpu,cpuacct:/", "0::/a/b"
  path->clear();
  Lines lines(content);
  std::string_view line;
  while (lines.Next(&line)) {
    const size_t first = line.find(':');
    const size_t second = first == std::string_view::npos ? first : line.find(':', first + 1);
    if (second == std::string_view::npos) {
      return host.NotUnderstoodOnce("cgroup", file, lines.Number());
    }
    std::string_view controllers = line.substr(first + 1, second - first - 1);
    bool found = controllers == controller;
    while (!found && !controllers.empty()) {
      const size_t comma = std::min(controllers.find(','), controllers.size());
      found = controllers.substr(0, comma) == controller;
      controllers.remove_prefix(std::min(comma + 1, controllers.size()));
    }
    if (found) *path = line.substr(second + 1);
  }
  return kOk;
}

Status ReadAddressSpaceLimit(const LinuxHost& host, int32_t pid, int64_t* limit) {
  const std::string file = ProcessFile(pid, "limits");
  std::string content;
  const Status status = host.Read(file, &content);
  if (status != kOk) return status;

  // "Max address space         unlimited            unlimited            bytes     "
  Lines lines(content);
  std::string_view line;
  while (lines.Next(&line)) {
    if (!TakePrefix(&line, "Max address space ")) continue;
    const std::string_view soft = TakeWord(&line);
    uint64_t bytes = 0;
    *limit = -1;
    if (soft == "unlimited") return kOk;
    if (!ParseNumber(soft, &bytes)) return host.NotUnderstoodOnce("limits", file, lines.Number());
    *limit = static_cast<int64_t>(bytes / 1024);
    return kOk;
  }
  return host.NotUnderstoodOnce("limits", file, lines.Number());
}

std::string ProcessFile(int32_t pid, std::string_view name) {
  std::string file = "/proc/" + std::to_string(pid) + '/';
  file += name;
  return file;
}

std::string Printable(std::string_view name) {
  std::string printable(name);
  std::ranges::replace_if(
      printable, [](char c) { return (c >= 0 && c < ' ') || c == '\x7f'; }, '?');
  return printable;
}

}  // namespace ksi
