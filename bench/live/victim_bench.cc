// victim_bench GIGABYTES SECONDS TALLY: what reports do to a process of that size while they look
// at it. The victim, in pages of 4 KB, maps, faults and unmaps memory in a loop and takes the time
// of each turn: alone, beside a report of TALLY each second, beside reports in a loop, beside a
// loop that does nothing for as long as those took of a processor, and beside one that reads its
// smaps_rollup, each for SECONDS in turns of one second. Prints the turns' percentiles in
// microseconds, and how the 99.9th compares with that beside the loop that does nothing: what is
// more is the reports' doing.
//
// The victim has a processor of its own, all go before others on this machine where that is
// permitted, and turns in which something else was given the processor are left out: so it only
// waits for what the kernel holds. What the processors share, caches and power, a loop that does
// nothing takes from it, too.

#include <fcntl.h>
#include <sched.h>
#include <signal.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <thread>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kPage = 4096;
constexpr size_t kTurn = 256 * kPage;
constexpr const char* kVictimName = "qemu-system-x86_64";  // which every report looks at closely

// The reports come before the loop that takes as long.
enum Beside : size_t { kNothing, kReport, kReports, kBusy, kRollup, kBesides };
constexpr std::array<const char*, kBesides> kNames = {"alone", "beside a report", "beside reports",
                                                      "beside a busy loop", "beside smaps_rollup"};

// Turns by their time, in steps of a hundredth.
class Histogram {
 public:
  void Add(Clock::duration time) {
    const double us = std::chrono::duration<double, std::micro>(time).count();
    const double step = std::log(std::max(us, 0.1) * 10) / std::log(kStep);
    ++counts_[std::min(static_cast<size_t>(step), counts_.size() - 1)];
    ++all_;
  }

  // The microseconds that this part of all turns does not exceed.
  double At(double part) const {
    const auto wanted = static_cast<uint64_t>(std::ceil(part * static_cast<double>(all_)));
    size_t i = 0;
    for (uint64_t seen = counts_[0]; seen < wanted && i + 1 < counts_.size(); seen += counts_[i])
      ++i;
    return std::pow(kStep, static_cast<double>(i + 1)) / 10;
  }

  uint64_t Count() const { return all_; }

 private:
  static constexpr double kStep = 1.01;
  std::array<uint64_t, 2500> counts_ = {};
  uint64_t all_ = 0;
};

// What the two processes have in common.
struct Shared {
  std::atomic<bool> isReady = false;
  std::atomic<size_t> beside = kNothing;
  std::array<Histogram, kBesides> turns;
};

void StayOn(int processor) {
  cpu_set_t set;
  CPU_ZERO(&set);
  CPU_SET(processor, &set);
  if (sched_setaffinity(0, sizeof set, &set) != 0) std::perror("victim_bench: sched_setaffinity");
}

// Whatever else runs on this machine waits.
void GoFirst() {
  sched_param priority = {};
  priority.sched_priority = 1;
  if (sched_setscheduler(0, SCHED_FIFO, &priority) != 0) {
    std::perror("victim_bench: sched_setscheduler");
  }
}

char* Map(size_t size) {
  void* memory = mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) {
    std::perror("victim_bench: mmap");
    std::exit(1);
  }
  madvise(memory, size, MADV_NOHUGEPAGE);
  return static_cast<char*>(memory);
}

// How often something else was given the processor of this thread.
long Interruptions() {
  rusage usage;
  getrusage(RUSAGE_THREAD, &usage);
  return usage.ru_nivcsw;
}

void Touch(char* memory, size_t size) {
  for (size_t at = 0; at < size; at += kPage) memory[at] = 1;
}

// "qemu-system-x86_64 -m 8G -name /dev/shm/..."
[[noreturn]] void BeVictim(size_t gigabytes, const char* sharedFile) {
  const int fd = open(sharedFile, O_RDWR);
  auto& shared = *static_cast<Shared*>(
      mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED, fd, 0));
  const size_t size = gigabytes << 30;
  Touch(Map(size), size);
  std::thread([] { pause(); }).detach();
  StayOn(0);
  shared.isReady = true;
  for (;;) {
    const size_t beside = shared.beside;
    const long before = Interruptions();
    const auto start = Clock::now();
    char* const memory = Map(kTurn);
    Touch(memory, kTurn);
    munmap(memory, kTurn);
    const auto taken = Clock::now() - start;
    if (Interruptions() == before) shared.turns[beside].Add(taken);
  }
}

