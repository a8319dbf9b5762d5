#include "tools/ksicache/diff/text.h"

#include <gtest/gtest.h>

namespace ksicache {
namespace {

TEST(OnTheLeft, CountsCellsOfATerminal) {
  EXPECT_EQ(OnTheLeft("mail", 6), "mail  ");
  EXPECT_EQ(OnTheLeft("日本", 6), "日本  ");
  EXPECT_EQ(OnTheLeft("日本語日本語", 9), "日...本語");
  EXPECT_EQ(OnTheLeft("日本語日本語", 8), "日...語 ");
}

TEST(OnTheLeft, CutsNoEscape) {
  EXPECT_EQ(OnTheLeft("a\x1b[", 6), "a\\x1b[");
  EXPECT_EQ(OnTheLeft("ab\x1b-cdef", 8), "ab...def");
  EXPECT_EQ(OnTheLeft("a\x1b-cdefg", 8), "a...defg");
}

TEST(OnTheRight, LeavesASpace) {
  EXPECT_EQ(OnTheRight("12", 4), "  12");
  EXPECT_EQ(OnTheRight("1234", 4), " 1234");
}

TEST(NameText, HasTheNumberOfAProcess) {
  EXPECT_EQ(NameText("cc1plus", -1), "cc1plus");
  EXPECT_EQ(NameText("mail", 1050), "mail 1050");
  EXPECT_EQ(NameText("cc1plus", 1099511632285), "cc1plus 4509");
  EXPECT_EQ(NameText("", -1), "(no name)");
}

TEST(PartText, HasNoSignOfNothing) {
  EXPECT_EQ(PartText(0, -7), "0%");
  EXPECT_EQ(PartText(-1, 1000), "<1%");
  EXPECT_EQ(PartText(1, 1000), "<1%");
  EXPECT_EQ(PartText(-5, 100), "-5%");
  EXPECT_EQ(PartText(5, 0), "-");
}

TEST(DurationText, HasYears) {
  EXPECT_EQ(DurationText(90), "1m 30s");
  EXPECT_EQ(DurationText(400.0 * 86400), "1y 35d");
}

TEST(RateText, HasNoExponent) {
  EXPECT_EQ(RateText(2.5), "2.5");
  EXPECT_EQ(RateText(0.0125), "0.013");
  EXPECT_EQ(RateText(6.9e-5), "<0.001");
}

}  // namespace
}  // namespace ksicache
