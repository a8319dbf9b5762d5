#include "knvlibs/linux/groups/process.h"

#include <sys/resource.h>

#include <algorithm>
#include <cerrno>
#include <optional>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

struct StatusField {
  std::string_view name;
  Figure Process::*figure;
};

constexpr StatusField kFields[] = {
    {"VmPeak", &Process::vmPeak},     {"VmSize", &Process::vmSize},
    {"VmHWM", &Process::vmHwm},       {"VmRSS", &Process::vmRss},
    {"RssAnon", &Process::rssAnon},   {"RssFile", &Process::rssFile},
    {"RssShmem", &Process::rssShmem}, {"VmPTE", &Process::vmPte},
    {"VmSwap", &Process::vmSwap},     {"VmLck", &Process::vmLck},
    {"VmPin", &Process::vmPin},       {"HugetlbPages", &Process::hugetlb},
};

// What the status file tells besides, before it is judged.
struct StatusFacts {
  std::string_view state;
  uint64_t parent = 0;
  Figure isKernelThread;
};

constexpr std::string_view kBlanks = " \t";

std::string_view Trimmed(std::string_view text) {
  text.remove_prefix(std::min(text.find_first_not_of(kBlanks), text.size()));
  return text.substr(0, text.find_last_not_of(kBlanks) + 1);
}

// "   18872 kB"
bool ParseKB(std::string_view text, Figure& figure) {
  return ParseNumber(TakeWord(text), figure.emplace()) && TakeWord(text) == "kB" &&
         TakeWord(text).empty();
}

bool ParsePid(std::string_view text, int32_t& pid) {
  uint64_t number = 0;
  if (!ParseNumber(text, number) || number == 0 || number > INT32_MAX) return false;
  pid = static_cast<int32_t>(number);
  return true;
}

// The last field of interest: signals, capabilities and the like come behind it.
constexpr std::string_view kLastField = "Threads";

// A name is up to 15 bytes of anything; only newlines and backslashes come escaped.
std::string Unescaped(std::string_view text) {
  std::string name;
  while (!text.empty()) {
    const bool isNewline = text.starts_with("\\n");
    const bool isEscaped = isNewline || text.starts_with("\\\\");
    name += isNewline ? '\n' : text.front();
    text.remove_prefix(isEscaped ? 2 : 1);
  }
  return name;
}

// Takes one field of the status file; false if it is not understood. Many are none of ours.
bool TakeField(std::string_view name, std::string_view value, Process& process,
               StatusFacts& facts) {
  if (name == "Name") {
    process.name = Printable(Unescaped(value.empty() ? value : value.substr(1)));
  } else if (name == "State") {
    facts.state = Trimmed(value).substr(0, 1);
  } else if (name == "Uid") {
    TakeWord(value);  // the real one
    return ParseNumber(TakeWord(value), process.user.emplace());
  } else if (name == "PPid") {
    return ParseNumber(Trimmed(value), facts.parent);
  } else if (name == "FDSize") {
    return ParseNumber(Trimmed(value), process.fdSize);
  } else if (name == kLastField) {
    return ParseNumber(Trimmed(value), process.threads);
  } else if (name == "Kthread") {
    return ParseNumber(Trimmed(value), facts.isKernelThread.emplace());
  } else {
    const auto* const field = std::ranges::find(kFields, name, &StatusField::name);
    if (field != std::end(kFields)) return ParseKB(value, process.*field->figure);
  }
  return true;
}

void Judge(const StatusFacts& facts, Process& process) {
  const bool hasMemory = process.vmSize.has_value();
  // Kernels before 6.8 do not say; there they are the children of process 2.
  constexpr int32_t kKernelThreadDaemon = 2;
  process.isKernelThread = facts.isKernelThread
                               ? *facts.isKernelThread != 0
                               : !hasMemory && (process.pid == kKernelThreadDaemon ||
                                                facts.parent == kKernelThreadDaemon);
  process.isZombie =
      !process.isKernelThread && (!hasMemory || facts.state == "Z" || facts.state == "X");
}

// Whether `word` is one of the words of a list: "cpu,cpuacct".
bool HasWord(std::string_view list, std::string_view word) {
  while (!list.empty()) {
    const size_t comma = std::min(list.find(','), list.size());
    if (list.substr(0, comma) == word) return true;
    list.remove_prefix(std::min(comma + 1, list.size()));
  }
  return false;
}

}  // namespace

