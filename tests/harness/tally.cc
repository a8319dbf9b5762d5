#include "tests/harness/tally.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <sstream>

#include "tests/double/script.h"

namespace harness {
namespace {

// Descriptors of the scenario and the trace in the program.
constexpr int kScenarioFile = 10;
constexpr int kTraceFile = 11;

std::string Device(int file) { return "/dev/fd/" + std::to_string(file); }

void Parse(const std::string& trace, TallyRun* run) {
  constexpr std::string_view kWarning = "Warning ";
  bool ended = false;
  std::istringstream lines(trace);
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with("! ")) {
      run->problems.push_back(line.substr(2));
    } else if (line.starts_with(kWarning)) {
      run->warnings += script::Unquote(std::string_view(line).substr(kWarning.size()));
    } else if (line == "exit") {
      ended = true;
    } else {
      run->calls.push_back(line);
    }
  }
  if (!ended || (run->status != 0 && run->status != 1)) {
    run->problems.push_back("ended in disorder with status " + std::to_string(run->status) + "\n" +
                            run->err);
  }
}

std::string Joined(std::vector<std::string>::const_iterator from,
                   std::vector<std::string>::const_iterator to) {
  std::string text;
  for (; from != to; ++from) text += (text.empty() ? "" : " ") + *from;
  return text;
}

// Sanitizers tell by their exit status that they, and not tally, ended the process.
std::vector<std::string> Environment() {
  return {"TZ=UTC", "LC_ALL=C", "ASAN_OPTIONS=exitcode=99:detect_leaks=1",
          "UBSAN_OPTIONS=exitcode=99:print_stacktrace=1"};
}

}  // namespace

std::string TallyRun::Calls() const { return Joined(calls.begin(), calls.end()); }

std::string TallyRun::CallsFrom(std::string_view from) const {
  const auto first = std::find_if(calls.begin(), calls.end(), [from](const std::string& call) {
    return call.starts_with(from);
  });
  return Joined(first, calls.end());
}

Program BuiltTally(const Args& args) {
  Program program;
  program.path = TALLY_PROGRAM;
  program.args = {"tally"};
  program.args.insert(program.args.end(), args.begin(), args.end());
  program.environment = Environment();
  return program;
}

TallyRun TryTally(const Scenario& scenario, const Args& args, Program how) {
  const Program tally = BuiltTally(args);
  const MemoryFile script("trace " + Device(kTraceFile) + "\n" + scenario.Text());
  const MemoryFile trace;
  if (how.path.empty()) how.path = tally.path;
  how.args = tally.args;
  how.environment = tally.environment;
  how.environment.emplace_back("LD_LIBRARY_PATH=" TALLY_DOUBLE_DIRECTORY);
  how.environment.push_back(std::string(script::kScenarioVariable) + "=" + Device(kScenarioFile));
  how.files = {{kScenarioFile, script.Descriptor()}, {kTraceFile, trace.Descriptor()}};

  TallyRun run;
  Result result = RunProgram(how);
  run.status = result.status;
  run.out = std::move(result.out);
  run.err = std::move(result.err);
  Parse(trace.Content(), &run);
  return run;
}

TallyRun TryTally(const Scenario& scenario, const Args& args) {
  TallyRun run = TryTally(scenario, args, {});
  if (run.err != run.warnings) run.problems.push_back("not through Warning: " + run.err);
  return run;
}

TallyRun RunTally(const Scenario& scenario, const Args& args) {
  TallyRun run = TryTally(scenario, args);
  for (const std::string& problem : run.problems) {
    ADD_FAILURE() << "tally " << Joined(args.begin(), args.end()) << ": " << problem;
  }
  return run;
}

}  // namespace harness
