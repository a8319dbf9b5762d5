// The nodes of the host as a whole, from recorded hosts and from files that are out of the
// ordinary. What each figure is to be is in tally-linux(7).
#include <gtest/gtest.h>
#include <unistd.h>

#include <numeric>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/linux_source.h"
#include "tests/harness/golden.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

constexpr uint32_t kNoValue32 = ~uint32_t{0};

class RecordedHostTest : public testing::TestWithParam<const char*> {};

TEST_P(RecordedHostTest, TellsTheFiguresOfTheHost) {
  LinuxSource source(RecordedHost(GetParam()));
  harness::ExpectGolden(std::string("knvlibs/hosts/") + GetParam() + ".txt", HostText(source));
}

INSTANTIATE_TEST_SUITE_P(Hosts, RecordedHostTest,
                         testing::Values("cgroup-v1-vm", "systemd-server", "kvm-two-nodes"),
                         [](const auto& host) {
                           std::string name = host.param;
                           std::erase(name, '-');
                           return name;
                         });

class LinuxHostTest : public testing::Test {
 protected:
  // Reads anew: a source keeps what it has read for a while.
  template <class Record>
  Status Get(std::string_view path, KeyList keys, Record* record) {
    LinuxSource source(tree_.Root());
    return GetValue(source, path, keys, record);
  }

  Status Names(std::string_view path, KeyList keys, std::vector<std::string>* names) {
    LinuxSource source(tree_.Root());
    return GetNames(source, path, keys, names);
  }

  // Expects the read to fail as not understood with this one diagnostic.
  template <class Read>
  void ExpectNotUnderstood(Read&& read, const std::string& diagnostic) {
    testing::internal::CaptureStderr();
    EXPECT_EQ(read(), KSI_STATUS_INVALID_METADATA);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), diagnostic + "\n");
  }

  // Expects `read` to end with `status` when a user without rights does it, and with `diagnostic`
  // in what it writes.
  template <class Read>
  void ExpectAsNobody(Read&& read, Status status, const std::string& diagnostic) {
    EXPECT_EXIT(
        {
          constexpr uid_t kNobody = 65534;
          if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
          _exit(read() == status ? 0 : 1);
        },
        testing::ExitedWithCode(0), diagnostic);
  }

  void WriteZone(int node, const std::string& zone, const std::string& buddies, int managed) {
    const std::string heading = "Node " + std::to_string(node) + ", zone " + zone;
    buddyinfo_ += heading + " " + buddies + "\n";
    zoneinfo_ += heading + "\n  pages free 1\n min 1\n low 1\n high 1\n present " +
                 std::to_string(managed) + "\n managed " + std::to_string(managed) +
                 "\n protection: (0, 0)\n";
    tree_.Write("/proc/buddyinfo", buddyinfo_);
    tree_.Write("/proc/zoneinfo", zoneinfo_);
  }

  void WriteMeminfo() { tree_.Write("/proc/meminfo", "MemTotal: 1024 kB\nVmallocUsed: 16 kB\n"); }

  void WriteSlabinfo(const std::string& lines) {
    WriteMeminfo();
    tree_.Write("/proc/slabinfo", "slabinfo - version: 2.1\n# name ...\n" + lines);
  }

  HostTree tree_;
  std::string buddyinfo_;
  std::string zoneinfo_;
};

// Page sharing.

constexpr char kPshare[] = "memory/pshare/stats";
constexpr char kKsm[] = "/sys/kernel/mm/ksm/";

TEST_F(LinuxHostTest, PageSharingThatTheKernelDoesNotHaveHasSharedNothing) {
  KSI_PshareStats stats;
  std::memset(&stats, 0xff, sizeof stats);
  ASSERT_EQ(Get(kPshare, {}, &stats), kOk);
  const KSI_PshareStats zeros = {};
  EXPECT_EQ(std::memcmp(&stats, &zeros, sizeof stats), 0);
}

