// The front end: its options, the cache file, the signature check and the exit status.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <fstream>
#include <sstream>
#include <string>

#include "tests/harness/hosts.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

constexpr char kSequence[] = "Unexpected or out-of-sequence argument detected\n";
constexpr char kMismatch[] =
    "0xbad003a: md5 signature mismatch with running kernova built on Jan  2 2025 03:04:05. "
    "(vs Nov 21 2026 10:00:00 for app sysinfo)\n";
constexpr char kCheckFailed[] = "Version check failed\n";

std::string Usage() {
  std::ifstream file(TALLY_TESTS_DIRECTORY "/golden/usage.txt");
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

Scenario Host() {
  Scenario scenario;
  AddHostMemory(scenario, {});
  return scenario;
}

Scenario MismatchingHost() {
  return Host().Signature(0xbad003a, "Jan  2 2025 03:04:05", "Nov 21 2026 10:00:00");
}

// Words after which a report's output is short.
Args Short(Args args) {
  args.insert(args.end(), {"-q", "-s", "free"});
  return args;
}
constexpr char kShortOutput[] = "free\n1011264\n";

struct Expected {
  std::string out;
  std::string err;
  int status;
  std::string calls;
};

void Expect(const Scenario& scenario, const Args& args, const Expected& expected) {
  const TallyRun run = RunTally(scenario, args);
  EXPECT_EQ(run.out, expected.out);
  EXPECT_EQ(run.err, expected.err);
  EXPECT_EQ(run.status, expected.status);
  // The front end's part of the calls.
  EXPECT_EQ(run.Calls().substr(0, run.Calls().find(" Create")), expected.calls);
}

TEST(FrontEnd, PrintsUsageOnRequest) {
  for (const char* option : {"-h", "--help", "--he"}) {
    Expect(Host(), {option}, {Usage(), "", 0, ""});
  }
  Expect(Host(), {"-c", "file", "--force", "-h", "-r", "comp-stats"}, {Usage(), "", 0, ""});
  Expect(MismatchingHost(), {"-f", "word", "-h"}, {Usage(), "", 0, ""});
}

TEST(FrontEnd, NamesItselfAsItWasCalled) {
  Program program = BuiltTally({"-h"});
  program.args[0] = "/some/where/other-name";
  const std::string usage = Usage();
  EXPECT_EQ(RunProgram(program).out,
            "Usage: /some/where/other-name" + usage.substr(usage.find(" [-hf]")));
}

TEST(FrontEnd, RefusesAnUnknownReport) {
  for (const char* name : {"bogus", "", "comp", "comp-stats "}) {
    Expect(Host(), {"-r", name}, {Usage(), std::string("Invalid report ") + name + "\n", 1, ""});
  }
  Expect(Host(), {"--report=x", "-h"}, {Usage(), "Invalid report x\n", 1, ""});
}

TEST(FrontEnd, RefusesUnknownOptionsBeforeTheReport) {
  Expect(Host(), {"-x"}, {Usage(), kSequence, 1, ""});
  Expect(Host(), {"-v", "-r", "comp-stats"}, {Usage(), kSequence, 1, ""});
  Expect(Host(), {"--bogus", "-r", "comp-stats"}, {Usage(), kSequence, 1, ""});
  Expect(Host(), {"--force=yes", "-r", "comp-stats"}, {Usage(), kSequence, 1, ""});
}

TEST(FrontEnd, RefusesMissingArguments) {
  for (const char* option : {"-f", "-c", "-r", "--cache", "--report"}) {
    Expect(Host(), {option}, {Usage(), kSequence, 1, ""});
  }
  Expect(Host(), {"-c", "file", "-f"}, {Usage(), kSequence, 1, ""});
}

TEST(FrontEnd, FindsAReportInAnyCase) {
  for (const char* name : {"comp-stats", "COMP-STATS", "Comp-Stats"}) {
    Expect(Host(), Short({"-r", name}), {kShortOutput, "", 0, "CheckSig()"});
  }
  Expect(Host(), Short({"--report", "comp-stats"}), {kShortOutput, "", 0, "CheckSig()"});
  Expect(Host(), Short({"-rcomp-stats"}), {kShortOutput, "", 0, "CheckSig()"});
}

TEST(FrontEnd, RunsTheReportOfEachName) {
  Scenario host = Host();
  host.Fails("sched_groups_members_groups", {0}, 0xbad0003)
      .Fails("memory_memInfo", {}, 0xbad0003)
      .Fails("memory_pmem_volumes", {}, 0xbad0003)
      .Value("memory_pshare_stats", {}, NumberedPshareStats(1))
      .List("system_buddy", {}, {})
      .List("system_heaps", {}, {});
  const struct {
    const char* name;
    const char* title;
  } reports[] = {
      {"group-stats", "GROUP STATS"},
      {"vm-stats", "VIRTUAL MACHINE STATS"},
      {"uw-stats", "USER-WORLD STATS"},
      {"pshare-stats", "PSHARE STATS"},
      {"pshareHint-stats", "PSHARE HINT STATS"},
      {"swap-stats", "VIRTUAL MACHINE SWAP STATS"},
      {"buddy-stats", "MEMMAP BUDDY STATS"},
      {"comp-stats", "COMPREHENSIVE STATS"},
      {"lpool-stats", "LPAGE POOL STATS"},
      {"heap-stats", "HEAP STATS"},
      {"guest-stats", "GUEST STATS"},
      {"zip-stats", "VIRTUAL MACHINE COMPRESSION STATS"},
      {"lpage-stats", "VIRTUAL MACHINE LARGE PAGE STATS"},
      {"asyncremap-stats", "ASYNC_REMAP STATS"},
      {"pmem-stats", "PERSISTENT MEMORY STATS"},
  };
  for (const auto& [name, title] : reports) {
    std::string upper = name;
    std::transform(upper.begin(), upper.end(), upper.begin(), toupper);
    for (const std::string& word : {std::string(name), upper}) {
      const TallyRun run = RunTally(host, {"-r", word});
      EXPECT_TRUE(run.out.starts_with("\n " + std::string(title) + ": Sat Nov 21 10:00:00 2026\n"))
          << word << "\n"
          << run.out << run.err;
    }
  }
}

TEST(FrontEnd, LeavesWhatFollowsTheReportToTheReport) {
  Expect(Host(), Short({"-r", "comp-stats", "-h", "-r", "bogus", "-c", "file"}),
         {kShortOutput, "", 0, "CheckSig()"});
}

TEST(FrontEnd, PassesOverWords) {
  Expect(Host(), Short({"word", "-r", "comp-stats"}), {kShortOutput, "", 0, "CheckSig()"});
}

TEST(FrontEnd, PrintsUsageWithoutAReport) {
  Expect(Host(), {}, {Usage(), "", 0, "CheckSig()"});
  Expect(Host(), {"word"}, {Usage(), "", 0, "CheckSig()"});
  Expect(Host(), {"--", "-r", "comp-stats"}, {Usage(), "", 0, "CheckSig()"});
  Expect(Host(), {"-c", "a file"}, {Usage(), "", 0, "UseCache('a file',0) CheckSig()"});
  Expect(MismatchingHost(), {},
         {"", std::string(kMismatch) + kCheckFailed, 1, "CheckSig()=0xbad003a"});
  Expect(MismatchingHost(), {"--force"}, {Usage(), kMismatch, 0, "CheckSig()=0xbad003a"});
}

TEST(FrontEnd, OpensTheCacheFileFirst) {
  for (const Args& args : {Args{"-c", "host.ksi"}, Args{"--cache", "host.ksi"},
                           Args{"--cache=host.ksi"}, Args{"-c", "other.ksi", "-chost.ksi"}}) {
    Args all = args;
    all.insert(all.end(), {"-r", "comp-stats"});
    Expect(Host(), Short(all), {kShortOutput, "", 0, "UseCache('host.ksi',0) CheckSig()"});
  }
}

TEST(FrontEnd, StopsWhenTheCacheFileCannotBeUsed) {
  Expect(MismatchingHost().Cache(0xbad0003), {"-c", "/nonexistent", "-r", "comp-stats"},
         {"", "Couldn't open cache file /nonexistent, error code: 195887107\n", 1,
          "UseCache('/nonexistent',0)=0xbad0003"});
  Expect(Host().Cache(0xffffffff), {"--force", "-c", "x"},
         {"", "Couldn't open cache file x, error code: 4294967295\n", 1,
          "UseCache('x',0)=0xffffffff"});
}

TEST(FrontEnd, StopsOnASignatureMismatch) {
  Expect(MismatchingHost(), {"-r", "comp-stats"},
         {"", std::string(kMismatch) + kCheckFailed, 1, "CheckSig()=0xbad003a"});
}

TEST(FrontEnd, GoesOnWhenForced) {
  Expect(MismatchingHost(), Short({"--force", "-r", "comp-stats"}),
         {kShortOutput, kMismatch, 0, "CheckSig()=0xbad003a"});
  Expect(MismatchingHost(), Short({"-f", "x", "-r", "comp-stats"}),
         {kShortOutput, kMismatch, 0, "CheckSig()=0xbad003a"});
}

TEST(FrontEnd, TakesAWordWithTheShortForceOption) {
  // -f takes "-r" for its word, so that no report is chosen.
  Expect(MismatchingHost(), {"-f", "-r", "comp-stats"},
         {Usage(), kMismatch, 0, "CheckSig()=0xbad003a"});
}

TEST(FrontEnd, IsNotForcedAfterTheReport) {
  for (const char* option : {"-f", "--force"}) {
    Expect(MismatchingHost(), {"-r", "comp-stats", option},
           {"", std::string(kMismatch) + kCheckFailed, 1, "CheckSig()=0xbad003a"});
  }
}

TEST(FrontEnd, CutsTheBuildDateThatFillsItsBuffer) {
  Expect(Host().Signature(1, "0123456789012345678901234567890", "an application build"),
         {"-r", "comp-stats"},
         {"",
          "0x1: md5 signature mismatch with running kernova built on 01234567890123456789. "
          "(vs an application build for app sysinfo)\n"
          "Version check failed\n",
          1, "CheckSig()=0x1"});
}

TEST(FrontEnd, FailsWhenTheReportFails) {
  const TallyRun run =
      RunTally(Host().Fails("memory_comprehensive", {}, 0xbad0003), Short({"-r", "comp-stats"}));
  EXPECT_EQ(run.out, "free\n");
  EXPECT_EQ(run.status, 1);
}

TEST(FrontEnd, ForcedRunHasTheReportsStatus) {
  const TallyRun run = RunTally(MismatchingHost().Fails("memory_comprehensive", {}, 0xbad0003),
                                Short({"--force", "-r", "comp-stats"}));
  EXPECT_EQ(run.status, 1);
}

}  // namespace
}  // namespace harness
