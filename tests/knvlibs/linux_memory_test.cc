// The host's memory as a whole, from files that the tests make.
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/linux_source.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

constexpr uint64_t kPage = 4;  // KB

// Two zones of a node and one of another, as kernels from 4.x to 6.x write them.
std::string Zoneinfo(uint64_t freeOfNormal) {
  return R"(Node 0, zone      DMA
  per-node stats
      nr_inactive_anon 985
      nr_free_cma  0
  pages free     100
        boost    0
        min      1
        low      2
        high     3
        promo    4
        spanned  500
        present  400
        managed  300
        cma      0
        protection: (0, 3019, 4043, 4043, 4043)
      nr_free_pages 3840
      high     77
  pagesets
    cpu: 0
              count: 9
              high:  8
  start_pfn:           1
Node 0, zone   Normal
  pages free     )" +
         std::to_string(freeOfNormal) + R"(
        min      90
        low      190
        high     290
        spanned  5000
        present  4000
        managed  3900
        protection: (0, 0, 0)
Node 1, zone  Movable
  pages free     0
        min      9
        low      8
        high     7
        spanned  0
        present  0
        managed  0
        protection: (0, 0, 0, 0, 0)
)";
}

constexpr const char* kMeminfo = R"(MemTotal:          16800 kB
MemFree:            4000 kB
Buffers:             100 kB
Cached:             2000 kB
AnonPages:          3000 kB
Shmem:               500 kB
Slab:                700 kB
PageTables:           50 kB
SecPageTables:         7 kB
VmallocUsed:          60 kB
Percpu:               30 kB
HardwareCorrupted:     8 kB
HugePages_Total:       5
HugePages_Free:        2
Hugepagesize:       2048 kB
)";

constexpr const char* kIomem = R"(00001000-0009fbff : System RAM
00100000-bfffffff : System RAM
  01000000-010fffff : Kernel code
  02000000-020fffff : Kernel rodata
100000000-1000fffff : System RAM
  100000000-1000003ff : Kernel code
)";

class LinuxMemory : public testing::Test {
 protected:
  void SetUp() override {
    if (sysconf(_SC_PAGESIZE) != 4096) GTEST_SKIP() << "the figures are for pages of 4 KB";
    tree_.Write("/proc/meminfo", kMeminfo);
    tree_.Write("/proc/zoneinfo", Zoneinfo(1000));
    tree_.Write("/proc/vmstat", "nr_free_pages 1100\nnr_memmap_pages 3\nnr_memmap_boot_pages 20\n");
    tree_.Write("/proc/iomem", kIomem);
  }

  Status Read(KSI_Comprehensive* record) {
    LinuxSource source(tree_.Root());
    return GetValue(source, "memory/comprehensive", {}, record);
  }
  Status Read(KSI_GlobalTally* record) {
    LinuxSource source(tree_.Root());
    return GetValue(source, "sched/globalStats/memory/tally", {}, record);
  }

  KSI_Comprehensive Comprehensive() {
    KSI_Comprehensive record = {};
    EXPECT_EQ(Read(&record), kOk);
    return record;
  }

  // Expects the read to fail as not understood, with this one diagnostic.
  void ExpectNotUnderstood(const std::string& diagnostic) {
    KSI_Comprehensive record;
    testing::internal::CaptureStderr();
    EXPECT_EQ(Read(&record), KSI_STATUS_INVALID_METADATA);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), diagnostic + "\n");
  }

  HostTree tree_;
};

TEST_F(LinuxMemory, IsDividedAsTheFilesSay) {
  const KSI_Comprehensive record = Comprehensive();
  EXPECT_EQ(uint64_t{record.total}, 4400 * kPage);
  EXPECT_EQ(uint64_t{record.managedByMemMap}, 16800u);
  EXPECT_EQ(uint64_t{record.reliableMem}, 0u);
  EXPECT_EQ(uint64_t{record.discarded}, 8u);
  EXPECT_EQ(uint64_t{record.critical}, 100 * kPage);
  EXPECT_EQ(uint64_t{record.buddyOvhd}, 23 * kPage);
  EXPECT_EQ(uint64_t{record.kernelCode}, 1024u + 1);
  EXPECT_EQ(uint64_t{record.dataAndHeap}, 700u + 50 + 7 + 60 + 30 + 9 * kPage);
  EXPECT_EQ(uint64_t{record.knvClientConsumed}, 100u + 2000 - 500);
  EXPECT_EQ(uint64_t{record.otherConsumed}, 3000u + 500 + 5 * 2048);
  EXPECT_EQ(uint64_t{record.rsvdLow}, 100 * kPage);
  EXPECT_EQ(uint64_t{record.free}, 4000u);
}

