// Virtual machines as a host's files show them: which processes they are, what memory they have,
// and what they take beside it. Fields of records are not aligned: "+" takes their values.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <utility>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/linux_source.h"
#include "knvlibs/linux/machines/kvm.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

class MachineTest : public testing::Test {
 protected:
  static constexpr int32_t kPid = 100;

  MachineTest() { WriteMeminfo("0"); }

  void WriteMeminfo(const std::string& secPageTables) {
    tree_.Write("/proc/meminfo",
                "MemTotal: 1024 kB\nMemFree: 24 kB\nSlab: 8 kB\nPageTables: 4 kB\n"
                "SecPageTables: " +
                    secPageTables + " kB\nVmallocUsed: 4 kB\nSwapTotal: 0 kB\nSwapFree: 0 kB\n");
  }

  void WriteProcess(int32_t pid, const std::string& name, int threads, int fdSize = 64) {
    tree_.Write(ProcessFile(pid, "status"), "Name:\t" + name + "\nState:\tS\nTgid:\t" +
                                                std::to_string(pid) + "\nPPid:\t1\nFDSize:\t" +
                                                std::to_string(fdSize) +
                                                "\nVmPeak:\t 90000 kB\nVmSize:\t 80000 kB\n"
                                                "VmHWM:\t 5000 kB\nVmRSS:\t 4000 kB\n"
                                                "VmPTE:\t 12 kB\nVmSwap:\t 0 kB\nThreads:\t" +
                                                std::to_string(threads) + "\n");
  }

  void WriteCommandLine(int32_t pid, std::initializer_list<const char*> words) {
    std::string text;
    for (const char* word : words) text.append(word).push_back('\0');
    tree_.Write(ProcessFile(pid, "cmdline"), text);
  }

  // A QEMU with 1 MB of memory, of which 1000 KB are resident.
  void WriteQemu(int32_t pid, const char* memory, const char* option, const char* value) {
    WriteProcess(pid, "qemu", 3);
    WriteCommandLine(pid, {"qemu-system-x86_64", "-m", memory, option, value});
    WriteMappings(pid, "");
  }

  void WriteMappings(int32_t pid, const std::string& more) {
    tree_.Write(ProcessFile(pid, "smaps"),
                "100000-200000 rw-p 0 00:00 0\nRss: 1000 kB\nVmFlags: rd wr dc\n" + more);
  }

  void WriteDescriptor(int32_t pid, const std::string& number, const std::string& target) {
    const std::string directory = tree_.Root() + ProcessFile(pid, "fd");
    std::filesystem::create_directories(directory);
    std::filesystem::create_symlink(target, directory + "/" + number);
  }

  template <class Record>
  Record Get(std::string_view path, int64_t key) {
    LinuxSource source(tree_.Root());
    Record record = {};
    EXPECT_EQ(GetValue(source, path, {key}, &record), kOk) << path;
    return record;
  }

  KSI_VmmTally Tally(int32_t pid = kPid) {
    return Get<KSI_VmmTally>("sched/memClients/tally/vmm", pid);
  }

  KSI_GroupMemoryStats Stats(int32_t pid = kPid) {
    return Get<KSI_GroupMemoryStats>("sched/groups/stats/memoryStats", kProcessGroup | pid);
  }

  HostTree tree_;
};

// Memory that may have been plugged in, where nobody can be asked.

TEST_F(MachineTest, WithoutRoomForModulesHasWhatItStartedWith) {
  WriteQemu(kPid, "1", "-smp", "2");
  WriteMappings(kPid, "1000000-9000000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: dc\n");
  EXPECT_EQ(+Tally().memSize, 1024u);
  EXPECT_EQ(+Tally().memSizeLimit, 1024u);
  EXPECT_EQ(+Tally().mapped, 1000u);
  EXPECT_EQ(+Stats().memSize, 1024u);
  EXPECT_EQ(+Stats().memSizePeak, 1024u);
}

