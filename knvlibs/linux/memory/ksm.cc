#include "knvlibs/linux/memory/ksm.h"

#include <string>
#include <string_view>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

constexpr std::string_view kDirectory = "/sys/kernel/mm/ksm/";

std::string FileOf(std::string_view name) { return std::string(kDirectory).append(name); }

// Whether the machine's kernel does not show what it has: all kernels have this directory, with
// page sharing or without, but /sys need not be mounted. Of a tree nobody records an empty
// directory.
bool IsHidden(const LinuxHost& host) {
  std::vector<LinuxHost::Entry> entries;
  const std::string directory = "/sys/kernel/mm";
  if (!host.IsThisMachine() || host.List(directory, entries) != KSI_STATUS_NOT_FOUND) return false;
  if (host.First(directory)) {
    Warning("%s: not there: what page sharing does has no value\n", directory.c_str());
  }
  return true;
}

Status ReadZeroPages(const LinuxHost& host, Figure& pages) {
  Status status = host.ReadNumberIfAny(FileOf("ksm_zero_pages"), pages);
  if (status != kOk || pages) return status;
  // Kernels before 6.6 do this too if they are told to, and do not count.
  Figure used;
  status = host.ReadNumberIfAny(FileOf("use_zero_pages"), used);
  if (used.value_or(0) == 0) pages = 0;
  return status;
}

Status ReadPshareStats(const LinuxHost& host, const Keys& /*keys*/, KSI_PshareStats& record) {
  const Ksm* ksm = nullptr;
  const Status status = host.Kept().ksm.Get(host, ksm);
  if (status != kOk) return status;

  // The kernel counts what is shared now, not what ever was: that can be told only of a scanner
  // that has not done anything yet. Which page has one reference left, only if there are no others.
  const Figure everShared = ksm->hasScanned || !ksm->isTold ? std::nullopt : Figure(0);
  const uint64_t pages4K = host.PageKB() / 4;
  const auto in4K = [&](Figure pages) { return FieldOf(ProductOf(pages, pages4K)); };
  const uint64_t zeroIfTold = ksm->zeroPages.value_or(0);
  const Figure shared = ksm->isTold ? Figure(ksm->pagesShared) : std::nullopt;

  record.cow = in4K(SumOf({shared, ksm->pagesSharing, zeroIfTold}));
  record.cow1 = in4K(ksm->pagesSharing == 0 ? shared : std::nullopt);
  record.zero = in4K(ksm->zeroPages);
  record.used = in4K(shared);
  record.reclaimed = in4K(shared ? SumOf({ksm->pagesSharing, zeroIfTold}) : std::nullopt);
  record.totAdd = FieldOf(everShared);
  record.totRemove = FieldOf(everShared);
  return kOk;
}

constexpr Reader kReaders[] = {ValueOf<node::memory_pshare_stats, ReadPshareStats>()};

}  // namespace

constinit const ReaderTable kKsmReaders = kReaders;

Figure Ksm::SavedOf(Figure merged) const {
  if (!isTold) return merged == 0u ? merged : std::nullopt;
  if (pagesSharing == 0) return 0;
  const Figure all = SumOf({pagesShared, pagesSharing});
  return all ? QuotientOf(ProductOf(merged, pagesSharing), *all) : std::nullopt;
}

Status ReadKsm(const LinuxHost& host, Ksm& ksm) {
  Status status = host.ReadNumber(FileOf("pages_shared"), ksm.pagesShared);
  if (status == KSI_STATUS_NOT_FOUND) {
    ksm.isTold = !IsHidden(host);
    if (!ksm.isTold) ksm.zeroPages.reset();
    return kOk;
  }

  uint64_t scans = 0;
  Figure scanned;
  if (status == kOk) status = host.ReadNumber(FileOf("pages_sharing"), ksm.pagesSharing);
  if (status == kOk) status = host.ReadNumber(FileOf("full_scans"), scans);
  if (status == kOk) status = host.ReadNumberIfAny(FileOf("pages_scanned"), scanned);
  if (status == kOk) status = ReadZeroPages(host, ksm.zeroPages);
  ksm.hasScanned = scans != 0 || scanned.value_or(0) != 0 || ksm.pagesShared != 0;
  // A process may be gone; of these files one that is missing is none that went.
  return status == KSI_STATUS_NOT_FOUND ? KSI_STATUS_INVALID_METADATA : status;
}

}  // namespace ksi
