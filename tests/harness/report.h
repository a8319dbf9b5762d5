// A report under test, and what all reports on memory clients are tested for.
#ifndef TESTS_HARNESS_REPORT_H_
#define TESTS_HARNESS_REPORT_H_

#include <string>
#include <vector>

#include "tests/harness/tally.h"

namespace harness {

class Report {
 public:
  constexpr explicit Report(const char* name) : name_(name) {}

  // Runs the report with these options, from group 4 on unless they say otherwise.
  TallyRun Run(const Scenario& scenario, Args args = {}) const;

  // The rows in CSV, without the header: the columns as for -s, or all for "". Expects success
  // without diagnostics.
  std::string Rows(const Scenario& scenario, const std::string& columns,
                   const Args& args = {}) const;

 private:
  const char* name_;
};

// A read that fails with 0xbad0003, and the diagnostics of that.
struct FailedRead {
  const char* node;
  Items keys;
  std::string warnings;
};

// Two virtual machines below group 4: 10, whose world group is 100, and 20, whose ids are negative:
// its world group is -300, its VMM leader -299 and its parent, by its own account, -1. Group 12 is
// below machine 10.
Scenario TwoMachines();

// Two user worlds below group 4: 10, whose world group is 100, and 20, whose world group is -300
// and whose parent is -1 by its own account. Group 12 is below user world 10.
Scenario TwoUserWorlds();

// The calls of every such report on group 20, which leads memory client -300: the children, then
// flags, name, parent and leader, with the flags once more.
std::string ReadsOfClient20();

// Expects of each of these reads, and of those of flags, name, parent and leader, if it fails
// alone, that group 10 of `host` gives no row and adds nothing to the Total row, that group 12
// below it is not visited, and that the report fails only when group 10 is its start.
void ExpectFailuresHideGroup10(const Report& report, const Scenario& host,
                               std::vector<FailedRead> reads);

}  // namespace harness

#endif  // TESTS_HARNESS_REPORT_H_
