// Everything that reads a cache file, while the system fails it one call at a time: memory that is
// not there, files that do not open, reads that fail. Nothing ends with a signal or without end,
// and what is shown is shown as ever or with a message.
//
// A run tries some calls of each kind. FULL_SWEEP=1 in the environment tries all, which takes long.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "tests/harness/program.h"
#include "tests/harness/report_names.h"
#include "tests/harness/tally.h"
#include "tests/knvlibs/cache_fixture.h"

#ifdef TALLY_FAIL_NTH

namespace ksi {
namespace {

constexpr const char* kDumpJson = "dump-json";

harness::Program Report(const std::string& name) {
  return harness::BuiltTally({"-c", TALLY_EXAMPLE, "-r", name, "-q"});
}

harness::Program Ksicache(const std::string& command) {
  harness::Program program;
  program.path = KSICACHE_PROGRAM;
  program.args = {"ksicache", command, TALLY_EXAMPLE};
  if (command == kDumpJson) program.args = {"ksicache", "dump", "--json", TALLY_EXAMPLE};
  program.environment = harness::OwnEnvironment();
  return program;
}

harness::Program ProgramOf(const std::string& command) {
  return command.ends_with("stats") ? Report(command) : Ksicache(command);
}

class SystemFaults : public testing::TestWithParam<const char*> {
 protected:
  harness::Result Run(const std::string& variable) {
    harness::Program program = ProgramOf(GetParam());
    program.environment.push_back("LD_PRELOAD=" TALLY_FAIL_NTH);
    program.environment.push_back(variable);
    return harness::RunProgram(program);
  }

  // How often each kind of call is made.
  std::map<std::string, uint64_t> Counts() {
    const std::string file = directory_.Path("counts");
    whole_ = Run("FAIL_COUNTS=" + file);
    EXPECT_EQ(whole_.status, 0) << whole_.err;
    EXPECT_EQ(whole_.err, "");
    std::istringstream lines(FileContent(file));
    std::map<std::string, uint64_t> counts;
    std::string kind;
    for (uint64_t count = 0; lines >> kind >> count;) counts[kind] = count;
    return counts;
  }

  static std::vector<std::string> Lines(const std::string& text) {
    std::istringstream stream(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(stream, line);) lines.push_back(line);
    return lines;
  }

  // Whether a line is one that the whole output has, but for the comma after it, the sum of those
  // that are there, or one of check's problems.
  bool IsKnown(const std::string& line) const {
    return line.starts_with("Total,") || line.starts_with(",,,") ||
           line.starts_with(TALLY_EXAMPLE ": ") || known_.contains(line) ||
           known_.contains(line + ",");
  }

  // The status of a command is 0 if all was shown, and of a report, too, if it said what was not.
  static bool IsCommand() { return !std::string(GetParam()).ends_with("stats"); }

  void ExpectSoundEnd(const std::string& fault) {
    const harness::Result result = Run("FAIL=" + fault);
    EXPECT_TRUE(result.status == 0 || result.status == 1) << fault << ": " << result.status;
    const bool told =
        !result.err.empty() || result.out.find(TALLY_EXAMPLE ": ") != std::string::npos;
    if (result.status == 0 && (IsCommand() || !told)) {
      EXPECT_TRUE(result.out == whole_.out) << fault << "\n" << result.err;
    }
    for (const std::string& line : Lines(result.out)) {
      EXPECT_TRUE(IsKnown(line)) << fault << ": " << line << "\n" << result.err;
    }
    EXPECT_TRUE(result.status == 0 || told) << fault;
  }

  harness::Result whole_;
  std::set<std::string> known_;
  TestDirectory directory_;
};

TEST_P(SystemFaults, AreToldAndChangeNoFigure) {
  const std::map<std::string, uint64_t> counts = Counts();
  ASSERT_GT(counts.at("malloc"), 20u);
  ASSERT_GT(counts.at("read"), 3u);
  for (const std::string& line : Lines(whole_.out)) known_.insert(line);
  const uint64_t tries = std::getenv("FULL_SWEEP") == nullptr ? 7 : UINT64_MAX;
  for (const auto& [kind, count] : counts) {
    if (kind == "write") continue;  // standard output is the concern of other tests
    const uint64_t stride = std::max<uint64_t>(1, count / tries);
    for (uint64_t n = 1; n <= count; n += stride) {
      ExpectSoundEnd(kind + ":" + std::to_string(n));
    }
    ExpectSoundEnd(kind + ":" + std::to_string(count / 2 + 1) + "+");
  }
}

INSTANTIATE_TEST_SUITE_P(Reports, SystemFaults, testing::ValuesIn(harness::kReportNames),
                         harness::NameOf);
INSTANTIATE_TEST_SUITE_P(Commands, SystemFaults,
                         testing::Values("info", "check", "dump", kDumpJson), harness::NameOf);

}  // namespace
}  // namespace ksi

#endif