TEST_F(MachineTest, WithRoomHasWhatItStartedWithIfThereIsNoMore) {
  WriteQemu(kPid, "1,slots=1,maxmem=64M", "-smp", "2");
  // A screen's memory.
  WriteMappings(kPid, "1000000-2000000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: dc\n");
  EXPECT_EQ(+Tally().memSize, 1024u);
  EXPECT_EQ(+Tally().memSizeLimit, 65536u);
  EXPECT_EQ(+Tally().mapped, 1000u);
  EXPECT_EQ(+Stats().memSize, 1024u);
  EXPECT_EQ(+Stats().memSizePeak, kNoValue);
}

TEST_F(MachineTest, WithRoomAndMoreThatMayBeMemoryIsNotTold) {
  WriteQemu(kPid, "1,slots=1,maxmem=64M", "-smp", "2");
  WriteMappings(kPid, "1000000-2001000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: dc\n");
  EXPECT_EQ(+Tally().memSize, kNoValue);
  EXPECT_EQ(+Tally().memSizeLimit, 65536u);
  EXPECT_EQ(+Tally().mapped, kNoValue);
  EXPECT_EQ(+Stats().memSize, kNoValue);
  EXPECT_EQ(+Stats().ovhd, kNoValue);
  // What QEMU does not keep from its children is not memory of a guest.
  WriteMappings(kPid, "1000000-2001000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: rd wr\n");
  EXPECT_EQ(+Tally().memSize, 1024u);
}

TEST_F(MachineTest, WhatItTouchesIsNotToldOfHugePages) {
  WriteQemu(kPid, "1", "-smp", "2");
  const auto map = [this](const std::string& hugetlb) {
    tree_.Write(ProcessFile(kPid, "smaps"),
                "100000-200000 rw-p 0 00:00 0\nRss: 100 kB\nReferenced: 90 kB\n"
                "Private_Hugetlb: " +
                    hugetlb + " kB\nVmFlags: rd wr dc\n");
  };
  map("0");
  EXPECT_EQ(+Tally().touched, 90u);
  map("512");
  EXPECT_EQ(+Tally().mapped, 612u);
  EXPECT_EQ(+Tally().touched, kNoValue);
}

TEST_F(MachineTest, WithTwoBlocksOfOneSizeWhatIsThereIsNotTold) {
  WriteQemu(kPid, "1", "-smp", "2");
  WriteMappings(kPid, "1000000-1100000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: dc\n");
  EXPECT_EQ(+Tally().memSize, 1024u);
  EXPECT_EQ(+Tally().mapped, kNoValue);
  // What QEMU does not keep from its children is not memory of a guest.
  WriteMappings(kPid, "1000000-1100000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: rd wr\n");
  EXPECT_EQ(+Tally().mapped, 1000u);
}

// A backend that nothing uses, as large as the machine's own memory or as its DIMM.
class SpareBlockTest : public MachineTest {
 protected:
  // `places` is what the monitor says of the addresses that it is asked for.
  KSI_VmmTally TallyBeside(const std::string& spare, const std::string& places) {
    WriteQemu(kPid, "1,slots=1,maxmem=64M", "-qmp", "unix:/run/q");
    tree_.Write("/run/q",
                "{\"QMP\": {}}\n{\"return\": {}}\n{\"return\": {\"actual\": 3145728}}\n"
                "{\"return\": {\"base-memory\": 1048576, \"plugged-memory\": 2097152}}\n"
                "{\"return\": [{\"type\": \"dimm\", \"data\": {\"memdev\": \"/objects/d\", "
                "\"addr\": 4294967296, \"size\": 2097152}}]}\n"
                "{\"return\": [{\"id\": \"d\", \"size\": 2097152}, "
                "{\"id\": \"pc.ram\", \"size\": 1048576}, {\"id\": \"spare\", \"size\": " +
                    spare + "}]}\n" + places);
    Map(spare == "1048576" ? "1100000" : "1200000");
    const KSI_VmmTally tally = Tally();
    EXPECT_EQ(+tally.memSize, 3072u);
    return tally;
  }

  static std::string Place(const std::string& what) {
    return "{\"return\": \"Host virtual address for " + what + "\\r\\n\"}\n";
  }