TEST_F(LinuxHostTest, PagesWithOneReferenceAreToldWhileNoPageHasMore) {
  const std::string ksm = kKsm;
  tree_.Write(ksm + "pages_shared", "7\n");
  tree_.Write(ksm + "pages_sharing", "0\n");
  tree_.Write(ksm + "full_scans", "3\n");
  KSI_PshareStats stats;
  ASSERT_EQ(Get(kPshare, {}, &stats), kOk);
  EXPECT_EQ(uint64_t{stats.cow}, 7u);
  EXPECT_EQ(uint64_t{stats.cow1}, 7u);
  EXPECT_EQ(uint64_t{stats.totAdd}, kNoValue);

  tree_.Write(ksm + "pages_sharing", "5\n");
  ASSERT_EQ(Get(kPshare, {}, &stats), kOk);
  EXPECT_EQ(uint64_t{stats.cow}, 12u);
  EXPECT_EQ(uint64_t{stats.cow1}, kNoValue);
  EXPECT_EQ(uint64_t{stats.reclaimed}, 5u);
}

TEST_F(LinuxHostTest, ZeroPagesThatTheKernelMakesAndDoesNotCountHaveNoValue) {
  const std::string ksm = kKsm;
  tree_.Write(ksm + "pages_shared", "2\n");
  tree_.Write(ksm + "pages_sharing", "6\n");
  tree_.Write(ksm + "full_scans", "3\n");
  tree_.Write(ksm + "use_zero_pages", "1\n");
  KSI_PshareStats stats;
  ASSERT_EQ(Get(kPshare, {}, &stats), kOk);
  EXPECT_EQ(uint64_t{stats.zero}, kNoValue);
  EXPECT_EQ(uint64_t{stats.cow}, 8u);
  EXPECT_EQ(uint64_t{stats.reclaimed}, 6u);
}

TEST_F(LinuxHostTest, PageSharingFiguresAreNumbers) {
  KSI_PshareStats stats;
  for (const char* content :
       {"", "\n", "x\n", "-1\n", "1 2\n", "1\n2\n", "18446744073709551616\n"}) {
    tree_.Write(std::string(kKsm) + "pages_shared", content);
    ExpectNotUnderstood([&] { return Get(kPshare, {}, &stats); },
                        "/sys/kernel/mm/ksm/pages_shared: line 1 is not understood");
  }
}

// Memory nodes.

constexpr char kHasMemory[] = "/sys/devices/system/node/has_memory";

TEST_F(LinuxHostTest, MachineWithoutNumaHasOneMemoryNode) {
  KSI_MemInfo info;
  ASSERT_EQ(Get("memory/memInfo", {}, &info), kOk);
  EXPECT_EQ(uint32_t{info.numNodes}, 1u);
  KSI_MemNode node;
  ASSERT_EQ(Get("memory/memNodes", {0}, &node), kOk);
  EXPECT_EQ(node.numaNode, 0);
  EXPECT_EQ(Get("memory/memNodes", {1}, &node), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(Get("memory/memNodes", {-1}, &node), KSI_STATUS_NOT_FOUND);
}

TEST_F(LinuxHostTest, MemoryNodesAreNumberedWithoutTheNodesThatHaveNoMemory) {
  tree_.Write(kHasMemory, "0,2-3,254-255\n");
  KSI_MemInfo info;
  ASSERT_EQ(Get("memory/memInfo", {}, &info), kOk);
  ASSERT_EQ(uint32_t{info.numNodes}, 5u);
  std::vector<int> numaNodes;
  for (int64_t i = 0; i < 5; ++i) {
    KSI_MemNode node;
    ASSERT_EQ(Get("memory/memNodes", {i}, &node), kOk);
    numaNodes.push_back(node.numaNode);
  }
  EXPECT_EQ(numaNodes, (std::vector<int>{0, 2, 3, 254, 255}));
}

TEST_F(LinuxHostTest, MemoryNodeListIsUnderstoodOrRefused) {
  KSI_MemInfo info;
  for (const char* content : {"", "\n", "0-\n", "-1\n", "1-0\n", "0,0\n", "0-1024\n", "0 1\n",
                              "0\n1\n", "0-99999999999999999999\n"}) {
    tree_.Write(kHasMemory, content);
    ExpectNotUnderstood([&] { return Get("memory/memInfo", {}, &info); },
                        "/sys/devices/system/node/has_memory: line 1 is not understood");
  }
}

// Buddies.

TEST_F(LinuxHostTest, EachZoneHasABuddyOfItsOwnName) {
  WriteZone(0, "DMA", "1", 10);
  WriteZone(0, "DMA32", "2", 10);
  WriteZone(0, "Normal", "3", 10);
  WriteZone(0, "Movable", "4", 10);
  std::vector<std::string> names;
  ASSERT_EQ(Names("system/buddy", {}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"memmap-00-lo", "memmap-00-lo32o", "memmap-00-hi",
                                             "memmap-00-hi-m"}));
  for (size_t i = 0; i < names.size(); ++i) {
    EXPECT_LE(names[i].size(), 15u);
    EXPECT_EQ(names[i].back() == 'o', i < 2) << "only low memory ends in 'o'";
    KSI_BuddyStats stats;
    ASSERT_EQ(Get("system/buddy/comprehensive", {names[i]}, &stats), kOk);
    EXPECT_EQ(uint32_t{stats.buffers[0].free}, i + 1);
    EXPECT_EQ(uint32_t{stats.buffers[0].used}, 10 - (i + 1));
  }
  KSI_BuddyStats stats;
  EXPECT_EQ(Get("system/buddy/comprehensive", {"memmap-01-hi"}, &stats), KSI_STATUS_NOT_FOUND);
}

