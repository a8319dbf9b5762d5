#include "framework/display_unit.h"

#include <gtest/gtest.h>
#include <knvlibs/ksi_records.h>

#include <string>

namespace tally {
namespace {

struct Parsed {
  Status status;
  DisplayUnit unit;
  std::string warnings;
};

Parsed Parse(const char* text, bool allowBytes) {
  Parsed parsed{};
  testing::internal::CaptureStderr();
  parsed.status = ParseDisplayUnit(text, allowBytes, parsed.unit);
  parsed.warnings = testing::internal::GetCapturedStderr();
  return parsed;
}

TEST(ParseDisplayUnit, KnowsTheWordsInAnyCase) {
  const struct {
    const char* word;
    DisplayUnit unit;
  } words[] = {{"mb", DisplayUnit::mb},   {"MB", DisplayUnit::mb}, {"kb", DisplayUnit::kb},
               {"Kb", DisplayUnit::kb},   {"pg", DisplayUnit::pg}, {"pG", DisplayUnit::pg},
               {nullptr, DisplayUnit::kb}};
  for (const auto& [word, unit] : words) {
    for (const bool allowBytes : {false, true}) {
      const Parsed parsed = Parse(word, allowBytes);
      EXPECT_EQ(parsed.status, 0U);
      EXPECT_EQ(parsed.unit, unit);
      EXPECT_EQ(parsed.warnings, "");
    }
  }
}

TEST(ParseDisplayUnit, KnowsBytesWhereTheyAreAllowed) {
  EXPECT_EQ(Parse("b", true).unit, DisplayUnit::b);
  EXPECT_EQ(Parse("B", true).status, 0U);
  const Parsed refused = Parse("b", false);
  EXPECT_EQ(refused.status, 0xbad0007U);
  EXPECT_EQ(refused.warnings, "Invalid unit specified. Choose from {mb, kb, pg}\n");
}

TEST(ParseDisplayUnit, RefusesOtherWords) {
  for (const char* word : {"", "m", "mbs", "gb", " kb"}) {
    EXPECT_EQ(Parse(word, false).status, 0xbad0007U) << word;
    const Parsed refused = Parse(word, true);
    EXPECT_EQ(refused.status, 0xbad0007U) << word;
    EXPECT_EQ(refused.warnings, "Invalid unit specified. Choose from {mb, kb, pg, b}\n");
  }
}

TEST(DisplayUnit, HasTheCodesOfTheInterface) {
  EXPECT_EQ(static_cast<int>(DisplayUnit::mb), 3);
  EXPECT_EQ(static_cast<int>(DisplayUnit::kb), 4);
  EXPECT_EQ(static_cast<int>(DisplayUnit::pg), 5);
  EXPECT_EQ(static_cast<int>(DisplayUnit::b), 6);
}

TEST(UnitTitle, NamesTheUnit) {
  EXPECT_STREQ(UnitTitle(DisplayUnit::mb), "MB");
  EXPECT_STREQ(UnitTitle(DisplayUnit::kb), "KB");
  EXPECT_STREQ(UnitTitle(DisplayUnit::pg), "Page (4K)");
}

TEST(FromKilobytes, DropsFractions) {
  EXPECT_EQ(FromKilobytes(1023, DisplayUnit::mb), 0U);
  EXPECT_EQ(FromKilobytes(1024, DisplayUnit::mb), 1U);
  EXPECT_EQ(FromKilobytes(7, DisplayUnit::pg), 1U);
  EXPECT_EQ(FromKilobytes(3, DisplayUnit::pg), 0U);
  EXPECT_EQ(FromKilobytes(7, DisplayUnit::kb), 7U);
  EXPECT_EQ(FromKilobytes(7, DisplayUnit::b), 7168U);
}

TEST(FromKilobytes, ShiftsWithoutASign) {
  EXPECT_EQ(FromKilobytes(UINT64_MAX - 1, DisplayUnit::mb), UINT64_MAX >> 10);
  EXPECT_EQ(FromKilobytes(UINT64_MAX - 1, DisplayUnit::b), UINT64_MAX << 11);
}

TEST(FromKilobytes, KeepsNoValueInEveryUnit) {
  for (const DisplayUnit unit :
       {DisplayUnit::mb, DisplayUnit::kb, DisplayUnit::pg, DisplayUnit::b}) {
    EXPECT_EQ(FromKilobytes(KSI_NO_VALUE, unit), UINT64_MAX);
  }
}

TEST(FromKilobytes, IsZeroInAnUnknownUnit) {
  EXPECT_EQ(FromKilobytes(1 << 20, static_cast<DisplayUnit>(2)), 0U);
  EXPECT_EQ(FromKilobytes(1 << 20, static_cast<DisplayUnit>(7)), 0U);
}

}  // namespace
}  // namespace tally