  // The machine's own memory is at 0x100000.
  void Map(const std::string& spareEnd) {
    WriteMappings(kPid, "1000000-" + spareEnd +
                            " rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: dc\n"
                            "4000000-4200000 rw-p 0 00:00 0\nRss: 30 kB\nVmFlags: dc\n");
  }
};

TEST_F(SpareBlockTest, IsNotTheDimmWhereTheMonitorTells) {
  const auto mapped = [this](const char* place) {
    return +TallyBeside("2097152", Place(place)).mapped;
  };
  EXPECT_EQ(mapped("0x100000000 (d) is 0x4000000"), 1030u);
  EXPECT_EQ(mapped("0x100000000 (d) is 0x1000000"), 1005u);
  EXPECT_EQ(mapped("0x100000000 (spare) is 0x4000000"), kNoValue) << "of another one";
}

TEST_F(SpareBlockTest, IsNotTheMachinesMemoryWhereTheMonitorTells) {
  const auto mapped = [this](const char* place) {
    return +TallyBeside("1048576", Place(place)).mapped;
  };
  EXPECT_EQ(mapped("0x0 (pc.ram) is 0x100000"), 1030u);
  EXPECT_EQ(mapped("0x0 (pc.ram) is 0x1000000"), 35u);
  EXPECT_EQ(mapped("0x0 (pc.ram) is 0x9000000"), kNoValue) << "nothing is mapped there";
  EXPECT_EQ(mapped("0x0 (vga.vram) is 0x100000"), kNoValue);
}

TEST_F(SpareBlockTest, IsAskedForWhereTheMachineCannotChange) {
  WriteProcess(kPid, "qemu", 3);
  WriteCommandLine(kPid, {"qemu-system-x86_64", "-m", "1", "-object",
                          "memory-backend-ram,id=spare,size=1M", "-qmp", "unix:/run/q"});
  Map("1100000");
  EXPECT_EQ(+Tally().memSize, 1024u);
  EXPECT_EQ(+Tally().mapped, kNoValue);
  tree_.Write("/run/q",
              "{\"QMP\": {}}\n{\"return\": {}}\n{\"return\": {\"actual\": 1048576}}\n"
              "{\"return\": {\"base-memory\": 1048576, \"plugged-memory\": 0}}\n"
              "{\"return\": []}\n{\"return\": [{\"id\": \"pc.ram\", \"size\": 1048576}, "
              "{\"id\": \"spare\", \"size\": 1048576}]}\n" +
                  Place("0x0 (pc.ram) is 0x100000"));
  EXPECT_EQ(+Tally().memSize, 1024u);
  EXPECT_EQ(+Tally().mapped, 1000u);
}

TEST_F(MachineTest, WhatItsMonitorTellsIsItsMemory) {
  WriteQemu(kPid, "1,slots=1,maxmem=64M", "-qmp", "unix:/run/q");
  tree_.Write("/run/q",
              "{\"QMP\": {}}\n{\"return\": {}}\n{\"return\": {\"actual\": 2097152}}\n"
              "{\"return\": {\"base-memory\": 1048576, \"plugged-memory\": 3145728}}\n"
              "{\"return\": [{\"type\": \"dimm\", \"data\": {\"memdev\": \"/objects/d\", "
              "\"size\": 2097152}}, {\"type\": \"virtio-mem\", \"data\": {\"memdev\": "
              "\"/objects/v\", \"size\": 1048576}}]}\n"
              "{\"return\": [{\"id\": \"d\", \"size\": 2097152}, "
              "{\"id\": \"v\", \"size\": 33554432}]}\n");
  WriteMappings(kPid,
                "1000000-3000000 rw-p 0 00:00 0\nRss: 700 kB\nVmFlags: dc\n"
                "4000000-4200000 rw-p 0 00:00 0\nRss: 30 kB\nVmFlags: dc\n"
                "6000000-7000000 rw-p 0 00:00 0\nRss: 5 kB\nVmFlags: dc\n");
  const KSI_VmmTally tally = Tally();
  EXPECT_EQ(+tally.memSize, 4096u);
  EXPECT_EQ(+tally.memSizeLimit, 65536u);
  EXPECT_EQ(+tally.mapped, 1730u);
  // QEMU takes the balloon off the memory that it has without the changing device: 3 MB.
  EXPECT_EQ(+tally.ballooned, 1024u);
  EXPECT_EQ(+Stats().memSize, 4096u);
  EXPECT_EQ(+Stats().ovhd, 4000u - 1730 + 12);
}

