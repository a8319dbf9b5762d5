// Groups and user worlds, from recorded hosts and from files that are out of the ordinary. What
// each figure is to be is in tally-linux(7).
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <utility>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/linux_source.h"
#include "tests/harness/golden.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

class RecordedGroupsTest : public testing::TestWithParam<const char*> {};

TEST_P(RecordedGroupsTest, TellsTheFiguresOfTheGroups) {
  LinuxSource source(RecordedHost(GetParam()));
  harness::ExpectGolden(std::string("knvlibs/hosts/") + GetParam() + ".groups.txt",
                        GroupsText(source));
}

INSTANTIATE_TEST_SUITE_P(Hosts, RecordedGroupsTest,
                         testing::Values("cgroup-v1-vm", "systemd-server", "kvm-two-nodes"),
                         [](const auto& host) {
                           std::string name = host.param;
                           std::erase(name, '-');
                           return name;
                         });

// A host of cgroup version 2 with one cgroup, "jobs" (id 7), and one process in it, 100.
class GroupsTest : public testing::Test {
 protected:
  static constexpr int64_t kJobs = 7;
  static constexpr int32_t kPid = 100;

  GroupsTest() {
    tree_.Write("/proc/meminfo",
                "MemTotal: 1024 kB\nMemFree: 24 kB\nSlab: 8 kB\nPageTables: 4 kB\n"
                "VmallocUsed: 4 kB\nSwapTotal: 0 kB\nSwapFree: 0 kB\n");
    tree_.Write("/sys/fs/cgroup/cgroup.controllers", "cpu memory\n");
    tree_.Write("/sys/fs/cgroup/cgroup.procs", "");
    WriteCgroup("/jobs", kJobs, "100\n");
    WriteProcess(kPid, "worker");
  }

  void WriteCgroup(const std::string& path, int64_t id, const std::string& processes) {
    const std::string directory = "/sys/fs/cgroup" + path + "/";
    tree_.Write(directory + "cgroup.id", std::to_string(id) + "\n");
    tree_.Write(directory + "cgroup.procs", processes);
    tree_.Write(directory + "memory.current", "1048576\n");
    tree_.Write(directory + "memory.stat", "kernel 4096\nactive_anon 8192\nactive_file 4096\n");
    tree_.Write(directory + "memory.min", "0\n");
    tree_.Write(directory + "memory.max", "max\n");
  }

  // Page sharing on the host.
  void WriteSharing(const std::string& shared, const std::string& sharing,
                    const std::string& zero) {
    const std::string directory = "/sys/kernel/mm/ksm/";
    tree_.Write(directory + "pages_shared", shared + "\n");
    tree_.Write(directory + "pages_sharing", sharing + "\n");
    tree_.Write(directory + "full_scans", "3\n");
    tree_.Write(directory + "ksm_zero_pages", zero + "\n");
  }

  void WriteProcess(int32_t pid, const std::string& name, const std::string& more = "") {
    tree_.Write(ProcessFile(pid, "status"),
                "Name:\t" + name + "\nState:\tS (sleeping)\nPPid:\t1\n" + more +
                    "VmPeak:\t 900 kB\nVmSize:\t 800 kB\nVmLck:\t 30 kB\nVmPin:\t 7 kB\n"
                    "VmHWM:\t 500 kB\nVmRSS:\t 400 kB\nRssAnon:\t 100 kB\n"
                    "RssFile:\t 290 kB\nRssShmem:\t 10 kB\n"
                    "VmPTE:\t 12 kB\nVmSwap:\t 20 kB\nHugetlbPages:\t 0 kB\nThreads:\t1\n");
    tree_.Write(ProcessFile(pid, "limits"),
                "Max address space         unlimited            unlimited            bytes     \n");
  }

  template <class Record>
  Record Get(std::string_view path, int64_t key) {
    LinuxSource source(tree_.Root());
    Record record = {};
    EXPECT_EQ(GetValue(source, path, {key}, &record), kOk) << path;
    return record;
  }

  template <class Record>
  Status StatusOf(std::string_view path, int64_t key) {
    LinuxSource source(tree_.Root());
    Record record = {};
    return GetValue(source, path, {key}, &record);
  }

  std::string NameOf(int64_t group) {
    const auto name = Get<KSI_GroupName>("sched/groups/groupName", group);
    return {name.text, strnlen(name.text, sizeof name.text)};
  }

  uint32_t FlagsOf(int64_t group) { return Get<uint32_t>("sched/groups/groupFlags", group); }

  HostTree tree_;
};

TEST_F(GroupsTest, AProcessStandsBelowItsCgroup) {
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}),
            (std::vector<int64_t>{kKernelGroup, kJobs}));
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}),
            (std::vector<int64_t>{kProcessGroup + kPid}));
  EXPECT_EQ(GetIds(source, "sched/groups/members/memClients", {kProcessGroup + kPid}),
            (std::vector<int64_t>{kPid}));
  EXPECT_EQ(Get<int64_t>("sched/groups/parentGroupID", kProcessGroup + kPid), kJobs);
  EXPECT_EQ(Get<int32_t>("sched/groups/groupLeaderID", kProcessGroup + kPid), kPid);
  EXPECT_EQ(FlagsOf(kProcessGroup + kPid), uint32_t{KSI_GROUP_USER_WORLD | KSI_GROUP_LEAF});
}

TEST_F(GroupsTest, AProcessHasANumberOf31Bits) {
  WriteProcess(INT32_MAX, "last");
  tree_.Write("/proc/2147483648/status", "Name:\tnone\nVmSize:\t 8 kB\n");
  tree_.Write("/proc/0/status", "Name:\tnone\nVmSize:\t 8 kB\n");
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}),
            (std::vector<int64_t>{kKernelGroup, kJobs, kProcessGroup + INT32_MAX}));
}

