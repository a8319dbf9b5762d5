// Moments leave when they are too old by time that passed, whatever the clock says meanwhile.
#include "tools/ksicache/retention.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>

#include "knvlibs/times.h"

namespace ksicache {
namespace {

using ksi::kDay;
using ksi::kHour;
using ksi::kMinute;

class RetentionTest : public testing::Test {
 protected:
  // Chunks of a minute for so long, from this uptime on, by a clock that is ahead by `wrong`.
  void Run(const std::string& boot, int64_t from, int64_t length, int64_t start,
           int64_t wrong = 0) {
    for (int64_t at = 0; at < length; at += kMinute) {
      retention_.Add(next_++, {boot, from + at, start + at + wrong});
      first_ = retention_.FirstKept(first_);
    }
  }

  static constexpr int64_t kStart = 20'000 * kDay;

  Retention retention_{10 * kHour};
  int64_t next_ = 0;  // the number of the next chunk
  int64_t first_ = 0;
};

TEST_F(RetentionTest, WithinARunOfTheHostItsUptimeTells) {
  Run("a", kMinute, 9 * kHour, kStart);
  EXPECT_EQ(first_, 0);
  Run("a", kMinute + 9 * kHour, 4 * kMinute, kStart + 9 * kHour, 30 * kDay);
  EXPECT_EQ(first_, 0);
  EXPECT_FALSE(retention_.HoldsBack());
  Run("a", kMinute + 9 * kHour + 4 * kMinute, 3 * kHour, kStart + 9 * kHour + 4 * kMinute);
  EXPECT_EQ(first_, 2 * 60 + 4 - 1);
}

TEST_F(RetentionTest, AnEarlierRunIsAsOldAsTheClockSaysOnceItIsTrusted) {
  Run("a", kMinute, kHour, kStart);
  Run("b", kMinute, 1, kStart + 20 * kHour);
  EXPECT_EQ(first_, 0);
  EXPECT_TRUE(retention_.HoldsBack());
  Run("b", 2 * kMinute, kHour, kStart + 20 * kHour + kMinute);
  EXPECT_EQ(first_, 60);
  EXPECT_FALSE(retention_.HoldsBack());
}

TEST_F(RetentionTest, AClockThatWasWrongForAWhileRemovesNothing) {
  Run("a", kMinute, kHour, kStart);
  Run("b", kMinute, kHour, kStart + kHour);
  Run("b", kMinute + kHour, 30 * kMinute, kStart + 2 * kHour, 30 * kDay);
  EXPECT_EQ(first_, 0);
  EXPECT_TRUE(retention_.HoldsBack());
  // Set right, it has to prove that anew.
  Run("b", kMinute + 90 * kMinute, 8 * kHour, kStart + 150 * kMinute);
  EXPECT_EQ(first_, 30 - 1);
}

// What its run had last is the offset of all of it.
TEST_F(RetentionTest, AClockThatWasSetRightLaterCountsAsItWasLast) {
  Run("a", kMinute, kHour, kStart, -400 * kDay);
  Run("a", kMinute + kHour, kHour, kStart + kHour);
  Run("b", kMinute, 3 * kHour, kStart + 2 * kHour);
  EXPECT_EQ(first_, 0);
}

TEST_F(RetentionTest, WhatSeemsToComeIsAsOldAsWhatPassedSince) {
  Run("a", kMinute, kHour, kStart, 30 * kDay);
  Run("b", kMinute, 9 * kHour, kStart + kHour);
  EXPECT_EQ(first_, 0);
  Run("c", kMinute, 3 * kHour, kStart + 10 * kHour);
  EXPECT_EQ(first_, 60 + 119);
}

TEST_F(RetentionTest, WithoutAnUptimeTheClockTells) {
  retention_.Add(0, {"", 0, kStart});
  retention_.Add(1, {"", 0, kStart + 3 * kHour});
  next_ = 2;
  Run("b", kMinute, 2 * kHour, kStart + 10 * kHour);
  EXPECT_EQ(first_, 1);
}

TEST_F(RetentionTest, TheLastChunkStays) {
  Run("a", kMinute, 1, kStart);
  EXPECT_EQ(retention_.FirstKept(0), 0);
  retention_.Add(0, {"a", 20 * kHour, kStart + 20 * kHour});
  EXPECT_EQ(retention_.FirstKept(0), 0);
}

TEST_F(RetentionTest, WhatLeftForAnotherReasonIsForgotten) {
  Run("a", kMinute, 10 * kMinute, kStart);
  EXPECT_EQ(retention_.FirstKept(7), 7);
}

TEST_F(RetentionTest, TakesAnyNumbers) {
  constexpr int64_t kLeast = std::numeric_limits<int64_t>::min();
  constexpr int64_t kMost = std::numeric_limits<int64_t>::max();
  Retention retention(kMost);
  int64_t number = 0;
  for (const int64_t uptime : {kLeast, int64_t{0}, kMost}) {
    for (const int64_t taken : {kLeast, kMost, kLeast}) {
      retention.Add(number++, {"a", uptime, taken});
      EXPECT_EQ(retention.FirstKept(0), 0);
    }
  }
}

}  // namespace
}  // namespace ksicache