TEST_F(MachineTest, HasABalloonThatWorksWhereADriverIsShown) {
  WriteQemu(kPid, "1", "-qmp", "unix:/run/q");
  WriteCommandLine(kPid, {"qemu-system-x86_64", "-m", "1", "-qmp", "unix:/run/q", "-device",
                          "virtio-balloon,id=b"});
  const auto isActive = [this](const char* actual, const char* lastUpdate) {
    tree_.Write("/run/q", std::string("{\"QMP\": {}}\n{\"return\": {}}\n{\"return\": "
                                      "{\"actual\": ") +
                              actual + "}}\n{\"return\": {\"stats\": {}, \"last-update\": " +
                              lastUpdate + "}}\n{\"return\": 0}\n");
    const KSI_VmmTally tally = Tally();
    EXPECT_NE(+tally.ballooned, kNoValue);
    return tally.balloonActive != 0;
  };
  EXPECT_FALSE(isActive("1048576", "0")) << "the firmware has none";
  EXPECT_TRUE(isActive("524288", "0"));
  EXPECT_TRUE(isActive("1048576", "17"));
}

TEST_F(MachineTest, WhatItTakesBesideItsGuestIsOfOneMoment) {
  WriteQemu(kPid, "1", "-smp", "2");
  LinuxSource source(tree_.Root());
  ASSERT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 2u);
  // Since the scan the guest has come to use all of its memory.
  tree_.Write(ProcessFile(kPid, "smaps"),
              "100000-200000 rw-p 0 00:00 0\nRss: 1024 kB\nVmFlags: rd wr dc\n");
  tree_.Write(ProcessFile(kPid, "status"),
              "Name:\tqemu\nVmSize:\t 9 kB\nVmRSS:\t 4024 kB\nVmPTE:\t 12 kB\nThreads:\t2\n");
  KSI_GroupMemoryStats stats = {};
  ASSERT_EQ(GetValue(source, "sched/groups/stats/memoryStats", {kProcessGroup | kPid}, &stats),
            kOk);
  EXPECT_EQ(+stats.ovhd, 3000u + 12);
  EXPECT_EQ(+stats.consumed, 4000u) << "that is of the scan, as of all processes";
}

TEST_F(MachineTest, AMachineThatEndsAfterTheScanIsShownAsItStartedIfItCannotHaveChanged) {
  WriteQemu(kPid, "1", "-smp", "2");
  WriteQemu(kPid + 1, "1,slots=1,maxmem=64M", "-smp", "2");
  LinuxSource source(tree_.Root());
  uint32_t count = 0;
  ASSERT_EQ(GetValue(source, "sched/globalStats/numVMs", {}, &count), kOk);
  EXPECT_EQ(count, 2u);
  std::filesystem::remove_all(tree_.Root() + "/proc/100");
  std::filesystem::remove_all(tree_.Root() + "/proc/101");
  for (const auto& [pid, size] : {std::pair(kPid, uint64_t{1024}), {kPid + 1, kNoValue}}) {
    KSI_GroupMemoryStats stats = {};
    const std::string path = "sched/groups/stats/memoryStats";
    ASSERT_EQ(GetValue(source, path, {kProcessGroup | pid}, &stats), kOk);
    EXPECT_EQ(+stats.memSize, size);
    EXPECT_EQ(+stats.consumed, 4000u);
  }
}