TEST_F(LinuxHostTest, BuddyOfADistantNumaNodeHasTheNumberOfItsMemoryNode) {
  tree_.Write(kHasMemory, "0,250\n");
  WriteZone(0, "Normal", "1", 10);
  WriteZone(250, "Movable", "1", 10);
  std::vector<std::string> names;
  ASSERT_EQ(Names("system/buddy", {}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"memmap-00-hi", "memmap-01-hi-m"}));
}

TEST_F(LinuxHostTest, LargestBuffersTakeInWhatIsLarger) {
  // 19 orders fill the record, the 20th is twice its largest.
  WriteZone(0, "Normal", "0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 0 5 3", 100);
  KSI_BuddyStats stats;
  ASSERT_EQ(Get("system/buddy/comprehensive", {"memmap-00-hi"}, &stats), kOk);
  EXPECT_EQ(uint32_t{stats.buffers[18].free}, 11u);
  EXPECT_EQ(uint32_t{stats.buffers[0].used}, 0u) << "more free than managed, for a moment";
}

TEST_F(LinuxHostTest, BuffersBeyondTheRecordHaveNoValue) {
  WriteZone(0, "Normal", "4294967295", 1);
  KSI_BuddyStats stats;
  ASSERT_EQ(Get("system/buddy/comprehensive", {"memmap-00-hi"}, &stats), kOk);
  EXPECT_EQ(uint32_t{stats.buffers[0].free}, kNoValue32);
}

