// The files that capture and load make.
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <stdlib.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <array>
#include <chrono>
#include <future>
#include <thread>
#include <utility>

#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {
namespace {

TEST_F(Ksicache, FilesAreReplacedOnlyByForce) {
  WriteContent(Path("a.json"), JsonWith(""));
  WriteContent(Path("a.ksi"), "precious");
  ExpectFailure({"load", Path("a.json"), Path("a.ksi")},
                Path("a.ksi") + ": exists already (--force replaces it)");
  ExpectFailure({"capture", Path("a.ksi")},
                Path("a.ksi") + ": exists already (--force replaces it)");
  EXPECT_EQ(FileContent(Path("a.ksi")), "precious");
  Output({"load", "--force", Path("a.json"), Path("a.ksi")});
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  ExpectFailure({"load", "--force", Path("a.json"), Path("")}, Path("") + ": Is a directory");
  ExpectFailure({"load", Path("a.json"), Path("no/a.ksi")},
                Path("no/a.ksi") + ": No such file or directory");
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
}

mode_t ModeOf(const std::string& fileName) {
  struct stat info = {};
  EXPECT_EQ(stat(fileName.c_str(), &info), 0);
  return info.st_mode & 07777;
}

TEST_F(Ksicache, FilesAreTheirOwnersUnlessAskedOtherwise) {
  WriteContent(Path("a.json"), JsonWith(""));
  const mode_t before = umask(0);
  Output({"load", Path("a.json"), Path("a.ksi")});
  EXPECT_EQ(ModeOf(Path("a.ksi")), 0600u);
  umask(077);
  Output({"load", "--force", "--mode", "0640", Path("a.json"), Path("a.ksi")});
  umask(before);
  EXPECT_EQ(ModeOf(Path("a.ksi")), 0640u);
  EXPECT_EQ(Run({"capture", "--mode=644", Path("b.ksi")}).status, 0);
  EXPECT_EQ(ModeOf(Path("b.ksi")), 0644u);
}

TEST_F(Ksicache, OnlyFilesAreReplaced) {
  WriteContent(Path("a.json"), JsonWith(""));
  WriteContent(Path("precious"), "precious");
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0600), 0);
  ExpectFailure({"load", "--force", Path("a.json"), Path("pipe")},
                Path("pipe") + ": is not a file, and not replaced");
  // A link is replaced, not what it leads to.
  ASSERT_EQ(symlink("precious", Path("link").c_str()), 0);
  ExpectFailure({"load", Path("a.json"), Path("link")},
                Path("link") + ": exists already (--force replaces it)");
  Output({"load", "--force", Path("a.json"), Path("link")});
  EXPECT_EQ(FileContent(Path("precious")), "precious");
  EXPECT_EQ(Output({"check", Path("link")}), "");
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "link", "pipe", "precious"}));
}

TEST_F(Ksicache, StandardOutputTakesAFile) {
  WriteContent(Path("a.json"), JsonWith(""));
  WriteContent(Path("a.ksi"), Output({"load", Path("a.json"), "-"}));
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  harness::Program program = Command({"load", Path("a.json"), "-"});
  program.outPath = "/dev/full";
  const harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: standard output: cannot write: No space left on device\n");
}

TEST_F(Ksicache, StandardOutputKeepsItsRights) {
  WriteContent(Path("a.json"), JsonWith(""));
  WriteContent(Path("out"), "");
  ASSERT_EQ(chmod(Path("out").c_str(), 0604), 0);
  harness::Program program = Command({"load", Path("a.json"), "-"});
  program.outPath = Path("out");
  EXPECT_EQ(harness::RunProgram(program).status, 0);
  EXPECT_EQ(ModeOf(Path("out")), 0604u);
  EXPECT_EQ(Output({"check", Path("out")}), "");
}

TEST_F(Ksicache, StandardOutputTakesNoOption) {
  ExpectFailure({"capture", "-", "--mode", "0644"}, "--mode is for a file, not standard output", 2);
  ExpectFailure({"load", "--force", Path("a.json"), "-"},
                "--force is for a file, not standard output", 2);
}

TEST_F(Ksicache, StandardOutputIsNoTerminal) {
  const int terminal = posix_openpt(O_RDWR | O_NOCTTY);
  ASSERT_GE(terminal, 0) << "is /dev/pts mounted?";
  ASSERT_EQ(grantpt(terminal), 0);
  ASSERT_EQ(unlockpt(terminal), 0);
  harness::Program program = Command({"capture", "-"});
  program.outPath = ptsname(terminal);
  const harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: standard output: is a terminal\n");
  close(terminal);
}