TEST_F(GroupsTest, WithoutARecordedIdACgroupHasThatOfItsDirectory) {
  const std::string directory = tree_.Root() + "/sys/fs/cgroup/jobs";
  std::filesystem::remove(directory + "/cgroup.id");
  struct stat status = {};
  ASSERT_EQ(stat(directory.c_str(), &status), 0);
  EXPECT_EQ(NameOf(static_cast<int64_t>(status.st_ino)), "jobs");
}

TEST_F(GroupsTest, ARecordedIdIsOfOneCgroupAlone) {
  for (const char* id : {"7", "0", "1099511627876", "18446744073709551615"}) {
    tree_.Write("/sys/fs/cgroup/other/cgroup.id", id);
    tree_.Write("/sys/fs/cgroup/other/cgroup.procs", "");
    tree_.Write("/sys/fs/cgroup/other/below/cgroup.procs", "");
    testing::internal::CaptureStderr();
    LinuxSource source(tree_.Root());
    const std::vector<int64_t> groups = GetIds(source, "sched/groups/members/groups", {int64_t{0}});
    ASSERT_EQ(groups.size(), 3u) << id;
    EXPECT_EQ(groups[1], kJobs);
    EXPECT_EQ(
        testing::internal::GetCapturedStderr(),
        "cgroup /other: its recorded id is another's or none: what is below it is left out\n");
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {groups[2]}), std::vector<int64_t>());
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}).size(), 1u);
  }
}

TEST_F(GroupsTest, WithoutCgroupsProcessesStandBelowTheRoot) {
  std::filesystem::remove_all(tree_.Root() + "/sys/fs/cgroup");
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}),
            (std::vector<int64_t>{kKernelGroup, kProcessGroup + kPid}));
}

TEST_F(GroupsTest, CgroupsAreThoseOfTheHierarchyThatHasTheController) {
  tree_.Write("/sys/fs/cgroup/cgroup.controllers", "cpu io\n");
  EXPECT_EQ(StatusOf<uint32_t>("sched/groups/groupFlags", kJobs), KSI_STATUS_NOT_FOUND);
  tree_.Write("/sys/fs/cgroup/unified/cgroup.controllers", "cpu\n");
  tree_.Write("/sys/fs/cgroup/unified/cgroup.procs", "");
  WriteCgroup("/unified/jobs", 8, "100\n");
  EXPECT_EQ(StatusOf<uint32_t>("sched/groups/groupFlags", 8), KSI_STATUS_NOT_FOUND);
  tree_.Write("/sys/fs/cgroup/unified/cgroup.controllers", "memory\n");
  EXPECT_EQ(StatusOf<uint32_t>("sched/groups/groupFlags", 8), kOk);
}

TEST_F(GroupsTest, AProcessThatNoCgroupListsTellsWhereItIs) {
  WriteProcess(101, "moved");
  tree_.Write("/proc/101/cgroup", "1:cpu,cpuacct:/\n0::/jobs\n");
  EXPECT_EQ(Get<int64_t>("sched/groups/parentGroupID", kProcessGroup + 101), kJobs);
  WriteProcess(102, "outside");
  tree_.Write("/proc/102/cgroup", "0::/../..\n");
  EXPECT_EQ(Get<int64_t>("sched/groups/parentGroupID", kProcessGroup + 102), kRootGroup);
}

TEST_F(GroupsTest, WhatDoesNotExistIsNotFound) {
  for (const int64_t id : {int64_t{-1}, int64_t{8}, kProcessGroup + 101, kVmmGroup + kPid}) {
    EXPECT_EQ(StatusOf<KSI_GroupName>("sched/groups/groupName", id), KSI_STATUS_NOT_FOUND) << id;
  }
  EXPECT_EQ(StatusOf<int32_t>("sched/groups/groupLeaderID", kJobs), KSI_STATUS_NOT_FOUND);
  for (const int64_t id : {int64_t{-1}, int64_t{0}, int64_t{101}, kProcessGroup}) {
    EXPECT_EQ(StatusOf<KSI_UwTally>("sched/memClients/tally/uw", id), KSI_STATUS_NOT_FOUND) << id;
  }
  EXPECT_EQ(StatusOf<KSI_VmmTally>("sched/memClients/tally/vmm", kPid), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(StatusOf<int32_t>("worldGroups/vmmLeaderID", kPid), KSI_STATUS_NOT_FOUND);
}

TEST_F(GroupsTest, NamesAreDecodedAndHarmless) {
  WriteCgroup("/a\\x2db\\x0ac.slice", 8, "");
  EXPECT_EQ(NameOf(8), "a-b?c.slice");
  WriteProcess(kPid, "(a) b: \x1b[2Jc\\n");
  EXPECT_EQ(NameOf(kProcessGroup + kPid), "(a) b: ?[2Jc?");
  const std::string longName(70, 'n');
  WriteCgroup("/" + longName, 9, "");
  EXPECT_EQ(NameOf(9), longName.substr(0, 64));
}

TEST_F(GroupsTest, NamesNeitherCommandNorTurnNorHide) {
  WriteCgroup("/\xe2\x80\xae\\xc2\\x9b2J", 8, "");
  EXPECT_EQ(NameOf(8), "??2J");
  WriteProcess(kPid, "a\xe2\x80\x8b\x9b\xff\xc3\xbc\xe2\x82");
  EXPECT_EQ(NameOf(kProcessGroup + kPid), "a???\xc3\xbc??");
  tree_.Write(ProcessFile(kPid, "status"), "Name:\tqemu\nVmSize:\t 8 kB\nThreads:\t2\n");
  tree_.Write(ProcessFile(kPid, "cmdline"),
              std::string("qemu-system-x86_64\0-name\0w\xc2\x85\xe2\x81\xa6\x7f", 32) + "z");
  EXPECT_EQ(NameOf(kProcessGroup + kPid), "w???z");
}

TEST_F(GroupsTest, NamesAreCutBetweenCharacters) {
  const std::string longName = std::string(63, 'n') + "\xc3\xbc";
  WriteCgroup("/" + longName, 9, "");
  EXPECT_EQ(NameOf(9), longName.substr(0, 63));
}

TEST_F(GroupsTest, NamesInMessagesAreHarmless) {
  const std::string directory = "/sys/fs/cgroup/\xc2\x9b";
  tree_.Write(directory + "/cgroup.procs", "many\n");
  testing::internal::CaptureStderr();
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 3u);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/sys/fs/cgroup/?/cgroup.procs: line 1 is not understood\n");
}

