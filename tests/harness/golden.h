// Golden files: expected texts that stand in files beside the tests. A test program that is run
// with --update-golden writes them anew; read the difference before you commit it.
#ifndef TESTS_HARNESS_GOLDEN_H_
#define TESTS_HARNESS_GOLDEN_H_

#include <string>

#include "tests/harness/tally.h"

namespace harness {

// Whether this run writes the golden files.
void UpdateGolden(bool update);

// Expects `text` to equal the golden file `name`, a path below tests/.
void ExpectGolden(const std::string& name, const std::string& text);

// Runs tally and expects its exit status, output and diagnostics as in the golden file `name`.
TallyRun ExpectTallyGolden(const std::string& name, const Scenario& scenario, const Args& args);

}  // namespace harness

#endif  // TESTS_HARNESS_GOLDEN_H_
