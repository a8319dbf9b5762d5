// Groups and their processes on the machine itself, compared with what other programs make of the
// same files. Where figures move, the tolerance is named.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/linux/linux_source.h"
#include "knvlibs/linux/machines/conversation.h"
#include "knvlibs/linux/machines/monitor_socket.h"
#include "tests/harness/program.h"
#include "tests/harness/tally.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

std::string Shell(const std::string& command) {
  std::string text;
  const std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
  std::array<char, 4096> part;
  while (const size_t size = fread(part.data(), 1, part.size(), pipe.get())) {
    text.append(part.data(), size);
  }
  return text;
}

// A child that runs a program until its owner goes.
class Child {
 public:
  explicit Child(const std::vector<std::string>& words) {
    std::vector<char*> arguments;
    for (const std::string& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
    arguments.push_back(nullptr);
    pid_ = fork();
    if (pid_ == 0) {
      execvp(arguments[0], arguments.data());
      _exit(127);
    }
  }
  Child(Child&& other) noexcept : pid_(std::exchange(other.pid_, -1)) {}
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;
  ~Child() {
    if (pid_ < 0) return;
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }

  pid_t Pid() const { return pid_; }

 private:
  pid_t pid_;
};

// What tally says without a cache, that is of this machine.
harness::Result TallyLive(const std::vector<std::string>& args) {
  return harness::RunProgram(harness::BuiltTally(args));
}

TEST(LiveGroupsTest, AChildIsAUserWorldWithTheFiguresOfPs) {
  const Child child({"sleep", "60"});
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  const std::string pid = std::to_string(child.Pid());
  LinuxSource source("/");
  KSI_UwTally tally = {};
  ASSERT_EQ(GetValue(source, "sched/memClients/tally/uw", {int64_t{child.Pid()}}, &tally), kOk);
  // Asleep, it does not move.
  EXPECT_EQ(std::to_string(tally.memSize),
            std::to_string(std::stoul(Shell("ps -o vsz= -p " + pid))));
  EXPECT_NEAR(static_cast<double>(tally.mapped), std::stod(Shell("ps -o rss= -p " + pid)), 256);
  KSI_GroupName name = {};
  ASSERT_EQ(GetValue(source, "sched/groups/groupName", {kProcessGroup + child.Pid()}, &name), kOk);
  EXPECT_STREQ(name.text, "sleep");
}

// Counts the groups of each kind as the walk meets them.
void Count(Source& source, int64_t group, size_t* cgroups, size_t* userWorlds) {
  for (const int64_t child : GetIds(source, "sched/groups/members/groups", {group})) {
    uint32_t flags = 0;
    if (GetValue(source, "sched/groups/groupFlags", {child}, &flags) != kOk) continue;
    if ((flags & KSI_GROUP_USER_WORLD) != 0) {
      ++*userWorlds;
    } else if (child < kProcessGroup) {
      ++*cgroups;
      Count(source, child, cgroups, userWorlds);
    }
  }
}

TEST(LiveGroupsTest, GroupsAreTheCgroupsAndProcessesThatOthersCount) {
  size_t cgroups = 0;
  size_t userWorlds = 0;
  LinuxSource source("/");
  Count(source, 0, &cgroups, &userWorlds);
  const std::string directory =
      access("/sys/fs/cgroup/memory/cgroup.procs", F_OK) == 0 ? "memory" : "";
  const double found =
      std::stod(Shell("find /sys/fs/cgroup/" + directory + " -mindepth 1 -type d | wc -l"));
  // Other programs come and go meanwhile.
  EXPECT_NEAR(static_cast<double>(cgroups), found, 3);
  const double counted = std::stod(Shell("ps -eo stat=,vsz= | awk '$1 !~ /^Z/ && $2 > 0' | wc -l"));
  EXPECT_NEAR(static_cast<double>(userWorlds), counted, 0.2 * counted + 10);
}

TEST(LiveGroupsTest, ACgroupHasTheFiguresOfItsFiles) {
  LinuxHost host("/");
  const GroupTree* tree = nullptr;
  ASSERT_EQ(GroupTree::Get(host, tree), kOk);
  if (!tree->Cgroups().Exists()) GTEST_SKIP() << "this machine has no cgroups";
  LinuxSource source("/");
  for (const int64_t id : GetIds(source, "sched/groups/members/groups", {int64_t{0}})) {
    const Group* group = tree->Find(id);
    if (group == nullptr || group->kind != Group::Kind::kCgroup) continue;
    const std::string file = Shell("ls /sys/fs/cgroup" + group->path +
                                   "/memory.current "
                                   "/sys/fs/cgroup/memory" +
                                   group->path + "/memory.usage_in_bytes 2>/dev/null");
    if (file.empty()) continue;
    const double before = std::stod(Shell("cat " + file));
    KSI_GroupMemoryStats stats = {};
    ASSERT_EQ(GetValue(source, "sched/groups/stats/memoryStats", {id}, &stats), kOk);
    // A tenth and 64 MB for a machine at work.
    EXPECT_NEAR(static_cast<double>(stats.consumed), before / 1024, before / 10240 + 65536)
        << group->path;
  }
}

TEST(LiveGroupsTest, ReportsStandAStormOfProcesses) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(4);
  std::thread storm([&] {
    std::vector<Child> children;
    while (std::chrono::steady_clock::now() < end) {
      for (int i = 0; i < 200; ++i) children.emplace_back(std::vector<std::string>{"sleep", "60"});
      children.clear();
    }
  });
  while (std::chrono::steady_clock::now() < end) {
    for (const char* report : {"group-stats", "uw-stats", "vm-stats", "asyncremap-stats"}) {
      const harness::Result run = TallyLive({"-r", report, "-q"});
      EXPECT_EQ(run.status, 0) << report << "\n" << run.err;
      EXPECT_NE(run.out, "");
    }
  }
  storm.join();
}

