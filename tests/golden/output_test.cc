// Output that cannot be written must not pass for written.
#include <gtest/gtest.h>

#include <csignal>
#include <string>

#include "tests/harness/hosts.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

Scenario Host() {
  Scenario scenario;
  AddHostMemory(scenario, {});
  return scenario;
}

// Reports and usage alike.
const Args kWriters[] = {{"-r", "comp-stats"}, {"-r", "comp-stats", "-q"}, {"-h"}, {}};

void ExpectComplaint(const TallyRun& run) {
  EXPECT_EQ(run.status, 1);
  EXPECT_NE(run.err.find("standard output"), std::string::npos) << run.err;
  EXPECT_TRUE(run.err.ends_with("\n"));
  EXPECT_TRUE(run.problems.empty());
}

TEST(Output, ComplainsOfAFullDisk) {
  for (const Args& args : kWriters) {
    Program how;
    how.outPath = "/dev/full";
    ExpectComplaint(TryTally(Host(), args, how));
  }
}

TEST(Output, TellsWhyAShortReportWasLost) {
  Program how;
  how.outPath = "/dev/full";
  EXPECT_EQ(TryTally(Host(), {"-r", "comp-stats"}, how).err,
            "tally: cannot write standard output: No space left on device\n");
}

TEST(Output, ComplainsOfClosedStandardOutput) {
  for (const Args& args : kWriters) {
    Program how;
    how.outClosed = true;
    ExpectComplaint(TryTally(Host(), args, how));
  }
}

TEST(Output, EndsWithItsReader) {
  Program how;
  how.outPipeWithoutReader = true;
  const TallyRun run = TryTally(Host(), {"-r", "comp-stats"}, how);
  EXPECT_EQ(run.status, -SIGPIPE);
  EXPECT_EQ(run.err, "");
}

TEST(Output, ComplainsOfALostReaderWhenSignalsAreIgnored) {
  Program how;
  how.outPipeWithoutReader = true;
  how.ignoreSigpipe = true;
  ExpectComplaint(TryTally(Host(), {"-r", "comp-stats"}, how));
}

TEST(Output, MayBeClosedWhenNothingIsWritten) {
  const TallyRun run = TryTally(Host().Cache(1), {"-c", "x", "-r", "comp-stats"});
  EXPECT_EQ(run.err, "Couldn't open cache file x, error code: 1\n");
  Program how;
  how.outPath = "/dev/full";
  EXPECT_EQ(TryTally(Host().Cache(1), {"-c", "x", "-r", "comp-stats"}, how).err, run.err);
}

}  // namespace
}  // namespace harness
