// The words of a command line as a program is handed them: getopt reorders them.
#ifndef TESTS_FUZZ_COMMAND_LINE_H_
#define TESTS_FUZZ_COMMAND_LINE_H_

#include <getopt.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

namespace fuzz {

class CommandLine {
 public:
  explicit CommandLine(std::vector<std::string> words) : words_(std::move(words)) {
    for (std::string& word : words_) pointers_.push_back(word.data());
    pointers_.push_back(nullptr);
  }

  // Calls `run` with argc and argv, before an untouched scan.
  template <class Run>
  void RunOn(Run run) {
    static const bool quiet = std::freopen("/dev/null", "w", stdout) != nullptr;
    if (!quiet) std::abort();
    optind = 0;
    opterr = 0;
    run(static_cast<int>(words_.size()), pointers_.data());
    std::fflush(stdout);
  }

 private:
  std::vector<std::string> words_;
  std::vector<char*> pointers_;
};

}  // namespace fuzz

#endif  // TESTS_FUZZ_COMMAND_LINE_H_
