// /sys/kernel/mm/ksm: page sharing.
#include <string>
#include <string_view>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/reader_tables.h"

namespace ksi {
namespace {

constexpr std::string_view kDirectory = "/sys/kernel/mm/ksm/";

std::string FileOf(std::string_view name) { return std::string(kDirectory).append(name); }

// Client pages that are mapped to the kernel's zero page instead of a page of their own.
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
  uint64_t shared = 0;
  Status status = host.ReadNumber(FileOf("pages_shared"), shared);
  // A kernel without page sharing has shared nothing.
  if (status == KSI_STATUS_NOT_FOUND) return kOk;

  uint64_t sharing = 0;
  uint64_t scans = 0;
  Figure scanned;
  Figure zero;
  if (status == kOk) status = host.ReadNumber(FileOf("pages_sharing"), sharing);
  if (status == kOk) status = host.ReadNumber(FileOf("full_scans"), scans);
  if (status == kOk) status = host.ReadNumberIfAny(FileOf("pages_scanned"), scanned);
  if (status == kOk) status = ReadZeroPages(host, zero);
  if (status != kOk) return status;

  // The kernel counts what is shared now, not what ever was: that can be told only of a scanner
  // that has not done anything yet. Which page has one reference left, only if there are no others.
  const bool neverScanned = scans == 0 && scanned.value_or(0) == 0 && shared == 0;
  const Figure everShared = neverScanned ? Figure(0) : std::nullopt;
  const uint64_t pages4K = host.PageKB() / 4;
  const auto in4K = [&](Figure pages) { return FieldOf(ProductOf(pages, pages4K)); };
  const uint64_t zeroIfTold = zero.value_or(0);

  record.cow = in4K(SumOf({shared, sharing, zeroIfTold}));
  record.cow1 = in4K(sharing == 0 ? Figure(shared) : std::nullopt);
  record.zero = in4K(zero);
  record.used = in4K(shared);
  record.reclaimed = in4K(SumOf({sharing, zeroIfTold}));
  record.totAdd = FieldOf(everShared);
  record.totRemove = FieldOf(everShared);
  return kOk;
}

constexpr Reader kReaders[] = {ValueOf<node::memory_pshare_stats, ReadPshareStats>()};

}  // namespace

constinit const ReaderTable kKsmReaders = kReaders;

}  // namespace ksi