TEST_F(MachineTest, WhoseCommandLineMayNotBeReadIsAUserWorldWithAWord) {
  for (const int32_t pid : {kPid, kPid + 1}) {
    WriteQemu(pid, "1", "-accel", "kvm");
    tree_.Lock(ProcessFile(pid, "cmdline"));
  }
  const auto asNobody = [&] {
    constexpr uid_t kNobody = 65534;
    if (geteuid() == 0 && setuid(kNobody) != 0) _exit(2);
    const LinuxHost host(tree_.Root());
    const GroupTree* tree = nullptr;
    _exit(GroupTree::Get(host, tree) == kOk && tree->VirtualMachines().empty() &&
                  tree->FindClient(kPid) != nullptr && host.LossStatus() == kOk
              ? 0
              : 1);
  };
  EXPECT_EXIT(asNobody(), testing::ExitedWithCode(0),
              "^/proc/PID/cmdline: not permitted for some processes: virtual machines may be shown "
              "as user worlds\n$");
}

// Machines of other monitors.

class OtherMonitorTest : public MachineTest {
 protected:
  OtherMonitorTest() {
    Make("/sys/devices/virtual/misc/kvm");
    WriteProcess(kPid, "light-monitor", 2);
    WriteCommandLine(kPid, {"/usr/bin/light-monitor"});
    WriteDescriptor(kPid, "3", "/dev/kvm");
    WriteDescriptor(kPid, "4", "anon_inode:kvm-vm");
  }

  void Make(const std::string& directory) {
    std::filesystem::create_directories(tree_.Root() + directory);
  }

  bool IsMachine() {
    return (Get<uint32_t>("sched/groups/groupFlags", kProcessGroup | kPid) & KSI_GROUP_VM) != 0;
  }
};

TEST_F(OtherMonitorTest, AProcessThatIsGoneHoldsNone) {
  Process gone;
  gone.pid = INT32_MAX;
  EXPECT_EQ(HoldsMachine(LinuxHost("/"), gone), false);
  EXPECT_EQ(HoldsMachine(LinuxHost(tree_.Root()), gone), std::nullopt) << "nobody recorded it";
}

TEST_F(OtherMonitorTest, IsKnownByItsDescriptor) {
  EXPECT_TRUE(IsMachine());
  EXPECT_EQ(Get<int32_t>("worldGroups/vmmLeaderID", kPid), kPid);
  EXPECT_STREQ(Get<KSI_GroupName>("sched/groups/groupName", kProcessGroup | kPid).text,
               "light-monitor");
  const KSI_GroupMemoryStats stats = Stats();
  EXPECT_EQ(+stats.consumed, 4000u);
  EXPECT_EQ(+stats.consumedPeak, 5000u);
  EXPECT_EQ(+stats.memSize, kNoValue);
  EXPECT_EQ(+stats.memSizePeak, kNoValue);
  EXPECT_EQ(+stats.ovhd, kNoValue);
  const KSI_VmmTally tally = Tally();
  EXPECT_EQ(+tally.memSize, kNoValue);
  EXPECT_EQ(+tally.memSizeLimit, kNoValue);
  EXPECT_EQ(+tally.mapped, kNoValue);
  EXPECT_EQ(+tally.ballooned, kNoValue);
  EXPECT_EQ(+tally.balloonActive, 0u);
}

TEST_F(OtherMonitorTest, WithoutTheDescriptorIsAUserWorld) {
  std::filesystem::remove(tree_.Root() + "/proc/100/fd/4");
  WriteDescriptor(kPid, "4", "anon_inode:kvm-vcpu:0");
  EXPECT_FALSE(IsMachine());
}

TEST_F(OtherMonitorTest, WithoutKvmThereIsNone) {
  std::filesystem::remove_all(tree_.Root() + "/sys/devices");
  EXPECT_FALSE(IsMachine());
}

TEST_F(OtherMonitorTest, OfOneThreadIsNotLookedAt) {
  WriteProcess(kPid, "light-monitor", 1);
  EXPECT_FALSE(IsMachine());
}

TEST_F(OtherMonitorTest, WhatTheKernelListsIsLookedAt) {
  Make("/sys/kernel/debug/kvm/7-3");
  Make("/sys/kernel/debug/kvm/none");
  EXPECT_FALSE(IsMachine());
  Make("/sys/kernel/debug/kvm/100-4");
  WriteProcess(kPid, "light-monitor", 1);
  EXPECT_TRUE(IsMachine());
}