TEST_F(GroupsTest, FlagsTellWhatACgroupIs) {
  int64_t id = 20;
  const auto flags = [&](const std::string& path) {
    WriteCgroup(path, ++id, "");
    return FlagsOf(id) & ~uint32_t{KSI_GROUP_LEAF};
  };
  EXPECT_EQ(FlagsOf(kRootGroup), uint32_t{KSI_GROUP_PREDEFINED});
  EXPECT_EQ(flags("/system.slice"), uint32_t{KSI_GROUP_PREDEFINED | KSI_GROUP_SYSTEM_WORLD});
  EXPECT_EQ(flags("/init.scope"),
            uint32_t{KSI_GROUP_PREDEFINED | KSI_GROUP_SYSTEM_WORLD | KSI_GROUP_NON_PERSISTENT});
  EXPECT_EQ(flags("/system.slice/x.service"), uint32_t{KSI_GROUP_SYSTEM_WORLD});
  EXPECT_EQ(flags("/user.slice"), uint32_t{KSI_GROUP_PREDEFINED | KSI_GROUP_USER_CREATED});
  EXPECT_EQ(flags("/user.slice/system.slice"), uint32_t{KSI_GROUP_USER_CREATED});
  EXPECT_EQ(flags("/machine.slice"), uint32_t{KSI_GROUP_PREDEFINED | KSI_GROUP_USER_CREATED});
  EXPECT_EQ(flags("/machine.slice/libpod-1.scope"),
            uint32_t{KSI_GROUP_USER_CREATED | KSI_GROUP_NON_PERSISTENT | KSI_GROUP_CONTAINER});
  EXPECT_EQ(flags("/machine.slice/libpod-1.scope/container"),
            uint32_t{KSI_GROUP_USER_CREATED | KSI_GROUP_SUB_CONTAINER});
  EXPECT_EQ(flags("/machine.slice/libpod-conmon-1.scope"),
            uint32_t{KSI_GROUP_USER_CREATED | KSI_GROUP_NON_PERSISTENT});
  EXPECT_EQ(flags("/kubepods"), uint32_t{KSI_GROUP_PREDEFINED | KSI_GROUP_USER_CREATED});
  EXPECT_EQ(flags("/kubepods/" + std::string(64, 'a')),
            uint32_t{KSI_GROUP_USER_CREATED | KSI_GROUP_CONTAINER});
}

TEST_F(GroupsTest, KernelThreadsAndTheDeadAreNoUserWorlds) {
  tree_.Write("/proc/2/status", "Name:\tkthreadd\nState:\tS (sleeping)\nPPid:\t0\nThreads:\t1\n");
  tree_.Write("/proc/3/status", "Name:\tksmd\nState:\tS (sleeping)\nPPid:\t2\nThreads:\t1\n");
  tree_.Write("/proc/4/status", "Name:\tnew\nState:\tS (sleeping)\nPPid:\t9\nKthread:\t1\n");
  tree_.Write("/proc/5/status", "Name:\tdead\nState:\tZ (zombie)\nPPid:\t9\nThreads:\t1\n");
  tree_.Write("/proc/6/status", "Name:\tending\nState:\tR (running)\nPPid:\t9\nThreads:\t1\n");
  std::filesystem::create_directories(tree_.Root() + "/proc/8");
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}),
            (std::vector<int64_t>{kKernelGroup, kJobs}));
}

TEST_F(GroupsTest, ReservationsAddUpAndLimitsMayBeMissing) {
  tree_.Write("/sys/fs/cgroup/jobs/memory.min", "65536\n");
  tree_.Write("/sys/fs/cgroup/jobs/memory.max", "1048576\n");
  const auto allocation = Get<KSI_GroupAllocation>("sched/groups/memAllocationInKB", kJobs);
  EXPECT_EQ(int64_t{allocation.min}, 64);
  EXPECT_EQ(int64_t{allocation.max}, 1024);
  const auto root = Get<KSI_GroupCapacity>("sched/groups/stats/capacity", kRootGroup);
  EXPECT_EQ(uint64_t{root.conResv}, 64u);
  EXPECT_EQ(uint64_t{root.availResv}, 960u);
  const auto work = Get<KSI_GroupCapacity>("sched/groups/stats/capacity", kJobs);
  EXPECT_EQ(uint64_t{work.availResv}, 64u);
  const auto stats = Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kJobs);
  EXPECT_EQ(uint64_t{stats.eMin}, kNoValue);

  tree_.Write("/sys/fs/cgroup/jobs/memory.min", "max\n");
  std::filesystem::remove(tree_.Root() + "/sys/fs/cgroup/jobs/memory.max");
  const auto without = Get<KSI_GroupAllocation>("sched/groups/memAllocationInKB", kJobs);
  EXPECT_EQ(int64_t{without.max}, -1);
}

