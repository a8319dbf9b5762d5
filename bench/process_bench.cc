// process_bench ROUNDS PROGRAM [ARGUMENT...]: whole runs of a program, output to /dev/null, against
// runs of /bin/true. The two take turns, and the median of each counts, so that a busy machine
// slows both. Prints the microseconds of /bin/true and of the program, their ratio and the
// program's largest resident set in KB.

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <vector>

extern char** environ;

namespace {

struct Taken {
  double microseconds;  // from the start of the program to its end
  long peakKilobytes;
};

Taken Run(char* const* command) {
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  const auto start = std::chrono::steady_clock::now();
  pid_t child = 0;
  int status = 0;
  rusage usage;
  if (posix_spawn(&child, command[0], &actions, nullptr, command, environ) != 0 ||
      wait4(child, &status, 0, &usage) < 0 || status != 0) {
    std::fprintf(stderr, "process_bench: %s failed\n", command[0]);
    std::exit(1);
  }
  const std::chrono::duration<double, std::micro> taken = std::chrono::steady_clock::now() - start;
  posix_spawn_file_actions_destroy(&actions);
  return {taken.count(), usage.ru_maxrss};
}

double Median(std::vector<double>& values) {
  std::nth_element(values.begin(), values.begin() + static_cast<long>(values.size() / 2),
                   values.end());
  return values[values.size() / 2];
}

}  // namespace

int main(int argc, char** argv) {
  const int rounds = argc > 2 ? std::atoi(argv[1]) : 0;
  if (rounds <= 0) {
    std::fputs("Usage: process_bench ROUNDS PROGRAM [ARGUMENT...]\n", stderr);
    return 2;
  }
  char trueName[] = "/bin/true";
  char* const baseline[] = {trueName, nullptr};
  std::vector<double> ofBaseline;
  std::vector<double> ofProgram;
  long peak = 0;
  for (int round = 0; round < rounds; ++round) {
    ofBaseline.push_back(Run(baseline).microseconds);
    const Taken taken = Run(argv + 2);
    ofProgram.push_back(taken.microseconds);
    peak = std::max(peak, taken.peakKilobytes);
  }
  const double baselineTime = Median(ofBaseline);
  const double programTime = Median(ofProgram);
  std::printf("%.0f %.0f %.2f %ld\n", baselineTime, programTime, programTime / baselineTime, peak);
  return 0;
}
