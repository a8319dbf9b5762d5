// cpu_bench PROCESSES ROUNDS TALLY KSICACHE: what looking at all processes costs the host, beside
// ps. With so many sleeping processes more, ps, the reports and a capture of all nodes take turns,
// and the median of each counts, so that a busy machine slows all. Prints the milliseconds of a
// processor that each takes, of the kernel and of its own, and their ratio to those of ps.

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

struct Contender {
  std::vector<std::string> words;
  std::vector<double> milliseconds = {};
};

double Milliseconds(const timeval& time) {
  return static_cast<double>(time.tv_sec) * 1e3 + static_cast<double>(time.tv_usec) / 1e3;
}

// Runs it once, output to /dev/null.
void Run(Contender& contender) {
  std::vector<char*> arguments;
  for (std::string& word : contender.words) arguments.push_back(word.data());
  arguments.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
  pid_t child = 0;
  int status = 0;
  rusage usage;
  if (posix_spawnp(&child, arguments[0], &actions, nullptr, arguments.data(), environ) != 0 ||
      wait4(child, &status, 0, &usage) < 0 || status != 0) {
    static_cast<void>(std::fprintf(stderr, "cpu_bench: %s failed\n", arguments[0]));
    std::exit(1);
  }
  posix_spawn_file_actions_destroy(&actions);
  contender.milliseconds.push_back(Milliseconds(usage.ru_utime) + Milliseconds(usage.ru_stime));
}

double Median(std::vector<double>& values) {
  const auto middle = values.begin() + static_cast<long>(values.size() / 2);
  std::nth_element(values.begin(), middle, values.end());
  return *middle;
}

// Starts sleeping processes, which end when this one does.
void StartSleepers(int count) {
  const pid_t self = getpid();
  for (int i = 0; i < count; ++i) {
    const pid_t child = fork();
    if (child < 0) {
      std::perror("cpu_bench: fork");
      std::exit(1);
    }
    if (child > 0) continue;
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != self) _exit(1);
    execlp("sleep", "sleep", "infinity", nullptr);
    _exit(127);
  }
  sleep(2 + static_cast<unsigned>(count) / 2000);
}

}  // namespace

int main(int argc, char** argv) {
  const int processes = argc == 5 ? std::atoi(argv[1]) : -1;
  const int rounds = argc == 5 ? std::atoi(argv[2]) : 0;
  if (processes < 0 || rounds <= 0) {
    static_cast<void>(std::fputs("Usage: cpu_bench PROCESSES ROUNDS TALLY KSICACHE\n", stderr));
    return 2;
  }
  StartSleepers(processes);
  char file[] = "/dev/shm/cpu_bench.XXXXXX";
  const int fd = mkstemp(file);
  if (fd < 0) {
    std::perror("cpu_bench: /dev/shm");
    return 1;
  }
  std::vector<Contender> contenders = {{{"ps", "-eo", "pid,comm,vsz,rss"}},
                                       {{argv[3], "-r", "uw-stats"}},
                                       {{argv[3], "-r", "group-stats"}},
                                       {{argv[4], "capture", "--force", file}}};
  for (int round = 0; round < rounds; ++round) {
    for (Contender& contender : contenders) Run(contender);
  }
  unlink(file);
  std::printf("%-24s %12s %10s\n", "", "median/ms", "of ps");
  const double ofPs = Median(contenders.front().milliseconds);
  for (Contender& contender : contenders) {
    const double median = Median(contender.milliseconds);
    const std::string what = contender.words[0] == "ps"   ? "ps"
                             : contender.words[1] == "-r" ? contender.words[2]
                                                          : contender.words[1];
    std::printf("%-24s %12.2f %10.3f\n", what.c_str(), median, median / ofPs);
  }
  return 0;
}