TEST_F(GroupsTest, ACgroupWithoutTheControllerHasNoFigures) {
  for (const char* file : {"memory.current", "memory.stat", "memory.min", "memory.max"}) {
    std::filesystem::remove(tree_.Root() + "/sys/fs/cgroup/jobs/" + file);
  }
  const auto stats = Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kJobs);
  EXPECT_EQ(uint64_t{stats.consumed}, kNoValue);
  EXPECT_EQ(uint64_t{stats.memSize}, kNoValue);
  EXPECT_EQ(uint64_t{stats.bMin}, 0u);
}

TEST_F(GroupsTest, ACgroupThatVanishesAfterTheScanHasNoFigures) {
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}).size(), 1u);
  std::filesystem::remove_all(tree_.Root() + "/sys/fs/cgroup/jobs");
  KSI_GroupMemoryStats stats = {};
  ASSERT_EQ(GetValue(source, "sched/groups/stats/memoryStats", {kJobs}, &stats), kOk);
  for (const uint64_t none : {stats.consumed, stats.consumedPeak, stats.memSize, stats.memSizePeak,
                              stats.ovhd, stats.touched, stats.bMax}) {
    EXPECT_EQ(none, kNoValue);
  }
  EXPECT_EQ(uint64_t{stats.bMin}, 0u);
  KSI_GroupName name = {};
  ASSERT_EQ(GetValue(source, "sched/groups/groupName", {kJobs}, &name), kOk);
  EXPECT_STREQ(name.text, "jobs");
  KSI_GroupAllocation allocation = {};
  EXPECT_EQ(GetValue(source, "sched/groups/memAllocationInKB", {kJobs}, &allocation), kOk);
  KSI_GroupCapacity capacity = {};
  EXPECT_EQ(GetValue(source, "sched/groups/stats/capacity", {kJobs}, &capacity), kOk);
}

TEST_F(GroupsTest, AProcessThatEndsAfterTheScanIsShownAsItWas) {
  for (const char* shared : {"0", "5"}) {
    WriteProcess(kPid, "worker");
    WriteSharing(shared, shared, "0");
    LinuxSource source(tree_.Root());
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}).size(), 1u);
    std::filesystem::remove_all(tree_.Root() + "/proc/100");
    KSI_UwTally tally = {};
    ASSERT_EQ(GetValue(source, "sched/memClients/tally/uw", {int64_t{kPid}}, &tally), kOk);
    EXPECT_EQ(uint64_t{tally.memSize}, 800u);
    EXPECT_EQ(int32_t{tally.memSizeLimit}, -1);
    // What it shared nobody can tell any more.
    const bool sharedNothing = *shared == '0';
    EXPECT_EQ(uint64_t{tally.mapped}, sharedNothing ? 400u : kNoValue);
    EXPECT_EQ(uint64_t{tally.sharedSaved}, 0u);
    KSI_GroupMemoryStats stats = {};
    ASSERT_EQ(GetValue(source, "sched/groups/stats/memoryStats", {kProcessGroup + kPid}, &stats),
              kOk);
    EXPECT_EQ(uint64_t{stats.sharedSaved}, sharedNothing ? 0u : kNoValue);
  }
}

TEST_F(GroupsTest, WhatIsNotUnderstoodIsToldOnceAndLeftOut) {
  for (int32_t pid = 201; pid < 204; ++pid) {
    tree_.Write(ProcessFile(pid, "status"), "Name:\tx\nVmSize:\tmuch\n");
  }
  testing::internal::CaptureStderr();
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 2u);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "/proc/201/status: line 2 is not understood\n");

  tree_.Write("/sys/fs/cgroup/jobs/memory.current", "plenty\n");
  tree_.Write("/proc/100/limits", "Max address space         vast\n");
  testing::internal::CaptureStderr();
  LinuxSource again(tree_.Root());
  KSI_GroupMemoryStats stats = {};
  KSI_UwTally tally = {};
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(GetValue(again, "sched/groups/stats/memoryStats", {kJobs}, &stats),
              KSI_STATUS_INVALID_METADATA);
    EXPECT_EQ(GetValue(again, "sched/memClients/tally/uw", {int64_t{kPid}}, &tally),
              KSI_STATUS_INVALID_METADATA);
  }
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/proc/201/status: line 2 is not understood\n"
            "/sys/fs/cgroup/jobs/memory.current: line 1 is not understood\n"
            "/proc/100/limits: line 1 is not understood\n");
}

TEST_F(GroupsTest, WhatCannotBeReadIsToldOnceInAReadingAndLeftOut) {
  // Even root cannot read a directory as a file.
  for (int32_t pid = 201; pid < 204; ++pid) tree_.Write(ProcessFile(pid, "status/x"), "");
  LinuxSource source(tree_.Root());
  for (int reading = 0; reading < 2; ++reading) {
    testing::internal::CaptureStderr();
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 2u);
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}).size(), 1u);
    EXPECT_EQ(
        testing::internal::GetCapturedStderr(),
        "/proc/201/status: Is a directory: what cannot be read is left out or has no value\n");
    source.Refresh();
  }
}

