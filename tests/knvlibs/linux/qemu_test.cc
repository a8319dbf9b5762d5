// What a QEMU command line and its monitor tell of a virtual machine.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/linux_source.h"
#include "knvlibs/linux/machines/qemu_command_line.h"
#include "knvlibs/linux/machines/qmp.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

constexpr uint64_t kGB = 1 << 20;

QemuCommandLine Parse(std::vector<std::string> words) {
  words.insert(words.begin(), "/usr/bin/qemu-system-x86_64");
  return ParseQemuCommandLine(words);
}

TEST(QemuCommandLineTest, QemuIsKnownByItsProgram) {
  EXPECT_TRUE(IsQemu({"/usr/bin/qemu-system-x86_64", "-m", "64"}));
  EXPECT_TRUE(IsQemu({"qemu-system-aarch64"}));
  EXPECT_TRUE(IsQemu({"/usr/libexec/qemu-kvm"}));
  EXPECT_TRUE(IsQemu({"/usr/bin/kvm"}));
  EXPECT_FALSE(IsQemu({"/usr/bin/qemu-img"}));
  EXPECT_FALSE(IsQemu({"qemu-x86_64", "program"}));
  EXPECT_FALSE(IsQemu({"vi", "/usr/bin/qemu-system-x86_64"}));
  EXPECT_FALSE(IsQemu({}));
  EXPECT_FALSE(IsQemu({""}));
}

TEST(QemuCommandLineTest, MemoryHasManyForms) {
  EXPECT_EQ(Parse({"-m", "64"}).memory, 64 * 1024u);
  EXPECT_EQ(Parse({"-m", "4G"}).memory, 4 * kGB);
  EXPECT_EQ(Parse({"-m", "4g"}).memory, 4 * kGB);
  EXPECT_EQ(Parse({"--m", "size=4194304k"}).memory, 4 * kGB);
  EXPECT_EQ(Parse({"-m", "size=2T,slots=4,maxmem=4T"}).memory, 2048 * kGB);
  EXPECT_EQ(Parse({"-m", "1G,slots=4,maxmem=4294967296B"}).maxMemory, 4 * kGB);
  EXPECT_EQ(Parse({"-m", "1G"}).maxMemory, kGB);
  for (const char* strange : {"", "x", "4X", "-4", "1.5G", "99999999999999999999", "16777216E"}) {
    EXPECT_EQ(Parse({"-m", strange}).memory, std::nullopt) << strange;
  }
  EXPECT_EQ(Parse({"-m"}).memory, std::nullopt);
  EXPECT_TRUE(Parse({}).blocks.empty());
}

TEST(QemuCommandLineTest, BackendsAreNodesOrModules) {
  const QemuCommandLine nodes =
      Parse({"-m", "4G", "-object", "memory-backend-ram,id=a,size=1G", "-object",
             R"({"qom-type":"memory-backend-memfd","id":"b","size":3221225472})"});
  EXPECT_EQ(nodes.memory, 4 * kGB);
  EXPECT_EQ(nodes.blocks, (std::vector<Figure>{kGB, 3 * kGB}));

  const QemuCommandLine module =
      Parse({"-m", "4G,maxmem=8G", "-object", "memory-backend-ram,id=a,size=1G", "-device",
             R"({"driver":"pc-dimm","id":"d","memdev":"a"})"});
  EXPECT_EQ(module.memory, 5 * kGB);
  EXPECT_EQ(module.maxMemory, 8 * kGB);
  EXPECT_EQ(module.blocks, (std::vector<Figure>{4 * kGB, kGB}));

  const QemuCommandLine persistent = Parse(
      {"-m", "4G", "-object", "memory-backend-file,id=n,size=1G", "-device", "nvdimm,memdev=n"});
  EXPECT_EQ(persistent.memory, 4 * kGB);
  EXPECT_EQ(persistent.blocks, (std::vector<Figure>{4 * kGB}));
}

TEST(QemuCommandLineTest, NamesMayHaveCommas) {
  EXPECT_EQ(Parse({"-name", "web"}).name, "web");
  EXPECT_EQ(Parse({"-name", "guest=a,,b,debug-threads=on"}).name, "a,b");
  EXPECT_EQ(Parse({"-name", "debug-threads=on"}).name, "");
}

TEST(QemuCommandLineTest, MonitorsAreNamedInThreeWays) {
  EXPECT_EQ(Parse({"-qmp", "unix:/run/q,server=on,wait=off"}).monitor, "/run/q");
  EXPECT_EQ(
      Parse({"-chardev", "socket,id=m,path=/run/q", "-mon", "chardev=m,mode=control"}).monitor,
      "/run/q");
  EXPECT_EQ(Parse({"-chardev", "socket,id=m,path=/run/q", "-mon", "m,mode=readline"}).monitor, "");
  EXPECT_EQ(Parse({"-chardev", "socket,id=m,fd=33", "-mon", "m,mode=control"}).monitor, "");
  EXPECT_EQ(Parse({"-qmp", "unix:here,server=on"}).monitor, "");
  EXPECT_EQ(Parse({"-qmp", "tcp:localhost:4444"}).monitor, "");
}

