#include "framework/report_options.h"

#include <getopt.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace tally {
namespace {

constexpr ReportFrame kEverything = {
    .title = "EVERYTHING", .ruleLength = 1, .options = "e:g:i:l:s:u:vqt"};

// What a report is told by a command line, and what was said to the user.
struct Parsed {
  ReportOptions options;
  Status status;
  std::string warnings;
};

// The texts of the options are those of the static `line`.
Parsed Parse(const ReportFrame& frame, const std::vector<const char*>& args) {
  static std::vector<std::string> line;
  line = {"tally"};
  line.insert(line.end(), args.begin(), args.end());
  std::vector<char*> argv;
  for (std::string& word : line) argv.push_back(word.data());
  argv.push_back(nullptr);
  optind = 0;  // a new scan
  opterr = 0;
  Parsed parsed;
  testing::internal::CaptureStderr();
  parsed.status =
      ParseReportOptions(frame, static_cast<int>(line.size()), argv.data(), parsed.options);
  parsed.warnings = testing::internal::GetCapturedStderr();
  return parsed;
}

TEST(ReportOptions, HaveDefaults) {
  const Parsed parsed = Parse(kEverything, {});
  EXPECT_EQ(parsed.status, kSuccess);
  EXPECT_EQ(parsed.options.startGid, 0);
  EXPECT_EQ(parsed.options.levels, 12U);
  EXPECT_EQ(parsed.options.unitText, nullptr);
  EXPECT_EQ(parsed.options.inclusionText, nullptr);
  EXPECT_EQ(parsed.options.exclusionText, nullptr);
  EXPECT_EQ(parsed.options.columnMask, nullptr);
  EXPECT_FALSE(parsed.options.verbose || parsed.options.csvMode || parsed.options.tags);
}

TEST(ReportOptions, AreReadInBothForms) {
  const std::vector<std::vector<const char*>> lines = {
      {"-g", "-4", "-l", "3", "-u", "mb", "-i", "vm", "-e", "uw", "-s", "name", "-v", "-q", "-t"},
      {"--gid", "-4", "--level", "3", "--unit", "mb", "--iFilter", "vm", "--eFilter", "uw",
       "--cSelect", "name", "--verbose", "--csvMode", "--tags"},
  };
  for (const std::vector<const char*>& line : lines) {
    const Parsed parsed = Parse(kEverything, line);
    EXPECT_EQ(parsed.status, kSuccess);
    EXPECT_EQ(parsed.options.startGid, -4);
    EXPECT_EQ(parsed.options.levels, 3U);
    EXPECT_STREQ(parsed.options.unitText, "mb");
    EXPECT_STREQ(parsed.options.inclusionText, "vm");
    EXPECT_STREQ(parsed.options.exclusionText, "uw");
    EXPECT_STREQ(parsed.options.columnMask, "name");
    EXPECT_TRUE(parsed.options.verbose && parsed.options.csvMode && parsed.options.tags);
    EXPECT_EQ(parsed.warnings, "");
  }
}

TEST(ReportOptions, OfOtherReportsArePassedOver) {
  constexpr ReportFrame kFew = {.title = "FEW", .ruleLength = 1, .options = "s:vq"};
  const Parsed parsed = Parse(kFew, {"-t", "-g", "-z", "--tags", "--bogus", "-q", "-s"});
  EXPECT_EQ(parsed.status, kSuccess);
  EXPECT_FALSE(parsed.options.tags);
  EXPECT_TRUE(parsed.options.csvMode);
  EXPECT_EQ(parsed.options.columnMask, nullptr);
}

TEST(ReportOptions, RefuseNoLevel) {
  for (const char* level : {"0", "none", ""}) {
    const Parsed parsed = Parse(kEverything, {"-l", level});
    EXPECT_EQ(parsed.status, kBadParameter);
    EXPECT_EQ(parsed.warnings, std::string("Invalid level ") + level + ", must be > 0\n");
  }
}

TEST(ReportOptions, KeepToTheDeepestLevel) {
  EXPECT_EQ(Parse(kEverything, {"-l", "12"}).warnings, "");
  for (const char* level : {"13", "-1"}) {
    const Parsed parsed = Parse(kEverything, {"-l", level});
    EXPECT_EQ(parsed.status, kSuccess);
    EXPECT_EQ(parsed.options.levels, 12U);
    EXPECT_EQ(parsed.warnings,
              std::string("Specified level ") + level + " too high, reseting to 12\n");
  }
}

TEST(ReportOptions, LeaveLevelsBelowZeroToWhoComparesSigned) {
  constexpr ReportFrame kSigned = {.title = "SIGNED",
                                   .ruleLength = 1,
                                   .options = "l:",
                                   .defaultLevels = 1,
                                   .levelCheck = LevelCheck::asSigned};
  EXPECT_EQ(Parse(kSigned, {}).options.levels, 1U);
  EXPECT_EQ(Parse(kSigned, {"-l", "-5"}).options.levels, static_cast<uint32_t>(-5));
  EXPECT_EQ(Parse(kSigned, {"-l", "13"}).options.levels, 12U);
}

TEST(ReportOptions, TakeVerboseForWhatTheFrameSays) {
  constexpr ReportFrame kOther = {
      .title = "OTHER", .ruleLength = 1, .options = "u:v", .longVerbose = 'u'};
  const Parsed parsed = Parse(kOther, {"-u", "kb", "--verbose"});
  EXPECT_FALSE(parsed.options.verbose);
  EXPECT_EQ(parsed.options.unitText, nullptr);
  EXPECT_TRUE(Parse(kOther, {"-v"}).options.verbose);
}

}  // namespace
}  // namespace tally
