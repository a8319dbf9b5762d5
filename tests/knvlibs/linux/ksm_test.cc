// Page sharing of a machine that does not show it.
#include "knvlibs/linux/memory/ksm.h"

#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include "knvlibs/linux/linux_source.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

// Puts an empty directory in the place of /sys for this process; false if it may not.
bool HideSys() {
  return unshare(CLONE_NEWNS) == 0 &&
         mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
         mount("none", "/sys", "tmpfs", 0, nullptr) == 0;
}

bool MayHideSys() {
  const pid_t pid = fork();
  if (pid == 0) _exit(HideSys() ? 0 : 1);
  int end = 1;
  return waitpid(pid, &end, 0) == pid && end == 0;
}

bool HasNoFigures() {
  LinuxSource source("/");
  KSI_PshareStats stats = {};
  if (GetValue(source, "memory/pshare/stats", {}, &stats) != kOk) return false;
  for (const uint64_t field :
       {uint64_t{stats.cow}, uint64_t{stats.cow1}, uint64_t{stats.zero}, uint64_t{stats.used},
        uint64_t{stats.reclaimed}, uint64_t{stats.totAdd}, uint64_t{stats.totRemove}}) {
    if (field != kNoValue) return false;
  }
  return GetValue(source, "memory/pshare/stats", {}, &stats) == kOk;
}

TEST(KsmTest, OfAMachineThatHidesItHasNoValueWhichIsToldOnce) {
  if (!MayHideSys()) GTEST_SKIP() << "nothing may be mounted here";
  EXPECT_EXIT(_exit(HideSys() && HasNoFigures() ? 0 : 1), testing::ExitedWithCode(0),
              "^/sys/kernel/mm: not there: what page sharing does has no value\n$");
}

TEST(KsmTest, OfARecordedHostWithoutItIsNone) {
  const HostTree tree;
  Ksm ksm;
  EXPECT_EQ(ReadKsm(LinuxHost(tree.Root()), ksm), kOk);
  EXPECT_TRUE(ksm.isTold);
  EXPECT_EQ(ksm.zeroPages, 0u);
  EXPECT_FALSE(ksm.IsSharing());
}

TEST(KsmTest, WhatIsNotToldSavesNothingOnlyOfNothing) {
  Ksm ksm;
  ksm.isTold = false;
  EXPECT_TRUE(ksm.IsSharing()) << "each process is to be looked at";
  EXPECT_EQ(ksm.SavedOf(0), 0u);
  EXPECT_EQ(ksm.SavedOf(8), std::nullopt);
  EXPECT_EQ(ksm.SavedOf(std::nullopt), std::nullopt);
}

}  // namespace
}  // namespace ksi
