#include "knvlibs/linux/groups/process_ksm.h"

#include <string>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

void WarnDenied(const LinuxHost& host) {
  if (!host.First("ksm denied")) return;
  Warning(
      "/proc/PID/ksm_stat: not permitted for some processes: their shared memory has no value\n");
}

// "ksm_merging_pages 120", "ksm_merge_any: no"
Status ParseKsmStat(const LinuxHost& host, const std::string& file, std::string_view content,
                    ProcessKsm& ksm) {
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    const std::string_view name = TakeWord(line);
    if (name != "ksm_merging_pages" && name != "ksm_zero_pages") continue;
    uint64_t pages = 0;
    if (!ParseNumber(TakeWord(line), pages)) {
      return host.NotUnderstoodOnce("ksm_stat", file, lines.Number());
    }
    (name == "ksm_zero_pages" ? ksm.zeroPages : ksm.merged) = ProductOf(pages, host.PageKB());
  }
  return kOk;
}

// Kernels before 6.5 have this figure in a file of its own, and none before 5.19.
Status ReadMergingPages(const LinuxHost& host, int32_t pid, Figure& merged) {
  uint64_t pages = 0;
  const Status status = host.ReadNumber(ProcessFile(pid, "ksm_merging_pages"), pages);
  if (status == kOk) merged = ProductOf(pages, host.PageKB());
  if (status == KSI_STATUS_PERMISSION_DENIED) WarnDenied(host);
  if (status == KSI_STATUS_NOT_FOUND) {
    Process process;
    if (ReadProcess(host, pid, process) == KSI_STATUS_NOT_FOUND) return KSI_STATUS_NOT_FOUND;
  }
  return kOk;
}

}  // namespace

Status ReadIsSharing(const LinuxHost& host, bool& isSharing) {
  isSharing = false;
  for (const char* file :
       {"/sys/kernel/mm/ksm/pages_shared", "/sys/kernel/mm/ksm/ksm_zero_pages"}) {
    Figure pages;
    const Status status = host.ReadNumberIfAny(file, pages);
    if (status != kOk) return status;
    if (pages.value_or(0) != 0) isSharing = true;
  }
  return kOk;
}

Status ReadProcessKsm(const LinuxHost& host, int32_t pid, ProcessKsm& ksm) {
  const bool* isSharing = nullptr;
  Status status = host.Kept().isSharing.Get(host, isSharing);
  ksm = ProcessKsm();
  if (status != kOk || !*isSharing) return status;

  ksm = {std::nullopt, std::nullopt};
  const std::string file = ProcessFile(pid, "ksm_stat");
  std::string content;
  status = host.Read(file, content);
  if (status == KSI_STATUS_PERMISSION_DENIED) {
    WarnDenied(host);
    return kOk;
  }
  if (status == kOk) status = ParseKsmStat(host, file, content, ksm);
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;
  return ksm.merged ? kOk : ReadMergingPages(host, pid, ksm.merged);
}

}  // namespace ksi
