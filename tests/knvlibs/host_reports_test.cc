// The reports of recorded hosts, through all that stands between a kernel's files and a row: the
// host is captured in a cache file and tally reads it from there.
#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <vector>

#include "tests/harness/golden.h"
#include "tests/harness/program.h"
#include "tests/harness/tally.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

struct Report {
  std::string_view name;
  std::vector<std::string> options;
};

// Comma-separated, for there is no title with the time of day in it.
const Report kReports[] = {
    {"group-stats", {}},
    {"group-stats", {"-t", "-i", "sys", "-u", "mb", "-s", "name:min:max:consumed:flags:tag"}},
    {"vm-stats", {}},
    {"uw-stats", {}},
    {"swap-stats", {}},
    {"guest-stats", {}},
    {"zip-stats", {}},
    {"lpage-stats", {}},
    {"asyncremap-stats", {}},
    {"pshare-stats", {}},
    {"pshareHint-stats", {}},
    {"buddy-stats", {}},
    {"comp-stats", {}},
    {"lpool-stats", {}},
    {"heap-stats", {}},
    {"pmem-stats", {}},
    {"pmem-stats", {"-l", "2", "-u", "mb"}},
};

harness::Result Capture(const std::string& host, const std::string& file) {
  harness::Program program;
  program.path = TALLY_KSICACHE;
  program.args = {"ksicache", "capture", "--root", RecordedHost(host), file};
  program.environment = harness::OwnEnvironment();
  return harness::RunProgram(program);
}

class HostReportsTest : public testing::TestWithParam<const char*> {};

TEST_P(HostReportsTest, ShowTheFiguresOfTheHost) {
  const HostTree directory;
  const std::string file = directory.Root() + "/host.ksi";
  const harness::Result capture = Capture(GetParam(), file);
  ASSERT_EQ(capture.status, 0) << capture.err;

  std::string text;
  for (const Report& report : kReports) {
    harness::Args args = {"-c", file, "-r", std::string(report.name), "-q"};
    args.insert(args.end(), report.options.begin(), report.options.end());
    const harness::Result run = harness::RunProgram(harness::BuiltTally(args));
    text += "$ tally -r " + std::string(report.name) + " -q";
    for (const std::string& option : report.options) text += " " + option;
    text += "\n" + run.out + run.err;
    EXPECT_EQ(run.status, 0) << report.name;
  }
  harness::ExpectGolden(std::string("knvlibs/hosts/") + GetParam() + ".reports.txt", text);
}

TEST_P(HostReportsTest, EveryPageIsInOneOfFourParts) {
  LinuxSource source(RecordedHost(GetParam()));
  KSI_Comprehensive memory = {};
  ASSERT_EQ(GetValue(source, "memory/comprehensive", {}, &memory), kOk);
  const auto total = static_cast<double>(memory.managedByMemMap);
  EXPECT_NEAR(static_cast<double>(memory.free + memory.dataAndHeap + memory.knvClientConsumed +
                                  memory.otherConsumed),
              total, 0.005 * total);
}

INSTANTIATE_TEST_SUITE_P(Hosts, HostReportsTest,
                         testing::Values("cgroup-v1-vm", "systemd-server", "kvm-two-nodes"),
                         [](const auto& host) {
                           std::string name = host.param;
                           std::erase(name, '-');
                           return name;
                         });

}  // namespace
}  // namespace ksi