void Run(std::initializer_list<std::string> words) {
  std::vector<char*> arguments;
  for (const std::string& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
  arguments.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
  pid_t child = 0;
  if (posix_spawnp(&child, arguments[0], &actions, nullptr, arguments.data(), environ) == 0) {
    waitpid(child, nullptr, 0);
  }
  posix_spawn_file_actions_destroy(&actions);
}

// The seconds of a processor that the programs run so far took.
double SecondsOfPrograms() {
  rusage usage;
  getrusage(RUSAGE_CHILDREN, &usage);
  return static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
         static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
}

// Takes this part of a processor for as long as a report might.
void BeBusy(double share) {
  using Milliseconds = std::chrono::duration<double, std::milli>;
  constexpr Milliseconds kReport(5);
  const auto start = Clock::now();
  while (Clock::now() - start < kReport * share) {
  }
  std::this_thread::sleep_for(kReport * (1 - share));
}

void WorkBeside(size_t beside, const std::string& tally, const std::string& rollup, double share) {
  if (beside == kNothing) {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  } else if (beside == kReport) {
    Run({tally, "-r", "vm-stats"});
    std::this_thread::sleep_for(std::chrono::seconds(1));
  } else if (beside == kReports) {
    for (const char* report :
         {"vm-stats", "group-stats", "uw-stats", "swap-stats", "lpage-stats"}) {
      Run({tally, "-r", report});
    }
  } else if (beside == kBusy) {
    BeBusy(share);
  } else {
    Run({"cat", rollup});
  }
}

}  // namespace

int main(int argc, char** argv) {
  const std::string name = argv[0];
  if (name == kVictimName && argc == 5) {
    BeVictim(std::strtoul(argv[2], nullptr, 10), argv[4]);
  }
  const size_t gigabytes = argc == 4 ? std::strtoul(argv[1], nullptr, 10) : 0;
  const int seconds = argc == 4 ? std::atoi(argv[2]) : 0;
  if (gigabytes == 0 || seconds == 0) {
    static_cast<void>(std::fputs("Usage: victim_bench GIGABYTES SECONDS TALLY\n", stderr));
    return 2;
  }
  char file[] = "/dev/shm/victim.XXXXXX";
  const int fd = mkstemp(file);
  if (fd < 0 || ftruncate(fd, sizeof(Shared)) != 0) {
    std::perror("victim_bench: /dev/shm");
    return 1;
  }
  GoFirst();
  auto& shared =
      *new (mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED, fd, 0)) Shared;
  const pid_t victim = fork();
  if (victim == 0) {
    const std::string size = std::to_string(gigabytes) + "G";
    execl("/proc/self/exe", kVictimName, "-m", size.c_str(), "-name", file, nullptr);
    _exit(127);
  }
  StayOn(1);
  while (!shared.isReady && waitpid(victim, nullptr, WNOHANG) == 0) usleep(10000);
  const std::string rollup = "/proc/" + std::to_string(victim) + "/smaps_rollup";
  double share = 0;  // what the latest reports took of the processor
  for (int second = 0; second < seconds; ++second) {
    for (size_t beside = 0; beside < kBesides; ++beside) {
      shared.beside = beside;
      const auto start = Clock::now();
      const double before = SecondsOfPrograms();
      while (Clock::now() - start < std::chrono::seconds(1)) {
        WorkBeside(beside, argv[3], rollup, share);
      }
      const std::chrono::duration<double> taken = Clock::now() - start;
      if (beside == kReports) share = std::min(1.0, (SecondsOfPrograms() - before) / taken.count());
    }
  }
  kill(victim, SIGKILL);
  waitpid(victim, nullptr, 0);
  unlink(file);
  std::printf("%-22s %10s %10s %10s %10s %12s %10s\n", "us of a turn", "turns", "p50", "p99",
              "p99.9", "p100", "of busy");
  const double ofBusy = shared.turns[kBusy].At(0.999);
  for (size_t beside = 0; beside < kBesides; ++beside) {
    const Histogram& turns = shared.turns[beside];
    std::printf("%-22s %10lu %10.1f %10.1f %10.1f %12.1f %10.3f\n", kNames[beside], turns.Count(),
                turns.At(0.5), turns.At(0.99), turns.At(0.999), turns.At(1),
                turns.At(0.999) / ofBusy);
  }
  return 0;
}
