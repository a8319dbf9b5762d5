// Monitors over real sockets, whose other ends say what a test lets them say.
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <functional>
#include <span>
#include <string>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/machines/listener.h"
#include "knvlibs/linux/machines/monitor_socket.h"
#include "knvlibs/linux/machines/qmp.h"
#include "knvlibs/linux/reading.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

using std::chrono::milliseconds;

// A socket in a directory of its own; not listening yet.
class Endpoint {
 public:
  Endpoint() : path_(directory_.Root() + "/monitor"), fd_(socket(AF_UNIX, SOCK_STREAM, 0)) {
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path_.data(), path_.size());
    EXPECT_EQ(bind(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  ~Endpoint() { close(fd_); }
  Endpoint(const Endpoint&) = delete;
  Endpoint& operator=(const Endpoint&) = delete;

  const std::string& Path() const { return path_; }
  int Fd() const { return fd_; }

  // How many connections have come that nobody has accepted.
  int CountWaiting() const {
    int count = 0;
    pollfd wait = {fd_, POLLIN, 0};
    while (poll(&wait, 1, 0) == 1) {
      close(accept(fd_, nullptr, nullptr));
      ++count;
    }
    return count;
  }

 private:
  HostTree directory_;
  std::string path_;
  int fd_;
};

// Listens in this process, and lets the first who comes hear a script.
class Peer {
 public:
  using Script = std::function<void(int fd)>;

  explicit Peer(Script script) {
    EXPECT_EQ(listen(endpoint_.Fd(), 8), 0);
    thread_ = std::thread([this, script = std::move(script)] {
      const int fd = accept(endpoint_.Fd(), nullptr, nullptr);
      if (fd < 0) return;
      script(fd);
      close(fd);
    });
  }
  ~Peer() {
    shutdown(endpoint_.Fd(), SHUT_RDWR);
    thread_.join();
  }
  Peer(const Peer&) = delete;
  Peer& operator=(const Peer&) = delete;

  const std::string& Path() const { return endpoint_.Path(); }

 private:
  Endpoint endpoint_;
  std::thread thread_;
};

bool Say(int fd, std::string_view text) {
  return send(fd, text.data(), text.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(text.size());
}

// Until the other side hangs up.
void Listen(int fd) {
  char buffer[4096];
  while (recv(fd, buffer, sizeof buffer, 0) > 0) {
  }
}

// Time that stands still, and time that goes on whenever it is looked at.
std::atomic<int> looks;
LinuxHost::TimePoint StandingClock() { return LinuxHost::TimePoint(); }
LinuxHost::TimePoint SteppingClock() { return LinuxHost::TimePoint() + milliseconds(50) * ++looks; }
LinuxHost::TimePoint LeapingClock() { return LinuxHost::TimePoint() + milliseconds(250) * ++looks; }

// A deadline that is not reached while time stands still, and bounds a test that hangs.
constexpr auto kDistant = LinuxHost::TimePoint() + std::chrono::seconds(30);

TEST(MonitorSocketTest, LinesComeInTurnHoweverTheyAreSent) {
  const Peer peer([](int fd) { Say(fd, "one\ntwo\nthr") && Say(fd, "ee\nrest"); });
  MonitorSocket socket(StandingClock, kDistant);
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  std::string line;
  for (const char* expected : {"one", "two", "three"}) {
    ASSERT_TRUE(socket.Receive(line));
    EXPECT_EQ(line, expected);
  }
  EXPECT_FALSE(socket.Receive(line)) << "a line that hangs up is none";
}

TEST(MonitorSocketTest, SaysWholeLines) {
  const Peer peer([](int fd) {
    char buffer[64];
    const ssize_t count = recv(fd, buffer, sizeof buffer, 0);
    Say(fd, std::string(buffer, static_cast<size_t>(count)) + "heard\n");
  });
  MonitorSocket socket(StandingClock, kDistant);
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  ASSERT_TRUE(socket.Send("hello"));
  std::string line;
  ASSERT_TRUE(socket.Receive(line));
  EXPECT_EQ(line, "hello");
  ASSERT_TRUE(socket.Receive(line));
  EXPECT_EQ(line, "heard");
}

TEST(MonitorSocketTest, WhoDoesNotListenIsNotConnectedTo) {
  const Endpoint endpoint;
  EXPECT_FALSE(
      MonitorSocket(StandingClock, kDistant).Connect(endpoint.Path(), getpid(), geteuid()));
  EXPECT_FALSE(MonitorSocket(StandingClock, kDistant).Connect("/none", getpid(), geteuid()));
  EXPECT_FALSE(MonitorSocket(StandingClock, kDistant)
                   .Connect("/" + std::string(200, 'x'), getpid(), geteuid()));
}

TEST(MonitorSocketTest, ASocketOfAnotherUserIsNotKnockedAt) {
  const Endpoint endpoint;
  ASSERT_EQ(listen(endpoint.Fd(), 4), 0);
  // Whoever names it, by whatever name.
  const std::string link = endpoint.Path() + ".link";
  ASSERT_EQ(symlink(endpoint.Path().c_str(), link.c_str()), 0);
  for (const std::string& path : {endpoint.Path(), link}) {
    MonitorSocket socket(StandingClock, kDistant);
    EXPECT_FALSE(socket.Connect(path, getpid(), geteuid() + 1));
  }
  pollfd waiting = {endpoint.Fd(), POLLIN, 0};
  EXPECT_EQ(poll(&waiting, 1, 0), 0) << "nobody is to have come";
  EXPECT_TRUE(MonitorSocket(StandingClock, kDistant).Connect(link, getpid(), geteuid()));
  EXPECT_EQ(unlink(link.c_str()), 0);
}

TEST(MonitorSocketTest, AListenerWhoseQueueIsFullIsNotWaitedFor) {
  const Endpoint endpoint;
  ASSERT_EQ(listen(endpoint.Fd(), 0), 0);
  MonitorSocket first(StandingClock, kDistant);
  ASSERT_TRUE(first.Connect(endpoint.Path(), getpid(), geteuid()));
  EXPECT_FALSE(
      MonitorSocket(StandingClock, kDistant).Connect(endpoint.Path(), getpid(), geteuid()));
}

TEST(MonitorSocketTest, AListenerOfAnotherProcessIsNotTalkedTo) {
  const Peer peer(Listen);
  EXPECT_FALSE(MonitorSocket(StandingClock, kDistant).Connect(peer.Path(), getppid(), geteuid()));
}

TEST(MonitorSocketTest, ASilentPeerIsLeftAtTheDeadline) {
  const Peer peer(Listen);
  MonitorSocket socket(StandingClock, StandingClock() + milliseconds(10));
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  std::string line;
  EXPECT_FALSE(socket.Receive(line));
}

TEST(MonitorSocketTest, NothingIsReceivedAfterTheDeadline) {
  std::atomic<bool> isSaid = false;
  const Peer peer([&](int fd) {
    Say(fd, "late\n");
    isSaid = true;
    Listen(fd);
  });
  MonitorSocket socket(StandingClock, StandingClock());
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  while (!isSaid) std::this_thread::yield();
  std::string line;
  EXPECT_FALSE(socket.Receive(line));
}

TEST(MonitorSocketTest, APeerThatSaysALittleAllTheTimeIsLeftAtTheDeadline) {
  const Peer peer([](int fd) {
    while (Say(fd, "x")) std::this_thread::sleep_for(milliseconds(1));
  });
  looks = 0;
  MonitorSocket socket(SteppingClock, LinuxHost::TimePoint() + milliseconds(250));
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  std::string line;
  EXPECT_FALSE(socket.Receive(line));
  EXPECT_EQ(looks, 5);
}

TEST(MonitorSocketTest, ALineWithoutEndIsCut) {
  std::atomic<size_t> said = 0;
  {
    const Peer peer([&](int fd) {
      const std::string text(1024, 'x');
      while (Say(fd, text)) said += text.size();
    });
    MonitorSocket socket(StandingClock, kDistant);
    ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
    std::string line;
    EXPECT_FALSE(socket.Receive(line));
  }
  // What was taken, and what may lie in the socket.
  EXPECT_GE(said, MonitorSocket::kMostBytes);
  EXPECT_LE(said, MonitorSocket::kMostBytes + (size_t{1} << 20));
}

TEST(MonitorSocketTest, LinesWithoutEndAreCut) {
  const Peer peer([](int fd) {
    while (Say(fd, "{}\n")) {
    }
  });
  MonitorSocket socket(StandingClock, kDistant);
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  std::string line;
  size_t count = 0;
  while (socket.Receive(line)) ++count;
  EXPECT_EQ(count, MonitorSocket::kMostLines);
}

TEST(MonitorSocketTest, WhoHangsUpIsLeft) {
  const Peer peer([](int) {});
  MonitorSocket socket(StandingClock, kDistant);
  ASSERT_TRUE(socket.Connect(peer.Path(), getpid(), geteuid()));
  std::string line;
  EXPECT_FALSE(socket.Receive(line));
  EXPECT_FALSE(socket.Send("anybody?"));
}

// Who listens, by files that tell.

class ListenerTest : public testing::Test {
 protected:
  ListenerTest() {
    tree_.Write("/proc/7/net/unix", sockets_);
    std::filesystem::create_directories(tree_.Root() + "/proc/7/fd");
    for (const int inode : {23, 25, 26}) Open(inode);
  }

  void Open(int inode) {
    std::filesystem::create_symlink("socket:[" + std::to_string(inode) + "]",
                                    tree_.Root() + "/proc/7/fd/" + std::to_string(inode));
  }

  // Adds a socket of the listener's path.
  void Connect(const std::string& state, const std::string& inode) {
    sockets_ += "ffff0009: 00000003 00000000 00000000 0001 " + state + " " + inode +
                " /run/web of a guest\n";
    tree_.Write("/proc/7/net/unix", sockets_);
  }

  std::optional<Listening> Find(std::string_view path) {
    return FindListener(LinuxHost(tree_.Root()), 7, path);
  }

  std::string sockets_ =
      "Num       RefCount Protocol Flags    Type St Inode Path\n"
      "ffff0001: 00000002 00000000 00010000 0001 01 23 /run/web of a guest\n"
      "ffff0002: 00000002 00000000 00010000 0001 01 24 /run/other\n"
      "ffff0003: 00000003 00000000 00000000 0001 03 25 /run/client\n"
      "ffff0004: 00000002 00000000 00010000 0001 01 26\n"
      "nonsense\n";

  HostTree tree_;
};

TEST_F(ListenerTest, IsTheProcessThatHasTheListeningSocketOpen) {
  EXPECT_EQ(Find("/run/web of a guest"), Listening::kFree);
  EXPECT_EQ(Find("/run/other"), Listening::kNot) << "of another process";
  EXPECT_EQ(Find("/run/client"), Listening::kNot) << "connected, not listening";
  EXPECT_EQ(Find("/run/web"), Listening::kNot);
  EXPECT_EQ(Find(""), Listening::kNot);
}

TEST_F(ListenerTest, IsHeldByWhoWasLetIn) {
  Connect("03", "31");
  EXPECT_EQ(Find("/run/web of a guest"), Listening::kFree) << "let in by another process";
  Open(31);
  EXPECT_EQ(Find("/run/web of a guest"), Listening::kHeld);
  EXPECT_EQ(Find("/run/other"), Listening::kNot);
}

TEST_F(ListenerTest, IsHeldByWhoWaits) {
  Connect("02", "0");
  EXPECT_EQ(Find("/run/web of a guest"), Listening::kHeld);
}

TEST_F(ListenerTest, CannotBeToldWithoutTheFiles) {
  std::filesystem::remove_all(tree_.Root() + "/proc/7/fd");
  EXPECT_EQ(Find("/run/web of a guest"), std::nullopt);
  std::filesystem::create_directories(tree_.Root() + "/proc/7/fd");
  std::filesystem::remove(tree_.Root() + "/proc/7/net/unix");
  EXPECT_EQ(Find("/run/web of a guest"), std::nullopt);
}

// Whole conversations.

QemuCommandLine LineOf(const std::string& monitor) {
  QemuCommandLine line;
  line.monitor = monitor;
  line.hasBalloon = true;
  line.balloon = "balloon0";
  return line;
}

// Greets, and answers a line with each of `answers`.
Peer::Script Answering(std::vector<std::string> answers) {
  return [answers = std::move(answers)](int fd) {
    Say(fd, "{\"QMP\": {}}\n");
    for (const std::string& answer : answers) {
      std::string line;
      for (char c = 0; c != '\n'; line += c) {
        if (recv(fd, &c, 1, 0) != 1) return;
      }
      Say(fd, answer + "\n");
    }
    Listen(fd);
  };
}

TEST(MonitorTest, AnswersTheQuestions) {
  const Peer peer(Answering(
      {R"({"return": {}})",
       R"({"event": "X"})"
       "\n"
       R"({"return": {"actual": 1048576}})",
       R"({"return": {"stats": {"stat-total-memory": 4096, "stat-available-memory": 2048},)"
       R"( "last-update": )" +
           std::to_string(std::time(nullptr)) + "}}",
       R"({"return": 60})"}));
  const LinuxHost host("/", StandingClock);
  const GuestMemory memory = ReadGuestMemory(host, getpid(), LineOf(peer.Path()));
  EXPECT_EQ(memory.balloon, GuestMemory::Balloon::kActive);
  EXPECT_EQ(memory.actual, 1024u);
  EXPECT_EQ(memory.total, 4u);
  EXPECT_EQ(memory.available, 2u);
}

TEST(MonitorTest, AStrangersSocketIsNotKnockedAt) {
  const Endpoint endpoint;
  ASSERT_EQ(listen(endpoint.Fd(), 8), 0);
  const LinuxHost host("/", StandingClock);
  if (!FindListener(host, getppid(), endpoint.Path())) {
    GTEST_SKIP() << "the parent's descriptors may not be read";
  }
  const GuestMemory memory = ReadGuestMemory(host, getppid(), LineOf(endpoint.Path()));
  EXPECT_EQ(memory.balloon, GuestMemory::Balloon::kUnknown);
  EXPECT_EQ(endpoint.CountWaiting(), 0);
}

// From here on the system fails this thread's calls of a number with this errno.
bool Fail(uint32_t call, uint32_t error) {
  sock_filter filter[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, call, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | error),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog program = {4, filter};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}

// What two monitors in one reading say of themselves on standard error and in the host's loss.
[[noreturn]] void AskTwice(uint32_t call, uint32_t error, const std::string& path, Status loss) {
  if (!Fail(call, error)) _exit(2);
  const LinuxHost host("/");
  bool isRight = true;
  for (int i = 0; i < 2; ++i) {
    const GuestMemory memory = ReadGuestMemory(host, getppid(), LineOf(path));
    isRight = isRight && memory.balloon == GuestMemory::Balloon::kUnknown;
  }
  _exit(isRight && host.LossStatus() == loss ? 0 : 1);
}

TEST(MonitorTest, WhatTheSystemIsShortOfIsToldOnce) {
  const Peer peer(Answering({}));
  const std::pair<uint32_t, uint32_t> failing[] = {
      {SYS_socket, ENOMEM}, {SYS_connect, ENFILE}, {SYS_recvfrom, ENOBUFS}};
  for (const auto& [call, error] : failing) {
    const std::string reason = std::generic_category().message(static_cast<int>(error));
    EXPECT_EXIT(
        AskTwice(call, error, peer.Path(), StatusOfErrno(static_cast<int>(error))),
        testing::ExitedWithCode(0),
        "^" + peer.Path() + ": " + reason + ": what cannot be read is left out or has no value\n$");
  }
}

TEST(MonitorTest, ARefusalIsNoShortage) {
  const Peer peer(Answering({}));
  EXPECT_EXIT(AskTwice(SYS_connect, ECONNREFUSED, peer.Path(), kOk), testing::ExitedWithCode(0),
              "^$");
}

TEST(MonitorTest, WhatSomebodyHoldsIsLeftAlone) {
  const Endpoint endpoint;
  ASSERT_EQ(listen(endpoint.Fd(), 8), 0);
  const LinuxHost host("/", StandingClock);
  const auto ask = [&] { return ReadGuestMemory(host, getpid(), LineOf(endpoint.Path())); };
  MonitorSocket client(StandingClock, kDistant);
  ASSERT_TRUE(client.Connect(endpoint.Path(), getpid(), geteuid()));
  EXPECT_EQ(ask().balloon, GuestMemory::Balloon::kUnknown);
  EXPECT_EQ(host.Kept().heldLooks, 0) << "it might have been left";
  const int letIn = accept(endpoint.Fd(), nullptr, nullptr);
  EXPECT_EQ(ask().balloon, GuestMemory::Balloon::kUnknown);
  EXPECT_EQ(endpoint.CountWaiting(), 0) << "nobody is to have come";
  EXPECT_EQ(host.Kept().monitorTime, kMonitorTime) << "others have their time";
  EXPECT_EQ(host.LossStatus(), kOk);
  close(letIn);
}

TEST(MonitorTest, WhatIsLeftMeanwhileIsAsked) {
  // Lets in and leaves before it answers: as if somebody had asked just before.
  const Endpoint endpoint;
  ASSERT_EQ(listen(endpoint.Fd(), 8), 0);
  MonitorSocket client(StandingClock, kDistant);
  ASSERT_TRUE(client.Connect(endpoint.Path(), getpid(), geteuid()));
  const int first = accept(endpoint.Fd(), nullptr, nullptr);
  const LinuxHost host("/", StandingClock);
  host.Kept().heldLooks = 3000;  // however long this machine takes
  std::thread monitor([&] {
    close(first);
    const int second = accept(endpoint.Fd(), nullptr, nullptr);
    Answering({R"({"return": {}})", R"({"return": {"actual": 1048576}})", "{}"})(second);
    close(second);
  });
  EXPECT_EQ(ReadGuestMemory(host, getpid(), LineOf(endpoint.Path())).actual, 1024u);
  shutdown(endpoint.Fd(), SHUT_RDWR);
  monitor.join();
}

TEST(MonitorTest, AllOfAReadingHaveASecondTogether) {
  const std::vector<Endpoint> endpoints(5);
  for (const Endpoint& endpoint : endpoints) ASSERT_EQ(listen(endpoint.Fd(), 8), 0);
  // Each look takes a quarter of a second: of three at a monitor the second ends its patience.
  LinuxHost host("/", LeapingClock);
  const auto ask = [&](size_t count) {
    testing::internal::CaptureStderr();
    for (const Endpoint& endpoint : std::span(endpoints).first(count)) {
      EXPECT_EQ(ReadGuestMemory(host, getpid(), LineOf(endpoint.Path())).balloon,
                GuestMemory::Balloon::kUnknown);
    }
    return testing::internal::GetCapturedStderr();
  };
  const auto countWaiting = [&] {
    int count = 0;
    for (const Endpoint& endpoint : endpoints) count += endpoint.CountWaiting();
    return count;
  };
  EXPECT_EQ(ask(5),
            "virtual machines: no time left to ask all of them: their balloons have no value\n");
  EXPECT_EQ(countWaiting(), 2);
  EXPECT_EQ(host.LossStatus(), KSI_STATUS_TIMEOUT);
  host.BeginReading();
  EXPECT_EQ(ask(1), "");
  EXPECT_EQ(countWaiting(), 1) << "a new reading has time again";
}

}  // namespace
}  // namespace ksi