TEST_F(OtherMonitorTest, MayBeListedByTheThreadThatMadeTheMachine) {
  Make("/sys/kernel/debug/kvm/101-4");
  tree_.Write("/proc/101/status", "Name:\tmaker\nTgid:\t100\nThreads:\t2\n");
  EXPECT_TRUE(IsMachine());
}

TEST_F(OtherMonitorTest, TooManyDescriptorsAreNotLookedAtWhichIsToldOnce) {
  WriteProcess(kPid, "light-monitor", 2, KvmSearch::kMostDescriptors + 1);
  WriteProcess(kPid + 1, "server", 2, KvmSearch::kMostDescriptors + 1);
  testing::internal::CaptureStderr();
  EXPECT_FALSE(IsMachine());
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "/proc/PID/fd: too many to look at all: virtual machines of other monitors than QEMU "
            "may be shown as user worlds\n");
  const LinuxHost host(tree_.Root());
  const GroupTree* tree = nullptr;
  EXPECT_EQ(GroupTree::Get(host, tree), kOk);
  EXPECT_EQ(host.LossStatus(), KSI_STATUS_LIMIT_EXCEEDED);
  WriteProcess(kPid, "light-monitor", 2, KvmSearch::kMostDescriptors);
  testing::internal::CaptureStderr();
  EXPECT_TRUE(IsMachine());
  EXPECT_NE(testing::internal::GetCapturedStderr(), "");
}

// The page tables of KVM, of which the host has 100 KB.

class KvmTablesTest : public MachineTest {
 protected:
  // Beside the guest: what is resident, and page tables.
  static constexpr uint64_t kOther = 4000 - 1000 + 12;

  KvmTablesTest() {
    WriteMeminfo("100");
    WriteVmstat("0");
    WriteQemu(kPid, "1", "-accel", "kvm");
  }

  void WriteVmstat(const std::string& devices) {
    tree_.Write("/proc/vmstat", "nr_free_pages 9\nnr_iommu_pages " + devices + "\n");
  }
};

TEST_F(KvmTablesTest, AreThoseOfTheOnlyMachine) { EXPECT_EQ(+Stats().ovhd, kOther + 100); }

TEST_F(KvmTablesTest, AMachineWithoutKvmHasNone) {
  WriteQemu(kPid, "1", "-accel", "tcg");
  EXPECT_EQ(+Stats().ovhd, kOther);
  // Descriptors know better than options.
  WriteQemu(kPid, "1", "-accel", "kvm:tcg");
  EXPECT_EQ(+Stats().ovhd, kNoValue);
  WriteDescriptor(kPid, "3", "/dev/null");
  EXPECT_EQ(+Stats().ovhd, kOther);
  WriteDescriptor(kPid, "4", "anon_inode:kvm-vm");
  EXPECT_EQ(+Stats().ovhd, kOther + 100);
}

TEST_F(KvmTablesTest, OfSeveralCannotBeDivided) {
  WriteQemu(kPid + 1, "1", "-accel", "kvm");
  EXPECT_EQ(+Stats().ovhd, kNoValue);
  EXPECT_EQ(+Stats(kPid + 1).ovhd, kNoValue);
  WriteQemu(kPid + 1, "1", "-accel", "tcg");
  EXPECT_EQ(+Stats().ovhd, kOther + 100);
  EXPECT_EQ(+Stats(kPid + 1).ovhd, kOther);
}

TEST_F(KvmTablesTest, AreWhatMachinesWithCgroupsOfTheirOwnLeave) {
  const std::string scope = "/sys/fs/cgroup/a.scope/";
  tree_.Write("/sys/fs/cgroup/cgroup.controllers", "memory\n");
  tree_.Write("/sys/fs/cgroup/cgroup.procs", "100\n");
  tree_.Write(scope + "cgroup.procs", "101\n");
  tree_.Write(scope + "memory.current", "4096\n");
  tree_.Write(scope + "memory.stat", "sec_pagetables 71680\n");
  tree_.Write(scope + "memory.zswap.max", "max\n");
  WriteQemu(kPid + 1, "1", "-accel", "kvm");
  EXPECT_EQ(+Stats(kPid + 1).ovhd, kOther + 70);
  EXPECT_EQ(+Stats().ovhd, kOther + 30);
}