#ifndef TALLY_SANITIZED
// Where files without a name are unknown, or get none, one with a name does as well. (A sanitizer
// does not share its process with another library that stands before it.)
TEST_F(Ksicache, FilesAreMadeWithoutUnnamedOnes) {
  WriteContent(Path("a.json"), JsonWith(""));
  for (const std::string refused : {"openat", "linkat"}) {
    harness::Program program = Command({"load", "--mode", "0604", Path("a.json"), Path("a.ksi")});
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_WITHOUT_UNNAMED_FILES);
    program.environment.push_back("REFUSED=" + refused);
    const harness::Result made = harness::RunProgram(program);
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
    EXPECT_EQ(ModeOf(Path("a.ksi")), 0604u);

    const harness::Result again = harness::RunProgram(program);
    EXPECT_EQ(again.err, "ksicache: " + Path("a.ksi") + ": exists already (--force replaces it)\n");
    WriteContent(Path("a.ksi"), "old");
    program.args.emplace_back("--force");
    EXPECT_EQ(harness::RunProgram(program).status, 0);
    EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
    EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
    unlink(Path("a.ksi").c_str());
  }
}

// A file that has another name for a while, for want of unnamed ones or to take the place of a file
// that is there, has its own before a signal ends the program.
TEST_F(Ksicache, AHangupLeavesNoOtherName) {
  WriteContent(Path("a.json"), JsonWith(""));
  const std::pair<std::string, std::string> cases[] = {{"openat", "fsync"}, {"", "linkat"}};
  for (const auto& [refused, last] : cases) {
    WriteContent(Path("a.ksi"), "old");
    harness::Program program = Command({"load", "--force", Path("a.json"), Path("a.ksi")});
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_WITHOUT_UNNAMED_FILES);
    program.environment.push_back("REFUSED=" + refused);
    program.environment.push_back("HANGUP_AFTER=" + last);
    EXPECT_EQ(harness::RunProgram(program).status, -SIGHUP) << last;
    EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
    EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
  }
}

// What comes into the place of a file to be while it is made stays.
TEST_F(Ksicache, AFileThatCameMeanwhileIsNotReplaced) {
  const std::string pipe = Path("pipe");
  for (const std::string refused : {"", "linkat"}) {
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int writer = open(pipe.c_str(), O_RDWR | O_CLOEXEC);
    ASSERT_GE(writer, 0);
    const std::string json = JsonWith("");
    ASSERT_EQ(write(writer, json.data(), 1), 1);
    harness::Program program = Command({"load", pipe, Path("a.ksi")});
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_WITHOUT_UNNAMED_FILES);
    program.environment.push_back("REFUSED=" + refused);
    auto result = std::async(std::launch::async, [&] { return harness::RunProgram(program); });
    // It has looked for the file when it reads.
    for (int unread = 1; unread != 0;) {
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
      ASSERT_EQ(ioctl(writer, FIONREAD, &unread), 0);
    }
    WriteContent(Path("a.ksi"), "precious");
    ASSERT_EQ(write(writer, json.data() + 1, json.size() - 1), ssize_t(json.size() - 1));
    close(writer);
    EXPECT_EQ(result.get().err,
              "ksicache: " + Path("a.ksi") + ": exists already (--force replaces it)\n");
    EXPECT_EQ(FileContent(Path("a.ksi")), "precious");
    EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.ksi", "pipe"}));
    unlink(Path("a.ksi").c_str());
    unlink(pipe.c_str());
  }
}

// The file and its name: neither is taken for kept before the disk has it.
TEST_F(Ksicache, WhatTheDiskDoesNotTakeIsToldAndReplacesNothing) {
  WriteContent(Path("a.json"), JsonWith(""));
  WriteContent(Path("a.ksi"), "precious");
  harness::Program program = Command({"load", "--force", Path("a.json"), Path("a.ksi")});
  program.environment.emplace_back("LD_PRELOAD=" TALLY_FAIL_NTH);
  program.environment.emplace_back("FAIL=fsync:1");
  harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + Path("a.ksi") + ": cannot write: Input/output error\n");
  EXPECT_EQ(FileContent(Path("a.ksi")), "precious");
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));

  // Nothing but that unnamed files are unknown is a reason to make one with a name.
  for (int n = 2; n <= 5; ++n) {
    program.environment.back() = "FAIL=open:" + std::to_string(n);
    result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1) << n;
    EXPECT_EQ(result.err, "ksicache: " + Path("a.ksi") + ": Too many open files\n") << n;
  }

  program.environment.back() = "FAIL=fsync:2";
  result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + Path("a.ksi") +
                            ": is whole, but may not outlast a crash: Input/output error\n");
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
}
#endif

// Readings of many groups, larger than what the tests below allow.
std::string ManyGroups() {
  std::string readings;
  for (int i = 0; i < 2000; ++i) {
    readings += (i == 0 ? "" : ",") + std::string(R"({"node":"sched/groups/groupName","keys":[)") +
                std::to_string(i) + R"(],"value":{"text":"group"}})";
  }
  return readings;
}

