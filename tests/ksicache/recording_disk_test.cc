// A disk that is full, and becomes roomy again, while a recorder runs.
#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <memory>
#include <regex>
#include <string>

#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/recording_fixture.h"

#ifdef KSICACHE_SET_CLOCK
namespace ksi {
namespace {

class RecordingDisk : public RecordingTest {
 protected:
  void SetUp() override {
    std::filesystem::create_directory(disk_);
    const pid_t child = fork();
    if (child == 0) _exit(MountDisk() ? 0 : 1);
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    if (status != 0) GTEST_SKIP() << "this user may mount no disk";
  }

  // A disk of 1 MB; only this process and those it starts see it.
  bool MountDisk() const {
    return unshare(CLONE_NEWNS) == 0 &&
           mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
           mount("tmpfs", disk_.c_str(), "tmpfs", 0, "size=1m") == 0;
  }

  // A recorder that does not wait for the clock, with what it says in files elsewhere.
  pid_t Start(const char* every = "1s") const {
    const pid_t child = fork();
    if (child != 0) return child;
    dup2(open(Path("out").c_str(), O_WRONLY | O_CREAT, 0600), STDOUT_FILENO);
    dup2(open(Path("err").c_str(), O_WRONLY | O_CREAT, 0600), STDERR_FILENO);
    setenv("LD_PRELOAD", KSICACHE_SET_CLOCK, 1);
    setenv("SET_CLOCK", "1795255200", 1);
    execl(KSICACHE_PROGRAM, "ksicache", "record", "--every", every, "--root",
          RecordedHost("systemd-server").c_str(), file_.c_str(), nullptr);
    _exit(127);
  }

  static bool WaitFor(const std::function<bool()>& isSo) {
    for (int i = 0; i < 30'000; ++i) {
      if (isSo()) return true;
      usleep(1000);
    }
    return false;
  }

  bool HasSaid(const std::string& text) const {
    return FileContent(Path("err")).find(text) != std::string::npos;
  }

  bool IsThere() const { return FileContent(Path("out")).find("recording ") != std::string::npos; }

  // Takes all room that there is.
  void FillDisk() const {
    const int file = open((disk_ + "/other").c_str(), O_WRONLY | O_CREAT, 0600);
    const std::string piece(4096, 'x');
    while (write(file, piece.data(), piece.size()) > 0) continue;
    close(file);
  }

  // Expects the one to have all moments of the other.
  static void ExpectHasAllOf(RecordingFile& all, RecordingFile& some) {
    ASSERT_EQ(some.Parts().front().number, 0);
    ChunkReader ofSome;
    ChunkReader ofAll;
    for (int64_t number = 0; number < some.Parts().back().End(); ++number) {
      Moment wanted;
      Moment moment;
      ASSERT_EQ(some.ReadWhole(number, ofSome, wanted, number - 1), kOk) << some.Why();
      ASSERT_EQ(all.ReadWhole(number, ofAll, moment, number - 1), kOk) << all.Why();
      ASSERT_EQ(moment.facts, wanted.facts) << number;
      ASSERT_EQ(moment.readings, wanted.readings) << number;
    }
  }

  // Ends a recorder that has dropped moments.
  static void Stop(pid_t recorder) {
    kill(recorder, SIGTERM);
    int status = 0;
    ASSERT_EQ(waitpid(recorder, &status, 0), recorder);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1) << status;
  }

  void RecordWhileTheDiskFills() const {
    const pid_t recorder = Start();
    const bool began = WaitFor([this] { return IsThere(); });
    FillDisk();
    const bool stopped = WaitFor([this] { return HasSaid("moments are dropped"); });
    // It goes on trying, and says no more.
    usleep(100'000);
    std::filesystem::copy_file(file_, Path("copy.ksi"));
    std::filesystem::remove(disk_ + "/other");
    const bool wentOn = WaitFor([this] { return HasSaid("is recorded again"); });
    usleep(100'000);
    Stop(recorder);
    ASSERT_TRUE(began && stopped && wentOn) << FileContent(Path("err"));
  }

  const std::string disk_ = Path("disk");
  const std::string file_ = Path("disk/r.ksi");
};

TEST_F(RecordingDisk, AFullOneIsToldOnceAndHarmsNothing) {
  ExpectBounded([this] {
    ASSERT_TRUE(MountDisk());
    ASSERT_NO_FATAL_FAILURE(RecordWhileTheDiskFills());
    std::smatch dropped;
    const std::string said = FileContent(Path("err"));
    ASSERT_TRUE(std::regex_match(
        said, dropped,
        std::regex("ksicache: " + file_ + ": No space left on device\n" + "ksicache: " + file_ +
                   ": moments are dropped until that is over\n" + "ksicache: " + file_ +
                   ": is recorded again; ([0-9]+) moments were dropped\n")))
        << said;
    EXPECT_EQ(Output({"check", Path("copy.ksi")}), "");
    EXPECT_EQ(Output({"check", file_}), "");
    // The first moment after the trouble tells what is missing.
    const std::string moments = Output({"moments", file_});
    EXPECT_NE(moments.find(dropped[1].str() + " skipped"), std::string::npos) << moments;
    ExpectHasAllOf(*OpenFile(file_), *OpenFile(Path("copy.ksi")));
  });
}

// Where a file cannot grow as it likes to, it grows by what is needed; and the account of an hour
// tells what was dropped.
TEST_F(RecordingDisk, TheLastRoomIsForMoments) {
  ExpectBounded([this] {
    ASSERT_TRUE(MountDisk());
    const pid_t recorder = Start("1m");
    const bool began = WaitFor([this] { return IsThere(); });
    WriteContent(disk_ + "/some", std::string(40960, 'x'));
    FillDisk();
    const std::regex account(", [1-9][0-9]* dropped; each took ");
    const bool stopped =
        WaitFor([&] { return std::regex_search(FileContent(Path("out")), account); });
    std::filesystem::remove(disk_ + "/some");
    const bool wentOn = WaitFor([this] { return HasSaid("is recorded again"); });
    Stop(recorder);
    EXPECT_TRUE(began && stopped && wentOn) << FileContent(Path("err"));
  });
}

}  // namespace
}  // namespace ksi
#endif
