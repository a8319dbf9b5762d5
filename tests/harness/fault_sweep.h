// The fault sweep: each fallible call on the library fails once, in turn.
#ifndef TESTS_HARNESS_FAULT_SWEEP_H_
#define TESTS_HARNESS_FAULT_SWEEP_H_

#include <cstdint>
#include <string>
#include <vector>

#include "tests/harness/tally.h"

namespace harness {

struct FaultSweep {
  // The golden file, a path below tests/, with what each failure leads to.
  std::string golden;
  Scenario scenario;
  Args args;
  // Each call fails with each of these, a process for each. The golden file shows the statuses
  // apart only where they lead to different ends.
  std::vector<uint32_t> statuses = {0xbad0003, 0xbad0014, 0xbad0017};
  // Leaks that are meant: beginnings of lines of TallyRun::problems.
  std::vector<std::string> allowedProblems = {};
};

// Runs the sweep and expects of every run that the process exits with 0 or 1 in good order, that
// no list is leaked, destroyed twice or used after it was destroyed, and that exit status,
// diagnostics and rows are those of the golden file.
void ExpectFaultSweep(const FaultSweep& sweep);

}  // namespace harness

#endif  // TESTS_HARNESS_FAULT_SWEEP_H_