TEST(LiveGroupsTest, AGuestIsAVirtualMachine) {
  if (std::system("command -v qemu-system-x86_64 >/dev/null") != 0) {
    GTEST_SKIP() << "this machine has no QEMU";
  }
  const HostTree directory;
  const std::string socket = directory.Root() + "/monitor";
  const Child guest({"qemu-system-x86_64", "-name", "guest=tally-test", "-accel", "tcg", "-M", "pc",
                     "-m", "64", "-display", "none", "-serial", "none", "-monitor", "none",
                     "-device", "virtio-balloon-pci,id=balloon0", "-qmp",
                     "unix:" + socket + ",server=on,wait=off"});
  // Until its firmware has run for a while.
  for (int i = 0; i < 100 && access(socket.c_str(), F_OK) != 0; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  std::this_thread::sleep_for(std::chrono::seconds(1));

  const harness::Result run = TallyLive(
      {"-r", "vm-stats", "-q", "-s", "name:b:worldGrp:memSizeLimit:memSize:ballooned:mapped"});
  EXPECT_EQ(run.status, 0) << run.err;
  // There is a balloon, and nobody in the guest who would drive it.
  const std::string start = "tally-test,n," + std::to_string(guest.Pid()) + ",65536,65536,0,";
  const size_t row = run.out.find(start);
  ASSERT_NE(row, std::string::npos) << run.out;
  const double mapped = std::stod(run.out.substr(row + start.size()));
  EXPECT_GT(mapped, 256) << "the firmware has touched some of it";
  EXPECT_LE(mapped, 65536);
  for (const char* report : {"swap-stats", "guest-stats", "zip-stats", "lpage-stats"}) {
    const harness::Result other = TallyLive({"-r", report, "-q", "-s", "name:worldGrp"});
    EXPECT_NE(other.out.find("tally-test," + std::to_string(guest.Pid())), std::string::npos)
        << report << "\n"
        << other.out << other.err;
  }
}

// A child that has made a machine with KVM and runs a second thread, as all that do.
class MachineMaker {
 public:
  MachineMaker() {
    int ready[2];
    EXPECT_EQ(pipe(ready), 0);
    pid_ = fork();
    if (pid_ == 0) {
      constexpr unsigned long kCreateMachine = _IO(0xAE, 0x01);
      const int kvm = open("/dev/kvm", O_RDWR);
      std::thread processor([] { pause(); });
      if (ioctl(kvm, kCreateMachine, 0) >= 0 && write(ready[1], "y", 1) == 1) pause();
      _exit(1);
    }
    close(ready[1]);
    char answer = 'n';
    isMade_ = read(ready[0], &answer, 1) == 1;
    close(ready[0]);
  }
  ~MachineMaker() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }
  MachineMaker(const MachineMaker&) = delete;
  MachineMaker& operator=(const MachineMaker&) = delete;

  bool IsMade() const { return isMade_; }
  pid_t Pid() const { return pid_; }

 private:
  pid_t pid_ = -1;
  bool isMade_ = false;
};