TEST_F(LinuxMemory, FiguresThatCannotBeToldHaveNoValue) {
  tree_.Write("/proc/vmstat", "nr_free_pages 1100\n");
  // As ordinary users see it.
  tree_.Write("/proc/iomem", "00000000-00000000 : System RAM\n  00000000-00000000 : Kernel code\n");
  KSI_Comprehensive record = Comprehensive();
  EXPECT_EQ(uint64_t{record.buddyOvhd}, kNoValue);
  EXPECT_EQ(uint64_t{record.kernelCode}, kNoValue);

  for (const char* iomem :
       {"", "01000000 : Kernel code\n", "xx-yy : Kernel code\n", "2000-1000 : Kernel code\n"}) {
    tree_.Write("/proc/iomem", iomem);
    record = Comprehensive();
    EXPECT_EQ(uint64_t{record.kernelCode}, kNoValue) << iomem;
  }
}

TEST_F(LinuxMemory, MechanismsThatAKernelIsBuiltWithoutAreZero) {
  tree_.Write("/proc/meminfo",
              "MemTotal: 16800 kB\nMemFree: 4000 kB\nBuffers: 100 kB\nCached: 2000 kB\n"
              "AnonPages: 3000 kB\nSlab: 700 kB\nPageTables: 50 kB\nVmallocUsed: 60 kB\n");
  const KSI_Comprehensive record = Comprehensive();
  EXPECT_EQ(uint64_t{record.discarded}, 0u);
  EXPECT_EQ(uint64_t{record.dataAndHeap}, 810u + 9 * kPage);
  EXPECT_EQ(uint64_t{record.otherConsumed}, 3000u);
}

TEST_F(LinuxMemory, CompressedMemoryIsTheKernels) {
  const uint64_t without = Comprehensive().dataAndHeap;
  tree_.Write("/proc/vmstat", "nr_zspages 50\n");
  EXPECT_EQ(uint64_t{Comprehensive().dataAndHeap}, without + 50 * kPage);
  // A pool of zswap that is in zsmalloc, and one that is not.
  tree_.Write("/proc/meminfo", std::string(kMeminfo) + "Zswap: 100 kB\n");
  EXPECT_EQ(uint64_t{Comprehensive().dataAndHeap}, without + 50 * kPage);
  tree_.Write("/proc/meminfo", std::string(kMeminfo) + "Zswap: 300 kB\n");
  EXPECT_EQ(uint64_t{Comprehensive().dataAndHeap}, without + 300);
}

TEST_F(LinuxMemory, HugePagesOfAllSizesAreInUseOrKeptForIt) {
  tree_.Write("/proc/meminfo", std::string(kMeminfo) + "Hugetlb: 1058816 kB\n");
  EXPECT_EQ(uint64_t{Comprehensive().otherConsumed}, 3000u + 500 + 1058816);
}

TEST_F(LinuxMemory, WhatNobodyHasMappedIsOnTheListsOfReclaim) {
  // Pages of files 1600, and of processes 3900, of which 400 wait in the swap cache.
  const std::string lists = "Active: 2000 kB\nInactive: 3000 kB\nUnevictable: 480 kB\n";
  tree_.Write("/proc/vmstat", "nr_isolated_anon 2\nnr_isolated_file 3\n");
  tree_.Write("/proc/meminfo", kMeminfo + lists);
  EXPECT_EQ(uint64_t{Comprehensive().otherConsumed}, 3900u + 5 * 2048);
  EXPECT_EQ(uint64_t{Comprehensive().knvClientConsumed}, 1600u);
  // Lists that miss pages that were just made, and such as tell of a part only.
  for (const char* less : {"Active: 1000 kB\nInactive: 100 kB\nUnevictable: 0 kB\n",
                           "Active: 9000 kB\nInactive: 9000 kB\n"}) {
    tree_.Write("/proc/meminfo", std::string(kMeminfo) + less);
    EXPECT_EQ(uint64_t{Comprehensive().otherConsumed}, 3500u + 5 * 2048) << less;
  }
}

