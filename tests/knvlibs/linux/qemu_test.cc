// What a QEMU command line and its monitor tell of a virtual machine.
#include <gtest/gtest.h>

#include <filesystem>
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
  EXPECT_EQ(Parse({"-m", "64"}).memory.Size(), 64 * 1024u);
  EXPECT_EQ(Parse({"-m", "129"}).memory.Size(), 129 * 1024u);
  EXPECT_EQ(Parse({"-m", "130"}).memory.Size(), 130 * 1024u);
  EXPECT_EQ(Parse({"-m", "4G"}).memory.Size(), 4 * kGB);
  EXPECT_EQ(Parse({"-m", "4g"}).memory.Size(), 4 * kGB);
  EXPECT_EQ(Parse({"--m", "size=4194304k"}).memory.Size(), 4 * kGB);
  EXPECT_EQ(Parse({"-m", "size=2T,slots=4,maxmem=4T"}).memory.Size(), 2048 * kGB);
  EXPECT_EQ(Parse({"-m", "1G,slots=4,maxmem=4294967296B"}).maxMemory, 4 * kGB);
  EXPECT_EQ(Parse({"-m", "1G"}).maxMemory, kGB);
  for (const char* strange : {"", "x", "4X", "-4", "1.5G", "99999999999999999999", "16777216E"}) {
    EXPECT_EQ(Parse({"-m", strange}).memory.Size(), std::nullopt) << strange;
  }
  EXPECT_EQ(Parse({"-m"}).memory.Size(), std::nullopt);
  EXPECT_TRUE(Parse({}).memory.AllBlocks().empty());
}

TEST(QemuCommandLineTest, BackendsAreNodesOrModules) {
  const QemuCommandLine nodes =
      Parse({"-m", "4G", "-object", "memory-backend-ram,id=a,size=1G", "-object",
             R"({"qom-type":"memory-backend-memfd","id":"b","size":3221225472})", "-numa",
             "node,memdev=a", "-numa", "node,memdev=b"});
  EXPECT_EQ(nodes.memory.Size(), 4 * kGB);
  EXPECT_EQ(nodes.memory.AllBlocks(), (std::vector<MemoryBlock>{{kGB, {}}, {3 * kGB, {}}}));
  EXPECT_FALSE(nodes.MayChange());

  const QemuCommandLine module =
      Parse({"-m", "4G,maxmem=8G", "-object", "memory-backend-ram,id=a,size=1G", "-device",
             R"({"driver":"pc-dimm","id":"d","memdev":"a"})"});
  EXPECT_EQ(module.memory.Size(), 5 * kGB);
  EXPECT_EQ(module.memory.BalloonSize(), 5 * kGB);
  EXPECT_EQ(module.maxMemory, 8 * kGB);
  EXPECT_EQ(module.memory.AllBlocks(), (std::vector<MemoryBlock>{{4 * kGB, {}}, {kGB, {}}}));
  EXPECT_TRUE(module.MayChange());
}

TEST(QemuCommandLineTest, BackendsThatNothingNamesAreSpare) {
  const auto parse = [](const char* option, const char* value) {
    return Parse({"-m", "1G", "-object", "memory-backend-ram,id=a,size=512M", "-object",
                  "memory-backend-ram,id=b,size=512M", option, value});
  };
  const QemuCommandLine spare = parse("-smp", "2");
  EXPECT_TRUE(spare.hasSpares);
  EXPECT_FALSE(spare.TellsMemory()) << "a monitor may tell which memory it is";
  EXPECT_FALSE(spare.MayChange());
  EXPECT_EQ(spare.memory.AllBlocks(), (std::vector<MemoryBlock>{{kGB, {}}}));
  EXPECT_TRUE(parse("-device", "pc-dimm,memdev=b").hasSpares);
  EXPECT_TRUE(parse("-machine", "q35,memory-backend=a").hasSpares);
  EXPECT_FALSE(parse("-readconfig", "nodes.cfg").hasSpares);
  const QemuCommandLine whole = Parse(
      {"-M", "pc,memory-backend=a", "-m", "1G", "-object", "memory-backend-ram,id=a,size=1G"});
  EXPECT_FALSE(whole.hasSpares);
  EXPECT_TRUE(whole.TellsMemory());
}

