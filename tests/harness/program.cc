#include "tests/harness/program.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>

namespace harness {
namespace {

constexpr int kMillisecondsToRun = 60'000;

// The harness cannot go on without these calls.
int Must(int result, const char* what) {
  if (result < 0) {
    std::perror(what);
    std::abort();
  }
  return result;
}

std::vector<char*> Pointers(const std::vector<std::string>& texts) {
  std::vector<char*> pointers;
  pointers.reserve(texts.size() + 1);
  for (const std::string& text : texts) pointers.push_back(const_cast<char*>(text.c_str()));
  pointers.push_back(nullptr);
  return pointers;
}

int WaitFor(pid_t pid) {
  const int process = Must(static_cast<int>(syscall(SYS_pidfd_open, pid, 0)), "pidfd_open");
  pollfd ended{process, POLLIN, 0};
  if (poll(&ended, 1, kMillisecondsToRun) != 1) kill(pid, SIGKILL);
  close(process);
  int status = 0;
  Must(waitpid(pid, &status, 0), "waitpid");
  return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

}  // namespace

MemoryFile::MemoryFile(const std::string& content)
    : descriptor_(Must(memfd_create("tally-test", MFD_CLOEXEC), "memfd_create")) {
  size_t written = 0;
  while (written < content.size()) {
    written += static_cast<size_t>(Must(
        static_cast<int>(write(descriptor_, content.data() + written, content.size() - written)),
        "write"));
  }
}

MemoryFile::~MemoryFile() { close(descriptor_); }

std::string MemoryFile::Content() const {
  std::string content;
  std::array<char, 65536> block;
  for (ssize_t got = 0; (got = pread(descriptor_, block.data(), block.size(),
                                     static_cast<off_t>(content.size()))) > 0;) {
    content.append(block.data(), static_cast<size_t>(got));
  }
  return content;
}

Result RunProgram(const Program& program) {
  const MemoryFile out;
  const MemoryFile err;
  std::array<int, 2> brokenPipe{-1, -1};

  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
  if (program.outClosed) {
    posix_spawn_file_actions_addclose(&actions, STDOUT_FILENO);
  } else if (!program.outPath.empty()) {
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, program.outPath.c_str(), O_WRONLY, 0);
  } else if (program.outPipeWithoutReader) {
    Must(pipe2(brokenPipe.data(), O_CLOEXEC), "pipe2");
    close(brokenPipe[0]);
    posix_spawn_file_actions_adddup2(&actions, brokenPipe[1], STDOUT_FILENO);
  } else {
    posix_spawn_file_actions_adddup2(&actions, out.Descriptor(), STDOUT_FILENO);
  }
  posix_spawn_file_actions_adddup2(&actions, err.Descriptor(), STDERR_FILENO);
  for (const auto& [number, file] : program.files) {
    posix_spawn_file_actions_adddup2(&actions, file, number);
  }

  // Nothing of the test runner's own signal settings passes on.
  posix_spawnattr_t attributes;
  posix_spawnattr_init(&attributes);
  sigset_t defaults;
  sigemptyset(&defaults);
  if (!program.ignoreSigpipe) sigaddset(&defaults, SIGPIPE);
  posix_spawnattr_setsigdefault(&attributes, &defaults);
  posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGDEF);
  const auto before = program.ignoreSigpipe ? std::signal(SIGPIPE, SIG_IGN) : SIG_DFL;

  pid_t pid = 0;
  const int error =
      posix_spawn(&pid, program.path.c_str(), &actions, &attributes, Pointers(program.args).data(),
                  Pointers(program.environment).data());
  if (program.ignoreSigpipe) (void)std::signal(SIGPIPE, before);
  posix_spawnattr_destroy(&attributes);
  posix_spawn_file_actions_destroy(&actions);
  if (brokenPipe[1] >= 0) close(brokenPipe[1]);
  if (error != 0) {
    errno = error;
    std::perror(program.path.c_str());
    std::abort();
  }

  Result result;
  result.status = WaitFor(pid);
  result.out = out.Content();
  result.err = err.Content();
  return result;
}

std::vector<std::string> OwnEnvironment() {
  std::vector<std::string> environment;
  for (char** variable = environ; *variable != nullptr; ++variable) {
    environment.emplace_back(*variable);
  }
  return environment;
}

}  // namespace harness