TEST_F(LinuxMemory, StateFollowsFromTheWatermarks) {
  // The sums over all zones: min 100, low 200, high 300, and 100 free outside of zone Normal.
  const struct {
    uint64_t free;
    uint32_t state;
  } kCases[] = {{5000, 0}, {300, 0}, {299, 1}, {200, 1}, {199, 2}, {150, 2}, {149, 3}, {100, 3}};
  for (const auto& each : kCases) {
    tree_.Write("/proc/zoneinfo", Zoneinfo(each.free - 100));
    KSI_GlobalTally record = {};
    ASSERT_EQ(Read(&record), kOk);
    EXPECT_EQ(uint32_t{record.memState}, each.state) << each.free;
    EXPECT_EQ(uint64_t{record.minFree}, 300 * kPage);
    EXPECT_EQ(uint64_t{record.managedByMemSched}, 16800u - 847 - 9 * kPage);
  }
  std::string low = Zoneinfo(0);
  low.replace(low.find("free     100"), 12, "free     099");
  tree_.Write("/proc/zoneinfo", low);
  KSI_GlobalTally record = {};
  ASSERT_EQ(Read(&record), kOk);
  EXPECT_EQ(uint32_t{record.memState}, 4u);
}

// Little may be free, or enough, at the price of what is wanted again at once.
TEST_F(LinuxMemory, StateFollowsFromThePressureWhereReclaimIsAtWork) {
  const auto stateAt = [this](uint64_t free, const std::string& some, const std::string& full) {
    tree_.Write("/proc/zoneinfo", Zoneinfo(free - 100));
    tree_.Write("/proc/pressure/memory",
                "some avg10=" + some + " avg60=0.00 avg300=0.00 total=1\n" + "full avg10=" + full +
                    " avg60=99.00 avg300=99.00 total=1\n");
    KSI_GlobalTally record = {};
    EXPECT_EQ(Read(&record), kOk);
    return uint32_t{record.memState};
  };
  EXPECT_EQ(stateAt(599, "9.99", "9.99"), 0u);
  EXPECT_EQ(stateAt(599, "10.00", "9.99"), 2u);
  EXPECT_EQ(stateAt(599, "10.00", "10.00"), 3u);
  EXPECT_EQ(stateAt(599, "100.00", "49.99"), 3u);
  EXPECT_EQ(stateAt(599, "50.00", "50.00"), 4u);
  // What the watermarks say is the least.
  EXPECT_EQ(stateAt(149, "10.00", "0.00"), 3u);
  EXPECT_EQ(stateAt(149, "60.00", "50.00"), 4u);
  // With so much free, who waits has come to a limit of his own.
  EXPECT_EQ(stateAt(600, "100.00", "100.00"), 0u);
}

TEST_F(LinuxMemory, PressureThatIsNotUnderstoodIsSaid) {
  for (const char* text :
       {"some avg10=1\n", "some avg10=1.2.3\n", "some avg10=x.00\n", "some avg60=0.00\n",
        "none avg10=0.00\n", "some avg10=.00\n", "some avg10=999999999999999999.00\n"}) {
    tree_.Write("/proc/pressure/memory", text);
    KSI_GlobalTally record = {};
    testing::internal::CaptureStderr();
    EXPECT_EQ(Read(&record), Status{KSI_STATUS_INVALID_METADATA}) << text;
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "/proc/pressure/memory: line 1 is not understood\n")
        << text;
  }
}

