#include "framework/flag_filter.h"

#include <gtest/gtest.h>

#include <string>

namespace tally {
namespace {

struct Parsed {
  Status status;
  uint32_t mask;
  std::string warnings;
};

Parsed Parse(const char* text, const FlagName* table, bool isExclusion) {
  Parsed parsed{0, 0x5a5a5a5a, ""};
  testing::internal::CaptureStderr();
  parsed.status = ParseFlagFilter(text, table, parsed.mask, isExclusion);
  parsed.warnings = testing::internal::GetCapturedStderr();
  return parsed;
}

uint32_t Mask(const char* text) {
  const Parsed parsed = Parse(text, groupFlagNames, false);
  EXPECT_EQ(parsed.status, 0U);
  EXPECT_EQ(parsed.warnings, "");
  return parsed.mask;
}

std::string Names(uint32_t mask, const FlagName* table) {
  return std::string(FormatFlagMask(mask, table).text());
}

TEST(ParseFlagFilter, TakesEverythingWhenNothingIsGiven) {
  EXPECT_EQ(Parse(nullptr, groupFlagNames, false).mask, 0xffffffffU);
  EXPECT_EQ(Parse(nullptr, groupFlagNames, true).mask, 0U);
}

TEST(ParseFlagFilter, KnowsEveryFlagInAnyCase) {
  EXPECT_EQ(Mask("VM:uw"), 0xcU);
  EXPECT_EQ(Mask("pre:lf:vm:uw:sys:tw:pr:sd:np:ke:ug:co:sc:vmm:usr"), 0x7fffU);
  EXPECT_EQ(Mask("pre"), 0x1U);
  EXPECT_EQ(Mask("ke"), 0x200U);
  EXPECT_EQ(Mask("USR"), 0x4000U);
  EXPECT_EQ(Parse("vm", uwTypeNames, false).mask, 0x4U);
  EXPECT_EQ(Parse("uw", uwTypeNames, false).mask, 0x8U);
}

TEST(ParseFlagFilter, TakesNothingFromNoWords) {
  EXPECT_EQ(Mask(""), 0U);
  EXPECT_EQ(Mask(":::"), 0U);
  EXPECT_EQ(Mask(":vm::uw:"), 0xcU);
}

TEST(ParseFlagFilter, RefusesUnknownWords) {
  const Parsed refused = Parse("vm:bogus:uw", groupFlagNames, false);
  EXPECT_EQ(refused.status, 0xbad0007U);
  EXPECT_EQ(refused.mask, 0U);
  EXPECT_EQ(refused.warnings, "Invalid flag (bogus) in filter\n");
  EXPECT_EQ(Parse("sys", uwTypeNames, true).warnings, "Invalid flag (sys) in filter\n");
}

TEST(FormatFlagMask, NamesFlagsInTableOrder) {
  EXPECT_EQ(Names(0x4001, groupFlagNames), "pre:usr");
  EXPECT_EQ(Names(0xc, uwTypeNames), "(all)");
  EXPECT_EQ(Names(0x8, uwTypeNames), "uw");
  EXPECT_EQ(Names(0xffffffff, groupFlagNames), "(all)");
  EXPECT_EQ(Names(0x7fff, groupFlagNames), "(all)");
  EXPECT_EQ(Names(0x3fff, groupFlagNames), "pre:lf:vm:uw:sys:tw:pr:sd:np:ke:ug:co:sc:vmm");
  EXPECT_EQ(Names(0, groupFlagNames), "(none)");
  EXPECT_EQ(Names(0x8000, groupFlagNames), "(none)");
}

TEST(FlagFilter, PassesWhatIsIncludedAndNotExcluded) {
  EXPECT_FALSE((FlagFilter{0xffffffff, 0}.Passes(0)));
  EXPECT_TRUE((FlagFilter{0xffffffff, 0}.Passes(1)));
  EXPECT_FALSE((FlagFilter{0, 0}.Passes(0xffffffff)));
  EXPECT_FALSE((FlagFilter{0xffffffff, 4}.Passes(0x6)));
  EXPECT_TRUE((FlagFilter{2, 4}.Passes(0x3)));
}

}  // namespace
}  // namespace tally