TEST_F(LinuxHostTest, NoMoreBuddiesThanAListHasRoomFor) {
  tree_.Write(kHasMemory, "0-119\n");
  for (int node = 0; node < 120; ++node) WriteZone(node, "Normal", "1", 10);
  LinuxSource source(tree_.Root());
  std::vector<std::string> names;
  KSI_BuddyStats stats;
  testing::internal::CaptureStderr();
  ASSERT_EQ(GetNames(source, "system/buddy", {}, &names), kOk);
  EXPECT_EQ(GetValue(source, "system/buddy/comprehensive", {"memmap-98-hi"}, &stats), kOk);
  EXPECT_EQ(GetValue(source, "system/buddy/comprehensive", {"memmap-99-hi"}, &stats),
            KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/proc/buddyinfo: more than 99 zones: the others are left out\n");
  EXPECT_EQ(source.LossStatus(), KSI_STATUS_LIMIT_EXCEEDED);
  ASSERT_EQ(names.size(), 99u);
  EXPECT_EQ(names.back(), "memmap-98-hi");
}

TEST_F(LinuxHostTest, AsManyBuddiesAsAListHasRoomForAreAll) {
  tree_.Write(kHasMemory, "0-98\n");
  for (int node = 0; node < 99; ++node) WriteZone(node, "Normal", "1", 10);
  std::vector<std::string> names;
  testing::internal::CaptureStderr();
  ASSERT_EQ(Names("system/buddy", {}, &names), kOk);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
  EXPECT_EQ(names.size(), 99u);
}

TEST_F(LinuxHostTest, BuddyinfoIsUnderstoodOrRefused) {
  WriteZone(0, "Normal", "1", 10);
  std::vector<std::string> names;
  for (const char* line :
       {"x", "Node 0 zone Normal 1", "Node 0, zone", "Node 0, zone Normal", "Node , zone Normal 1",
        "Node 0, zone Normal 1 x", "Node 0, zone Normal -1", "Node 0, zone Unheard 1",
        "Node 0, Zone Normal 1"}) {
    tree_.Write("/proc/buddyinfo", std::string("Node 0, zone Normal 1\n") + line + "\n");
    ExpectNotUnderstood([&] { return Names("system/buddy", {}, &names); },
                        "/proc/buddyinfo: line 2 is not understood");
  }
  tree_.Write("/proc/buddyinfo", "");
  ExpectNotUnderstood([&] { return Names("system/buddy", {}, &names); },
                      "/proc/buddyinfo: line 1 is not understood");
}

TEST_F(LinuxHostTest, RowsAreOfOneReading) {
  WriteZone(0, "Normal", "1", 10);
  LinuxSource source(tree_.Root(), [] { return LinuxHost::TimePoint(); });
  const auto freeBuffers = [&] {
    KSI_BuddyStats stats = {};
    EXPECT_EQ(GetValue(source, "system/buddy/comprehensive", {"memmap-00-hi"}, &stats), kOk);
    return uint32_t{stats.buffers[0].free};
  };
  std::vector<std::string> names;
  ASSERT_EQ(GetNames(source, "system/buddy", {}, &names), kOk);
  tree_.Write("/proc/buddyinfo", "Node 0, zone Normal 2\n");
  EXPECT_EQ(freeBuffers(), 1u);
  ASSERT_EQ(GetNames(source, "system/buddy", {}, &names), kOk);
  EXPECT_EQ(freeBuffers(), 1u);
  source.Refresh();
  EXPECT_EQ(freeBuffers(), 2u);
}

// Huge pages.

constexpr char kPools[] = "memory/lpage/nodeList/vmPools";

TEST_F(LinuxHostTest, KernelWithoutHugePagesHasNoPool) {
  std::vector<std::string> names;
  ASSERT_EQ(Names(kPools, {0}, &names), kOk);
  EXPECT_TRUE(names.empty());
  EXPECT_EQ(Names(kPools, {1}, &names), KSI_STATUS_NOT_FOUND);
}

TEST_F(LinuxHostTest, PoolsStandInTheOrderOfTheirPageSizes) {
  for (const char* size : {"1048576", "2048", "64", "32768"}) {
    const std::string pool = std::string("/sys/kernel/mm/hugepages/hugepages-") + size + "kB/";
    tree_.Write(pool + "nr_hugepages", "100\n");
    tree_.Write(pool + "free_hugepages", "10\n");
  }
  std::vector<std::string> names;
  ASSERT_EQ(Names(kPools, {0}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"huge-64kB", "huge-2048kB", "huge-32768kB",
                                             "huge-1048576kB"}));
  const uint32_t expected[][2] = {{3, 160}, {100, 5120}, {1600, 81920}, {51200, 2621440}};
  for (size_t i = 0; i < names.size(); ++i) {
    KSI_LargePagePool pool;
    ASSERT_EQ(Get(kPools, {0, names[i]}, &pool), kOk);
    EXPECT_EQ(uint32_t{pool.nrLPages}, expected[i][0]) << names[i];
    EXPECT_EQ(uint32_t{pool.nrFreeSPages}, expected[i][1]) << names[i];
  }
  KSI_LargePagePool pool;
  for (const char* name : {"huge-4096kB", "huge-2048", "hugepages-2048kB", "", "huge-../../x"}) {
    EXPECT_EQ(Get(kPools, {0, name}, &pool), KSI_STATUS_NOT_FOUND) << name;
  }
}

TEST_F(LinuxHostTest, PoolDirectoryIsUnderstoodOrRefused) {
  tree_.Write("/sys/kernel/mm/hugepages/hugepages-2MB/nr_hugepages", "1\n");
  std::vector<std::string> names;
  ExpectNotUnderstood([&] { return Names(kPools, {0}, &names); },
                      "/sys/kernel/mm/hugepages: the name hugepages-2MB is not understood");
}