// In a recorded tree. Nothing of what lies outside is shown, and that is told.
TEST_F(GroupsTest, WhatLeadsOutIsToldOnceInAReadingAndLeftOut) {
  const HostTree outside;
  std::filesystem::copy(tree_.Root(), outside.Root(), std::filesystem::copy_options::recursive);
  const auto link = [&](const std::string& file, const std::string& target) {
    std::filesystem::create_symlink(target, tree_.Root() + file);
  };
  const auto expectTold = [&](const std::string& what) {
    testing::internal::CaptureStderr();
    LinuxSource source(tree_.Root());
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}),
              (std::vector<int64_t>{kKernelGroup, kJobs}));
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}),
              (std::vector<int64_t>{kProcessGroup + kPid}));
    EXPECT_EQ(source.LossStatus(), what.empty() ? kOk : KSI_STATUS_NOT_FOUND);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              what.empty() ? ""
                           : what +
                                 ": leads out of the recorded tree: what cannot be read is left "
                                 "out or has no value\n");
  };
  link("/proc/self", "4711");
  link("/sys/fs/cgroup/none", "gone");
  expectTold("");
  link("/sys/fs/cgroup/more", outside.Root() + "/sys/fs/cgroup/jobs");
  expectTold("/sys/fs/cgroup/more");
  std::filesystem::remove(tree_.Root() + "/sys/fs/cgroup/more");
  link("/proc/201", outside.Root() + "/proc/100");
  link("/proc/202", outside.Root() + "/proc/100");
  expectTold("/proc/201/status");
  std::filesystem::remove(tree_.Root() + "/proc/201");
  std::filesystem::remove(tree_.Root() + "/proc/202");
  tree_.Write("/proc/203/limits", "");
  link("/proc/203/status", "../../../" + outside.Root() + "/proc/100/status");
  expectTold("/proc/203/status");
}

TEST_F(GroupsTest, AProcessMayLieBehindALinkInTheTree) {
  std::filesystem::rename(tree_.Root() + "/proc/100", tree_.Root() + "/moved");
  std::filesystem::create_symlink("/moved", tree_.Root() + "/proc/100");
  LinuxSource source(tree_.Root());
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}),
            (std::vector<int64_t>{kProcessGroup + kPid}));
  EXPECT_EQ(source.LossStatus(), kOk);
}

TEST_F(GroupsTest, AnOrdinaryUserIsShownWhatItMaySee) {
  WriteProcess(101, "other");
  WriteProcess(102, "hidden");
  WriteSharing("1", "1", "0");
  for (const char* pid : {"100", "101"}) {
    const std::string file = std::string("/proc/") + pid + "/ksm_stat";
    tree_.Write(file, "ksm_merging_pages 1\n");
    tree_.Lock(file);
  }
  tree_.Lock("/proc/102/status");
  const auto asNobody = [&] {
    constexpr uid_t kNobody = 65534;
    if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
    LinuxSource source(tree_.Root());
    bool isRight = true;
    for (const int64_t pid : {100, 101}) {
      KSI_UwTally tally = {};
      isRight = isRight && GetValue(source, "sched/memClients/tally/uw", {pid}, &tally) == kOk;
      // Readers make "no value" of the two for what is consumed.
      isRight = isRight && tally.memSize == 800 && tally.mapped == kNoValue &&
                tally.sharedSaved == 0 && tally.pinned == 37;
    }
    KSI_GroupName name = {};
    isRight = isRight && GetValue(source, "sched/groups/groupName", {kProcessGroup + 102}, &name) ==
                             KSI_STATUS_NOT_FOUND;
    _exit(isRight ? 0 : 1);
  };
  EXPECT_EXIT(
      asNobody(), testing::ExitedWithCode(0),
      "^/proc/PID/status: not permitted for some processes: they are left out\n"
      "/proc/PID/ksm_stat: not permitted for some processes: their shared memory has no value\n$");
}

// All but its end would pass for a process that has ended.
TEST_F(GroupsTest, AStatusFileThatIsCutOffIsNotUnderstood) {
  const std::pair<const char*, const char*> cut[] = {{"", "1"},
                                                     {"Name:\tx\nState:\tS (sleeping)\n", "3"}};
  for (const auto& [content, line] : cut) {
    tree_.Write("/proc/201/status", content);
    testing::internal::CaptureStderr();
    LinuxSource source(tree_.Root());
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 2u);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              std::string("/proc/201/status: line ") + line + " is not understood\n");
    EXPECT_EQ(source.LossStatus(), KSI_STATUS_INVALID_METADATA);
  }
}

TEST_F(GroupsTest, CgroupsThatMayNotBeReadAreLeftOutWithAWord) {
  const auto asNobody = [&] {
    constexpr uid_t kNobody = 65534;
    if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
    LinuxSource source(tree_.Root());
    const auto expected = std::vector<int64_t>{kKernelGroup, kProcessGroup + kPid};
    bool isRight = true;
    for (int i = 0; i < 2; ++i) {
      isRight = isRight && GetIds(source, "sched/groups/members/groups", {int64_t{0}}) == expected;
    }
    _exit(isRight ? 0 : 1);
  };
  tree_.Lock("/sys/fs/cgroup/cgroup.controllers");
  EXPECT_EXIT(asNobody(), testing::ExitedWithCode(0),
              "^/sys/fs/cgroup/cgroup.controllers: not permitted: all cgroups are left out\n$");
  std::filesystem::remove(tree_.Root() + "/sys/fs/cgroup/cgroup.controllers");
  tree_.Write("/sys/fs/cgroup/memory/cgroup.procs", "");
  tree_.Lock("/sys/fs/cgroup/memory/cgroup.procs");
  EXPECT_EXIT(asNobody(), testing::ExitedWithCode(0),
              "^/sys/fs/cgroup/memory/cgroup.procs: not permitted: all cgroups are left out\n$");
}

// What may not be read was not needed.
TEST_F(GroupsTest, AHierarchyThatMayNotBeReadIsNotMissedBesideAnother) {
  tree_.Write("/sys/fs/cgroup/unified/cgroup.controllers", "memory\n");
  tree_.Lock("/sys/fs/cgroup/cgroup.controllers");
  const auto asNobody = [&] {
    constexpr uid_t kNobody = 65534;
    if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
    LinuxSource source(tree_.Root());
    _exit(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size() == 2 ? 0 : 1);
  };
  EXPECT_EXIT(asNobody(), testing::ExitedWithCode(0), "^$");
}