TEST(QemuCommandLineTest, PersistentMemoryIsMemoryButForItsLabelAndTheBalloon) {
  const QemuCommandLine line =
      Parse({"-m", "4G,slots=1,maxmem=5G", "-object", "memory-backend-file,id=n,size=1G", "-device",
             "nvdimm,memdev=n,label-size=128K"});
  EXPECT_EQ(line.memory.Size(), 5 * kGB - 128);
  EXPECT_EQ(line.memory.BalloonSize(), 4 * kGB);
  EXPECT_EQ(line.memory.AllBlocks(), (std::vector<MemoryBlock>{{4 * kGB, {}}, {kGB, {}}}));
  EXPECT_EQ(Parse({"-m", "4G", "-object", "memory-backend-file,id=n,size=1G", "-device",
                   "nvdimm,memdev=n"})
                .memory.Size(),
            5 * kGB);
}

TEST(QemuCommandLineTest, HowMuchOfADeviceOfChangingSizeIsPluggedIsNotSaid) {
  const QemuCommandLine line =
      Parse({"-m", "4G,maxmem=8G", "-object", "memory-backend-ram,id=m,size=2G", "-device",
             "virtio-mem-pci,memdev=m,requested-size=1G"});
  EXPECT_EQ(line.memory.Size(), std::nullopt);
  EXPECT_EQ(line.memory.BalloonSize(), 4 * kGB);
  EXPECT_EQ(line.memory.AllBlocks(), (std::vector<MemoryBlock>{{4 * kGB, {}}, {2 * kGB, {}}}));
}

TEST(QemuCommandLineTest, WithRoomForModulesMemoryMayChange) {
  EXPECT_FALSE(Parse({"-m", "4G"}).MayChange());
  EXPECT_FALSE(Parse({"-m", "4G,maxmem=4G"}).MayChange());
  EXPECT_TRUE(Parse({"-m", "4G,slots=1,maxmem=8G"}).MayChange());
  EXPECT_TRUE(Parse({"-m", "slots=1,maxmem=8G"}).MayChange());
  EXPECT_FALSE(Parse({}).MayChange());
  EXPECT_FALSE(Parse({}).TellsMemory());
  EXPECT_TRUE(Parse({"-m", "4G"}).TellsMemory());
}

TEST(QemuCommandLineTest, AcceleratorsAreNamedInManyWays) {
  EXPECT_EQ(Parse({"-accel", "kvm"}).usesKvm, true);
  EXPECT_EQ(Parse({"-accel", "accel=kvm,dirty-ring-size=4096"}).usesKvm, true);
  EXPECT_EQ(Parse({"-machine", "pc-q35-9.2,usb=off,accel=kvm"}).usesKvm, true);
  EXPECT_EQ(Parse({"-m", "64", "-enable-kvm"}).usesKvm, true);
  EXPECT_EQ(Parse({"-M", "q35,accel=kvm:tcg"}).usesKvm, std::nullopt);
  EXPECT_EQ(Parse({"-accel", "kvm", "-accel", "tcg"}).usesKvm, std::nullopt);
  EXPECT_EQ(Parse({"-accel", "tcg"}).usesKvm, false);
  EXPECT_EQ(Parse({"-m", "64"}).usesKvm, false);
  EXPECT_EQ(Parse({"-readconfig", "vm.cfg"}).usesKvm, std::nullopt);
  EXPECT_EQ(ParseQemuCommandLine({"/usr/libexec/qemu-kvm", "-m", "64"}).usesKvm, std::nullopt);
}

TEST(QemuCommandLineTest, MoreBackendsThanQemuTakesAreNotTold) {
  std::vector<std::string> words = {"-m", "1G"};
  const auto add = [&](int count) {
    for (int i = 0; i < count; ++i) {
      const std::string id = "m" + std::to_string(words.size());
      words.insert(words.end(), {"-object", "memory-backend-ram,size=1M,id=" + id, "-device",
                                 "pc-dimm,memdev=" + id});
    }
  };
  add(512);
  EXPECT_EQ(Parse(words).memory.modules->size(), 512u);
  add(1);
  EXPECT_EQ(Parse(words).memory.modules, std::nullopt);
  EXPECT_TRUE(Parse(words).memory.blocks.empty());
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
    tree_.Write("/proc/stat", "cpu  1 2 3\nbtime 1000\nprocesses 5\n");
    tree_.Write("/proc/uptime", "100.99 350.12\n");
    line_.monitor = "/run/q";
    line_.hasBalloon = true;
    line_.balloon = balloon;
    return ReadGuestMemory(LinuxHost(tree_.Root()), 100, line_);
  }

  QemuCommandLine line_;
  const std::string hello_ = "{\"QMP\": {}}\n{\"return\": {}}\n";
  HostTree tree_;
};

