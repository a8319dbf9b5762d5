#include "knvlibs/linux/groups/smaps.h"

#include <gtest/gtest.h>

#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

constexpr int32_t kPid = 7;
constexpr char kStatus[] = "Name:\tx\nState:\tS (sleeping)\nVmSize:\t 800 kB\nThreads:\t1\n";

class SmapsTest : public testing::Test {
 protected:
  Status Mappings(const std::string& text) {
    tree_.Write("/proc/7/smaps", text);
    return ReadMappings(LinuxHost(tree_.Root()), kPid, MappingsFile::kSmaps, mappings_);
  }

  HostTree tree_;
  std::vector<Mapping> mappings_;
};

TEST_F(SmapsTest, AMappingIsAHeaderAndItsFields) {
  ASSERT_EQ(
      Mappings("7f2c00000000-7f2c00400000 rw-p 00000000 00:00 0      /memory of a guest\n"
               "Size:               4096 kB\nRss:                1688 kB\n"
               "Referenced:         1600 kB\nAnonHugePages:      1024 kB\n"
               "Shared_Hugetlb:        2 kB\nPrivate_Hugetlb:       3 kB\n"
               "Swap:                  5 kB\nKSM:                   6 kB\nVmFlags: rd wr mr dc\n"
               "7fff0000-7fff1000 r--p 00000000 00:00 0\nRss: 4 kB\nVmFlags: rd dce\n"),
      kOk);
  ASSERT_EQ(mappings_.size(), 2u);
  const Mapping& guest = mappings_[0];
  EXPECT_EQ(guest.start, 0x7f2c00000000u);
  EXPECT_EQ(guest.end, 0x7f2c00400000u);
  EXPECT_TRUE(guest.isWritable);
  EXPECT_TRUE(guest.isDontCopy);
  EXPECT_EQ(guest.name, "/memory of a guest");
  EXPECT_EQ(guest.smaps.rss, 1688u);
  EXPECT_EQ(guest.smaps.referenced, 1600u);
  EXPECT_EQ(guest.smaps.anonHugePages, 1024u);
  EXPECT_EQ(guest.smaps.hugetlb, 5u);
  EXPECT_EQ(guest.smaps.swap, 5u);
  EXPECT_EQ(guest.smaps.ksm, 6u);
  EXPECT_FALSE(mappings_[1].isWritable);
  EXPECT_FALSE(mappings_[1].isDontCopy);
  EXPECT_EQ(mappings_[1].name, "");
  EXPECT_EQ(mappings_[1].smaps.ksm, std::nullopt);
}

TEST_F(SmapsTest, IsUnderstoodOrRefused) {
  const std::string header = "1000-2000 rw-p 00000000 00:00 0\n";
  const std::pair<std::string, int> kCases[] = {{"Rss: 4 kB\n", 1},
                                                {header + "Rss: 4 MB\n", 2},
                                                {header + "Rss: x kB\n", 2},
                                                {header + "Rss: -4 kB\n", 2},
                                                {header + "nothing\n", 2},

                                                {header + "2000-3000 rw\n", 2}};
  for (const auto& [text, line] : kCases) {
    testing::internal::CaptureStderr();
    EXPECT_EQ(Mappings(text), KSI_STATUS_INVALID_METADATA) << text;
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "/proc/7/smaps: line " + std::to_string(line) + " is not understood\n");
  }
}

TEST_F(SmapsTest, AKernelWithoutItHasNoFiguresAndAZombieIsGone) {
  const LinuxHost host(tree_.Root());
  EXPECT_EQ(ReadMappings(host, kPid, MappingsFile::kSmaps, mappings_), KSI_STATUS_NOT_FOUND);
  tree_.Write("/proc/7/status", kStatus);
  EXPECT_EQ(ReadMappings(host, kPid, MappingsFile::kSmaps, mappings_), kOk);
  EXPECT_TRUE(mappings_.empty());
  tree_.Write("/proc/7/status", "Name:\tx\nState:\tZ (zombie)\nThreads:\t1\n");
  EXPECT_EQ(ReadMappings(host, kPid, MappingsFile::kSmaps, mappings_), KSI_STATUS_NOT_FOUND);
}

TEST_F(SmapsTest, MapsTellsOfMappingsAlone) {
  tree_.Write("/proc/7/maps",
              "1000-3000 rw-p 00000000 00:00 0          [heap]\n"
              "8000-9000 rwxp 00000000 00:00 0\n");
  ASSERT_EQ(ReadMappings(LinuxHost(tree_.Root()), kPid, MappingsFile::kMaps, mappings_), kOk);
  ASSERT_EQ(mappings_.size(), 2u);
  EXPECT_EQ(mappings_[0].start, 0x1000u);
  EXPECT_EQ(mappings_[0].end, 0x3000u);
  EXPECT_TRUE(mappings_[0].isWritable);
  EXPECT_EQ(mappings_[0].name, "[heap]");
  EXPECT_EQ(mappings_[0].smaps.rss, std::nullopt);
  EXPECT_FALSE(mappings_[1].isWritable) << "memory for code is none of a guest's";
}

TEST_F(SmapsTest, MappingsTogetherHaveWhatBothTell) {
  Smaps sum;
  sum.rss = 1;
  sum.swap = 2;
  Smaps other;
  other.rss = 10;
  other.ksm = 5;
  sum.Add(other);
  EXPECT_EQ(sum.rss, 11u);
  EXPECT_EQ(sum.swap, std::nullopt);
  EXPECT_EQ(sum.ksm, std::nullopt);
  EXPECT_EQ(sum.hugetlb, 0u);
}

}  // namespace
}  // namespace ksi