TEST(QemuCommandLineTest, AServerWaitsForItsFirstClientUnlessItIsToldNotTo) {
  const struct {
    const char* options;
    bool waits;
  } kCases[] = {{",server=on", true},
                {",server", true},
                {",server=on,wait=on", true},
                {",server=on,wait=off", false},
                {",server=on,wait=no", false},
                {",server,nowait", false},
                {",server=on,nowait", false},
                {",server=off", false},
                {"", false},
                {",server=yes,wait=true", true}};
  for (const auto& [options, waits] : kCases) {
    const std::string socket = std::string("/run/q") + options;
    EXPECT_EQ(Parse({"-qmp", "unix:" + socket}).waitsForClient, waits) << options;
    const QemuCommandLine device =
        Parse({"-chardev", "socket,id=m,path=" + socket, "-mon", "chardev=m,mode=control"});
    EXPECT_EQ(device.monitor, "/run/q") << options;
    EXPECT_EQ(device.waitsForClient, waits) << options;
  }
}

class QmpTest : public testing::Test {
 protected:
  GuestMemory Ask(const std::string& text, const std::string& balloon = "balloon0") {
    tree_.Write("/run/q", text);
    QemuCommandLine line;
    line.monitor = "/run/q";
    line.hasBalloon = true;
    line.balloon = balloon;
    return ReadGuestMemory(LinuxHost(tree_.Root()), 100, line);
  }

  const std::string hello_ = "{\"QMP\": {}}\n{\"return\": {}}\n";
  HostTree tree_;
};

TEST_F(QmpTest, TellsTheBalloonAndTheGuest) {
  const GuestMemory memory =
      Ask(hello_ +
          "{\"event\": \"X\"}\n{\"return\": {\"actual\": 1048576}}\n"
          "{\"return\": {\"stats\": {\"stat-total-memory\": 4096, "
          "\"stat-available-memory\": 18446744073709551615}, \"last-update\": 5}}\n");
  EXPECT_EQ(memory.balloon, GuestMemory::Balloon::kActive);
  EXPECT_EQ(memory.actual, 1024u);
  EXPECT_EQ(memory.total, 4u);
  EXPECT_EQ(memory.available, std::nullopt);
}

TEST_F(QmpTest, StatisticsThatWereNeverSentAreNone) {
  const GuestMemory memory = Ask(hello_ +
                                 "{\"return\": {\"actual\": 1048576}}\n{\"return\": {\"stats\": "
                                 "{\"stat-total-memory\": 4096}, \"last-update\": 0}}\n");
  EXPECT_EQ(memory.actual, 1024u);
  EXPECT_EQ(memory.total, std::nullopt);
}

TEST_F(QmpTest, OnlyABalloonWhoseNameCanStandInAPathIsAskedForTheGuest) {
  const std::string answers = hello_ +
                              "{\"return\": {\"actual\": 1048576}}\n{\"return\": {\"stats\": "
                              "{\"stat-total-memory\": 4096}, \"last-update\": 5}}\n";
  EXPECT_EQ(Ask(answers, "Balloon-0._z").total, 4u);
  for (const char* name : {"", "a/b", "a b", "a\"}}", "\xc3\xbc"}) {
    EXPECT_EQ(Ask(answers, name).actual, 1024u) << name;
    EXPECT_EQ(Ask(answers, name).total, std::nullopt) << name;
  }
}

TEST_F(QmpTest, WithoutABalloonDeviceThereIsNone) {
  const GuestMemory memory =
      Ask(hello_ + "{\"error\": {\"class\": \"DeviceNotActive\", \"desc\": \"none\"}}\n");
  EXPECT_EQ(memory.balloon, GuestMemory::Balloon::kNone);
}

TEST_F(QmpTest, WhatAnswersOtherwiseTellsNothing) {
  for (const std::string& text :
       {std::string(), std::string("220 mail\n"), std::string("{}\n"), hello_ + "nonsense\n",
        hello_ + "{\"error\": {\"class\": \"CommandNotFound\"}}\n",
        std::string("{\"QMP\": {}}\n")}) {
    const GuestMemory memory = Ask(text);
    EXPECT_EQ(memory.balloon, GuestMemory::Balloon::kUnknown) << text;
    EXPECT_EQ(memory.actual, std::nullopt) << text;
  }
}

// A QEMU that makes its machine when its monitor has had a client.
class WaitingMachineTest : public testing::Test {
 protected:
  WaitingMachineTest() {
    tree_.Write("/proc/100/status",
                "Name:\tqemu\nState:\tS\nPPid:\t1\nVmSize:\t9 kB\nThreads:\t2\n");
    std::string words;
    for (const char* word : {"qemu-kvm", "-m", "1", "-qmp", "unix:/run/q,server=on", "-device",
                             "virtio-balloon,id=b"}) {
      words.append(word).push_back('\0');
    }
    tree_.Write("/proc/100/cmdline", words);
    tree_.Write("/run/q", "{\"QMP\": {}}\n{\"return\": {}}\n{\"return\": {\"actual\": 524288}}\n");
  }

  // All ones where nobody was asked.
  uint64_t BalloonWith(const std::string& flags) {
    tree_.Write("/proc/100/smaps",
                "100000-200000 rw-p 0 00:00 0\nRss: 4 kB\nVmFlags: " + flags + "\n");
    LinuxSource source(tree_.Root());
    KSI_VmmTally tally = {};
    EXPECT_EQ(GetValue(source, "sched/memClients/tally/vmm", {int64_t{100}}, &tally), kOk);
    EXPECT_EQ(tally.balloonActive, tally.ballooned == kNoValue ? 0 : 1);
    return tally.ballooned;
  }

  HostTree tree_;
};

TEST_F(WaitingMachineTest, IsNotReleased) { EXPECT_EQ(BalloonWith("rd wr mr"), kNoValue); }

TEST_F(WaitingMachineTest, IsAskedOnceItIsMade) { EXPECT_EQ(BalloonWith("rd wr mr dc"), 512u); }

}  // namespace
}  // namespace ksi
