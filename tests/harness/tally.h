// Runs tally against the test double.
#ifndef TESTS_HARNESS_TALLY_H_
#define TESTS_HARNESS_TALLY_H_

#include <string>
#include <vector>

#include "tests/harness/program.h"
#include "tests/harness/scenario.h"

namespace harness {

// Options of tally, without argv[0].
using Args = std::vector<std::string>;

struct TallyRun {
  int status = 0;  // exit status, or minus the signal
  std::string out;
  std::string err;
  std::string warnings;               // what went through Warning
  std::vector<std::string> calls;     // on the library, in order
  std::vector<std::string> problems;  // leaked lists and other misuse of the library

  // The calls as one text with blanks between them.
  std::string Calls() const;
  // The calls from the first that begins with `from`.
  std::string CallsFrom(std::string_view from) const;
};

// Runs tally as "tally args...". Every problem fails the test: misuse of the library, a process
// that did not end in good order, standard error that did not go through Warning.
TallyRun RunTally(const Scenario& scenario, const Args& args);

// The same without failing the test: for those that look for problems.
TallyRun TryTally(const Scenario& scenario, const Args& args);

// The same with standard output arranged as in `how`, and with the program at `how.path` if it is
// given; arguments, environment and files are filled in.
TallyRun TryTally(const Scenario& scenario, const Args& args, Program how);

// tally without the double: with the library that was built beside it.
Program BuiltTally(const Args& args);

}  // namespace harness

#endif  // TESTS_HARNESS_TALLY_H_