TEST_F(QmpTest, TellsTheBalloonAndTheGuest) {
  const GuestMemory memory =
      Ask(hello_ +
          "{\"event\": \"X\"}\n{\"return\": {\"actual\": 1048576}}\n"
          "{\"return\": {\"stats\": {\"stat-total-memory\": 4096, "
          "\"stat-available-memory\": 18446744073709551615}, \"last-update\": 1085}}\n"
          "{\"return\": 10}\n");
  EXPECT_EQ(memory.balloon, GuestMemory::Balloon::kActive);
  EXPECT_TRUE(memory.hasDriver);
  EXPECT_EQ(memory.actual, 1024u);
  EXPECT_EQ(memory.total, 4u);
  EXPECT_EQ(memory.available, std::nullopt);
}

TEST_F(QmpTest, StatisticsThatWereNeverSentAreNone) {
  const GuestMemory memory = Ask(hello_ +
                                 "{\"return\": {\"actual\": 1048576}}\n{\"return\": {\"stats\": "
                                 "{\"stat-total-memory\": 4096}, \"last-update\": 0}}\n");
  EXPECT_FALSE(memory.hasDriver);
  EXPECT_EQ(memory.actual, 1024u);
  EXPECT_EQ(memory.total, std::nullopt);
}

TEST_F(QmpTest, OnlyABalloonWhoseNameCanStandInAPathIsAskedForTheGuest) {
  const std::string answers = hello_ +
                              "{\"return\": {\"actual\": 1048576}}\n{\"return\": {\"stats\": "
                              "{\"stat-total-memory\": 4096}, \"last-update\": 1095}}\n"
                              "{\"return\": 10}\n";
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

TEST(QemuCommandLineTest, AMachineOfLibvirtHasItsMonitor) {
  const char* const socket = "socket,id=charmonitor,fd=25,server=on,wait=off";
  const QemuCommandLine line =
      Parse({"-chardev", socket, "-mon", "chardev=charmonitor,id=monitor,mode=control"});
  EXPECT_TRUE(line.isOfLibvirt);
  EXPECT_EQ(line.monitor, "");
  EXPECT_FALSE(Parse({"-chardev", socket}).isOfLibvirt);
  EXPECT_FALSE(Parse({"-qmp", "unix:/run/q"}).isOfLibvirt);
}

TEST(AreCurrentTest, NotWhatIsOlderThanTwoIntervalsOrFiveMinutes) {
  EXPECT_TRUE(AreCurrent(1000, 1020, 10));
  EXPECT_FALSE(AreCurrent(1000, 1021, 10));
  EXPECT_TRUE(AreCurrent(1000, 1300, 86400));
  EXPECT_FALSE(AreCurrent(1000, 1301, 86400));
  EXPECT_FALSE(AreCurrent(1000, 1301, UINT64_MAX));
  EXPECT_FALSE(AreCurrent(1000, 1000, 0));
}

TEST_F(QmpTest, StatisticsAreOfNowOrNone) {
  const auto totalOf = [&](const std::string& lastUpdate, const std::string& interval) {
    return Ask(hello_ + "{\"return\": {\"actual\": 1048576}}\n{\"return\": {\"stats\": " +
               "{\"stat-total-memory\": 4096}, \"last-update\": " + lastUpdate + "}}\n" + interval)
        .total;
  };
  const std::string ten = "{\"return\": 10}\n";
  EXPECT_EQ(totalOf("1100", ten), 4u);
  EXPECT_EQ(totalOf("1080", ten), 4u);
  EXPECT_EQ(totalOf("1079", ten), std::nullopt) << "it has missed two";
  EXPECT_EQ(totalOf("1120", ten), 4u);
  EXPECT_EQ(totalOf("1121", ten), std::nullopt) << "the clock was set";
  EXPECT_EQ(totalOf("1100", "{\"return\": 0}\n"), std::nullopt) << "nobody asks it any more";
  EXPECT_EQ(totalOf("1100", ""), std::nullopt);
  EXPECT_EQ(totalOf("1100", "{\"error\": {\"class\": \"GenericError\"}}\n"), std::nullopt);
}

TEST_F(QmpTest, WithoutTheTimeOfDayStatisticsAreNone) {
  const std::string answers = hello_ +
                              "{\"return\": {\"actual\": 1048576}}\n{\"return\": {\"stats\": "
                              "{\"stat-total-memory\": 4096}, \"last-update\": 1095}}\n"
                              "{\"return\": 10}\n";
  EXPECT_EQ(Ask(answers).total, 4u);
  for (const char* file : {"/proc/uptime", "/proc/stat"}) {
    std::filesystem::remove(tree_.Root() + file);
    tree_.Write("/run/q", answers);
    EXPECT_EQ(ReadGuestMemory(LinuxHost(tree_.Root()), 100, line_).total, std::nullopt) << file;
  }
}

// One answer on several lines, with what looks like an end in a text.
TEST_F(QmpTest, AnswersMayStandOnSeveralLines) {
  const GuestMemory memory = Ask(R"({
    "QMP": {
        "version": {
            "package": "}]\"}"
        },
        "capabilities": [
            "oob"
        ]
    }
}
{
    "return": {
    }
}
{
    "event": "X",
    "data": {
    }
}
{
    "return": {
        "actual": 1048576
    }
}
{
    "return": {
        "stats": {
            "stat-total-memory": 4096
        },
        "last-update": 1095
    }
}
{
    "return": 10
}
)");
  EXPECT_EQ(memory.actual, 1024u);
  EXPECT_EQ(memory.total, 4u);
}