// Heaps.

TEST_F(LinuxHostTest, HeapNamesFitAndDiffer) {
  const std::string figures = " 1 2 64 64 1 : tunables 0 0 0 : slabdata 1 1 0\n";
  const std::string longName(35, 'n');
  WriteSlabinfo("twice" + figures + longName + "1" + figures + longName + "2" + figures + "twice" +
                figures + "vmalloc" + figures);
  std::vector<std::string> names;
  ASSERT_EQ(Names("system/heaps", {}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"twice", longName, longName.substr(0, 33) + "~2",
                                             "twice~2", "vmalloc", "vmalloc~2"}));
  for (const std::string& name : names) {
    KSI_HeapStats stats;
    ASSERT_EQ(Get("system/heaps/stats", {name}, &stats), kOk);
    EXPECT_EQ(std::string(stats.name), name);
  }
  KSI_HeapStats stats;
  EXPECT_EQ(Get("system/heaps/stats", {"none"}, &stats), KSI_STATUS_NOT_FOUND);
}

TEST_F(LinuxHostTest, HeapNamesAreHarmlessAndStayWhole) {
  const std::string figures = " 1 2 64 64 1 : tunables 0 0 0 : slabdata 1 1 0\n";
  const std::string longName = std::string(32, 'n') + "\xc3\xbc";
  WriteSlabinfo("a\xc2\x9b" + figures + "a\x1b" + figures + longName + "\xc3\xbc" + figures +
                longName + "n" + figures + longName + "n" + figures);
  std::vector<std::string> names;
  ASSERT_EQ(Names("system/heaps", {}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"a?", "a?~2", longName, longName + "n",
                                             longName.substr(0, 32) + "~2", "vmalloc"}));
}

TEST_F(LinuxHostTest, HeapLargerThanItsFieldHasNoSize) {
  WriteSlabinfo("dentry 21000000 42000000 192 21 1 : tunables 0 0 0 : slabdata 1 2000000 0\n");
  KSI_HeapStats stats;
  ASSERT_EQ(Get("system/heaps/stats", {"dentry"}, &stats), kOk);
  EXPECT_EQ(uint32_t{stats.size}, kNoValue32);
  EXPECT_EQ(uint32_t{stats.avail}, 21000000u * 192);
  EXPECT_EQ(uint32_t{stats.dlMallocOvdh}, 2000000u * 4096ull - 42000000ull * 192);
  EXPECT_EQ(uint32_t{stats.pctFreeOfCur}, 49u);
}

TEST_F(LinuxHostTest, SlabinfoIsUnderstoodOrRefused) {
  std::vector<std::string> names;
  for (const char* line :
       {"dentry", "dentry 1 2 64 64 1", "dentry 1 2 64 64 x : tunables 0 0 0 : slabdata 1 1 0",
        "dentry 1 2 64 64 1 : tunables 0 0 : slabdata 1 1 0",
        "dentry 1 2 64 64 1 : tunables 0 0 0 : slabdata 1", ""}) {
    WriteSlabinfo(std::string(line) + "\n");
    ExpectNotUnderstood([&] { return Names("system/heaps", {}, &names); },
                        "/proc/slabinfo: line 3 is not understood");
  }
  tree_.Write("/proc/slabinfo", "slabinfo - version: 3.0\n");
  ExpectNotUnderstood([&] { return Names("system/heaps", {}, &names); },
                      "/proc/slabinfo: line 1 is not understood");
}

TEST_F(LinuxHostTest, HeapsThatAListHasNoRoomForAreAStatus) {
  WriteSlabinfo("a_name_of_some_length 1 2 64 64 1 : tunables 0 0 0 : slabdata 1 1 0\n");
  LinuxSource source(tree_.Root());
  ParamList all(2, 30);
  EXPECT_EQ(source.Instances(*FindNode("system/heaps"), Keys(), all), kOk);
  ParamList narrow(2, 21);  // the second would fit
  EXPECT_EQ(source.Instances(*FindNode("system/heaps"), Keys(), narrow),
            KSI_STATUS_TOO_MANY_ELEMENTS);
}

