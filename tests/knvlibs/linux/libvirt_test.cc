// libvirt: what its descriptions say, what its library may do, and whose machines are believed.
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/machines/domain_xml.h"
#include "knvlibs/linux/machines/guest.h"
#include "knvlibs/linux/machines/libvirt.h"
#include "knvlibs/linux/machines/libvirt_client.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

using End = LibvirtAnswer::End;

std::string Domain(const std::string& devices) {
  return "<?xml version='1.0'?>\n<domain type='kvm' id='1'>\n  <name>a &lt;b&gt;</name>\n"
         "  <!-- <memory> -->\n  <memory unit='KiB'>1048576</memory>\n  <devices>\n" +
         devices + "  </devices>\n</domain>\n";
}

std::string Memory(const std::string& model, const std::string& target) {
  return "<memory model='" + model + "'>\n  <target>\n" + target +
         "  </target>\n  <alias name='m'/>\n</memory>\n";
}

using Modules = std::vector<MemoryModule>;

TEST(DomainXmlTest, TellsOfModules) {
  const DomainXml xml = ParseDomainXml(Domain(
      Memory("dimm", "<size unit='KiB'>2048</size><node>0</node>") +
      Memory("nvdimm", "<size unit='KiB'>4096</size><label><size unit='KiB'>128</size></label>") +
      Memory("virtio-mem",
             "<size unit='KiB'>8192</size><block unit='KiB'>2048</block>"
             "<requested unit='KiB'>6144</requested><current unit='KiB'>4096</current>") +
      "<memballoon model='virtio'>\n<stats period='5'/>\n</memballoon>\n"));
  EXPECT_EQ(
      xml.modules,
      (Modules{{2048, {2048, {}}, true}, {3968, {4096, {}}, false}, {4096, {8192, {}}, false}}));
  EXPECT_EQ(xml.period, 5u);
}

TEST(DomainXmlTest, ModulesAreDevicesOfTheDomain) {
  const DomainXml xml = ParseDomainXml(
      "<domain><metadata><devices>" + Memory("dimm", "<size unit='KiB'>2048</size>") +
      "<memballoon><stats period='5'/></memballoon></devices></metadata></domain>");
  EXPECT_EQ(xml.modules, Modules());
  EXPECT_EQ(xml.period, std::nullopt);
}

TEST(DomainXmlTest, RemarksAreNone) {
  const std::string size = "<size unit='KiB'>2048</size>";
  EXPECT_EQ(ParseDomainXml(Domain("<!--" + Memory("dimm", size) + "-->")).modules, Modules());
  EXPECT_EQ(ParseDomainXml(Domain("<![CDATA[" + Memory("dimm", size) + "]]>")).modules, Modules());
  EXPECT_EQ(ParseDomainXml(Domain("<!-- without end")).modules, std::nullopt);
}

TEST(DomainXmlTest, WhatIsNotUnderstoodTellsOfNoModules) {
  for (const std::string& xml :
       {std::string(), std::string("text"), std::string("<domain>"), std::string("</domain>"),
        std::string("<domain></other>"), std::string("<domain"), std::string("<host></host>"),
        Domain(Memory("dimm", "<size unit='MiB'>2</size>")),
        Domain(Memory("dimm", "<size>2048</size>")),
        Domain(Memory("dimm", "<size unit='KiB'>-1</size>")),
        Domain(Memory("dimm", "<size unit='KiB'/>")), Domain("<memory>")}) {
    EXPECT_EQ(ParseDomainXml(xml).modules, std::nullopt) << xml;
  }
}

// The library, a fake one. A clock that stands still lets it take as long as it needs.

LinuxHost::TimePoint StandingClock() { return LinuxHost::TimePoint(); }

LibvirtAnswer AskFake(const char* mode, std::chrono::milliseconds patience) {
  errno = EINTR;  // of something that was before
  return AskLibvirt(TALLY_FAKE_LIBVIRT, mode, StandingClock, StandingClock() + patience);
}

LibvirtAnswer AskFake(const char* mode) { return AskFake(mode, std::chrono::seconds(60)); }

TEST(LibvirtClientTest, TellsOfDomains) {
  const LibvirtAnswer answer = AskFake("whole");
  EXPECT_EQ(answer.end, End::kWhole);
  ASSERT_EQ(answer.domains.size(), 2u) << "a name that is too long is nobody's";
  const LibvirtDomain& web = answer.domains[0];
  EXPECT_EQ(web.name, "web");
  EXPECT_EQ(web.uuid, "11111111-2222-4333-8444-000000000000");
  EXPECT_EQ(web.actual, 1024u);
  EXPECT_EQ(web.available, 900u);
  EXPECT_EQ(web.usable, 300u);
  EXPECT_EQ(web.lastUpdate, 1095u);
  EXPECT_EQ(web.period, 10u);
  EXPECT_EQ(web.modules, (Modules{{2048, {2048, {}}, true}}));
  const LibvirtDomain& db = answer.domains[1];
  EXPECT_EQ(db.name, "db");
  EXPECT_EQ(db.uuid, "11111111-2222-4333-8444-000000000001");
  EXPECT_EQ(db.actual, std::nullopt);
  EXPECT_EQ(db.lastUpdate, std::nullopt);
  EXPECT_EQ(db.period, std::nullopt);
  EXPECT_EQ(db.modules, std::nullopt);
}

