#include "knvlibs/linux/groups/process_ksm.h"

#include <string>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/recent.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

// Whether there is a page on the host that is shared.
Status ReadIsSharing(const LinuxHost& host, bool* sharing) {
  *sharing = false;
  for (const char* file :
       {"/sys/kernel/mm/ksm/pages_shared", "/sys/kernel/mm/ksm/ksm_zero_pages"}) {
    uint64_t pages = 0;
    const Status status = host.ReadNumber(file, &pages);
    if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;
    if (pages != 0) *sharing = true;
  }
  return kOk;
}

void WarnDenied(const LinuxHost& host) {
  if (!host.First("ksm denied")) return;
  Warning(
      "/proc/PID/ksm_stat: not permitted for some processes: their shared memory has no value\n");
}

}  // namespace

Status ReadProcessKsm(const LinuxHost& host, int32_t pid, ProcessKsm* ksm) {
  const bool* sharing = nullptr;
  Status status = host.Keep<Recent<bool>>().Get(host, ReadIsSharing, &sharing);
  *ksm = ProcessKsm();
  if (status != kOk || !*sharing) return status;

  *ksm = {kNoValue, kNoValue};
  const std::string file = ProcessFile(pid, "ksm_stat");
  std::string content;
  status = host.Read(file, &content);
  if (status == KSI_STATUS_PERMISSION_DENIED) {
    WarnDenied(host);
    return kOk;
  }
  // "ksm_merging_pages 120", "ksm_merge_any: no"
  Lines lines(content);
  std::string_view line;
  while (status == kOk && lines.Next(&line)) {
    const std::string_view name = TakeWord(&line);
    if (name != "ksm_merging_pages" && name != "ksm_zero_pages") continue;
    uint64_t pages = 0;
    if (!ParseNumber(TakeWord(&line), &pages)) {
      return host.NotUnderstoodOnce("ksm_stat", file, lines.Number());
    }
    (name == "ksm_zero_pages" ? ksm->zeroPages : ksm->merged) = pages * host.PageKB();
  }
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) return status;

  if (ksm->merged != kNoValue) return kOk;

  // Kernels before 6.5 have this figure in a file of its own, and none before 5.19.
  uint64_t pages = 0;
  status = host.ReadNumber(ProcessFile(pid, "ksm_merging_pages"), &pages);
  if (status == kOk) ksm->merged = pages * host.PageKB();
  if (status == KSI_STATUS_PERMISSION_DENIED) WarnDenied(host);
  if (status == KSI_STATUS_NOT_FOUND) {
    Process process;
    if (ReadProcess(host, pid, &process) == KSI_STATUS_NOT_FOUND) return KSI_STATUS_NOT_FOUND;
  }
  return kOk;
}

}  // namespace ksi
