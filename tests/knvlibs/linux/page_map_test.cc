// Counting the pages of a process: those of this program by the kernel itself, and entries of
// pagemap as older kernels hand them over.
#include "knvlibs/linux/machines/page_map.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <iterator>
#include <string>
#include <vector>

#include "knvlibs/linux/reading.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

constexpr uint64_t kMB = uint64_t{1} << 20;

// Memory that goes when its owner does.
class Memory {
 public:
  explicit Memory(size_t size) : size_(size) {
    start_ = static_cast<char*>(mmap(nullptr, size, PROT_READ | PROT_WRITE,
                                     MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0));
    madvise(start_, size, MADV_NOHUGEPAGE);
  }
  Memory(const Memory&) = delete;
  Memory& operator=(const Memory&) = delete;
  ~Memory() { munmap(start_, size_); }

  void Write(size_t offset, size_t size) const {
    for (size_t at = offset; at < offset + size; at += 4096) start_[at] = 1;
  }
  void Read(size_t offset, size_t size) const {
    for (size_t at = offset; at < offset + size; at += 4096) {
      (void)*static_cast<const volatile char*>(start_ + at);
    }
  }
  AddressRange Range() const {
    const auto start = reinterpret_cast<uintptr_t>(start_);
    return {start, start + size_};
  }

 private:
  size_t size_;
  char* start_;
};

TEST(PageMapTest, CountsWhatIsInMemoryAndNoZeroPages) {
  const Memory memory(400 * kMB);
  memory.Write(0, kMB);
  memory.Read(10 * kMB, 2 * kMB);
  memory.Write(300 * kMB, 3 * kMB);
  const Memory other(8 * kMB);
  other.Write(0, kMB);
  const AddressRange ranges[] = {memory.Range(), other.Range()};
  const LinuxHost host("/");
  PageCounts counts;
  ASSERT_EQ(CountPages(host, getpid(), ranges, counts), kOk);
  if (!counts.resident) GTEST_SKIP() << "this kernel tells nobody here which pages are zero pages";
  EXPECT_EQ(counts.resident, 5 * 1024u);
  EXPECT_EQ(counts.swapped, 0u);
  if (counts.huge) {
    EXPECT_EQ(counts.huge, 0u);
  }
}

TEST(PageMapTest, AProcessThatIsGoneIsNotFound) {
  const LinuxHost host("/");
  const AddressRange ranges[] = {{0x1000, 0x2000}};
  PageCounts counts;
  EXPECT_EQ(CountPages(host, INT32_MAX, ranges, counts), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(counts.resident, std::nullopt);
}

// From here on the kernel fails these calls of this process with an errno: requests to scan, and
// reads of more than one entry. 0 is none.
void FailPagemap(uint32_t scanError, uint32_t readError) {
  constexpr uint32_t kScanRequest = _IOC(_IOC_READ | _IOC_WRITE, 'f', 16, 96);
  const auto load = [](size_t at) {
    return sock_filter BPF_STMT(BPF_LD | BPF_W | BPF_ABS, static_cast<uint32_t>(at));
  };
  const auto unless = [](uint16_t relation, uint32_t value, uint8_t skipped) {
    return sock_filter BPF_JUMP(BPF_JMP | relation | BPF_K, value, 0, skipped);
  };
  const auto end = [](uint32_t error) {
    return sock_filter BPF_STMT(BPF_RET | BPF_K,
                                error == 0 ? SECCOMP_RET_ALLOW : SECCOMP_RET_ERRNO | error);
  };
  constexpr size_t kNumber = offsetof(seccomp_data, nr);
  constexpr size_t kSecond = offsetof(seccomp_data, args) + sizeof(uint64_t);
  constexpr size_t kThird = kSecond + sizeof(uint64_t);
  sock_filter steps[] = {load(kNumber),
                         unless(BPF_JEQ, SYS_ioctl, 3),
                         load(kSecond),
                         unless(BPF_JEQ, kScanRequest, 1),
                         end(scanError),
                         load(kNumber),
                         unless(BPF_JEQ, SYS_pread64, 3),
                         load(kThird),
                         unless(BPF_JGT, sizeof(uint64_t), 1),
                         end(readError),
                         end(0)};
  const sock_fprog program = {static_cast<uint16_t>(std::size(steps)), steps};
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 ||
      prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) != 0) {
    _exit(2);
  }
}