TEST_F(Ksicache, FullDiskLosesNothingAndSaysSo) {
  WriteContent(Path("a.json"), JsonWith(ManyGroups()));
  const std::vector<std::string> commands[] = {
      {"load", "--force", Path("a.json"), Path("a.ksi")},
      {"capture", "--force", "--root", RecordedHost("kvm-two-nodes"), Path("a.ksi")},
  };
  for (const std::vector<std::string>& command : commands) {
    WriteContent(Path("a.ksi"), "precious");
    // A limit on the size of files is the full disk that every user can have.
    harness::Program program = Command(command);
    program.path = "/bin/sh";
    program.args = {"sh", "-c", "ulimit -f 40; exec \"$0\" \"$@\"", KSICACHE_PROGRAM};
    program.args.insert(program.args.end(), command.begin(), command.end());
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1) << command[0];
    EXPECT_NE(result.err.find("ksicache: " + Path("a.ksi") + ": cannot write: "), result.err.npos)
        << result.err;
    EXPECT_EQ(FileContent(Path("a.ksi")), "precious");
    EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
  }
}

// Whether a process has a file in the directory that has no name any more, or none yet.
bool HasUnnamedFile(pid_t process, const TestDirectory& directory) {
  const std::string descriptors = "/proc/" + std::to_string(process) + "/fd";
  for (int fd = 3; fd < 64; ++fd) {
    std::array<char, 4096> target;
    const ssize_t size =
        readlink((descriptors + "/" + std::to_string(fd)).c_str(), target.data(), target.size());
    if (size <= 0) continue;
    const std::string_view name(target.data(), static_cast<size_t>(size));
    if (name.starts_with(directory.Path("")) && name.ends_with(" (deleted)")) return true;
  }
  return false;
}

// Starts ksicache, which has a file to make and then waits for what does not come; expects that
// nothing but `names` can be seen in the directory then, and after a signal ended it.
// `diagnostics`, unless negative, is its standard error.
void ExpectNothingLeftBy(int signal, std::vector<std::string> words, int diagnostics,
                         const TestDirectory& directory, const std::vector<std::string>& names) {
  std::vector<char*> args;
  for (std::string& word : words) args.push_back(word.data());
  args.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  if (diagnostics >= 0) {
    posix_spawn_file_actions_adddup2(&actions, diagnostics, STDERR_FILENO);
  }
  pid_t process = 0;
  ASSERT_EQ(posix_spawn(&process, KSICACHE_PROGRAM, &actions, nullptr, args.data(), environ), 0);
  posix_spawn_file_actions_destroy(&actions);
  for (int i = 0; i < 1000 && !HasUnnamedFile(process, directory); ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  EXPECT_TRUE(HasUnnamedFile(process, directory));
  EXPECT_EQ(directory.Names(), names);
  ASSERT_EQ(kill(process, signal), 0);
  int status = 0;
  ASSERT_EQ(waitpid(process, &status, 0), process);
  EXPECT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), signal);
  EXPECT_EQ(directory.Names(), names);
}

TEST_F(Ksicache, SignalsLeaveNothingBehind) {
  // JSON that does not come.
  const std::string pipe = Path("pipe");
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  const int writer = open(pipe.c_str(), O_RDWR | O_CLOEXEC);
  ASSERT_GE(writer, 0);
  for (const int signal : {SIGINT, SIGTERM, SIGKILL}) {
    ExpectNothingLeftBy(signal, {"ksicache", "load", pipe, Path("a.ksi")}, -1, directory_,
                        {"pipe"});
  }
  close(writer);
}

TEST_F(Ksicache, SignalsLeaveNothingOfACapture) {
  // A diagnostic that nobody reads.
  const HostTree host;
  host.Write("/proc/meminfo", "MemTotal: 1000 kB\n");
  host.Write("/proc/buddyinfo", "no line of this file\n");
  std::array<int, 2> pipe = {};
  ASSERT_EQ(pipe2(pipe.data(), O_CLOEXEC | O_NONBLOCK), 0);
  const std::string page(4096, ' ');
  while (write(pipe[1], page.data(), page.size()) > 0) continue;
  ASSERT_EQ(fcntl(pipe[1], F_SETFL, 0), 0);
  for (const int signal : {SIGINT, SIGTERM, SIGKILL}) {
    ExpectNothingLeftBy(signal, {"ksicache", "capture", "--root", host.Root(), Path("a.ksi")},
                        pipe[1], directory_, {});
  }
  close(pipe[0]);
  close(pipe[1]);
}

}  // namespace
}  // namespace ksi
