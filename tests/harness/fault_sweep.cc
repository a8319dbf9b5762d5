#include "tests/harness/fault_sweep.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <sstream>

#include "framework/return_status.h"
#include "tests/double/script.h"
#include "tests/harness/golden.h"

namespace harness {
namespace {

using Lines = std::vector<std::string>;

bool IsFallible(const std::string& call) {
  return !call.starts_with("UsedCount") && !call.starts_with("RemoveLast") &&
         !call.starts_with("Destroy");
}

Lines FallibleCalls(const TallyRun& run) {
  Lines calls;
  std::copy_if(run.calls.begin(), run.calls.end(), std::back_inserter(calls), IsFallible);
  return calls;
}

Lines SplitLines(const std::string& text) {
  Lines lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  return lines;
}

// The sweep is about which rows are there, not about how they are padded.
std::string Squeezed(const std::string& line) {
  std::string squeezed;
  for (const char c : line) {
    if (c != ' ' || (!squeezed.empty() && squeezed.back() != ' ')) squeezed += c;
  }
  if (squeezed.find_first_not_of('-') == std::string::npos)
    squeezed.resize(squeezed.empty() ? 0 : 1);
  return squeezed;
}

void ReplaceAll(std::string* text, const std::string& from, const std::string& to) {
  for (size_t at = 0; (at = text->find(from, at)) != std::string::npos; at += to.size()) {
    text->replace(at, from.size(), to);
  }
}

// `err` with the words for `status` taken out, so that two statuses can be compared.
std::string WithoutStatus(std::string err, uint32_t status) {
  ReplaceAll(&err, std::to_string(status), "<status>");
  ReplaceAll(&err, script::Status(status), "<status>");
  ReplaceAll(&err, std::string(": ") + KNV_ReturnStatusToString(status) + "\n", ": <message>\n");
  return err;
}

// "3-5,9" for lines 3, 4, 5 and 9.
std::string Ranges(const std::vector<size_t>& numbers) {
  std::string text;
  for (size_t i = 0; i < numbers.size();) {
    size_t last = i;
    while (last + 1 < numbers.size() && numbers[last + 1] == numbers[last] + 1) ++last;
    text += (text.empty() ? "" : ",") + std::to_string(numbers[i]);
    if (last > i) text += "-" + std::to_string(numbers[last]);
    i = last + 1;
  }
  return text;
}

// What `now` lacks of `before`, by line number, and what it has besides, from a longest common
// subsequence.
std::string Difference(const Lines& before, const Lines& now) {
  std::vector<std::vector<size_t>> common(before.size() + 1, std::vector<size_t>(now.size() + 1));
  for (size_t i = before.size(); i-- > 0;) {
    for (size_t j = now.size(); j-- > 0;) {
      common[i][j] = before[i] == now[j] ? common[i + 1][j + 1] + 1
                                         : std::max(common[i + 1][j], common[i][j + 1]);
    }
  }
  std::vector<size_t> lost;
  std::string added;
  size_t i = 0;
  size_t j = 0;
  while (i < before.size() || j < now.size()) {
    if (i < before.size() && j < now.size() && before[i] == now[j]) {
      ++i;
      ++j;
    } else if (j == now.size() || (i < before.size() && common[i + 1][j] >= common[i][j + 1])) {
      lost.push_back(++i);
    } else {
      added += "  new  " + Squeezed(now[j++]) + "\n";
    }
  }
  return (lost.empty() ? "" : "  lost " + Ranges(lost) + "\n") + added;
}

bool IsAllowed(const std::string& problem, const std::vector<std::string>& allowed) {
  return std::any_of(allowed.begin(), allowed.end(), [&problem](const std::string& beginning) {
    return problem.starts_with(beginning);
  });
}

// Runs with the `number`-th fallible call failing with `status` and tells how that ended.
std::string Outcome(const FaultSweep& sweep, const TallyRun& whole, int number,
                    const std::string& call, uint32_t status) {
  Scenario scenario = sweep.scenario;
  scenario.FailCall(number, status);
  const TallyRun run = TryTally(scenario, sweep.args);

  const std::string where = "call " + std::to_string(number) + " " + call;
  for (const std::string& problem : run.problems) {
    EXPECT_TRUE(IsAllowed(problem, sweep.allowedProblems)) << where << ": " << problem;
  }
  const Lines calls = FallibleCalls(run);
  const auto index = static_cast<size_t>(number - 1);
  EXPECT_TRUE(index < calls.size() && calls[index].starts_with(call + "="))
      << where << " was not made, or did not fail";

  std::string outcome = "  exit " + std::to_string(run.status) + "\n";
  for (const std::string& line : SplitLines(WithoutStatus(run.err, status))) {
    outcome += "  err  " + line + "\n";
  }
  outcome += Difference(SplitLines(whole.out), SplitLines(run.out));
  for (const std::string& problem : run.problems) outcome += "  " + problem + "\n";
  return outcome;
}

}  // namespace

void ExpectFaultSweep(const FaultSweep& sweep) {
  const TallyRun whole = RunTally(sweep.scenario, sweep.args);
  std::string text = "$ tally";
  for (const std::string& arg : sweep.args) text += " " + arg;
  text += "\n  exit " + std::to_string(whole.status) + "\n";
  size_t lineNumber = 0;
  for (const std::string& line : SplitLines(whole.out)) {
    text += "  " + std::to_string(++lineNumber) + "| " + Squeezed(line) + "\n";
  }

  const Lines calls = FallibleCalls(whole);
  for (size_t i = 0; i < calls.size(); ++i) {
    const std::string call = calls[i].substr(0, calls[i].find('='));
    const bool hasStatus = !call.starts_with("Create");
    // The ends that the statuses lead to, each with the statuses that lead there.
    std::vector<std::pair<std::string, std::string>> ends;
    for (const uint32_t status : sweep.statuses) {
      const std::string outcome = Outcome(sweep, whole, static_cast<int>(i + 1), call, status);
      const auto same = std::find_if(ends.begin(), ends.end(),
                                     [&outcome](const auto& end) { return end.first == outcome; });
      const std::string name = " " + std::to_string(status - 0xbad0000);
      if (same == ends.end()) {
        ends.emplace_back(outcome, name);
      } else {
        same->second += name;
      }
      if (!hasStatus) break;
    }
    for (const auto& [outcome, statuses] : ends) {
      text += std::to_string(i + 1) + " " + call;
      if (ends.size() > 1) text += ", status" + statuses;
      text += "\n" + outcome;
    }
  }
  ExpectGolden(sweep.golden, text);
}

}  // namespace harness