TEST_F(GroupsTest, WhatIsBelowALockedCgroupIsLeftOutWithAWord) {
  tree_.Write("/sys/fs/cgroup/jobs/a/b/cgroup.procs", "");
  tree_.Write("/sys/fs/cgroup/jobs/c/cgroup.procs", "");
  tree_.Lock("/sys/fs/cgroup/jobs/a");
  tree_.Lock("/sys/fs/cgroup/jobs/c");
  const auto asNobody = [&] {
    constexpr uid_t kNobody = 65534;
    if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
    LinuxSource source(tree_.Root());
    // The two and the process.
    _exit(GetIds(source, "sched/groups/members/groups", {kJobs}).size() == 3 ? 0 : 1);
  };
  EXPECT_EXIT(asNobody(), testing::ExitedWithCode(0),
              "^cgroup /jobs/a: not permitted: what is below such cgroups is left out\n$");
}

TEST_F(GroupsTest, ALockedCgroupIsDeniedAndNoZero) {
  tree_.Lock("/sys/fs/cgroup/jobs/memory.current");
  const auto asNobody = [&] {
    constexpr uid_t kNobody = 65534;
    if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
    _exit(StatusOf<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kJobs) ==
                  KSI_STATUS_PERMISSION_DENIED
              ? 0
              : 1);
  };
  EXPECT_EXIT(asNobody(), testing::ExitedWithCode(0),
              "^/sys/fs/cgroup/jobs/memory.current: permission denied\n$");
}

TEST_F(GroupsTest, AUserWorldIsWalkedForNothing) {
  const auto tally = Get<KSI_UwTally>("sched/memClients/tally/uw", kPid);
  EXPECT_EQ(uint64_t{tally.mapped}, 400u);
  EXPECT_EQ(uint64_t{tally.touched}, kNoValue);
  EXPECT_EQ(uint64_t{tally.swappable}, kNoValue);
}

TEST_F(GroupsTest, WhatIsLockedOrPinnedOrHugeIsNotSwappedAndInMemory) {
  const auto pinned = [&](const std::string& sizes) {
    WriteProcess(kPid, "worker", sizes);
    return uint64_t{Get<KSI_UwTally>("sched/memClients/tally/uw", kPid).pinned};
  };
  EXPECT_EQ(pinned(""), 37u);
  tree_.Write("/proc/100/status",
              "Name:\tx\nVmSize:\t 800 kB\nVmLck:\t 30 kB\nVmPin:\t 7 kB\nVmRSS:\t 40 kB\n"
              "HugetlbPages:\t 64 kB\nThreads:\t1\n");
  EXPECT_EQ(uint64_t{Get<KSI_UwTally>("sched/memClients/tally/uw", kPid).pinned}, 101u);
  // Locked when it comes into memory: of what is there, nobody tells how much is.
  tree_.Write(
      "/proc/100/status",
      "Name:\tx\nVmSize:\t 800 kB\nVmLck:\t 700 kB\nVmPin:\t 0 kB\nVmRSS:\t 40 kB\nThreads:\t1\n");
  EXPECT_EQ(uint64_t{Get<KSI_UwTally>("sched/memClients/tally/uw", kPid).pinned}, kNoValue);
}

TEST_F(GroupsTest, ANameIsWhatTheProcessIsCalled) {
  const auto nameOf = [this](const std::string& inStatus) {
    WriteProcess(kPid, inStatus);
    return NameOf(kProcessGroup + kPid);
  };
  EXPECT_EQ(nameOf("a\\\\b"), "a\\b");
  EXPECT_EQ(nameOf("a\\\\nb"), "a\\nb") << "a backslash and an n";
  EXPECT_EQ(nameOf("a\\nb"), "a?b") << "a newline";
  EXPECT_EQ(nameOf("a\\"), "a\\") << "no kernel writes that";
}

TEST_F(GroupsTest, ProcessesThatAreNotVisibleAreToldOnce) {
  WriteCgroup("/jobs", kJobs, "0\n100\n0\n");
  WriteCgroup("/more", 8, "0\n");
  LinuxSource source(tree_.Root());
  testing::internal::CaptureStderr();
  EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {kJobs}),
            (std::vector<int64_t>{kProcessGroup + kPid}));
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/sys/fs/cgroup/jobs/cgroup.procs: lists processes that are not visible from here: "
            "such are left out\n");
}

