#include "knvlibs/linux/groups/process_ksm.h"

#include <string>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/memory/ksm.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

void WarnDenied(const LinuxHost& host) {
  if (!host.First("ksm denied")) return;
  Warning(
      "/proc/PID/ksm_stat: not permitted for some processes: their shared memory has no value\n");
}

// Pages.
struct KsmStat {
  Figure merging;
  Figure zero;
};

// "ksm_merging_pages 120", "ksm_merge_any: no"
Status ParseKsmStat(const LinuxHost& host, const std::string& file, std::string_view content,
                    KsmStat& stat) {
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    const std::string_view name = TakeWord(line);
    if (name != "ksm_merging_pages" && name != "ksm_zero_pages") continue;
    Figure& pages = name == "ksm_zero_pages" ? stat.zero : stat.merging;
    if (!ParseNumber(TakeWord(line), pages.emplace())) {
      return host.NotUnderstoodOnce("ksm_stat", file, lines.Number());
    }
  }
  return kOk;
}

// Kernels before 6.5 have this figure in a file of its own, and none before 5.19.
Status ReadMergingPages(const LinuxHost& host, int32_t pid, Figure& merging) {
  const Status status = host.ReadNumberIfAny(ProcessFile(pid, "ksm_merging_pages"), merging);
  if (status != kOk || merging) return status;
  Process process;
  return ReadProcess(host, pid, process) == KSI_STATUS_NOT_FOUND ? KSI_STATUS_NOT_FOUND : kOk;
}

Status ReadKsmStat(const LinuxHost& host, int32_t pid, KsmStat& stat) {
  const std::string file = ProcessFile(pid, "ksm_stat");
  std::string content;
  Status status = host.ReadPiece(file, content);
  if (status == kOk) status = ParseKsmStat(host, file, content, stat);
  if (status == KSI_STATUS_NOT_FOUND) status = kOk;
  return status != kOk || stat.merging ? status : ReadMergingPages(host, pid, stat.merging);
}

}  // namespace

Status ReadProcessKsm(const LinuxHost& host, int32_t pid, ProcessKsm& ksm) {
  const Ksm* all = nullptr;
  Status status = host.Kept().ksm.Get(host, all);
  ksm = ProcessKsm();
  if (status != kOk || !all->IsSharing()) return status;

  KsmStat stat;
  status = ReadKsmStat(host, pid, stat);
  if (status == KSI_STATUS_PERMISSION_DENIED) {
    WarnDenied(host);
    status = kOk;
  }
  // Where the kernel makes none or tells that there are none, a process has none.
  if (!stat.zero && stat.merging && all->zeroPages == 0u) stat.zero = 0;
  ksm.merged = ProductOf(stat.merging, host.PageKB());
  ksm.zeroPages = ProductOf(stat.zero, host.PageKB());
  ksm.saved = SumOf({all->SavedOf(ksm.merged), ksm.zeroPages.value_or(0)});
  return status;
}

}  // namespace ksi