Status ListProcesses(const LinuxHost& host, std::vector<int32_t>& pids) {
  std::vector<LinuxHost::Entry> entries;
  const Status status = host.List("/proc", entries);
  if (status != kOk) return status;

  pids.clear();
  for (const LinuxHost::Entry& entry : entries) {
    int32_t pid = 0;
    // In a recorded tree it may be a link.
    if ((entry.isDirectory || entry.isLink) && ParsePid(entry.name, pid)) pids.push_back(pid);
  }
  std::ranges::sort(pids);
  return kOk;
}

Status ReadProcess(const LinuxHost& host, int32_t pid, Process& process) {
  const std::string file = ProcessFile(pid, "status");
  std::string content;
  const Status status = host.ReadPiece(file, content);
  if (status != kOk) return status;

  process = Process();
  process.pid = pid;
  StatusFacts facts;
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    const size_t colon = line.find(':');
    if (colon == std::string_view::npos ||
        !TakeField(line.substr(0, colon), line.substr(colon + 1), process, facts)) {
      return host.NotUnderstoodOnce("status", file, lines.Number());
    }
    if (line.starts_with(kLastField)) {
      Judge(facts, process);
      return kOk;
    }
  }
  // What is cut off would pass for the end of a process.
  return host.NotUnderstoodOnce("status", file, lines.Number() + 1);
}

Status ReadCommandLine(const LinuxHost& host, int32_t pid, std::vector<std::string>& words) {
  std::string content;
  const Status status = host.ReadPiece(ProcessFile(pid, "cmdline"), content);
  if (status != kOk) return status;

  words.clear();
  for (std::string_view rest = content; !rest.empty();) {
    const size_t end = std::min(rest.find('\0'), rest.size());
    words.emplace_back(rest.substr(0, end));
    rest.remove_prefix(std::min(end + 1, rest.size()));
  }
  return kOk;
}

Status ReadCgroupPath(const LinuxHost& host, int32_t pid, std::string_view controller,
                      std::string& path) {
  const std::string file = ProcessFile(pid, "cgroup");
  std::string content;
  const Status status = host.ReadPiece(file, content);
  if (status != kOk) return status;

  // "4:memory:/a/b", "1:cpu,cpuacct:/", "0::/a/b"
  path.clear();
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    const size_t first = line.find(':');
    const size_t second = first == std::string_view::npos ? first : line.find(':', first + 1);
    if (second == std::string_view::npos) {
      return host.NotUnderstoodOnce("cgroup", file, lines.Number());
    }
    const std::string_view controllers = line.substr(first + 1, second - first - 1);
    if (controllers == controller || HasWord(controllers, controller)) {
      path = line.substr(second + 1);
    }
  }
  return kOk;
}

namespace {

// By the system call, which costs a tenth of the file, but is refused for processes of others.
std::optional<Status> AskAddressSpaceLimit(int32_t pid, Figure& limit) {
  rlimit64 soft = {};
  if (prlimit64(pid, RLIMIT_AS, nullptr, &soft) != 0) {
    return errno == ESRCH ? std::optional<Status>(KSI_STATUS_NOT_FOUND) : std::nullopt;
  }
  limit = soft.rlim_cur == RLIM64_INFINITY ? std::nullopt : Figure(soft.rlim_cur / 1024);
  return kOk;
}

}  // namespace

Status ReadAddressSpaceLimit(const LinuxHost& host, int32_t pid, Figure& limit) {
  if (host.IsThisMachine()) {
    if (const std::optional<Status> status = AskAddressSpaceLimit(pid, limit)) return *status;
  }
  const std::string file = ProcessFile(pid, "limits");
  std::string content;
  const Status status = host.ReadPiece(file, content);
  if (status != kOk) return status;

  // "Max address space         unlimited            unlimited            bytes     "
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    if (!TakePrefix(line, "Max address space ")) continue;
    const std::string_view soft = TakeWord(line);
    uint64_t bytes = 0;
    limit.reset();
    if (soft == "unlimited") return kOk;
    if (!ParseNumber(soft, bytes)) return host.NotUnderstoodOnce("limits", file, lines.Number());
    limit = bytes / 1024;
    return kOk;
  }
  return host.NotUnderstoodOnce("limits", file, lines.Number());
}

std::string ProcessFile(int32_t pid, std::string_view name) {
  std::string file = "/proc/" + std::to_string(pid) + '/';
  file += name;
  return file;
}

}  // namespace ksi
