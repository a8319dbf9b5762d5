// All reports from end to end: the program, the bundled library and the cache file of the example
// host. A golden file holds one report as a table, as CSV, explained and in each of its units.

#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <vector>

#include "tests/harness/golden.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

struct Report {
  std::string name;
  std::vector<std::string> units;
  std::vector<Args> more = {};  // other options worth a look
};

void PrintTo(const Report& report, std::ostream* out) { *out << report.name; }

const std::vector<std::string> kUnits = {"mb", "kb", "pg"};

const Report kReports[] = {
    {"group-stats", kUnits, {{"-t", "-u", "mb"}, {"-i", "vm", "-l", "3"}, {"-g", "4", "-e", "vm"}}},
    {"vm-stats", kUnits, {{"-g", "4", "-l", "1"}}},
    {"uw-stats", kUnits, {{"-i", "vm"}, {"-e", "vm"}}},
    {"pshare-stats", kUnits},
    {"pshareHint-stats", kUnits},
    {"swap-stats", kUnits},
    {"buddy-stats", {}, {{"-s", "name:type:4KBfree"}}},
    {"comp-stats", kUnits},
    {"lpool-stats", {}},
    {"heap-stats", {"b", "mb", "kb", "pg"}, {{"-u", "kb", "--verbose"}}},
    {"guest-stats", kUnits},
    {"zip-stats", kUnits},
    {"lpage-stats", kUnits},
    {"asyncremap-stats", kUnits},
    {"pmem-stats", kUnits, {{"-l", "2"}, {"-l", "2", "-u", "mb", "-q"}}},
};

// The title block tells the time of the run.
std::string WithoutTime(const std::string& output) {
  static const std::regex time("STATS: [A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9]{2} [0-9:]{8} [0-9]{4}\n");
  return std::regex_replace(output, time, "STATS: (the time)\n");
}

class Example : public testing::TestWithParam<Report> {};

TEST_P(Example, PrintsWhatItShould) {
  const Report& report = GetParam();
  std::vector<Args> runs = {{}, {"-q"}, {"-v", "-s", "name"}, {"-v"}};
  for (const std::string& unit : report.units) runs.push_back({"-u", unit});
  for (const std::string& unit : report.units) runs.push_back({"-q", "-u", unit});
  runs.insert(runs.end(), report.more.begin(), report.more.end());

  std::string text;
  for (const Args& options : runs) {
    Args args = {"-c", TALLY_EXAMPLE, "-r", report.name};
    args.insert(args.end(), options.begin(), options.end());
    const Result result = RunProgram(BuiltTally(args));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    text += "$ tally -c hypervisor.ksi -r " + report.name;
    for (const std::string& option : options) text += " " + option;
    text += "\n" + WithoutTime(result.out);
  }
  ExpectGolden("example/" + report.name + ".txt", text);
}

INSTANTIATE_TEST_SUITE_P(Reports, Example, testing::ValuesIn(kReports), [](const auto& report) {
  std::string name = report.param.name;
  std::erase(name, '-');
  return name;
});

}  // namespace
}  // namespace harness