TEST(LiveGroupsTest, WhatMakesAMachineWithKvmIsAVirtualMachine) {
  if (access("/dev/kvm", R_OK | W_OK) != 0) GTEST_SKIP() << "this machine has no KVM";
  const MachineMaker maker;
  if (!maker.IsMade()) GTEST_SKIP() << "KVM makes no machine here";
  const harness::Result run = TallyLive({"-r", "vm-stats", "-q", "-s", "worldGrp:memSize:mapped"});
  EXPECT_EQ(run.status, 0) << run.err;
  const std::string row =
      std::to_string(maker.Pid()) + ",18446744073709551615,18446744073709551615\n";
  EXPECT_NE(run.out.find(row), std::string::npos) << run.out;
}

// A QEMU that this machine can run, with room for modules, and what plugs them in.
struct RoomyGuest {
  const char* accelerator;
  int64_t memory;  // MB
  const char* monitor;

  friend std::ostream& operator<<(std::ostream& out, const RoomyGuest& guest) {
    return out << guest.accelerator << ' ' << guest.memory << " MB";
  }
};

class PluggedMemoryTest : public testing::TestWithParam<RoomyGuest> {
 protected:
  void SetUp() override {
    if (std::system("command -v qemu-system-x86_64 >/dev/null") != 0) {
      GTEST_SKIP() << "this machine has no QEMU";
    }
    if (GetParam().accelerator == std::string("kvm") && access("/dev/kvm", R_OK | W_OK) != 0) {
      GTEST_SKIP() << "this machine has no KVM";
    }
    const std::string memory = std::to_string(GetParam().memory) + "M,slots=4,maxmem=8G";
    guest_.emplace(std::vector<std::string>{"qemu-system-x86_64",
                                            "-name",
                                            "guest=" + Name(),
                                            "-accel",
                                            GetParam().accelerator,
                                            "-M",
                                            "pc,nvdimm=on",
                                            "-m",
                                            memory,
                                            "-display",
                                            "none",
                                            "-serial",
                                            "none",
                                            "-monitor",
                                            "none",
                                            "-device",
                                            "virtio-balloon-pci,id=balloon0",
                                            "-object",
                                            "memory-backend-ram,id=changing,size=512M",
                                            "-device",
                                            "virtio-mem-pci,memdev=changing,requested-size=0",
                                            GetParam().monitor,
                                            "unix:" + path_ + ",server=on,wait=off"});
  }

  // The tests of the other guests run beside this one, and this one from another build tree.
  static std::string Name() {
    return std::string("tally-plug-") + GetParam().accelerator + std::to_string(GetParam().memory) +
           "-" + std::to_string(getpid());
  }

  // Tries until it is so. A monitor has one client at a time, and reports of other tests ask it,
  // too.
  template <class Attempt>
  static bool Eventually(Attempt&& attempt) {
    for (int i = 0; i < 100; ++i) {
      if (attempt()) return true;
      std::this_thread::sleep_for(std::chrono::milliseconds(200));
    }
    return false;
  }

  bool TryCommand(const std::string& command) const {
    MonitorSocket socket(std::chrono::steady_clock::now,
                         std::chrono::steady_clock::now() + std::chrono::seconds(20));
    if (!socket.Connect(path_, guest_->Pid(), geteuid())) return false;
    Conversation monitor(socket);
    if (!monitor.Begin()) return false;
    const std::optional<Json> answer = monitor.Ask(command);
    EXPECT_TRUE(answer && FindMember(&*answer, "return") != nullptr) << command;
    return true;
  }

  void Command(const std::string& command) const {
    ASSERT_TRUE(Eventually([&] { return TryCommand(command); })) << command;
  }

