// What work that takes long shows on a terminal.
#include "tools/ksicache/progress.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <stdlib.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <string>

namespace ksicache {
namespace {

using std::chrono::milliseconds;

Progress::Clock::time_point now;

// A terminal in place of standard error.
class ProgressTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_GE(screen_, 0) << "is /dev/pts mounted?";
    ASSERT_EQ(grantpt(screen_), 0);
    ASSERT_EQ(unlockpt(screen_), 0);
    const int terminal = open(ptsname(screen_), O_RDWR | O_NOCTTY | O_CLOEXEC);
    ASSERT_GE(terminal, 0);
    ASSERT_EQ(dup2(terminal, STDERR_FILENO), STDERR_FILENO);
    close(terminal);
  }
  ~ProgressTest() override {
    dup2(before_, STDERR_FILENO);
    close(before_);
    close(screen_);
  }

  // What has been shown since the last time.
  std::string Shown() const {
    std::string shown;
    pollfd wait = {screen_, POLLIN, 0};
    while (poll(&wait, 1, 0) == 1) {
      std::array<char, 1024> part;
      const ssize_t count = read(screen_, part.data(), part.size());
      if (count <= 0) break;
      shown.append(part.data(), static_cast<size_t>(count));
    }
    return shown;
  }

  int screen_ = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
  int before_ = dup(STDERR_FILENO);
};

TEST_F(ProgressTest, IsShownAfterASecondTenTimesASecondAndTakenAway) {
  {
    Progress progress("reading", [] { return now; });
    now += milliseconds(999);
    progress.Show(10, 40);
    EXPECT_EQ(Shown(), "");
    now += milliseconds(1);
    progress.Show(0, 0);
    EXPECT_EQ(Shown(), "");
    progress.Show(10, 40);
    EXPECT_EQ(Shown(), "\rreading [#######.......................] 10 of 40\x1b[K");
    now += milliseconds(99);
    progress.Show(20, 40);
    EXPECT_EQ(Shown(), "");
    now += milliseconds(1);
    progress.Show(40, 40);
    EXPECT_EQ(Shown(), "\rreading [##############################] 40 of 40\x1b[K");
  }
  EXPECT_EQ(Shown(), "\r\x1b[K");
}

TEST_F(ProgressTest, IsNothingOfWhatIsQuick) {
  {
    Progress("reading", [] { return now; }).Show(1, 2);
  }
  EXPECT_EQ(Shown(), "");
}

TEST_F(ProgressTest, IsForTerminalsAlone) {
  std::array<int, 2> pipe = {};
  ASSERT_EQ(pipe2(pipe.data(), O_CLOEXEC | O_NONBLOCK), 0);
  ASSERT_EQ(dup2(pipe[1], STDERR_FILENO), STDERR_FILENO);
  {
    Progress progress("reading", [] { return now; });
    now += milliseconds(1000);
    progress.Show(1, 2);
  }
  char byte = 0;
  EXPECT_EQ(read(pipe[0], &byte, 1), -1);
  close(pipe[0]);
  close(pipe[1]);
}

}  // namespace
}  // namespace ksicache
