// How the mappings of a process are looked at: a large one is not walked, whatever makes it large.
#include "knvlibs/linux/machines/guest_mapping.h"

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <utility>
#include <vector>

#include "knvlibs/linux/host/walk_time.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

MappingsFile FileFor(const LinuxHost& host, const Process& process) {
  QemuMappings mappings;
  EXPECT_EQ(ReadQemuMappings(host, process, mappings), kOk);
  return mappings.file;
}

Process OfSize(Figure resident, Figure swapped, Figure tables) {
  Process process;
  process.pid = getpid();
  process.vmRss = resident;
  process.vmSwap = swapped;
  process.vmPte = tables;
  return process;
}

TEST(QemuMappingsTest, AreWalkedOfASmallProcess) {
  const LinuxHost host("/");
  constexpr uint64_t kMost = kShortWalkKB;
  constexpr uint64_t kTables = kShortWalkTablesKB;
  EXPECT_EQ(FileFor(host, OfSize(kMost - 4, 4, kTables)), MappingsFile::kSmaps);
  EXPECT_EQ(FileFor(host, OfSize(kMost, 4, kTables)), MappingsFile::kMaps);
  EXPECT_EQ(FileFor(host, OfSize(4, kMost, kTables)), MappingsFile::kMaps);
  EXPECT_EQ(FileFor(host, OfSize(4, 0, kTables + 4)), MappingsFile::kMaps);
  EXPECT_EQ(FileFor(host, OfSize(4, 0, std::nullopt)), MappingsFile::kMaps);
  EXPECT_EQ(FileFor(host, OfSize(std::nullopt, 0, 4)), MappingsFile::kMaps);
}

TEST(QemuMappingsTest, OfARecordedProcessAreInSmaps) {
  const HostTree tree;
  tree.Write(ProcessFile(getpid(), "smaps"), "100000-200000 rw-p 0 00:00 0\nRss: 4 kB\n");
  EXPECT_EQ(FileFor(LinuxHost(tree.Root()), OfSize(kShortWalkKB + 4, 0, 4)), MappingsFile::kSmaps);
}

TEST(QemuMappingsTest, WhatHasOnlyBeenReadIsNotWalkedEither) {
  // 4 GB of the kernel's zero page: 8 MB of page tables for no memory at all.
  constexpr size_t kSize = size_t{4} << 30;
  char* const start = static_cast<char*>(mmap(nullptr, kSize, PROT_READ | PROT_WRITE,
                                              MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0));
  ASSERT_NE(start, MAP_FAILED);
  ASSERT_EQ(madvise(start, kSize, MADV_NOHUGEPAGE), 0);
  for (size_t at = 0; at < kSize; at += 4096) (void)*static_cast<volatile const char*>(start + at);
  const LinuxHost host("/");
  Process process;
  ASSERT_EQ(ReadProcess(host, getpid(), process), kOk);
  EXPECT_GT(process.vmPte, kSize / 1024 / 512);
  EXPECT_EQ(FileFor(host, process), MappingsFile::kMaps);
  munmap(start, kSize);
}

}  // namespace
}  // namespace ksi