  void AddBackend(const std::string& id, const std::string& size, const char* prealloc) const {
    Command(R"({"execute":"object-add","arguments":{"qom-type":"memory-backend-ram","id":")" + id +
            R"(","prealloc":)" + prealloc + R"(,"size":)" + size + "}}");
  }

  // `device` is the driver and what it is told more.
  void Plug(const std::string& id, const std::string& size,
            const std::string& device = R"("pc-dimm")") const {
    AddBackend(id, size, "true");
    Command(R"({"execute":"device_add","arguments":{"driver":)" + device + R"(,"memdev":")" + id +
            R"(","id":"dimm-)" + id + R"("}})");
  }

  // "memSizeLimit,memSize,ballooned", and the last, mapped; empty if there is no such row.
  static std::string Row(double& mapped) {
    const harness::Result run =
        TallyLive({"-r", "vm-stats", "-q", "-s", "name:memSizeLimit:memSize:ballooned:mapped"});
    EXPECT_EQ(run.status, 0) << run.err;
    const std::string start = "\n" + Name() + ",";
    const size_t row = run.out.find(start);
    if (row == std::string::npos) return {};
    std::string line = run.out.substr(row + start.size());
    line.resize(line.find('\n'));
    const size_t last = line.rfind(',');
    mapped = std::stod(line.substr(last + 1));
    return line.substr(0, last);
  }

  // The row with these sizes, in MB, once it is there; what of it is mapped.
  double MappedOnceItHas(int64_t megabytes) const {
    double mapped = 0;
    std::string row;
    Eventually([&] { return (row = Row(mapped)) == SizesOf(megabytes); });
    EXPECT_EQ(row, SizesOf(megabytes));
    return mapped;
  }

  std::string SizesOf(int64_t megabytes) const {
    return "8388608," + std::to_string(megabytes * 1024) + ",0";
  }

  const HostTree directory_;
  const std::string path_ = directory_.Root() + "/monitor";
  std::optional<Child> guest_;
};

TEST_P(PluggedMemoryTest, IsMemoryOfTheGuest) {
  const int64_t start = GetParam().memory;
  EXPECT_LT(MappedOnceItHas(start), 65536) << "an idle machine has little of its memory";
  Plug("small", "67108864");
  EXPECT_GE(MappedOnceItHas(start + 64), 65536) << "all of it is there";
  // So much that the process is not walked any more.
  Plug("large", "268435456");
  const double large = MappedOnceItHas(start + 320);
  EXPECT_GE(large, 327680);
  EXPECT_LE(large, static_cast<double>((start + 320) * 1024));
  // Its label takes of it, and what remains is whole pieces of 2 MB.
  Plug("persistent", "134217728", R"("nvdimm","label-size":131072)");
  const double persistent = MappedOnceItHas(start + 320 + 126);
  EXPECT_GE(persistent - large, 126 * 1024);
}

TEST_P(PluggedMemoryTest, IsNotMistakenForWhatNothingUses) {
  const int64_t start = GetParam().memory;
  // One before and one behind it.
  AddBackend("before", "67108864", "false");
  Plug("small", "67108864");
  AddBackend("behind", "67108864", "false");
  EXPECT_GE(MappedOnceItHas(start + 64), 65536) << "all of it is there";
  AddBackend("as-machine", std::to_string(start << 20), "false");
  const double mapped = MappedOnceItHas(start + 64);
  EXPECT_GE(mapped, 65536 + 256) << "the firmware has touched some memory";
  EXPECT_LE(mapped, 2 * 65536);
}

INSTANTIATE_TEST_SUITE_P(
    Guests, PluggedMemoryTest,
    testing::Values(RoomyGuest{"tcg", 64, "-qmp"}, RoomyGuest{"tcg", 2048, "-qmp-pretty"},
                    RoomyGuest{"kvm", 64, "-qmp-pretty"}, RoomyGuest{"kvm", 2048, "-qmp"}),
    [](const auto& guest) {
      return std::string(guest.param.accelerator) + std::to_string(guest.param.memory);
    });

TEST(LiveGroupsTest, AGuestThatWaitsForItsFirstClientIsNotReleased) {
  if (std::system("command -v qemu-system-x86_64 >/dev/null") != 0) {
    GTEST_SKIP() << "this machine has no QEMU";
  }
  const HostTree directory;
  const std::string socket = directory.Root() + "/monitor";
  const std::string name = "tally-waits-" + std::to_string(getpid());
  const Child guest({"qemu-system-x86_64", "-name", "guest=" + name, "-accel", "tcg", "-M", "pc",
                     "-m", "64", "-display", "none", "-serial", "none", "-monitor", "none",
                     "-device", "virtio-balloon-pci", "-qmp", "unix:" + socket + ",server=on"});
  for (int i = 0; i < 100 && access(socket.c_str(), F_OK) != 0; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  const harness::Result run = TallyLive({"-r", "vm-stats", "-q", "-s", "name:memSize:ballooned"});
  EXPECT_NE(run.out.find(name + ",65536,18446744073709551615\n"), std::string::npos) << run.out;
  // It would have its memory at once.
  std::this_thread::sleep_for(std::chrono::seconds(1));
  const std::string smaps = "/proc/" + std::to_string(guest.Pid()) + "/smaps";
  EXPECT_EQ(Shell("grep -c '^VmFlags:.* dc' " + smaps), "0\n");
}

}  // namespace
}  // namespace ksi