TEST(LibvirtClientTest, StandsALibraryThatLies) {
  EXPECT_EQ(AskFake("nameless").domains.size(), 2u);
  const LibvirtAnswer answer = AskFake("boasts");
  ASSERT_EQ(answer.domains.size(), 2u);
  EXPECT_EQ(answer.domains[0].actual, 1024u);
  EXPECT_EQ(AskFake("two").domains.size(), 2u);
}

TEST(LibvirtClientTest, SaysWhyItHasNoAnswer) {
  const LinuxHost::TimePoint deadline = StandingClock() + std::chrono::seconds(60);
  EXPECT_EQ(AskLibvirt("libnone.so", "whole", StandingClock, deadline).end, End::kNoLibrary);
  EXPECT_EQ(AskLibvirt("libm.so.6", "whole", StandingClock, deadline).end, End::kNoLibrary)
      << "of another interface";
  EXPECT_EQ(AskFake("refuses").end, End::kNoConnection);
  EXPECT_EQ(AskFake("fails").end, End::kNoConnection);
}

TEST(LibvirtClientTest, ALibraryThatEndsTheProcessEndsNotThisOne) {
  EXPECT_EQ(AskFake("crashes").end, End::kTooLate);
  EXPECT_EQ(AskFake("exits").end, End::kTooLate);
}

TEST(LibvirtClientTest, AHangingLibraryIsLeftAtTheDeadline) {
  const LibvirtAnswer answer = AskFake("hangs", std::chrono::milliseconds(20));
  EXPECT_EQ(answer.end, End::kTooLate);
  EXPECT_TRUE(answer.domains.empty());
}