TEST_F(QmpTest, NoMoreThan256MessagesAreTaken) {
  const auto actualAfter = [&](size_t events) {
    std::string text = hello_;
    for (size_t i = 0; i < events; ++i) text += "{\"event\": \"X\"}\n";
    return Ask(text + "{\"return\": {\"actual\": 1048576}}\n").actual;
  };
  EXPECT_EQ(actualAfter(253), 1024u);
  EXPECT_EQ(actualAfter(254), std::nullopt);
}

// What a monitor says of a machine that started with 1 GB: of its sizes, devices and backends.
class ModulesTest : public QmpTest {
 protected:
  ModulesTest() { line_.maxMemory = 8 * kGB; }

  GuestMemory Told(const std::string& plugged, const std::string& devices,
                   const std::string& backends, const std::string& more = "") {
    return Ask(hello_ + "{\"error\": {\"class\": \"DeviceNotActive\"}}\n{\"return\": " +
                   "{\"base-memory\": 1073741824, \"plugged-memory\": " + plugged +
                   "}}\n{\"return\": [" + devices + "]}\n{\"return\": [" + backends + "]}\n" + more,
               "");
  }

  const std::string dimm_ =
      R"({"type": "dimm", "data": {"memdev": "/objects/d", "size": 1048576}})";
  const std::string persistent_ =
      R"({"type": "nvdimm", "data": {"memdev": "/objects/n", "size": 2097152}})";
  const std::string changing_ =
      R"({"type": "virtio-mem", "data": {"memdev": "/objects/v", "size": 4194304}})";
  const std::string backends_ =
      R"({"id": "pc.ram", "size": 1073741824}, {"id": "d", "size": 1048576}, )"
      R"({"id": "n", "size": 2228224}, {"id": "v", "size": 8388608})";
};

TEST_F(ModulesTest, HaveASizeAndABlock) {
  const GuestMemory memory =
      Told("7340032", dimm_ + ", " + persistent_ + ", " + changing_, backends_);
  EXPECT_EQ(memory.base, kGB);
  EXPECT_EQ(memory.modules,
            (std::vector<MemoryModule>{
                {1024, {1024, {}}, true}, {2048, {2176, {}}, false}, {4096, {8192, {}}, false}}));
}

TEST_F(ModulesTest, MayBeNone) {
  EXPECT_EQ(Told("0", "", "").modules, std::vector<MemoryModule>());
}

TEST_F(ModulesTest, AreNotToldIfTheyDoNotAddUp) {
  EXPECT_EQ(Told("7340033", dimm_, backends_).modules, std::nullopt);
  EXPECT_EQ(Told("null", dimm_, backends_).modules, std::nullopt);
  EXPECT_EQ(Told("0", R"({"type": "dimm", "data": {}})", "").modules, std::nullopt);
}

