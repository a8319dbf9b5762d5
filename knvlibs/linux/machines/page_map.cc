#include "knvlibs/linux/machines/page_map.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <functional>
#include <optional>
#include <string>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/groups/process.h"
#include "knvlibs/linux/host/walk_time.h"

namespace ksi {
namespace {

constexpr uint64_t kHugePage = uint64_t{2} << 20;

// The PAGEMAP_SCAN request of Linux 6.7, which the headers of older systems do not have.
struct pm_scan_arg {
  uint64_t size;
  uint64_t flags;
  uint64_t start;
  uint64_t end;
  uint64_t walk_end;
  uint64_t vec;
  uint64_t vec_len;
  uint64_t max_pages;
  uint64_t category_inverted;
  uint64_t category_mask;
  uint64_t category_anyof_mask;
  uint64_t return_mask;
};
struct page_region {
  uint64_t start;
  uint64_t end;
  uint64_t categories;
};
constexpr unsigned long kScanRequest = _IOWR('f', 16, pm_scan_arg);
constexpr uint64_t kIsPresent = 1 << 3;
constexpr uint64_t kIsSwapped = 1 << 4;
constexpr uint64_t kIsZero = 1 << 5;
constexpr uint64_t kIsHuge = 1 << 6;

// The kernel holds the address space for one request: some 30 us for so much, which whoever maps
// or unmaps memory meanwhile waits. Smaller pieces spare it little and are more waits.
constexpr uint64_t kMostScanned = uint64_t{8} << 20;

// A piece of the walk and what comes after it: who asks again at once may be served before a
// process that waits, which is to have its turn.
class Piece {
 public:
  explicit Piece(const LinuxHost& host) : walk_(host) {}
  Piece(const Piece&) = delete;
  Piece& operator=(const Piece&) = delete;
  ~Piece() {
    constexpr useconds_t kPause = 100;
    usleep(kPause);
  }

 private:
  Walk walk_;
};

struct ByteCounts {
  uint64_t resident = 0;
  uint64_t swapped = 0;
  uint64_t huge = 0;