// Expects a count that fails so to end with `status` and with `told`.
void ExpectFailedCount(uint32_t scanError, uint32_t readError, Status status,
                       const std::string& told) {
  const LinuxHost host("/");
  host.Kept().walkTime = std::chrono::milliseconds(1);
  const Memory memory(kMB);
  const AddressRange ranges[] = {memory.Range()};
  const auto count = [&] {
    FailPagemap(scanError, readError);
    PageCounts counts;
    const Status end = CountPages(host, getpid(), ranges, counts);
    const bool isLost = host.LossStatus() != kOk;
    return end == status && !counts.resident && isLost == !told.empty();
  };
  EXPECT_EXIT(_exit(count() ? 0 : 1), testing::ExitedWithCode(0), "^" + told + "$")
      << scanError << " " << readError;
}

constexpr char kLeftOut[] = ": what cannot be read is left out or has no value\n";
constexpr char kNoTime[] =
    "virtual machines: no time left to look at the memory of all of them: what that would tell has "
    "no value\n";

TEST(PageMapTest, AScanThatFailsIsToldAndTheProcessIsNotGone) {
  const std::string file = "/proc/[0-9]+/pagemap: ";
  ExpectFailedCount(EIO, 0, KSI_STATUS_IO_ERROR, file + "Input/output error" + kLeftOut);
  ExpectFailedCount(ENOMEM, 0, KSI_STATUS_NO_MEMORY, file + "Cannot allocate memory" + kLeftOut);
  ExpectFailedCount(ESRCH, 0, KSI_STATUS_NOT_FOUND, "");
  // Asked again until there is no more time.
  ExpectFailedCount(EINTR, 0, kOk, kNoTime);
}

// Whether the kernel tells this process in which frame a page lies.
bool TellsFrames() {
  uint64_t entry = 0;
  const FileDescriptor pagemap(open("/proc/self/pagemap", O_RDONLY | O_CLOEXEC));
  const auto page = reinterpret_cast<uintptr_t>(&entry) / static_cast<uintptr_t>(getpagesize());
  const auto at = static_cast<off_t>(page * sizeof entry);
  return pread(pagemap.Get(), &entry, sizeof entry, at) == sizeof entry && entry << 9 != 0;
}

TEST(PageMapTest, SoIsAReadOfEntries) {
  if (!TellsFrames()) GTEST_SKIP() << "this kernel tells nobody here which pages are zero pages";
  const std::string file = "/proc/[0-9]+/pagemap: ";
  ExpectFailedCount(ENOTTY, EIO, KSI_STATUS_IO_ERROR, file + "Input/output error" + kLeftOut);
  ExpectFailedCount(ENOTTY, ENOMEM, KSI_STATUS_NO_MEMORY,
                    file + "Cannot allocate memory" + kLeftOut);
  ExpectFailedCount(ENOTTY, ESRCH, KSI_STATUS_NOT_FOUND, "");
  ExpectFailedCount(ENOTTY, EINTR, kOk, kNoTime);
}

