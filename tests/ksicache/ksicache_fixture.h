// ksicache from its command line to its exit status.
#ifndef TESTS_KSICACHE_KSICACHE_FIXTURE_H_
#define TESTS_KSICACHE_KSICACHE_FIXTURE_H_

#include <gtest/gtest.h>
#include <unistd.h>

#include <string>
#include <string_view>
#include <vector>

#include "tests/harness/program.h"
#include "tests/knvlibs/cache_fixture.h"

namespace ksi {

class Ksicache : public testing::Test {
 protected:
  static harness::Program Command(const std::vector<std::string>& args) {
    harness::Program program;
    program.path = KSICACHE_PROGRAM;
    program.args = {"ksicache"};
    program.args.insert(program.args.end(), args.begin(), args.end());
    program.environment = harness::OwnEnvironment();
    return program;
  }

  static harness::Result Run(const std::vector<std::string>& args) {
    return harness::RunProgram(Command(args));
  }

  // Runs and expects success without diagnostics; gives the output.
  static std::string Output(const std::vector<std::string>& args) {
    const harness::Result result = Run(args);
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.err, "");
    return result.out;
  }

  // Runs and expects it to fail with this message and no output.
  static void ExpectFailure(const std::vector<std::string>& args, const std::string& message,
                            int status = 1) {
    const harness::Result result = Run(args);
    EXPECT_EQ(result.status, status);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err,
              "ksicache: " + message + (status == 2 ? "\nTry 'ksicache --help'.\n" : "\n"));
  }

  std::string Path(std::string_view name) const { return directory_.Path(name); }

  // The JSON of a cache file with these readings.
  static std::string JsonWith(const std::string& readings) {
    return R"({"ksiCache":1,"host":"h","taken":"2026-11-21T10:00:00Z","readings":[)" + readings +
           "]}";
  }

  // Expects `load` to refuse JSON with a message that starts with the file's name, and to leave
  // nothing behind.
  void ExpectRefused(const std::string& json, const std::string& message) {
    WriteContent(Path("bad.json"), json);
    ExpectFailure({"load", Path("bad.json"), Path("bad.ksi")}, Path("bad.json") + ": " + message);
    EXPECT_EQ(access(Path("bad.ksi").c_str(), F_OK), -1);
  }

  TestDirectory directory_;
};

}  // namespace ksi

#endif  // TESTS_KSICACHE_KSICACHE_FIXTURE_H_