TEST_F(GroupsTest, ALimitIsTheSmallestOnTheWayUp) {
  constexpr int64_t kBelow = 8;
  const std::string jobs = "/sys/fs/cgroup/jobs/";
  WriteCgroup("/jobs/below", kBelow, "101\n");
  WriteProcess(101, "worker");
  const auto limitOf = [this](int64_t group) {
    return uint64_t{Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", group).bMax};
  };
  const auto expect = [&](uint64_t above, uint64_t below) {
    EXPECT_EQ(limitOf(kRootGroup), kNoValue);
    EXPECT_EQ(limitOf(kJobs), above);
    EXPECT_EQ(limitOf(kProcessGroup + kPid), above);
    EXPECT_EQ(limitOf(kBelow), below);
    EXPECT_EQ(limitOf(kProcessGroup + 101), below);
  };
  expect(kNoValue, kNoValue);
  tree_.Write(jobs + "below/memory.max", "4194304\n");
  expect(kNoValue, 4096);
  tree_.Write(jobs + "memory.max", "2097152\n");
  expect(2048, 2048);
  tree_.Write(jobs + "memory.high", "max\n");
  tree_.Write(jobs + "below/memory.high", "1048576\n");
  expect(2048, 1024);
  tree_.Write(jobs + "memory.high", "0\n");
  expect(0, 0);
  // What is set stays as it is.
  EXPECT_EQ(int64_t{Get<KSI_GroupAllocation>("sched/groups/memAllocationInKB", kBelow).max}, 4096);
}

// In a container, limits above what it sees hold, too.
TEST_F(GroupsTest, InVersion1TheKernelTellsTheSmallestLimitOnTheWayUp) {
  tree_.Write("/sys/fs/cgroup/cgroup.controllers", "");
  WriteCgroup("/memory", 0, "");
  WriteCgroup("/memory/jobs", kJobs, "100\n");
  const std::string jobs = "/sys/fs/cgroup/memory/jobs/";
  const auto expect = [this](uint64_t limit) {
    for (const int64_t group : {kJobs, kProcessGroup + kPid}) {
      const auto stats = Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", group);
      EXPECT_EQ(uint64_t{stats.bMax}, limit) << group;
    }
    EXPECT_EQ(int64_t{Get<KSI_GroupAllocation>("sched/groups/memAllocationInKB", kJobs).max}, 4096);
  };
  tree_.Write(jobs + "memory.limit_in_bytes", "4194304\n");
  expect(4096);
  tree_.Write(jobs + "memory.stat", "hierarchical_memory_limit 2097152\n");
  expect(2048);
  // A hierarchy that was not used as one.
  tree_.Write("/sys/fs/cgroup/memory/memory.limit_in_bytes", "1048576\n");
  tree_.Write(jobs + "memory.stat", "hierarchical_memory_limit 9223372036854771712\n");
  expect(kNoValue);
}

TEST_F(GroupsTest, MemoryLowIsABaseReservation) {
  const std::string jobs = "/sys/fs/cgroup/jobs/";
  const auto stats = [this] {
    return Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kJobs);
  };
  tree_.Write(jobs + "memory.low", "2097152\n");
  EXPECT_EQ(uint64_t{stats().bMin}, 2048u);
  EXPECT_EQ(uint64_t{stats().eMin}, 0u) << "it does not hold in any case";
  tree_.Write(jobs + "memory.min", "4194304\n");
  EXPECT_EQ(uint64_t{stats().bMin}, 4096u);
  tree_.Write(jobs + "memory.low", "max\n");
  EXPECT_EQ(uint64_t{stats().bMin}, kNoValue);
}

// For which part of the time groups may run, by what the kernel measures of waiting for memory.
class ThrottleTest : public GroupsTest {
 protected:
  void WritePressure(const std::string& file, const std::string& some, const std::string& full) {
    tree_.Write(file, "some avg10=" + some + " avg60=0.00 avg300=0.00 total=1\nfull avg10=" + full +
                          " avg60=0.00 avg300=0.00 total=1\n");
  }

  uint32_t Throttle(int64_t group) {
    return Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", group).throttlePct;
  }

  const std::string host_ = "/proc/pressure/memory";
  const std::string jobs_ = "/sys/fs/cgroup/jobs/memory.pressure";
  static constexpr uint32_t kNone = 255;
};

TEST_F(ThrottleTest, IsNotKnownWhereItIsNotMeasured) {
  for (const int64_t group : {kRootGroup, kKernelGroup, kJobs, kProcessGroup + kPid}) {
    EXPECT_EQ(Throttle(group), kNone) << group;
  }
  WritePressure(host_, "3.00", "1.00");
  EXPECT_EQ(Throttle(kJobs), kNone);
}

TEST_F(ThrottleTest, IsNoneWhereNobodyWaits) {
  WritePressure(host_, "0.49", "0.49");
  WritePressure(jobs_, "90.00", "80.00");
  for (const int64_t group : {kRootGroup, kKernelGroup, kJobs, kProcessGroup + kPid}) {
    EXPECT_EQ(Throttle(group), 100u) << group;
  }
}

TEST_F(ThrottleTest, IsWhatAllOfACgroupHaveWaited) {
  WritePressure(host_, "0.50", "0.49");
  WritePressure(jobs_, "0.50", "0.50");
  EXPECT_EQ(Throttle(kRootGroup), 100u);
  EXPECT_EQ(Throttle(kKernelGroup), kNone);
  EXPECT_EQ(Throttle(kJobs), 99u);
  EXPECT_EQ(Throttle(kProcessGroup + kPid), kNone) << "others may have waited there";
  WritePressure(host_, "90.00", "7.51");
  WritePressure(jobs_, "100.00", "100.00");
  EXPECT_EQ(Throttle(kRootGroup), 92u);
  EXPECT_EQ(Throttle(kJobs), 0u);
  WritePressure(jobs_, "0.49", "0.10");
  EXPECT_EQ(Throttle(kJobs), 100u);
  EXPECT_EQ(Throttle(kProcessGroup + kPid), 100u);
}

// Huge pages of hugetlb, which a cgroup's current does not count: 6 MB of them are in use.
class HugetlbTest : public GroupsTest {
 protected:
  HugetlbTest() {
    tree_.Write("/proc/meminfo",
                "MemTotal: 65536 kB\nMemFree: 24 kB\nSlab: 8 kB\nPageTables: 4 kB\n"
                "VmallocUsed: 4 kB\nHugePages_Total: 5\nHugePages_Free: 2\nHugepagesize: 2048 kB\n"
                "Hugetlb: 10240 kB\n");
    for (const char* pool : {"2048kB", "1048576kB"}) {
      tree_.Write(std::string("/sys/kernel/mm/hugepages/hugepages-") + pool + "/nr_hugepages", "");
    }
    WriteHuge(kPid, 6144);
  }

  void WriteHuge(int32_t pid, uint64_t size) {
    tree_.Write(ProcessFile(pid, "status"),
                "Name:\tworker\nVmSize:\t 9000 kB\nVmRSS:\t 400 kB\nHugetlbPages:\t " +
                    std::to_string(size) + " kB\nThreads:\t1\n");
  }

  KSI_GroupMemoryStats Jobs() {
    return Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kJobs);
  }
};

