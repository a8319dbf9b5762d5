// The figures of the machine itself, compared with what other programs make of the same files at
// the same time. Figures move between two looks: they are to lie between what was seen before and
// what was seen after, give or take the tolerance that each test names.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <map>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/linux_source.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

// What a shell command prints; fails the test if it fails.
std::string Shell(const std::string& command) {
  const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"),
                                                   [](FILE*) { return 0; });
  if (pipe == nullptr) {
    ADD_FAILURE() << command;
    return "";
  }
  std::string text;
  std::array<char, 4096> part;
  while (const size_t size = fread(part.data(), 1, part.size(), pipe.get())) {
    text.append(part.data(), size);
  }
  EXPECT_EQ(pclose(pipe.get()), 0) << command;
  return text;
}

double Number(const std::string& command) {
  const std::string text = Shell(command);
  try {
    return std::stod(text);
  } catch (const std::exception&) {
    ADD_FAILURE() << command << " printed \"" << text << '"';
    return -1;
  }
}

bool Exists(const std::string& test) { return std::system(test.c_str()) == 0; }

#define SKIP_WITHOUT(test, what) \
  if (!Exists(test)) GTEST_SKIP() << "this machine has no " << (what)

// Expects `ours` between the results of `command` before and after it, with `tolerance` on both
// sides. A machine at work gets three tries.
template <class Ours>
void ExpectAgree(const std::string& command, double tolerance, Ours&& ours) {
  double before = 0;
  double value = 0;
  double after = 0;
  for (int i = 0; i < 3; ++i) {
    before = Number(command);
    value = ours();
    after = Number(command);
    if (value >= std::min(before, after) - tolerance &&
        value <= std::max(before, after) + tolerance) {
      return;
    }
  }
  ADD_FAILURE() << "we say " << value << ", `" << command << "` " << before << " before and "
                << after << " after";
}

template <class Record>
Record Value(Source& source, std::string_view path, KeyList keys) {
  Record record = {};
  EXPECT_EQ(GetValue(source, path, keys, &record), kOk) << path;
  return record;
}

std::vector<KSI_BuddyStats> Buddies() {
  LinuxSource source("/");
  std::vector<std::string> names;
  EXPECT_EQ(GetNames(source, "system/buddy", {}, &names), kOk);
  std::vector<KSI_BuddyStats> buddies;
  for (const std::string& name : names) {
    buddies.push_back(Value<KSI_BuddyStats>(source, "system/buddy/comprehensive", {name}));
  }
  return buddies;
}

// In KB.
double FreeOf(const KSI_BuddyStats& buddy) {
  double sum = 0;
  for (size_t i = 0; i < KSI_BUDDY_SIZES; ++i) {
    sum += static_cast<double>(uint64_t{buddy.buffers[i].free} * (uint64_t{4} << i));
  }
  return sum;
}

constexpr double kMB = 1024;  // in KB

double FreeOfAll() {
  double sum = 0;
  for (const KSI_BuddyStats& buddy : Buddies()) sum += FreeOf(buddy);
  return sum;
}

TEST(LiveHostTest, FreeBuffersAreThoseOfBuddyinfo) {
  const std::string pageKB = "$(($(getconf PAGESIZE) / 1024))";
  ExpectAgree("awk -v page=" + pageKB +
                  " '{ for (i = 5; i <= NF; ++i) sum += $i * page * 2 ^ (i - 5) }"
                  " END { printf \"%.0f\", sum }' /proc/buddyinfo",
              64 * kMB, FreeOfAll);
}

TEST(LiveHostTest, FreeBuffersAreTheFreeMemory) {
  SKIP_WITHOUT("command -v free >/dev/null", "free");
  // Some virtual machines count memory that their host has yet to give.
  SKIP_WITHOUT(
      "test $(free -k | awk '$1 == \"Mem:\" { print $2 }') -le "
      "$(awk '$1 == \"managed\" { sum += $2 } END { print sum }' /proc/zoneinfo |"
      " awk -v page=$(getconf PAGESIZE) '{ printf \"%.0f\", $1 * page / 1024 }')",
      "zones for all its memory");
  ExpectAgree("free -k | awk '$1 == \"Mem:\" { print $4 }'", 256 * kMB, FreeOfAll);
}

TEST(LiveHostTest, FreeBuffersAreTheFreeMemoryOfNumastat) {
  SKIP_WITHOUT("command -v numastat >/dev/null", "numastat");
  // In MB.
  ExpectAgree("numastat -m | awk '$1 == \"MemFree\" { print $NF }'", 256,
              [] { return FreeOfAll() / kMB; });
}

TEST(LiveHostTest, EveryPageIsInOneOfFourParts) {
  // What is left are pages that drivers take from the page allocator for themselves.
  LinuxSource source("/");
  KSI_Comprehensive memory = {};
  ASSERT_EQ(GetValue(source, "memory/comprehensive", {}, &memory), kOk);
  const double total = static_cast<double>(memory.managedByMemMap);
  const double parts = static_cast<double>(memory.free + memory.dataAndHeap +
                                           memory.knvClientConsumed + memory.otherConsumed);
  EXPECT_NEAR(parts, total, total < 3 * kMB * kMB ? 0.02 * total : 0.005 * total);
}