TEST_F(KvmTablesTest, OfDevicesAreNotThoseOfAMachine) {
  WriteVmstat("1");
  EXPECT_EQ(+Stats().ovhd, kNoValue);
}

TEST_F(KvmTablesTest, AreNotToldWhereAMachineMayHaveBeenMissed) {
  std::filesystem::create_directories(tree_.Root() + "/sys/devices/virtual/misc/kvm");
  WriteProcess(kPid + 1, "server", 2, KvmSearch::kMostDescriptors + 1);
  testing::internal::CaptureStderr();
  EXPECT_EQ(+Stats().ovhd, kNoValue);
  EXPECT_NE(testing::internal::GetCapturedStderr(), "");
}

// A machine with a cgroup of its own, in a slice, on a host with 10,000 KB of swap.
class SwappedMachineTest : public MachineTest {
 protected:
  SwappedMachineTest() {
    tree_.Write("/proc/meminfo",
                "MemTotal: 1024 kB\nMemFree: 24 kB\nSlab: 8 kB\nPageTables: 4 kB\n"
                "VmallocUsed: 4 kB\nSwapTotal: 10000 kB\nSwapFree: 6000 kB\n");
    WriteQemu(kPid, "1", "-smp", "2");
    tree_.Write(kRoot + "/cgroup.controllers", "memory\n");
    tree_.Write(kRoot + "/cgroup.procs", "");
    tree_.Write(kSlice + "/cgroup.procs", "");
    tree_.Write(kOwn + "/cgroup.procs", "100\n");
    for (const std::string& cgroup : {kSlice, kOwn}) {
      tree_.Write(cgroup + "/memory.stat", "zswapped 0\nzswap 0\n");
      WriteSwap(cgroup, "max", 2000);
    }
  }

  void WriteSwap(const std::string& cgroup, const std::string& max, uint64_t current) {
    tree_.Write(cgroup + "/memory.swap.max", max + "\n");
    tree_.Write(cgroup + "/memory.swap.current", std::to_string(current * 1024) + "\n");
  }

  static constexpr const char* kNode = "sched/memClients/swapInfo";
  const std::string kRoot = "/sys/fs/cgroup";
  const std::string kSlice = kRoot + "/machine.slice";
  const std::string kOwn = kSlice + "/web.scope";
};

TEST_F(SwappedMachineTest, SharesTheSwapOfTheHost) {
  const auto swap = Get<KSI_SwapInfo>(kNode, kPid);
  EXPECT_EQ(uint64_t{swap.totalReg}, 10000u);
  EXPECT_EQ(uint64_t{swap.freeReg}, 6000u);
  EXPECT_EQ(uint8_t{swap.isSwapping}, 0u);
}

TEST_F(SwappedMachineTest, HasWhatItIsLimitedTo) {
  WriteSwap(kOwn, "4096000", 1000);
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).totalReg}, 4000u);
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).freeReg}, 3000u);
  // What is around it may be limited more, and have less left.
  WriteSwap(kSlice, "3072000", 2500);
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).totalReg}, 3000u);
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).freeReg}, 500u);
  // No more than there is.
  WriteSwap(kSlice, "max", 2500);
  WriteSwap(kOwn, "20480000", 1000);
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).totalReg}, 10000u);
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).freeReg}, 6000u);
}

TEST_F(SwappedMachineTest, IsSwappingIfItsSwapHasGrownSinceTheReportBegan) {
  LinuxSource source(tree_.Root());
  for (const auto& [current, isSwapping] : {std::pair(2001, 1), {2000, 0}, {1999, 0}}) {
    source.Refresh();
    WriteSwap(kOwn, "max", 2000);
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 2u);
    WriteSwap(kOwn, "max", static_cast<uint64_t>(current));
    KSI_SwapInfo swap = {};
    ASSERT_EQ(GetValue(source, kNode, {int64_t{kPid}}, &swap), kOk);
    EXPECT_EQ(uint8_t{swap.isSwapping}, isSwapping) << current;
  }
}

