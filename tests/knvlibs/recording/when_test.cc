#include "knvlibs/recording/when.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <optional>
#include <string>

#include "knvlibs/times.h"

namespace ksi {
namespace {

// A time of UTC; the last microsecond of the second.
int64_t EndOf(int year, int month, int day, int hour, int minute, int second = 0) {
  struct tm parts = {};
  parts.tm_year = year - 1900;
  parts.tm_mon = month - 1;
  parts.tm_mday = day;
  parts.tm_hour = hour;
  parts.tm_min = minute;
  parts.tm_sec = second;
  return int64_t{timegm(&parts)} * kSecond + kSecond - 1;
}

class WhenTest : public testing::Test {
 protected:
  WhenTest() { SetZone("Europe/Berlin"); }
  ~WhenTest() override { SetZone("UTC"); }

  static void SetZone(const char* zone) {
    // As a rule, for machines that know no zones by their names.
    const bool isBerlin = std::string(zone) == "Europe/Berlin";
    setenv("TZ", isBerlin ? "CET-1CEST,M3.5.0,M10.5.0/3" : zone, 1);
    tzset();
  }

  std::optional<int64_t> Of(const std::string& when) const { return TimeOf(when, span_); }

  // From 9:00 to 12:30 in Berlin.
  Span span_ = {EndOf(2026, 11, 20, 8, 0) - kSecond + 1, EndOf(2026, 11, 21, 11, 30) - kSecond + 1};
};

TEST_F(WhenTest, DatesAreLocalUnlessTheySayOtherwise) {
  EXPECT_EQ(Of("2026-11-21T10:05"), EndOf(2026, 11, 21, 9, 5));
  EXPECT_EQ(Of("2026-11-21T10:05:30"), EndOf(2026, 11, 21, 9, 5, 30));
  EXPECT_EQ(Of("2026-11-21T10:05Z"), EndOf(2026, 11, 21, 10, 5));
  EXPECT_EQ(Of("2026-11-21T10:05:30Z"), EndOf(2026, 11, 21, 10, 5, 30));
  EXPECT_EQ(Of("2024-02-29T00:00Z"), EndOf(2024, 2, 29, 0, 0));
  EXPECT_EQ(Of("1969-12-31T23:59:59Z"), -1);
}

TEST_F(WhenTest, DatesAreWrittenInSeveralWays) {
  for (const char* when : {"2026-11-21T10:05:30Z", "2026-11-21 10:05:30Z", "2026-11-21t10:05:30z",
                           "2026-11-21 10:05:30z"}) {
    EXPECT_EQ(Of(when), EndOf(2026, 11, 21, 10, 5, 30)) << when;
  }
  EXPECT_EQ(Of("2026-11-21 10:05"), EndOf(2026, 11, 21, 9, 5));
  EXPECT_EQ(Of("10:05z"), EndOf(2026, 11, 21, 10, 5));
}

TEST_F(WhenTest, ADateAloneIsItsBeginning) {
  EXPECT_EQ(Of("2026-11-21"), EndOf(2026, 11, 20, 23, 0));
  EXPECT_EQ(Of("2026-11-21Z"), EndOf(2026, 11, 21, 0, 0));
  EXPECT_EQ(Of("2026-11-21z"), EndOf(2026, 11, 21, 0, 0));
  EXPECT_EQ(Of("0000-01-01Z"), kFirstTime + kSecond - 1);
  EXPECT_EQ(Of("9999-12-31T23:59:59Z"), kLastTime);
}

// A zone whose clocks are put forward at midnight: that day begins with 1:00.
TEST_F(WhenTest, ADayWithoutAMidnightIsADay) {
  SetZone("XST0XDT,M3.2.0/0,M11.1.0/0");
  const std::optional<int64_t> day = Of("2026-03-08");
  ASSERT_TRUE(day);
  EXPECT_TRUE(*day == EndOf(2026, 3, 8, 0, 0) || *day == EndOf(2026, 3, 7, 23, 0)) << *day;
}

TEST_F(WhenTest, TimesOfDayAreTheLatestThatThereAre) {
  EXPECT_EQ(Of("10:05"), EndOf(2026, 11, 21, 9, 5));
  EXPECT_EQ(Of("12:30"), EndOf(2026, 11, 21, 11, 30));
  EXPECT_EQ(Of("12:31"), EndOf(2026, 11, 20, 11, 31));
  EXPECT_EQ(Of("23:59:59"), EndOf(2026, 11, 20, 22, 59, 59));
  EXPECT_EQ(Of("10:05Z"), EndOf(2026, 11, 21, 10, 5));
  EXPECT_EQ(Of("11:31Z"), EndOf(2026, 11, 20, 11, 31));
}

TEST_F(WhenTest, TimesBackAreThoseWithASign) {
  EXPECT_EQ(TimeBack("-10m"), 600 * kSecond);
  EXPECT_EQ(TimeBack("-0s"), 0);
  EXPECT_EQ(TimeBack("-9223372036854s"), kFarthest);
  for (const char* when : {"", "-", "10m", "-m", "last", "10:05", "2026-11-21", "--1m", "-1"}) {
    EXPECT_EQ(TimeBack(when), std::nullopt) << when;
  }
}

TEST_F(WhenTest, SpansAreBeforeTheLastMoment) {
  EXPECT_EQ(Of("first"), span_.first);
  EXPECT_EQ(Of("last"), span_.last);
  EXPECT_EQ(Of("-0s"), span_.last);
  EXPECT_EQ(Of("-90s"), span_.last - 90 * kSecond);
  EXPECT_EQ(Of("-10m"), span_.last - 600 * kSecond);
  EXPECT_EQ(Of("-2h"), span_.last - 7200 * kSecond);
  EXPECT_EQ(Of("-7d"), span_.last - 7 * 86400 * kSecond);
}

// The hour from 2 to 3 is left out in spring, and comes twice in autumn.
TEST_F(WhenTest, NightsInWhichClocksAreSet) {
  EXPECT_EQ(Of("2026-03-29T01:59"), EndOf(2026, 3, 29, 0, 59));
  EXPECT_EQ(Of("2026-03-29T03:00"), EndOf(2026, 3, 29, 1, 0));
  const std::optional<int64_t> left = Of("2026-03-29T02:30");
  ASSERT_TRUE(left);
  EXPECT_TRUE(*left == EndOf(2026, 3, 29, 1, 30) || *left == EndOf(2026, 3, 29, 0, 30));
  const std::optional<int64_t> twice = Of("2026-10-25T02:30");
  ASSERT_TRUE(twice);
  EXPECT_TRUE(*twice == EndOf(2026, 10, 25, 0, 30) || *twice == EndOf(2026, 10, 25, 1, 30));
  // The day before has one hour less, or more.
  span_.last = EndOf(2026, 3, 30, 8, 0);
  EXPECT_EQ(Of("23:00"), EndOf(2026, 3, 29, 21, 0));
  EXPECT_EQ(Of("01:00"), EndOf(2026, 3, 29, 23, 0));
  span_.last = EndOf(2026, 10, 26, 0, 30);
  EXPECT_EQ(Of("23:00"), EndOf(2026, 10, 25, 22, 0));
  span_.last = EndOf(2026, 10, 25, 22, 30);
  EXPECT_EQ(Of("23:45"), EndOf(2026, 10, 24, 21, 45));
}

TEST_F(WhenTest, OtherZonesHaveOtherDays) {
  SetZone("NZST-12");
  EXPECT_EQ(Of("00:30"), EndOf(2026, 11, 20, 12, 30));
  EXPECT_EQ(Of("2026-11-21T23:30"), EndOf(2026, 11, 21, 11, 30));
  SetZone("HST10");
  EXPECT_EQ(Of("23:00"), EndOf(2026, 11, 21, 9, 0));
}

TEST_F(WhenTest, WhatIsNoTimeIsNone) {
  for (const char* when : {"",
                           "now",
                           "First",
                           "10",
                           "10:5",
                           "1:05",
                           "24:00",
                           "10:60",
                           "10:05:60",
                           "10:05 ",
                           " 10:05",
                           "10:05:30.5",
                           "10:05zZ",
                           "2026-11-21T",
                           "2026-11-21 ",
                           "2026-11-21TZ",
                           "2026-11-21_10:05",
                           "2026-11-21  10:05",
                           "2026-11-2110:05",
                           "2026-11",
                           "2026-11-1",
                           "2026-02-29",
                           "10:05-1",
                           "-",
                           "-m",
                           "-5",
                           "-5w",
                           "--5m",
                           "- 5m",
                           "-5mm",
                           "-1.5h",
                           "+5m",
                           "5m",
                           "Z",
                           "T10:05",
                           "2026-02-29T10:05",
                           "2026-04-31T10:05",
                           "2026-13-01T10:05",
                           "2026-00-01T10:05",
                           "2026-01-00T10:05",
                           "2026-01-32T10:05",
                           "2026-11-21T25:00Z",
                           "-99999999999999999999s",
                           "-9223372036854775807d",
                           "-9223372036854775s\xff"}) {
    EXPECT_EQ(Of(when), std::nullopt) << when;
  }
}

// Moments of any file, which may tell any time that there is.
TEST_F(WhenTest, SpansOfNonsenseEndWithAnAnswer) {
  for (const int64_t last : {kFirstTime, int64_t{-1}, int64_t{0}, kLastTime}) {
    span_ = {kFirstTime, last};
    for (const char* when : {"10:05", "00:00", "23:59:59Z", "-1s", "-9223372036854s", "last"}) {
      EXPECT_TRUE(Of(when)) << when;
      EXPECT_LE(*Of(when), last + kSecond) << when;
    }
  }
}

}  // namespace
}  // namespace ksi
