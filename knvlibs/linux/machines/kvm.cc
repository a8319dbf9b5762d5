#include "knvlibs/linux/machines/kvm.h"

#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

// What may not be read here has not kept an answer from anybody.
class Unheeded {
 public:
  explicit Unheeded(const LinuxHost& host) : host_(host), denied_(host.Kept().denied) {}
  ~Unheeded() { host_.Kept().denied = std::move(denied_); }
  Unheeded(const Unheeded&) = delete;
  Unheeded& operator=(const Unheeded&) = delete;

 private:
  const LinuxHost& host_;
  std::string denied_;
};

// One that has been closed since leads nowhere.
std::optional<bool> IsMachineLink(const LinuxHost& host, int32_t pid,
                                  const std::string& descriptor) {
  std::string target;
  const Status status = host.ReadLink(ProcessFile(pid, "fd/" + descriptor), target);
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return std::nullopt;
  return status == kOk && target == "anon_inode:kvm-vm";
}

std::optional<bool> LookFor(const LinuxHost& host, int32_t pid, uint64_t& count) {
  const Unheeded unheeded(host);
  std::vector<std::string> descriptors;
  constexpr auto kAll = LinuxHost::Entries::kAll;
  const Status status = host.List(ProcessFile(pid, "fd"), kAll, descriptors);
  if (status == KSI_STATUS_NOT_FOUND && host.IsThisMachine()) return false;
  if (status != kOk) return std::nullopt;
  count = descriptors.size();
  for (const std::string& descriptor : descriptors) {
    const std::optional<bool> isMachine = IsMachineLink(host, pid, descriptor);
    // A directory may be seen without where its links lead.
    if (!isMachine || *isMachine) return isMachine;
  }
  return false;
}

// The process of a thread; none if it has gone.
std::optional<int32_t> ProcessOfThread(const LinuxHost& host, int32_t thread) {
  std::string content;
  if (host.ReadPiece(ProcessFile(thread, "status"), content) != kOk) return std::nullopt;
  Lines lines(content);
  std::string_view line;
  uint64_t pid = 0;
  while (lines.Next(line)) {
    if (!TakePrefix(line, "Tgid:\t")) continue;
    if (!ParseNumber(line, pid) || pid > INT32_MAX) return std::nullopt;
    return static_cast<int32_t>(pid);
  }
  return std::nullopt;
}

}  // namespace

std::optional<bool> HoldsMachine(const LinuxHost& host, const Process& process) {
  uint64_t count = 0;
  if (process.fdSize > KvmSearch::kMostDescriptors) return std::nullopt;
  return LookFor(host, process.pid, count);
}

KvmSearch::KvmSearch(const LinuxHost& host) {
  const Unheeded unheeded(host);
  std::vector<std::string> names;
  constexpr auto kAll = LinuxHost::Entries::kAll;
  if (host.List("/sys/devices/virtual/misc/kvm", kAll, names) == KSI_STATUS_NOT_FOUND) return;
  by_ = FindList(host) ? By::kList : By::kDescriptors;
}

// The kernel's own list, which as a rule only root may read: a directory for each machine, "812-11"
// for the thread that made it and its descriptor.
bool KvmSearch::FindList(const LinuxHost& host) {
  std::vector<std::string> names;
  constexpr auto kDirectories = LinuxHost::Entries::kDirectories;
  if (host.List("/sys/kernel/debug/kvm", kDirectories, names) != kOk) return false;
  for (const std::string& name : names) {
    uint64_t thread = 0;
    const std::string_view number = std::string_view(name).substr(0, name.find('-'));
    if (!ParseNumber(number, thread) || thread > INT32_MAX) continue;
    const std::optional<int32_t> pid = ProcessOfThread(host, static_cast<int32_t>(thread));
    if (pid) listed_.insert(*pid);
  }
  return true;
}

bool KvmSearch::IsMachine(const LinuxHost& host, const Process& process) {
  if (by_ == By::kList) {
    return listed_.contains(process.pid) && HoldsMachine(host, process).value_or(false);
  }
  // Each processor of a machine is a thread.
  if (by_ == By::kNothing || process.threads < 2) return false;
  if (process.fdSize > left_) {
    Miss(host);
    return false;
  }
  uint64_t count = 0;
  const std::optional<bool> holds = LookFor(host, process.pid, count);
  left_ = Less(left_, count);
  if (!holds) isWhole_ = false;
  return holds.value_or(false);
}

void KvmSearch::Miss(const LinuxHost& host) {
  isWhole_ = false;
  host.Lose(KSI_STATUS_LIMIT_EXCEEDED);
  if (!host.First("kvm descriptors")) return;
  Warning(
      "/proc/PID/fd: too many to look at all: virtual machines of other monitors than QEMU may be "
      "shown as user worlds\n");
}

}  // namespace ksi