TEST(LiveHostTest, BuffersTogetherAreWhatTheZonesManage) {
  // To the page, for what is used is what is not free at the same moment.
  ExpectAgree("awk '$1 == \"managed\" { sum += $2 } END { printf \"%.0f\", sum }' /proc/zoneinfo",
              0, [] {
                double sum = 0;
                for (const KSI_BuddyStats& buddy : Buddies()) {
                  sum += FreeOf(buddy) / 4 + uint32_t{buddy.buffers[0].used};
                }
                return sum / (static_cast<double>(LinuxHost("/").PageKB()) / 4);
              });
}

TEST(LiveHostTest, MemoryNodesAreTheDirectoriesWithMemory) {
  SKIP_WITHOUT("test -d /sys/devices/system/node/node0", "NUMA nodes");
  ExpectAgree("grep -l 'MemTotal: *[1-9]' /sys/devices/system/node/node*/meminfo | wc -l", 0, [] {
    LinuxSource source("/");
    return uint32_t{Value<KSI_MemInfo>(source, "memory/memInfo", {}).numNodes};
  });
}

TEST(LiveHostTest, HugePagePoolsAreThoseOfNumastat) {
  SKIP_WITHOUT("command -v numastat >/dev/null", "numastat");
  const auto pools = [](auto figure) {
    LinuxSource source("/");
    double sum = 0;
    const uint32_t nodes = Value<KSI_MemInfo>(source, "memory/memInfo", {}).numNodes;
    for (int64_t node = 0; node < nodes; ++node) {
      sum += figure(
          Value<KSI_LargePagePool>(source, "memory/lpage/nodeList/vmPools", {node, "huge-2048kB"}));
    }
    return sum;
  };
  // numastat counts in MB.
  ExpectAgree("numastat -m | awk '$1 == \"HugePages_Total\" { print $NF }'", 0, [&] {
    return pools([](const KSI_LargePagePool& pool) { return 2.0 * pool.nrLPages; });
  });
  ExpectAgree("numastat -m | awk '$1 == \"HugePages_Free\" { print $NF }'", 0, [&] {
    return pools([](const KSI_LargePagePool& pool) { return pool.nrFreeSPages / 256.0; });
  });
}

TEST(LiveHostTest, SharedPagesAreThoseOfTheKernel) {
  SKIP_WITHOUT("test -r /sys/kernel/mm/ksm/pages_shared", "page sharing");
  const double pages4K = static_cast<double>(LinuxHost("/").PageKB()) / 4;
  ExpectAgree("cat /sys/kernel/mm/ksm/pages_shared", 1024, [&] {
    LinuxSource source("/");
    const auto stats = Value<KSI_PshareStats>(source, "memory/pshare/stats", {});
    return static_cast<double>(uint64_t{stats.used}) / pages4K;
  });
}

std::map<std::string, KSI_HeapStats> HeapsOfThisMachine() {
  LinuxSource source("/");
  std::vector<std::string> names;
  EXPECT_EQ(GetNames(source, "system/heaps", {}, &names), kOk);
  std::map<std::string, KSI_HeapStats> heaps;
  for (const std::string& name : names) {
    heaps[name] = Value<KSI_HeapStats>(source, "system/heaps/stats", {name});
  }
  return heaps;
}

TEST(LiveHostTest, SlabCachesAreThoseOfSlabtop) {
  SKIP_WITHOUT("command -v slabtop >/dev/null", "slabtop");
  SKIP_WITHOUT("test -r /proc/slabinfo", "slab caches to see");

  // "OBJS ACTIVE USE OBJ-SIZE SLABS OBJ/SLAB CACHE-SIZE NAME", the sizes as "0.19K" and "1234K".
  const std::map<std::string, KSI_HeapStats> heaps = HeapsOfThisMachine();
  std::istringstream rows(Shell("slabtop -o -s c | awk '$7 ~ /^[0-9]+K$/'"));
  size_t compared = 0;
  std::string objects;
  std::string active;
  std::string use;
  std::string objectSize;
  std::string slabs;
  std::string perSlab;
  std::string cacheSize;
  std::string name;
  while (rows >> objects >> active >> use >> objectSize >> slabs >> perSlab >> cacheSize >> name) {
    const auto heap = heaps.find(name);
    ASSERT_NE(heap, heaps.end()) << name;
    const double kb = std::stod(cacheSize);
    // A busy machine's caches move by a slab or two, the busiest by a part of themselves.
    EXPECT_NEAR(heap->second.size / 1024.0, kb, std::max(kb / 10, 256.0)) << name;
    EXPECT_NEAR(heap->second.avgAllocSize / 1024.0, std::stod(objectSize), 0.01) << name;
    ++compared;
  }
  EXPECT_EQ(compared + 1, heaps.size()) << "all but vmalloc";
}

TEST(LiveHostTest, VmallocIsThatOfMeminfo) {
  SKIP_WITHOUT("test -r /proc/slabinfo", "slab caches to see");
  ExpectAgree("awk '$1 == \"VmallocUsed:\" { print $2 }' /proc/meminfo", 4 * kMB,
              [] { return HeapsOfThisMachine().at("vmalloc").size / 1024.0; });
}

TEST(LiveHostTest, VolumesAreTheRegionsOfTheBus) {
  ExpectAgree("ls /sys/bus/nd/devices 2>/dev/null | grep -c '^region[0-9]*$' || true", 0, [] {
    LinuxSource source("/");
    std::vector<std::string> names;
    EXPECT_EQ(GetNames(source, "memory/pmem/volumes", {}, &names), kOk);
    return static_cast<double>(names.size());
  });
}

}  // namespace
}  // namespace ksi