  void Add(const page_region& region) {
    const uint64_t size = region.end - region.start;
    if ((region.categories & kIsSwapped) != 0) swapped += size;
    if ((region.categories & kIsPresent) == 0 || (region.categories & kIsZero) != 0) return;
    resident += size;
    if ((region.categories & kIsHuge) != 0) huge += size;
  }
};

// Scans from range.start on, some way; false with errno if that fails. range.start goes along.
bool ScanPiece(int pagemap, AddressRange& range, ByteCounts& counts) {
  std::array<page_region, 512> regions;
  pm_scan_arg request = {};
  request.size = sizeof request;
  request.start = range.start;
  request.end = std::min(range.end, range.start + kMostScanned);
  request.vec = reinterpret_cast<uintptr_t>(regions.data());
  request.vec_len = regions.size();
  request.category_anyof_mask = kIsPresent | kIsSwapped;
  request.return_mask = kIsPresent | kIsSwapped | kIsZero | kIsHuge;
  const int found = ioctl(pagemap, kScanRequest, &request);
  if (found < 0) return false;
  for (const page_region& region : std::span(regions).first(static_cast<size_t>(found))) {
    counts.Add(region);
  }
  // What is no longer mapped ends a walk early.
  range.start = request.walk_end > range.start ? request.walk_end : request.end;
  return true;
}

// An entry of pagemap: the frame that a page in memory lies in.
uint64_t FrameOf(uint64_t entry) { return entry & ((uint64_t{1} << 55) - 1); }

// The zero page is nobody's own and no file's.
bool MayBeZero(uint64_t entry) {
  constexpr uint64_t kIsExclusive = uint64_t{1} << 56;
  constexpr uint64_t kIsFile = uint64_t{1} << 61;
  return (entry & (kIsExclusive | kIsFile)) == 0;
}

// The frame that a page of this program lies in, if the kernel tells.
Figure FrameOf(const void* page) {
  const FileDescriptor pagemap(open("/proc/self/pagemap", O_RDONLY | O_CLOEXEC));
  const auto number = reinterpret_cast<uintptr_t>(page) / static_cast<uintptr_t>(getpagesize());
  uint64_t entry = 0;
  if (pread(pagemap.Get(), &entry, sizeof entry, static_cast<off_t>(number * sizeof entry)) !=
      sizeof entry) {
    return std::nullopt;
  }
  return FrameOf(entry) == 0 ? std::nullopt : Figure(FrameOf(entry));
}

// Memory that was only ever read is the zero page.
Figure FindZeroFrame() {
  const auto size = static_cast<size_t>(getpagesize());
  void* page = mmap(nullptr, size, PROT_READ, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (page == MAP_FAILED) return std::nullopt;
  (void)*static_cast<volatile const char*>(page);
  const Figure frame = FrameOf(page);
  munmap(page, size);
  return frame;
}

// What the kernel says of frames.
class FrameFlags {
 public:
  Figure operator()(uint64_t frame) const {
    uint64_t flags = 0;
    const auto at = static_cast<off_t>(frame * sizeof flags);
    if (pread(file_.Get(), &flags, sizeof flags, at) != sizeof flags) return std::nullopt;
    return flags;
  }

 private:
  FileDescriptor file_{open("/proc/kpageflags", O_RDONLY | O_CLOEXEC)};
};

// The kernel itself hands the entries over in pieces.
Status CountEntries(const LinuxHost& host, const std::string& file, int pagemap,
                    std::span<const AddressRange> ranges, PageCounts& counts) {
  const Figure zeroFrame = FindZeroFrame();
  if (!zeroFrame) return KSI_STATUS_PERMISSION_DENIED;
  const uint64_t pageSize = host.PageKB() * 1024;
  const FrameFlags flags;
  EntryCounter counter(pageSize, *zeroFrame, std::ref(flags));
  std::array<uint64_t, 4096> entries;
  for (const AddressRange& range : ranges) {
    for (uint64_t at = range.start; at < range.end;) {
      if (!MayWalk(host)) return kOk;
      const Piece piece(host);
      const size_t most = std::min<uint64_t>(entries.size(), (range.end - at) / pageSize);
      const ssize_t size = pread(pagemap, entries.data(), most * sizeof entries[0],
                                 static_cast<off_t>(at / pageSize * sizeof entries[0]));
      if (size < 0 && errno == EINTR) continue;
      if (size < 0) return host.Failed(file, errno);
      const size_t count = static_cast<size_t>(size) / sizeof entries[0];
      if (count == 0) return KSI_STATUS_NOT_FOUND;
      for (const uint64_t entry : std::span(entries).first(count)) {
        counter.Take(at, entry);
        at += pageSize;
      }
    }
  }
  counts = {counter.Resident() * host.PageKB(), counter.Swapped() * host.PageKB(),
            ProductOf(counter.Huge(), host.PageKB())};
  return kOk;
}

// None if the kernel does not offer it.
std::optional<Status> Scan(const LinuxHost& host, const std::string& file, int pagemap,
                           std::span<const AddressRange> ranges, PageCounts& counts) {
  ByteCounts bytes;
  for (AddressRange range : ranges) {
    while (range.start < range.end) {
      if (!MayWalk(host)) return kOk;
      const Piece piece(host);
      if (ScanPiece(pagemap, range, bytes) || errno == EINTR) continue;
      if (errno == ENOTTY || errno == EINVAL) return std::nullopt;
      return host.Failed(file, errno);
    }
  }
  counts = {bytes.resident / 1024, bytes.swapped / 1024, bytes.huge / 1024};
  return kOk;
}

void WarnDenied(const LinuxHost& host, const std::string& file) {
  if (!host.First("pagemap denied")) return;
  Warning("%s: not permitted: what is in memory of large virtual machines has no value\n",
          file.c_str());
}

}  // namespace

// What begins with the entry of an address at which a huge page may.
EntryCounter::Within EntryCounter::FindBeginning(uint64_t entry) {
  constexpr uint64_t kIsHugetlb = uint64_t{1} << 17;
  constexpr uint64_t kIsTransparent = uint64_t{1} << 22;
  constexpr uint64_t kIsZeroPage = uint64_t{1} << 24;
  next_ = FrameOf(entry);
  if (next_ % (kHugePage / pageSize_) != 0 || next_ == zeroFrame_) return Within::kSmall;
  const Figure flags = flagsOf_(next_);
  if (!flags) huge_.reset();
  if ((flags.value_or(0) & kIsZeroPage) != 0) {
    return MayBeZero(entry) ? Within::kHugeZero : Within::kSmall;
  }
  return (flags.value_or(0) & (kIsHugetlb | kIsTransparent)) != 0 ? Within::kHuge : Within::kSmall;
}

void EntryCounter::TakePresent(uint64_t entry) {
  if (MayBeZero(entry) && (FrameOf(entry) == zeroFrame_ || within_ == Within::kHugeZero)) return;
  ++resident_;
  // Of a huge page that was cut, what is left is mapped page by page.
  if (within_ != Within::kHuge || FrameOf(entry) != next_) {
    within_ = Within::kSmall;
    return;
  }
  ++next_;
  const uint64_t frames = kHugePage / pageSize_;
  if (next_ % frames == 0) huge_ = SumOf({huge_, frames});
}

void EntryCounter::Take(uint64_t address, uint64_t entry) {
  constexpr uint64_t kIsInSwap = uint64_t{1} << 62;
  constexpr uint64_t kIsInMemory = uint64_t{1} << 63;
  if ((entry & kIsInSwap) != 0) ++swapped_;
  if ((entry & kIsInMemory) == 0) {
    within_ = Within::kSmall;
    return;
  }
  if (address % kHugePage == 0) within_ = FindBeginning(entry);
  TakePresent(entry);
}

Status CountPages(const LinuxHost& host, int32_t pid, std::span<const AddressRange> ranges,
                  PageCounts& counts) {
  counts = PageCounts();
  const std::string file = ProcessFile(pid, "pagemap");
  FileDescriptor pagemap;
  Status status = host.Open(file, pagemap);
  if (status == kOk) {
    const std::optional<Status> scanned = Scan(host, file, pagemap.Get(), ranges, counts);
    status = scanned ? *scanned : CountEntries(host, file, pagemap.Get(), ranges, counts);
  }
  if (status != KSI_STATUS_PERMISSION_DENIED) return status;
  WarnDenied(host, file);
  return kOk;
}

}  // namespace ksi