TEST_F(LinuxHostTest, SlabCachesThatMayNotBeSeenAreAStatus) {
  WriteSlabinfo("dentry 1 2 64 64 1 : tunables 0 0 0 : slabdata 1 1 0\n");
  tree_.Lock("/proc/slabinfo");
  std::vector<std::string> names;
  ExpectAsNobody([&] { return Names("system/heaps", {}, &names); }, KSI_STATUS_PERMISSION_DENIED,
                 "^/proc/slabinfo: permission denied\n$");
  KSI_HeapStats stats;
  ExpectAsNobody([&] { return Get("system/heaps/stats", {"dentry"}, &stats); },
                 KSI_STATUS_PERMISSION_DENIED, "^/proc/slabinfo: permission denied\n$");
}

TEST_F(LinuxHostTest, SlabCachesAreSeenInTheirDirectoryWhereTheFileMayNotBe) {
  WriteSlabinfo("dentry 1 2 64 64 1 : tunables 0 0 0 : slabdata 1 1 0\n");
  tree_.Lock("/proc/slabinfo");
  const std::string cache = "/sys/kernel/slab/dentry/";
  tree_.Write(cache + "order", "1\n");
  tree_.Write(cache + "slab_size", "192\n");
  tree_.Write(cache + "slabs", "3 N0=3\n");
  tree_.Write(cache + "total_objects", "126 N0=126\n");
  tree_.Write(cache + "objects", "100 N0=100\n");
  // One that went while it was read.
  tree_.Write("/sys/kernel/slab/gone/order", "1\n");
  ExpectAsNobody(
      [&]() -> Status {
        std::vector<std::string> names;
        if (Names("system/heaps", {}, &names) != kOk) return KSI_STATUS_FAILURE;
        if (names != std::vector<std::string>{"dentry", "vmalloc"}) return KSI_STATUS_FAILURE;
        KSI_HeapStats stats;
        if (Get("system/heaps/stats", {"dentry"}, &stats) != kOk) return KSI_STATUS_FAILURE;
        return stats.size == 3 * 8192 && stats.avail == 26 * 192 ? kOk : KSI_STATUS_FAILURE;
      },
      kOk, "^$");
}

TEST_F(LinuxHostTest, SlabsHaveAsManyPagesAsACountHolds) {
  WriteSlabinfo("dentry 1 2 64 64 1 : tunables 0 0 0 : slabdata 1 1 0\n");
  tree_.Lock("/proc/slabinfo");
  const std::string cache = "/sys/kernel/slab/dentry/";
  for (const char* file : {"slab_size", "slabs", "total_objects", "objects"}) {
    tree_.Write(cache + file, "1\n");
  }
  std::vector<std::string> names;
  tree_.Write(cache + "order", "31\n");
  ExpectAsNobody([&] { return Names("system/heaps", {}, &names); }, kOk, "^$");
  tree_.Write(cache + "order", "32\n");
  ExpectAsNobody([&] { return Names("system/heaps", {}, &names); }, KSI_STATUS_INVALID_METADATA,
                 "^/sys/kernel/slab/dentry/order: line 1 is not understood\n$");
}

TEST_F(LinuxHostTest, KernelWithoutSlabCachesHasVmallocAlone) {
  WriteMeminfo();
  std::vector<std::string> names;
  ASSERT_EQ(Names("system/heaps", {}, &names), kOk);
  EXPECT_EQ(names, std::vector<std::string>{"vmalloc"});
  KSI_HeapStats stats;
  ASSERT_EQ(Get("system/heaps/stats", {"vmalloc"}, &stats), kOk);
  EXPECT_EQ(uint32_t{stats.size}, 16u * 1024);
  EXPECT_EQ(uint32_t{stats.numRanges}, 1u);
}

// Persistent memory.

constexpr char kNd[] = "/sys/bus/nd/devices/";

TEST_F(LinuxHostTest, KernelWithoutPersistentMemoryHasNoVolume) {
  std::vector<std::string> names;
  ASSERT_EQ(Names("memory/pmem/volumes", {}, &names), kOk);
  EXPECT_TRUE(names.empty());
  KSI_PmemVolume volume;
  EXPECT_EQ(Get("memory/pmem/volumes/info", {"region0"}, &volume), KSI_STATUS_NOT_FOUND);
}

