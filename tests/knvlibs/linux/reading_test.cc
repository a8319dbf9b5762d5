// When what was read of a host answers, and when it is read again.
#include <gtest/gtest.h>

#include <chrono>
#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/linux_source.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

// Time stands still unless a test moves it.
LinuxHost::TimePoint now;

// The source of a host with one buddy; its count of free buffers tells which reading answers.
class ReadingTest : public testing::Test {
 protected:
  ReadingTest() : source_(tree_.Root(), [] { return now; }) {
    tree_.Write("/proc/zoneinfo",
                "Node 0, zone Normal\n  pages free 1\n min 1\n low 1\n high 1\n present 99\n"
                " managed 99\n protection: (0, 0)\n");
    WriteBuffers(1);
  }

  void WriteBuffers(uint32_t count) {
    tree_.Write("/proc/buddyinfo", "Node 0, zone Normal " + std::to_string(count) + "\n");
  }

  // The first question of each test.
  uint32_t Buffers() {
    KSI_BuddyStats stats = {};
    EXPECT_EQ(GetValue(source_, "system/buddy/comprehensive", {"memmap-00-hi"}, &stats), kOk);
    return stats.buffers[0].free;
  }

  // Any other question; an answer that fails is one, too.
  void AskElse() {
    KSI_BuddyStats stats = {};
    EXPECT_EQ(GetValue(source_, "system/buddy/comprehensive", {"none"}, &stats),
              KSI_STATUS_NOT_FOUND);
  }

  HostTree tree_;
  LinuxSource source_;
};

TEST_F(ReadingTest, AnswersForASecond) {
  EXPECT_EQ(Buffers(), 1u);
  WriteBuffers(2);
  now += seconds(1);
  EXPECT_EQ(Buffers(), 1u);
}

TEST_F(ReadingTest, EndsWhenNobodyHasAskedForMoreThanASecond) {
  EXPECT_EQ(Buffers(), 1u);
  WriteBuffers(2);
  now += milliseconds(1001);
  AskElse();
  EXPECT_EQ(Buffers(), 2u);
}

TEST_F(ReadingTest, EndsWhenItsFirstQuestionComesAgainLater) {
  EXPECT_EQ(Buffers(), 1u);
  WriteBuffers(2);
  now += milliseconds(900);
  AskElse();
  now += milliseconds(101);
  EXPECT_EQ(Buffers(), 2u);
}

TEST_F(ReadingTest, AnotherKeyIsAnotherQuestion) {
  AskElse();
  EXPECT_EQ(Buffers(), 1u);
  WriteBuffers(2);
  for (int i = 0; i < 4; ++i) {
    now += milliseconds(900);
    EXPECT_EQ(Buffers(), 1u);
  }
}

TEST_F(ReadingTest, LastsThroughALongReportButNoLongerThanAMinute) {
  EXPECT_EQ(Buffers(), 1u);
  WriteBuffers(2);
  for (int i = 0; i < 60; ++i) {
    now += seconds(1);
    AskElse();
  }
  std::vector<std::string> names;
  ASSERT_EQ(GetNames(source_, "system/buddy", {}, &names), kOk);
  WriteBuffers(3);
  now += milliseconds(1);
  AskElse();
  EXPECT_EQ(Buffers(), 3u) << "neither the first reading nor what changed during it";
}

TEST_F(ReadingTest, EndsAtOnceWhenItIsToldTo) {
  EXPECT_EQ(Buffers(), 1u);
  WriteBuffers(2);
  source_.Refresh();
  EXPECT_EQ(Buffers(), 2u);
}

TEST_F(ReadingTest, ReadsAgainWhatFailed) {
  tree_.Write("/proc/buddyinfo", "");
  KSI_BuddyStats stats = {};
  testing::internal::CaptureStderr();
  EXPECT_EQ(GetValue(source_, "system/buddy/comprehensive", {"memmap-00-hi"}, &stats),
            KSI_STATUS_INVALID_METADATA);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "/proc/buddyinfo: line 1 is not understood\n");
  WriteBuffers(4);
  EXPECT_EQ(Buffers(), 4u);
}

TEST_F(ReadingTest, TellsOnceInEach) {
  const auto diagnostics = [&] {
    testing::internal::CaptureStderr();
    for (int i = 0; i < 2; ++i) {
      EXPECT_EQ(GetIds(source_, "sched/groups/members/groups", {int64_t{0}}).size(), 1u);
    }
    return testing::internal::GetCapturedStderr();
  };
  tree_.Write("/proc/201/status", "Name:\tx\nVmSize:\tmuch\n");
  tree_.Write("/proc/202/status", "Name:\tx\nVmSize:\tmuch\n");
  const std::string once = "/proc/201/status: line 2 is not understood\n";
  EXPECT_EQ(diagnostics(), once);
  EXPECT_EQ(diagnostics(), "") << "the same reading";
  source_.Refresh();
  EXPECT_EQ(diagnostics(), once);
}

TEST_F(ReadingTest, CountsFromTheEndOfAnAnswer) {
  LinuxSource source(tree_.Root(), [] {
    static int looks = 0;
    // The first answer takes ten seconds, all others no time.
    if (++looks == 2) now += seconds(10);
    return now;
  });
  KSI_BuddyStats stats = {};
  ASSERT_EQ(GetValue(source, "system/buddy/comprehensive", {"memmap-00-hi"}, &stats), kOk);
  WriteBuffers(2);
  ASSERT_EQ(GetValue(source, "system/buddy/comprehensive", {"memmap-00-hi"}, &stats), kOk);
  EXPECT_EQ(uint32_t{stats.buffers[0].free}, 1u);
}

}  // namespace
}  // namespace ksi