TEST_F(MachineTest, InVersion1HasTheSwapThatMemoryLeavesOfTheLimitOfBoth) {
  const std::string root = "/sys/fs/cgroup/memory/";
  const std::string own = root + "machine.slice/web.scope/";
  tree_.Write("/proc/meminfo", "SwapTotal: 10000 kB\nSwapFree: 6000 kB\n");
  WriteQemu(kPid, "1", "-smp", "2");
  for (const std::string& each : {root, root + "machine.slice/"}) {
    tree_.Write(each + "cgroup.procs", "");
  }
  tree_.Write(own + "cgroup.procs", "100\n");
  tree_.Write(own + "memory.memsw.limit_in_bytes", "4096000\n");
  tree_.Write(own + "memory.memsw.usage_in_bytes", "1024000\n");
  const auto swap = Get<KSI_SwapInfo>("sched/memClients/swapInfo", kPid);
  EXPECT_EQ(uint64_t{swap.totalReg}, 4000u);
  EXPECT_EQ(uint64_t{swap.freeReg}, 3000u);
  tree_.Write(own + "memory.memsw.limit_in_bytes", "9223372036854771712\n");
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>("sched/memClients/swapInfo", kPid).totalReg}, 10000u);
}

TEST_F(MachineTest, WithoutACgroupOfItsOwnIsSwappingIfItsProcessIs) {
  WriteQemu(kPid, "1", "-smp", "2");
  LinuxSource source(tree_.Root());
  const auto writeSwap = [this](int swap) {
    tree_.Write(ProcessFile(kPid, "status"),
                "Name:\tqemu\nVmSize:\t 9 kB\nVmRSS:\t 4 kB\nVmSwap:\t " + std::to_string(swap) +
                    " kB\nThreads:\t2\n");
  };
  for (const auto& [now, isSwapping] : {std::pair(2001, 1), {2000, 0}, {1999, 0}}) {
    source.Refresh();
    writeSwap(2000);
    EXPECT_EQ(GetIds(source, "sched/groups/members/groups", {int64_t{0}}).size(), 2u);
    writeSwap(now);
    KSI_SwapInfo swap = {};
    ASSERT_EQ(GetValue(source, "sched/memClients/swapInfo", {int64_t{kPid}}, &swap), kOk);
    EXPECT_EQ(uint8_t{swap.isSwapping}, isSwapping) << now;
  }
}

TEST_F(SwappedMachineTest, WhatIsCompressedIsNotSwappedToo) {
  tree_.Write("/sys/module/zswap/parameters/enabled", "Y\n");
  tree_.Write(ProcessFile(kPid, "smaps"),
              "100000-200000 rw-p 0 00:00 0\nRss: 1000 kB\nSwap: 500 kB\nVmFlags: rd wr dc\n");
  tree_.Write(kOwn + "/memory.stat", "zswapped 307200\nzswap 102400\n");
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).swapped}, 200u);
  EXPECT_EQ(uint64_t{Tally().zipped}, 300u);
  EXPECT_EQ(uint64_t{Tally().zipSaved}, 200u);
  // Of the machine nothing is told; that nothing is compressed on the host settles it.
  tree_.Write(kOwn + "/memory.stat", "");
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).swapped}, kNoValue);
  tree_.Write("/proc/meminfo",
              "MemTotal: 1024 kB\nSlab: 8 kB\nPageTables: 4 kB\nVmallocUsed: 4 kB\n"
              "SwapTotal: 10000 kB\nZswapped: 0 kB\n");
  EXPECT_EQ(uint64_t{Get<KSI_SwapInfo>(kNode, kPid).swapped}, 500u);
  EXPECT_EQ(uint64_t{Tally().zipped}, 0u);
}

}  // namespace
}  // namespace ksi