TEST(PageMapTest, EntriesTellWhatAScanTells) {
  if (!TellsFrames()) GTEST_SKIP() << "this kernel tells nobody here which pages are zero pages";
  const Memory memory(40 * kMB);
  memory.Write(0, 20 * kMB);
  memory.Read(20 * kMB, kMB);
  memory.Write(22 * kMB, 18 * kMB);
  const uint64_t start = memory.Range().start;
  const AddressRange ranges[] = {{start + kMB, start + 2 * kMB},
                                 {start + 3 * kMB, start + 23 * kMB}};
  const auto count = [&] {
    FailPagemap(ENOTTY, 0);
    PageCounts counts;
    return CountPages(LinuxHost("/"), getpid(), ranges, counts) == kOk &&
           counts.resident == 19 * 1024u && counts.swapped == 0u && counts.huge == 0u;
  };
  EXPECT_EXIT(_exit(count() ? 0 : 1), testing::ExitedWithCode(0), "^$");
}

TEST(PageMapTest, EntriesTellOfHugePagesWhatAScanTells) {
  if (!TellsFrames()) GTEST_SKIP() << "this kernel tells nobody here which pages are zero pages";
  const Memory memory(32 * kMB);
  madvise(reinterpret_cast<void*>(memory.Range().start), 32 * kMB, MADV_HUGEPAGE);
  memory.Write(0, 32 * kMB);
  const AddressRange ranges[] = {memory.Range()};
  const LinuxHost host("/");
  PageCounts scanned;
  ASSERT_EQ(CountPages(host, getpid(), ranges, scanned), kOk);
  if (scanned.huge.value_or(0) == 0) GTEST_SKIP() << "this machine has no huge pages to give";
  const auto count = [&] {
    FailPagemap(ENOTTY, 0);
    PageCounts counts;
    return CountPages(host, getpid(), ranges, counts) == kOk && counts.resident == 32 * 1024u &&
           counts.huge == scanned.huge;
  };
  EXPECT_EXIT(_exit(count() ? 0 : 1), testing::ExitedWithCode(0), "^$");
}

TEST(PageMapTest, WithoutTimeThereAreNoFiguresAndAWord) {
  const LinuxHost host("/");
  host.Kept().walkTime = std::chrono::nanoseconds(0);
  const Memory memory(kMB);
  const AddressRange ranges[] = {memory.Range()};
  for (const char* told :
       {"virtual machines: no time left to look at the memory of all of them: what that would tell "
        "has no value\n",
        ""}) {
    PageCounts counts;
    testing::internal::CaptureStderr();
    EXPECT_EQ(CountPages(host, getpid(), ranges, counts), kOk);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), told);
    EXPECT_EQ(counts.resident, std::nullopt);
    EXPECT_EQ(counts.swapped, std::nullopt);
    EXPECT_EQ(host.LossStatus(), KSI_STATUS_TIMEOUT);
  }
}

TEST(PageMapTest, WalksTakeOfTheTimeForAll) {
  const LinuxHost host("/");
  const Memory memory(64 * kMB);
  memory.Write(0, 64 * kMB);
  const AddressRange ranges[] = {memory.Range()};
  PageCounts counts;
  ASSERT_EQ(CountPages(host, getpid(), ranges, counts), kOk);
  EXPECT_LT(host.Kept().walkTime, kWalkTime);
}

constexpr uint64_t kPresent = uint64_t{1} << 63;
constexpr uint64_t kSwap = uint64_t{1} << 62;
constexpr uint64_t kFile = uint64_t{1} << 61;
constexpr uint64_t kExclusive = uint64_t{1} << 56;
constexpr uint64_t kZeroFrame = 4711;

constexpr uint64_t kHugeZero = 1024;
constexpr uint64_t kTransparent = 2048;
constexpr uint64_t kHugetlb = 4096;
constexpr uint64_t kCannotBeRead = 8192;

// /proc/kpageflags
Figure FlagsOf(uint64_t frame) {
  switch (frame) {
    case kHugeZero:
      return uint64_t{1} << 24 | uint64_t{1} << 22;
    case kTransparent:
      return uint64_t{1} << 22;
    case kHugetlb:
      return uint64_t{1} << 17;
    case kCannotBeRead:
      return std::nullopt;
    default:
      return 0;
  }
}

