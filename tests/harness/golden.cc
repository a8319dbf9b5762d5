#include "tests/harness/golden.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <sstream>

namespace harness {
namespace {

bool updating = false;

std::string Section(const std::string& title, const std::string& text) {
  if (text.empty()) return "";
  return "--- " + title + "\n" + text + (text.ends_with('\n') ? "" : "\n--- no newline\n");
}

}  // namespace

void UpdateGolden(bool update) { updating = update; }

void ExpectGolden(const std::string& name, const std::string& text) {
  const std::filesystem::path path = std::filesystem::path(TALLY_TESTS_DIRECTORY) / name;
  if (updating) {
    std::filesystem::create_directories(path.parent_path());
    std::ofstream(path) << text;
    return;
  }
  std::ifstream file(path);
  ASSERT_TRUE(file) << "no golden file " << path << "; --update-golden writes it";
  std::ostringstream expected;
  expected << file.rdbuf();
  EXPECT_EQ(text, expected.str()) << "in " << path;
}

TallyRun ExpectTallyGolden(const std::string& name, const Scenario& scenario, const Args& args) {
  TallyRun run = RunTally(scenario, args);
  std::string text = "$ tally";
  for (const std::string& arg : args) text += " " + arg;
  text += "\n--- exit " + std::to_string(run.status) + "\n" + Section("out", run.out) +
          Section("err", run.err);
  ExpectGolden(name, text);
  return run;
}

}  // namespace harness