TEST_F(LinuxMemory, StatesWereNeverLeft) {
  LinuxSource source(tree_.Root());
  for (const char* state : {"high", "clear", "soft", "hard", "low"}) {
    KSI_StateTransitions record = {};
    record.up = record.down = 7;
    EXPECT_EQ(GetValue(source, "sched/globalStats/memory/stateTransitions", {state}, &record), kOk);
    EXPECT_EQ(uint32_t{record.up}, 0u);
    EXPECT_EQ(uint32_t{record.down}, 0u);
  }
  KSI_StateTransitions record = {};
  for (const char* state : {"unknown", "High", ""}) {
    EXPECT_EQ(GetValue(source, "sched/globalStats/memory/stateTransitions", {state}, &record),
              KSI_STATUS_NOT_FOUND);
  }
}

TEST_F(LinuxMemory, MeminfoIsUnderstoodOrRefused) {
  tree_.Write("/proc/meminfo", "MemTotal: 5 kB\nMemFree 5 kB\n");
  ExpectNotUnderstood("/proc/meminfo: line 2 is not understood");
  for (const char* line : {"MemTotal: 5 MB", "MemTotal: -5 kB", "MemTotal: 5 kB more", "MemTotal:",
                           "MemTotal: 5x kB", "MemTotal: 18446744073709551616 kB", ""}) {
    tree_.Write("/proc/meminfo", std::string(line) + "\n");
    ExpectNotUnderstood("/proc/meminfo: line 1 is not understood");
  }
  tree_.Write("/proc/meminfo", "MemTotal: 5 kB\n");
  ExpectNotUnderstood("/proc/meminfo: MemFree is missing");
}

TEST_F(LinuxMemory, VmstatIsUnderstoodOrRefused) {
  for (const char* line : {"nr_free_pages", "nr_free_pages x", "nr_free_pages 1 2"}) {
    tree_.Write("/proc/vmstat", std::string("a 1\n") + line + "\n");
    ExpectNotUnderstood("/proc/vmstat: line 2 is not understood");
  }
}

TEST_F(LinuxMemory, ZoneinfoIsUnderstoodOrRefused) {
  const std::string good = Zoneinfo(1000);
  const auto without = [&](const std::string& part, const std::string& instead = "") {
    std::string text = good;
    text.replace(text.find(part), part.size(), instead);
    return text;
  };
  const std::pair<std::string, int> kCases[] = {
      {"", 0},
      {"Node 0\n", 1},
      {without("Node 0, zone      DMA", "Node x, zone DMA"), 1},
      {without("Node 0, zone      DMA", "Node 0, zone"), 1},
      {without("        low      2\n"), 14},  // a watermark is missing
      {without("low      2", "low      two"), 8},
      {without("low      2", "low      2 3"), 8},
      {good.substr(0, good.find("        protection: (0, 0, 0)\n")), 30},  // cut off
      {without("        protection: (0, 0, 0)\n"), 31},  // the next zone begins in this one
  };
  for (const auto& [text, line] : kCases) {
    tree_.Write("/proc/zoneinfo", text);
    ExpectNotUnderstood("/proc/zoneinfo: line " + std::to_string(line) + " is not understood");
  }
}

TEST_F(LinuxMemory, FilesThatAreMissingOrLockedAreAStatus) {
  for (const char* file : {"/proc/meminfo", "/proc/vmstat", "/proc/zoneinfo"}) {
    const HostTree tree;
    const std::string skipped = file;
    if (skipped != "/proc/meminfo") tree.Write("/proc/meminfo", kMeminfo);
    if (skipped != "/proc/vmstat") tree.Write("/proc/vmstat", "a 1\n");
    if (skipped != "/proc/zoneinfo") tree.Write("/proc/zoneinfo", Zoneinfo(5));
    LinuxSource source(tree.Root());
    KSI_Comprehensive record = {};
    EXPECT_EQ(GetValue(source, "memory/comprehensive", {}, &record), KSI_STATUS_NOT_FOUND) << file;
  }
  const LinuxHost nowhere(tree_.Root() + "/none");
  std::string content;
  EXPECT_EQ(nowhere.Read("/proc/meminfo", content), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(LinuxHost(tree_.Root()).Read("/proc", content), KSI_STATUS_IS_A_DIRECTORY);
}

}  // namespace
}  // namespace ksi