// The entries of so many frames side by side.
std::vector<uint64_t> Entries(uint64_t first, uint64_t count) {
  std::vector<uint64_t> entries;
  for (uint64_t i = 0; i < count; ++i) entries.push_back(kPresent | (first + i));
  return entries;
}

class EntryCounterTest : public testing::Test {
 protected:
  // Takes entries of the pages from `address` on.
  void Take(uint64_t address, const std::vector<uint64_t>& entries) {
    for (const uint64_t entry : entries) {
      counter_.Take(address, entry);
      address += 4096;
    }
  }

  EntryCounter counter_{4096, kZeroFrame, FlagsOf};
};

TEST_F(EntryCounterTest, PagesAreResidentOrSwappedOrNothing) {
  Take(0x1000, {0, kPresent | kExclusive | 5, kPresent | kFile | 6, kPresent | 7, kSwap | 8, 9});
  EXPECT_EQ(counter_.Resident(), 3u);
  EXPECT_EQ(counter_.Swapped(), 1u);
}

TEST_F(EntryCounterTest, TheZeroPageIsNotResident) {
  Take(0x1000, {kPresent | kZeroFrame, kPresent | kZeroFrame});
  EXPECT_EQ(counter_.Resident(), 0u);
  Take(0x3000, {kPresent | kExclusive | kZeroFrame, kPresent | kFile | kZeroFrame});
  EXPECT_EQ(counter_.Resident(), 2u) << "it is nobody's own and no file's";
}

TEST_F(EntryCounterTest, NeitherIsTheHugeZeroPage) {
  Take(4 * kMB, Entries(kHugeZero, 512));
  EXPECT_EQ(counter_.Resident(), 0u);
  Take(6 * kMB, {kPresent | 512, kPresent | 513});
  EXPECT_EQ(counter_.Resident(), 2u) << "a huge page of another frame";
  Take(8 * kMB + 4096, {kPresent | 1024});
  EXPECT_EQ(counter_.Resident(), 3u) << "no huge page begins there";
  Take(10 * kMB, {kPresent | kExclusive | 1024});
  EXPECT_EQ(counter_.Resident(), 4u) << "the huge zero page is nobody's own";
  EXPECT_EQ(counter_.Huge(), 0u);
}

TEST_F(EntryCounterTest, HugePagesAreTransparentOrOfHugetlb) {
  Take(4 * kMB, Entries(kTransparent, 512));
  EXPECT_EQ(counter_.Huge(), 512u);
  Take(6 * kMB, Entries(kHugetlb, 512));
  EXPECT_EQ(counter_.Huge(), 1024u);
  Take(8 * kMB, Entries(512, 512));
  EXPECT_EQ(counter_.Huge(), 1024u) << "frames side by side are no huge page by that";
  EXPECT_EQ(counter_.Resident(), 3 * 512u);
}

TEST_F(EntryCounterTest, WhatIsLeftOfAHugePageIsNone) {
  std::vector<uint64_t> cut = Entries(kTransparent, 512);
  cut[100] = 0;
  Take(4 * kMB, cut);
  cut[100] = kPresent | kExclusive | 7;
  Take(6 * kMB, cut);
  Take(8 * kMB, Entries(kTransparent, 511));
  Take(10 * kMB + 4096, Entries(kTransparent, 511));
  Take(12 * kMB, Entries(kTransparent + 1, 512));
  EXPECT_EQ(counter_.Huge(), 0u);
  EXPECT_EQ(counter_.Resident(), 511u + 512 + 511 + 511 + 512);
}

TEST_F(EntryCounterTest, WithoutFlagsHugePagesAreNotKnown) {
  Take(4 * kMB, Entries(kTransparent, 512));
  Take(6 * kMB, Entries(kCannotBeRead, 512));
  EXPECT_EQ(counter_.Huge(), std::nullopt);
  EXPECT_EQ(counter_.Resident(), 2 * 512u);
}

}  // namespace
}  // namespace ksi