TEST_F(ModulesTest, WithoutABackendHaveNoBlock) {
  EXPECT_EQ(Told("1048576", dimm_, "").modules, (std::vector<MemoryModule>{{1024, {}, true}}));
}

// What HMP says of a place in the guest.
std::string PlaceText(const std::string& backend, const std::string& address) {
  return "{\"return\": \"Host virtual address for 0x0 (" + backend + ") is 0x" + address +
         "\\r\\n\"}\n";
}

class SpareTest : public ModulesTest {
 protected:
  // With a DIMM of 1 MB, and a backend that nobody uses.
  GuestMemory ToldBeside(const std::string& spareSize, const std::string& places) {
    return Told("1048576",
                R"({"type": "dimm", "data": {"memdev": "/objects/d", "addr": 4294967296, )"
                R"("size": 1048576}})",
                R"({"id": "pc.ram", "size": 1073741824}, {"id": "d", "size": 1048576}, )"
                R"({"id": "spare", "size": )" +
                    spareSize + "}",
                places);
  }
};

TEST_F(SpareTest, OfOtherSizesAreNotMistaken) {
  const GuestMemory memory = ToldBeside("4096", PlaceText("d", "7f00"));
  EXPECT_EQ(memory.modules, (std::vector<MemoryModule>{{1024, {1024, {}}, true}}));
  EXPECT_EQ(memory.baseAddress, std::nullopt);
}

TEST_F(SpareTest, OfAModulesSizeTheModulesAddressIsAskedFor) {
  const GuestMemory memory = ToldBeside("1048576", PlaceText("d", "7f00"));
  EXPECT_EQ(memory.modules, (std::vector<MemoryModule>{{1024, {1024, 0x7f00}, true}}));
  EXPECT_EQ(memory.baseAddress, std::nullopt);
}

TEST_F(SpareTest, OfTheBasesSizeTheBasesAddressIsAskedFor) {
  EXPECT_EQ(ToldBeside("1073741824", PlaceText("/objects/pc.ram", "7f2000000000")).baseAddress,
            0x7f2000000000u);
  // Not all machines begin at 0.
  const std::string none = "{\"return\": \"No memory is mapped at address 0x0\\r\\n\"}\n";
  const std::string flash = PlaceText("virt.flash0", "7f5000");
  EXPECT_EQ(ToldBeside("1073741824", none + flash + PlaceText("pc.ram", "10")).baseAddress, 0x10u);
  EXPECT_EQ(ToldBeside("1073741824", none + flash + none + PlaceText("pc.ram", "10")).baseAddress,
            std::nullopt);
}

TEST_F(SpareTest, WhatIsNotThePlaceOfTheModuleIsNoAddress) {
  for (const std::string& places :
       {PlaceText("spare", "7f00"), PlaceText("", "7f00"), PlaceText("d", ""),
        PlaceText("d", "7fg0"), PlaceText("d", "11112222333344445"), std::string(),
        std::string("{\"return\": \"Memory at address 0x100000000 is not RAM\\r\\n\"}\n"),
        std::string("{\"return\": \") is 0x10 (d\"}\n"), std::string("{\"return\": 7}\n"),
        std::string("{\"error\": {\"class\": \"CommandNotFound\"}}\n")}) {
    EXPECT_EQ(ToldBeside("1048576", places).modules,
              (std::vector<MemoryModule>{{1024, {1024, {}}, true}}))
        << places;
  }
}

TEST_F(ModulesTest, AreAskedForOnlyWhereTheCommandLineDoesNotTell) {
  line_.memory.base = kGB;
  line_.maxMemory = kGB;
  EXPECT_EQ(Told("0", "", "").modules, std::nullopt);
}

TEST_F(ModulesTest, NoMachineHasMoreThan256) {
  const auto count = [&](size_t devices) {
    std::string list;
    for (size_t i = 0; i < devices; ++i) {
      list += list.empty() ? "" : ", ";
      list += R"({"type": "dimm", "data": {"size": 1024}})";
    }
    const auto modules = Told(std::to_string(devices * 1024), list, "").modules;
    return modules ? modules->size() : 0;
  };
  EXPECT_EQ(count(256), 256u);
  EXPECT_EQ(count(257), 0u);
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