TEST_F(LinuxHostTest, VolumesAndRegionsStandInTheOrderOfTheirNumbers) {
  for (const char* device : {"region10", "region2", "namespace2.10", "namespace2.9", "pfn2.0",
                             "namespace10.0", "nmem0", "regionx", "namespace2"}) {
    tree_.Write(std::string(kNd) + device + "/size", "2097151\n");
  }
  std::vector<std::string> names;
  ASSERT_EQ(Names("memory/pmem/volumes", {}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"region2", "region10"}));
  constexpr char kRegions[] = "memory/pmem/volumes/regionStore/regions";
  ASSERT_EQ(Names(kRegions, {"region2"}, &names), kOk);
  EXPECT_EQ(names, (std::vector<std::string>{"namespace2.9", "namespace2.10"}));
  EXPECT_EQ(Names(kRegions, {"region3"}, &names), KSI_STATUS_NOT_FOUND);

  // Memory without labels has no room to give; a region is reserved in whole blocks.
  KSI_PmemRegion region;
  constexpr char kInfo[] = "memory/pmem/volumes/regionStore/regions/info";
  ASSERT_EQ(Get(kInfo, {"region2", "namespace2.9"}, &region), kOk);
  EXPECT_EQ(uint64_t{region.reserved}, 1u);
  EXPECT_EQ(uint32_t{region.flags}, uint32_t{KSI_PMEM_ALLOCATED});
  EXPECT_EQ(Get(kInfo, {"region2", "namespace10.0"}, &region), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(Get(kInfo, {"region2", "namespace2.11"}, &region), KSI_STATUS_NOT_FOUND);
  KSI_PmemRegionStore store;
  ASSERT_EQ(Get("memory/pmem/volumes/regionStore/info", {"region2"}, &store), kOk);
  EXPECT_EQ(uint64_t{store.avail2MBlocks}, 0u);
  EXPECT_EQ(uint64_t{store.alloc2MBlocks}, 1u) << "the two together";

  // Some kernels call all of it available, for no label has any.
  const std::string nd = kNd;
  tree_.Write(nd + "region4/size", "8388608\n");
  tree_.Write(nd + "region4/available_size", "8388608\n");
  tree_.Write(nd + "namespace4.0/size", "6291456\n");
  ASSERT_EQ(Get("memory/pmem/volumes/regionStore/info", {"region4"}, &store), kOk);
  EXPECT_EQ(uint64_t{store.total2MBlocks}, 4u);
  EXPECT_EQ(uint64_t{store.alloc2MBlocks}, 3u);
  EXPECT_EQ(uint64_t{store.avail2MBlocks}, 1u);
  EXPECT_EQ(uint64_t{store.resvd2MBlocks}, 3u);
}

TEST_F(LinuxHostTest, NamespaceIsNotFollowedOutOfItsDirectory) {
  const std::string nd = kNd;
  tree_.Write(nd + "region0/size", "2097152\n");
  tree_.Write(nd + "namespace0.0/size", "2097152\n");
  tree_.Write(nd + "namespace0.0/holder", "../../..\n");
  KSI_PmemRegion region;
  ExpectNotUnderstood(
      [&] {
        return Get("memory/pmem/volumes/regionStore/regions/info", {"region0", "namespace0.0"},
                   &region);
      },
      "/sys/bus/nd/devices/namespace0.0/holder: line 1 is not understood");
}

TEST_F(LinuxHostTest, PersistentMemoryThatMayNotBeSeenIsAStatus) {
  tree_.Write(std::string(kNd) + "region0/size", "2097152\n");
  tree_.Lock(std::string(kNd) + "region0/size");
  KSI_PmemRegionStore store;
  ExpectAsNobody([&] { return Get("memory/pmem/volumes/regionStore/info", {"region0"}, &store); },
                 KSI_STATUS_PERMISSION_DENIED,
                 "^/sys/bus/nd/devices/region0/size: permission denied\n$");
}

}  // namespace
}  // namespace ksi
