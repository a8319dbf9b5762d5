// Command lines through the front end and the reports. An input is the words after the program's
// name, a line each.
#include <array>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "tests/fuzz/command_line.h"
#include "tests/fuzz/fed_library.h"
#include "tests/fuzz/target.h"

// The front end as it is, but for its name: here is another main.
#define main TallyMain
#include "frontend/main.cc"  // NOLINT(bugprone-suspicious-include)
#undef main

namespace {

// The same answers for every command line: some groups and clients, and failures among them.
std::array<uint8_t, 16384> MakeAnswers() {
  std::minstd_rand random(2026);
  std::array<uint8_t, 16384> answers = {};
  for (uint8_t& byte : answers) byte = static_cast<uint8_t>(random() >> 8);
  // The cache file and the signature, which come first, are fine.
  std::fill_n(answers.begin(), 32, uint8_t{' '});
  return answers;
}

std::vector<std::string> WordsOf(const char* text, size_t size) {
  std::vector<std::string> words = {"tally"};
  const std::string content(text, size);
  constexpr size_t kMostWords = 64;
  for (size_t at = 0; at < content.size() && words.size() < kMostWords;) {
    const size_t end = std::min(content.find('\n', at), content.size());
    words.emplace_back(content.substr(at, end - at).c_str());  // up to a NUL, as exec would
    at = end + 1;
  }
  return words;
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const auto answers = MakeAnswers();
  const fuzz::FedLibrary library(answers);
  fuzz::CommandLine(WordsOf(reinterpret_cast<const char*>(data), size)).RunOn(tally::Run);
  return 0;
}