// Time that goes on once something has been said.
std::atomic<int> looks;
LinuxHost::TimePoint LateClock() {
  return LinuxHost::TimePoint() + std::chrono::milliseconds(++looks > 1 ? 59'900 : 0);
}

TEST(LibvirtClientTest, WhatWasToldBeforeTheDeadlineIsKept) {
  looks = 0;
  const LibvirtAnswer answer = AskLibvirt(TALLY_FAKE_LIBVIRT, "stalls", LateClock,
                                          LinuxHost::TimePoint() + std::chrono::seconds(60));
  EXPECT_EQ(answer.end, End::kTooLate);
  ASSERT_EQ(answer.domains.size(), 1u);
  EXPECT_EQ(answer.domains[0].name, "web");
}

// Whose machines are believed.

class DomainProcessTest : public testing::Test {
 protected:
  static constexpr int32_t kPid = 100;

  DomainProcessTest() {
    domain_.name = "web";
    domain_.uuid = "11111111-2222-4333-8444-555555555555";
    tree_.Write("/proc/100/status",
                "Name:\tqemu\nState:\tS\nPPid:\t1\nVmSize:\t9 kB\nThreads:\t2\n");
    tree_.Write("/proc/101/status",
                "Name:\tother\nState:\tS\nPPid:\t1\nVmSize:\t9 kB\nThreads:\t2\n");
    std::string words;
    for (const std::string& word : {std::string("qemu-kvm"), std::string("-uuid"), domain_.uuid}) {
      words.append(word).push_back('\0');
    }
    tree_.Write("/proc/100/cmdline", words);
    WritePid("100");
  }

  void WritePid(const std::string& pid) { tree_.Write("/run/web.pid", pid); }

  // The pid file is in the recorded tree, and its owner this user.
  int32_t Find(uint32_t owner = geteuid()) {
    const LinuxHost host(tree_.Root());
    const GroupTree* groups = nullptr;
    EXPECT_EQ(GroupTree::Get(host, groups), kOk);
    return ProcessOfDomain(LinuxHost("/"), *groups, tree_.Root() + "/run/", owner, domain_);
  }

  HostTree tree_;
  LibvirtDomain domain_;
};

TEST_F(DomainProcessTest, IsTheQemuOfThePidFileThatHasTheUuid) {
  EXPECT_EQ(Find(), kPid);
  WritePid("100\n");
  EXPECT_EQ(Find(), kPid);
}

TEST_F(DomainProcessTest, IsNotOneThatOnlyHasTheUuid) {
  WritePid("101");
  EXPECT_EQ(Find(), 0) << "no QEMU";
  WritePid("102");
  EXPECT_EQ(Find(), 0) << "nobody";
  WritePid("4294967396");
  EXPECT_EQ(Find(), 0);
  WritePid("x");
  EXPECT_EQ(Find(), 0);
}

TEST_F(DomainProcessTest, IsNotOneOfAnotherDomain) {
  domain_.uuid.back() = '6';
  EXPECT_EQ(Find(), 0);
  domain_.uuid.clear();
  EXPECT_EQ(Find(), 0);
}

TEST_F(DomainProcessTest, IsNotToldByAFileOfSomebodyElse) { EXPECT_EQ(Find(geteuid() + 1), 0); }

TEST_F(DomainProcessTest, IsNotSoughtOutsideOfTheDirectory) {
  domain_.name = "../run/web";
  EXPECT_EQ(Find(), 0);
}

// Which daemons are asked. The tree calls this process libvirtd; it listens itself.

class DaemonTest : public testing::Test {
 protected:
  DaemonTest() {
    Call("libvirtd");
    tree_.Write("/run/file", "");
    EXPECT_EQ(chmod(daemon_.directory.c_str(), 0755), 0);
    Listen(fd_.Get(), "socket");
  }

  void Call(const std::string& name) const {
    tree_.Write(ProcessFile(getpid(), "status"),
                "Name:\t" + name + "\nState:\tS\nPPid:\t1\nVmSize:\t9 kB\nThreads:\t2\n");
  }

  void Listen(int fd, const std::string& name) const {
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    (daemon_.directory + name).copy(address.sun_path, sizeof address.sun_path - 1);
    EXPECT_EQ(bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(listen(fd, 1), 0);
  }

  bool IsBelieved() const {
    const LinuxHost host(tree_.Root());
    const GroupTree* groups = nullptr;
    EXPECT_EQ(GroupTree::Get(host, groups), kOk);
    return IsThere(LinuxHost("/"), *groups, daemon_);
  }

  HostTree tree_;
  LibvirtDaemon daemon_{"", tree_.Root() + "/run/", {"none", "socket"}, "", geteuid()};
  FileDescriptor fd_{socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)};
};

TEST_F(DaemonTest, IsThereWhereItListens) {
  EXPECT_TRUE(IsBelieved());
  Call("virtqemud");
  EXPECT_TRUE(IsBelieved());
  daemon_.sockets = {"none", "file"};
  EXPECT_FALSE(IsBelieved());
  daemon_.sockets = {"socket"};
  fd_ = FileDescriptor();
  EXPECT_FALSE(IsBelieved()) << "left behind";
}

TEST_F(DaemonTest, IsNotWhoIsCalledOtherwise) {
  Call("other");
  EXPECT_FALSE(IsBelieved());
}

TEST_F(DaemonTest, IsNotWhereOthersMayWrite) {
  for (const mode_t mode : {0775U, 0757U, 0777U}) {
    EXPECT_EQ(chmod(daemon_.directory.c_str(), mode), 0);
    EXPECT_FALSE(IsBelieved()) << mode;
  }
}

TEST_F(DaemonTest, IsNotSomebodyElse) {
  ++daemon_.owner;
  EXPECT_FALSE(IsBelieved());
}

// A machine of a libvirt that does not run.

TEST(UnknownDomainTest, IsToldOnce) {
  const LinuxHost host("/");
  const GroupTree tree;
  const auto ask = [&](bool isOfLibvirt, const char* monitor) {
    VirtualMachine machine;
    machine.pid = INT32_MAX;
    machine.commandLine.uuid = "6f7d3c1a-0000-4000-8000-000000000000";
    machine.commandLine.isOfLibvirt = isOfLibvirt;
    machine.commandLine.monitor = monitor;
    testing::internal::CaptureStderr();
    EXPECT_EQ(GetGuest(host, tree, machine).actual, std::nullopt);
    return testing::internal::GetCapturedStderr();
  };
  EXPECT_EQ(ask(false, ""), "");
  EXPECT_EQ(ask(true, "/none"), "") << "its monitor may tell";
  EXPECT_EQ(ask(true, ""),
            "libvirt: it does not run, or not know all machines that it started: their balloons "
            "and guests have no value\n");
  EXPECT_EQ(ask(true, ""), "");
}

// What is taken of a domain.

TEST(TakeDomainTest, FiguresOfTheGuestAreOfNowOrNone) {
  LibvirtDomain domain;
  domain.actual = 1024;
  domain.available = 900;
  domain.usable = 300;
  domain.lastUpdate = 1000;
  domain.period = 10;
  domain.modules.emplace();
  GuestMemory guest;
  TakeDomain(domain, 1020, guest);
  EXPECT_EQ(guest.balloon, GuestMemory::Balloon::kActive);
  EXPECT_TRUE(guest.hasDriver);
  EXPECT_EQ(guest.actual, 1024u);
  EXPECT_EQ(guest.total, 900u);
  EXPECT_EQ(guest.available, 300u);
  EXPECT_EQ(guest.modules, Modules());

  GuestMemory late;
  TakeDomain(domain, 1021, late);
  EXPECT_EQ(late.actual, 1024u);
  EXPECT_EQ(late.total, std::nullopt);
  EXPECT_EQ(late.available, std::nullopt);
}

TEST(TakeDomainTest, WithoutABalloonsSizeWhatIsKnownOfItStays) {
  GuestMemory guest;
  guest.balloon = GuestMemory::Balloon::kNone;
  TakeDomain(LibvirtDomain(), 1000, guest);
  EXPECT_EQ(guest.balloon, GuestMemory::Balloon::kNone);
  EXPECT_EQ(guest.modules, std::nullopt);
}

}  // namespace
}  // namespace ksi
