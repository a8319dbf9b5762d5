// Counting the pages of a process: those of this program by the kernel itself, and entries of
// pagemap as older kernels hand them over.
#include "knvlibs/linux/machines/page_map.h"

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

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

bool IsAt1024(uint64_t frame) { return frame == 1024; }

class EntryCounterTest : public testing::Test {
 protected:
  // Takes entries of the pages from `address` on.
  void Take(uint64_t address, const std::vector<uint64_t>& entries) {
    for (const uint64_t entry : entries) {
      counter_.Take(address, entry);
      address += 4096;
    }
  }

  EntryCounter counter_{4096, kZeroFrame, IsAt1024};
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
  std::vector<uint64_t> huge;
  for (uint64_t i = 0; i < 512; ++i) huge.push_back(kPresent | (1024 + i));
  Take(4 * kMB, huge);
  EXPECT_EQ(counter_.Resident(), 0u);
  Take(6 * kMB, {kPresent | 512, kPresent | 513});
  EXPECT_EQ(counter_.Resident(), 2u) << "a huge page of another frame";
  Take(8 * kMB + 4096, {kPresent | 1024});
  EXPECT_EQ(counter_.Resident(), 3u) << "no huge page begins there";
  Take(10 * kMB, {kPresent | kExclusive | 1024});
  EXPECT_EQ(counter_.Resident(), 4u) << "the huge zero page is nobody's own";
}

}  // namespace
}  // namespace ksi