TEST_F(HugetlbTest, IsConsumedByTheCgroup) {
  tree_.Write("/sys/fs/cgroup/jobs/hugetlb.2MB.current", "4194304\n");
  tree_.Write("/sys/fs/cgroup/jobs/hugetlb.1GB.current", "1073741824\n");
  tree_.Write("/sys/fs/cgroup/jobs/memory.peak", "9999360\n");
  EXPECT_EQ(uint64_t{Jobs().consumed}, 1024u + 4096 + 1048576);
  EXPECT_EQ(uint64_t{Jobs().consumedPeak}, kNoValue) << "no kernel keeps the peak of both";
}

TEST_F(HugetlbTest, WithoutTheControllerTheProcessesTell) {
  EXPECT_EQ(uint64_t{Jobs().consumed}, 1024u + 6144);
  // Two that map the same pages: nobody tells whose they are.
  WriteHuge(101, 2048);
  EXPECT_EQ(uint64_t{Jobs().consumed}, kNoValue);
}

TEST_F(HugetlbTest, WhoHasNoneSharesNone) {
  tree_.Write("/sys/fs/cgroup/jobs/memory.peak", "9999360\n");
  WriteHuge(kPid, 0);
  for (const int32_t pid : {101, 102}) WriteHuge(pid, 6144);
  EXPECT_EQ(uint64_t{Jobs().consumed}, 1024u);
  EXPECT_EQ(uint64_t{Jobs().consumedPeak}, 9765u);
}

TEST_F(HugetlbTest, MayBeMountedToCountAsMemory) {
  tree_.Write("/proc/self/mounts",
              "cgroup2 /sys/fs/cgroup cgroup2 rw,memory_hugetlb_accounting 0 0\n");
  EXPECT_EQ(uint64_t{Jobs().consumed}, 1024u);
}

// Page sharing on the host: 20 pages stand for 100, and 8 zero pages for as many.
class SharingTest : public GroupsTest {
 protected:
  SharingTest() { WriteSharing("20", "80", "8"); }

  KSI_UwTally Tally(int32_t pid, const std::string& stat) {
    tree_.Write(ProcessFile(pid, "ksm_stat"), stat);
    return Get<KSI_UwTally>("sched/memClients/tally/uw", pid);
  }
};

TEST_F(SharingTest, OfThePagesThatShareOneStays) {
  const auto tally = Tally(kPid, "ksm_merging_pages 50\nksm_zero_pages 3\n");
  EXPECT_EQ(uint64_t{tally.sharedSaved}, 4 * (50u * 80 / 100 + 3));
  EXPECT_EQ(uint64_t{tally.mapped}, 400u + 4 * 3) << "zero pages do not count as resident";
}

TEST_F(SharingTest, WhatAllSaveIsWhatTheHostReclaimed) {
  WriteProcess(101, "other");
  tree_.Write("/sys/fs/cgroup/jobs/cgroup.procs", "100\n101\n");
  tree_.Write("/proc/100/ksm_stat", "ksm_merging_pages 25\nksm_zero_pages 3\n");
  tree_.Write("/proc/101/ksm_stat", "ksm_merging_pages 75\nksm_zero_pages 5\n");
  const auto jobs = Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kJobs);
  LinuxSource source(tree_.Root());
  KSI_PshareStats host = {};
  ASSERT_EQ(GetValue(source, "memory/pshare/stats", {}, &host), kOk);
  EXPECT_EQ(uint64_t{host.reclaimed}, 88u);
  EXPECT_EQ(uint64_t{jobs.sharedSaved}, 4 * 88u);
}

TEST_F(SharingTest, ZeroPagesThatTheKernelDoesNotCountVoidNothing) {
  std::filesystem::remove(tree_.Root() + "/sys/kernel/mm/ksm/ksm_zero_pages");
  for (const char* used : {"0", "1"}) {
    tree_.Write("/sys/kernel/mm/ksm/use_zero_pages", used);
    const auto tally = Tally(kPid, "ksm_merging_pages 50\n");
    EXPECT_EQ(uint64_t{tally.sharedSaved}, 160u);
    EXPECT_EQ(uint64_t{tally.mapped}, 400u);
  }
}

TEST_F(SharingTest, OlderKernelsTellOfMergedPagesInAFileOfTheirOwn) {
  std::filesystem::remove(tree_.Root() + "/sys/kernel/mm/ksm/ksm_zero_pages");
  tree_.Write("/proc/100/ksm_merging_pages", "50\n");
  EXPECT_EQ(uint64_t{Get<KSI_UwTally>("sched/memClients/tally/uw", kPid).sharedSaved}, 160u);
  std::filesystem::remove(tree_.Root() + "/proc/100/ksm_merging_pages");
  EXPECT_EQ(uint64_t{Get<KSI_UwTally>("sched/memClients/tally/uw", kPid).mapped}, kNoValue);
}

TEST_F(SharingTest, NoneSavesMoreThanItHas) {
  EXPECT_EQ(uint64_t{Tally(kPid, "ksm_merging_pages 9999\nksm_zero_pages 0\n").sharedSaved}, 400u);
}

TEST_F(GroupsTest, AddressSpacesHaveLimits) {
  const auto limit = [&](const std::string& soft) {
    tree_.Write("/proc/100/limits", "Limit    Soft Limit\nMax address space         " + soft +
                                        "   unlimited     bytes\n");
    return int32_t{Get<KSI_UwTally>("sched/memClients/tally/uw", kPid).memSizeLimit};
  };
  EXPECT_EQ(limit("1048576"), 1024);
  EXPECT_EQ(limit("unlimited"), -1);
  EXPECT_EQ(limit("8796093022208"), -1) << "too large for the field";
}

}  // namespace
}  // namespace ksi
