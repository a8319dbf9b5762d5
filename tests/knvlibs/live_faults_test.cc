// The live reports of a recorded host, while the system fails them one call at a time. Nothing ends
// with a signal, and what is not shown as ever is told.
//
// A run tries some calls of each kind. FULL_SWEEP=1 in the environment tries all, which takes long.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <map>
#include <string>

#include "tests/harness/program.h"
#include "tests/harness/report_names.h"
#include "tests/harness/tally.h"
#include "tests/knvlibs/host_tree.h"

#ifdef TALLY_FAIL_NTH

namespace ksi {
namespace {

harness::Result Show(const std::string& report, const std::string& variable) {
  harness::Program program = harness::BuiltTally({"-r", report, "-q"});
  program.environment.push_back("LD_PRELOAD=" TALLY_HOST_ROOT ":" TALLY_FAIL_NTH);
  program.environment.push_back("HOST_ROOT=" + RecordedHost("kvm-two-nodes"));
  program.environment.push_back(variable);
  return harness::RunProgram(program);
}

size_t CountOf(const std::string& text, const std::string& part) {
  size_t count = 0;
  for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++count;
  return count;
}

class LiveFaults : public testing::TestWithParam<const char*> {
 protected:
  // How often each kind of call is made.
  std::map<std::string, uint64_t> Counts() {
    const HostTree directory;
    const std::string file = directory.Root() + "/counts";
    directory.Write("/counts", "");
    whole_ = Show(GetParam(), "FAIL_COUNTS=" + file);
    EXPECT_EQ(whole_.status, 0) << whole_.err;
    // Of the recorded host, and not of this machine, whose figures change.
    EXPECT_EQ(Show(GetParam(), "").out, whole_.out);
    std::ifstream lines(file);
    std::map<std::string, uint64_t> counts;
    std::string kind;
    for (uint64_t count = 0; lines >> kind >> count;) counts[kind] = count;
    return counts;
  }

  void ExpectSoundEnd(const std::string& fault) {
    const harness::Result result = Show(GetParam(), "FAIL=" + fault);
    EXPECT_TRUE(result.status == 0 || result.status == 1) << fault << ": " << result.status;
    const bool isWhole = result.status == 0 && result.out == whole_.out;
    EXPECT_TRUE(isWhole || !result.err.empty()) << fault << "\n" << result.out;
    EXPECT_LE(CountOf(result.err, "left out or has no value"), 1u) << fault << "\n" << result.err;
  }

  harness::Result whole_;
};

TEST_P(LiveFaults, AreToldOnce) {
  const std::map<std::string, uint64_t> counts = Counts();
  const uint64_t tries = std::getenv("FULL_SWEEP") == nullptr ? 9 : UINT64_MAX;
  for (const std::string kind : {"malloc", "open", "read"}) {
    const uint64_t count = counts.at(kind);
    const uint64_t stride = std::max<uint64_t>(1, count / tries);
    for (uint64_t n = 1; n <= count; n += stride) {
      ExpectSoundEnd(kind + ":" + std::to_string(n));
      ExpectSoundEnd(kind + ":" + std::to_string(n) + "+");
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Reports, LiveFaults, testing::ValuesIn(harness::kReportNames),
                         harness::NameOf);

}  // namespace
}  // namespace ksi

#endif
