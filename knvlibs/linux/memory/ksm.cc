// /sys/kernel/mm/ksm: page sharing.
#include <string>
#include <string_view>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/handlers.h"

namespace ksi {
namespace {

constexpr std::string_view kDirectory = "/sys/kernel/mm/ksm/";

Status ReadFigure(const LinuxHost& host, std::string_view name, uint64_t* figure) {
  std::string file(kDirectory);
  file += name;
  return host.ReadNumber(file, figure);
}

// A figure that not every kernel has, `otherwise` where it does not.
Status ReadFigureOr(const LinuxHost& host, std::string_view name, uint64_t otherwise,
                    uint64_t* figure) {
  const Status status = ReadFigure(host, name, figure);
  if (status != KSI_STATUS_NOT_FOUND) return status;
  *figure = otherwise;
  return kOk;
}

// Client pages that are mapped to the kernel's zero page instead of a page of their own.
Status ReadZeroPages(const LinuxHost& host, uint64_t* pages) {
  const Status status = ReadFigure(host, "ksm_zero_pages", pages);
  if (status != KSI_STATUS_NOT_FOUND) return status;
  // Kernels before 6.6 do this too if they are told to, and do not count.
  uint64_t used = 0;
  const Status usedStatus = ReadFigureOr(host, "use_zero_pages", 0, &used);
  *pages = used == 0 ? 0 : kNoValue;
  return usedStatus;
}

}  // namespace

Status ReadPshareStats(const LinuxHost& host, const Keys& /*keys*/, Buffer buffer) {
  KSI_PshareStats record = {};
  uint64_t shared = 0;
  Status status = ReadFigure(host, "pages_shared", &shared);
  // A kernel without page sharing has shared nothing.
  if (status == KSI_STATUS_NOT_FOUND) return Answer(buffer, record);

  uint64_t sharing = 0;
  uint64_t zero = 0;
  uint64_t scans = 0;
  uint64_t scanned = 0;
  if (status == kOk) status = ReadFigure(host, "pages_sharing", &sharing);
  if (status == kOk) status = ReadFigure(host, "full_scans", &scans);
  if (status == kOk) status = ReadFigureOr(host, "pages_scanned", 0, &scanned);
  if (status == kOk) status = ReadZeroPages(host, &zero);
  if (status != kOk) return status;

  // The kernel counts what is shared now, not what ever was: that can be told only of a scanner
  // that has not done anything yet. Which page has one reference left, only if there are no others.
  const bool neverScanned = scans == 0 && scanned == 0 && shared == 0;
  const uint64_t pages4K = host.PageKB() / 4;
  const auto in4K = [&](uint64_t pages) { return pages == kNoValue ? pages : pages * pages4K; };
  const uint64_t zeroIfTold = zero == kNoValue ? 0 : zero;

  record.cow = in4K(shared + sharing + zeroIfTold);
  record.cow1 = in4K(sharing == 0 ? shared : kNoValue);
  record.zero = in4K(zero);
  record.used = in4K(shared);
  record.reclaimed = in4K(sharing + zeroIfTold);
  record.totAdd = neverScanned ? 0 : kNoValue;
  record.totRemove = neverScanned ? 0 : kNoValue;
  return Answer(buffer, record);
}

}  // namespace ksi
