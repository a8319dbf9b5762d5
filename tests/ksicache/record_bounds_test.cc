// `ksicache record` by a clock that the test sets: which moments it takes, and which it removes.
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <regex>
#include <string>
#include <vector>

#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/recording_fixture.h"

#ifdef KSICACHE_SET_CLOCK
namespace ksi {
namespace {

class RecordBounds : public RecordingTest {
 protected:
  static constexpr int64_t kMonth = 30 * 86400;

  // What is recorded is not what these tests are about: a host that is read quickly.
  RecordBounds() {
    host_.Write("/proc/meminfo",
                "MemTotal: 1024 kB\nMemFree: 24 kB\nBuffers: 0 kB\nCached: 0 kB\n"
                "AnonPages: 0 kB\nSlab: 8 kB\nPageTables: 4 kB\nVmallocUsed: 4 kB\n");
  }

  // A recorder that does not wait, from some seconds after kStart on; for `steps` see set_clock.c.
  harness::Program Recorder(int64_t after, std::vector<std::string> args,
                            const std::string& steps = "") const {
    args.insert(args.begin(), {"record", "--root", host_.Root(), file_});
    harness::Program program = Command(args);
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_SET_CLOCK);
    program.environment.push_back("SET_CLOCK=" + std::to_string(kStart / kSecond + after));
    program.environment.push_back("CLOCK_STEPS=" + steps);
    return program;
  }

  // Records so, and gives what was said on standard error.
  std::string RecordBy(int64_t after, const std::vector<std::string>& args,
                       const std::string& steps = "") {
    const harness::Result result = harness::RunProgram(Recorder(after, args, steps));
    EXPECT_EQ(result.status, 0) << result.err;
    out_ = result.out;
    return result.err;
  }

  // One that goes on until it is stopped; what it says is in files "out" and "err".
  pid_t Start(const std::string& out = "out") const {
    const harness::Program program = Recorder(0, {"--every", "1m"});
    const pid_t child = fork();
    if (child != 0) return child;
    dup2(open(Path(out).c_str(), O_WRONLY | O_CREAT, 0600), STDOUT_FILENO);
    dup2(open(Path("err").c_str(), O_WRONLY | O_CREAT, 0600), STDERR_FILENO);
    setenv("LD_PRELOAD", KSICACHE_SET_CLOCK, 1);
    setenv("SET_CLOCK", "1795255200", 1);
    std::vector<char*> args;
    for (const std::string& each : program.args) args.push_back(const_cast<char*>(each.c_str()));
    args.push_back(nullptr);
    execv(KSICACHE_PROGRAM, args.data());
    _exit(127);
  }

  // A recorder that has recorded something.
  pid_t StartAndAwait() const {
    const pid_t child = Start();
    while (access(file_.c_str(), F_OK) != 0 || OpenFile(file_)->Parts().empty()) usleep(1000);
    return child;
  }

  // What it said, once it has ended with status 1.
  std::string ErrorOf(pid_t child) const {
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 1) << status;
    return FileContent(Path("err"));
  }

  int64_t MomentCount() const {
    int64_t count = 0;
    const std::unique_ptr<RecordingFile> file = OpenFile(file_);
    for (const RecordingFile::Part& part : file->Parts()) count += part.moments;
    return count;
  }

  std::vector<MomentFacts> Facts() const {
    std::vector<MomentFacts> all;
    const std::unique_ptr<RecordingFile> file = OpenFile(file_);
    for (const RecordingFile::Part& part : file->Parts()) {
      std::vector<MomentFacts> facts;
      EXPECT_EQ(file->ReadFacts(part, facts), kOk) << file->Why();
      all.insert(all.end(), facts.begin(), facts.end());
    }
    return all;
  }

  const HostTree host_;
  const std::string file_ = Path("r.rec");
  std::string out_;  // of the last recorder
};

TEST_F(RecordBounds, AClockThatIsWrongForAWhileRemovesNothing) {
  const std::string month = std::to_string(kMonth);
  EXPECT_EQ(RecordBy(0, {"--every", "30s", "--keep", "1h", "--count", "110"},
                     "90:" + month + ":0 95:-" + month + ":0"),
            "");
  EXPECT_EQ(MomentCount(), 110);
}

TEST_F(RecordBounds, WhatLeavesIsSaid) {
  EXPECT_EQ(RecordBy(0, {"--every", "30s", "--keep", "1h", "--count", "150"}), "");
  EXPECT_GE(MomentCount(), 120);
  EXPECT_LE(MomentCount(), 120 + 15 + 1);
  EXPECT_NE(out_.find(": removed 16 moments of 2026-11-21T10:00:30Z to 2026-11-21T10:08:00Z, "
                      "older than --keep\n"),
            std::string::npos)
      << out_;
}

TEST_F(RecordBounds, AClockThatMayBeWrongAtTheStartRemovesNothingForAnHour) {
  const auto record = [this](int64_t after, const char* count) {
    return RecordBy(after, {"--every", "30s", "--keep", "1h", "--count", count});
  };
  EXPECT_EQ(record(0, "60"), "");
  const std::string said = "ksicache: " + file_ +
                           ": files tell no uptime: for an hour the clock makes no moment too "
                           "old\n";
  EXPECT_EQ(record(kMonth, "20"), said);
  EXPECT_EQ(MomentCount(), 80);
  EXPECT_EQ(record(kMonth + 1200, "115"), said);
  EXPECT_EQ(MomentCount(), 195);
  EXPECT_EQ(record(kMonth + 7200, "125"), said);
  EXPECT_LE(MomentCount(), 125);
  EXPECT_NE(out_.find(" moments of 2026-11-21T10:00:30Z to "), std::string::npos) << out_;
}

TEST_F(RecordBounds, SlowMomentsAreKeptNoLongerThanAnEighthMore) {
  RecordBy(0, {"--every", "1d", "--keep", "2d", "--count", "12"});
  EXPECT_EQ(MomentCount(), 3);
  std::filesystem::remove(file_);
  RecordBy(0, {"--every", "1m", "--keep", "80m", "--count", "300"});
  EXPECT_GE(MomentCount(), 80);
  EXPECT_LE(MomentCount(), 80 + 10 + 1);
}

TEST_F(RecordBounds, ALateMomentIsLeftOutAndCounted) {
  RecordBy(0, {"--every", "1s", "--count", "6"}, "3:0:3.4 7:0:0.26 8:0:0.24");
  std::vector<int64_t> taken;
  std::vector<uint64_t> skipped;
  for (const MomentFacts& each : Facts()) {
    taken.push_back((each.taken - kStart) / 10'000);
    skipped.push_back(each.skipped);
  }
  EXPECT_EQ(taken, (std::vector<int64_t>{100, 200, 700, 800, 900, 1124}));
  EXPECT_EQ(skipped, (std::vector<uint64_t>{0, 0, 4, 0, 0, 1}));
}

// Each write takes a millisecond, and all of them are made after a moment has been read.
TEST_F(RecordBounds, AMomentsCostIsWritingTheOneBeforeItToo) {
  RecordBy(0, {"--every", "1s", "--count", "3"});
  const std::vector<MomentFacts> facts = Facts();
  ASSERT_EQ(facts.size(), 3u);
  EXPECT_EQ(facts[0].cpu, 0u);
  EXPECT_GT(facts[1].cpu, 0u);
  EXPECT_GT(facts[2].cpu, 0u);
}

TEST_F(RecordBounds, ARecorderEndsWhenItsFileIsRemovedOrReplaced) {
  pid_t child = StartAndAwait();
  std::filesystem::remove(file_);
  const std::string lost =
      "ksicache: " + file_ + ": was removed or replaced while it was recorded\n";
  EXPECT_EQ(ErrorOf(child), lost);
  child = StartAndAwait();
  MakeEmpty(Path("other"));
  std::filesystem::rename(Path("other"), file_);
  EXPECT_EQ(ErrorOf(child), lost);
}

TEST_F(RecordBounds, ARecorderEndsWhenItsFileIsTruncatedOrOverwritten) {
  const std::string harmed =
      "ksicache: " + file_ + ": was truncated or written by others while it was recorded\n";
  for (const off_t length : {0, 8192}) {
    const pid_t child = StartAndAwait();
    ASSERT_EQ(truncate(file_.c_str(), length), 0);
    EXPECT_EQ(ErrorOf(child), harmed);
    std::filesystem::remove(file_);
    std::filesystem::remove(Path("err"));
  }
  const pid_t child = StartAndAwait();
  const int file = open(file_.c_str(), O_WRONLY);
  EXPECT_EQ(write(file, std::string(4096, 'x').data(), 4096), 4096);
  close(file);
  EXPECT_EQ(ErrorOf(child), harmed);
}

TEST_F(RecordBounds, WhatIsRecordedIsNotReplaced) {
  WriteContent(Path("host.json"), JsonWith(""));
  const pid_t child = StartAndAwait();
  const std::string refused = file_ + ": is being recorded by process " + std::to_string(child);
  ExpectFailure({"capture", "--force", "--root", RecordedHost("systemd-server"), file_}, refused);
  ExpectFailure({"load", "--force", Path("host.json"), file_}, refused);
  ExpectFailure({"extract", "--force", file_ + "@first", file_}, refused);
  kill(child, SIGKILL);
  waitpid(child, nullptr, 0);
  Output({"load", "--force", Path("host.json"), file_});
}

TEST_F(RecordBounds, AFileOfAnotherHostIsRefused) {
  Record(file_, MakeMoments(1, 3));
  const std::string before = FileContent(file_);
  ExpectFailure({"record", "--root", RecordedHost("systemd-server"), "--count", "1", file_},
                file_ + ": is of the host h, not of unknown");
  EXPECT_EQ(FileContent(file_), before);
}

// A host that was renamed has moments by both names, and goes on with its file by each of them.
TEST_F(RecordBounds, AFileWithMomentsOfThisNameIsGoneOnWith) {
  std::vector<Moment> moments = MakeMoments(1, 2);
  moments[0].host = Host("unknown");
  Record(file_, moments);
  EXPECT_EQ(RecordBy(60, {"--every", "1s", "--count", "1"}), "");
  EXPECT_EQ(MomentCount(), 3);
}

TEST_F(RecordBounds, ANameThatMeansAMomentOfAnotherFileIsRefused) {
  for (const char* when :
       {"@last", "@10:05", "@2026-11-21T10:05:00Z", "@-10m", "@..", "@10:00.."}) {
    ExpectFailure({"record", Path("a.rec") + when},
                  Path("a.rec") + when + ": such a name means a moment of another file", 2);
    EXPECT_NE(access((Path("a.rec") + when).c_str(), F_OK), 0);
  }
  const harness::Result result = Run({"record", "--root", RecordedHost("systemd-server"), "--every",
                                      "1s", "--count", "1", Path("a@b.rec")});
  EXPECT_EQ(result.status, 0) << result.err;
}

TEST_F(RecordBounds, GoesOnWhenNobodyReadsTheLog) {
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  const pid_t child = fork();
  if (child == 0) {
    dup2(ends[1], STDOUT_FILENO);
    dup2(ends[1], STDERR_FILENO);
    close(ends[0]);
    close(ends[1]);
    signal(SIGPIPE, SIG_DFL);
    setenv("LD_PRELOAD", KSICACHE_SET_CLOCK, 1);
    setenv("SET_CLOCK", "1795255200", 1);
    // It waits for the other end to be closed.
    while (getppid() != 1 && access(Path("closed").c_str(), F_OK) != 0) usleep(1000);
    execl(KSICACHE_PROGRAM, "ksicache", "record", "--every", "20m", "--count", "9", "--root",
          RecordedHost("systemd-server").c_str(), file_.c_str(), nullptr);
    _exit(127);
  }
  close(ends[0]);
  close(ends[1]);
  WriteContent(Path("closed"), "");
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << status;
  EXPECT_EQ(MomentCount(), 9);
}

TEST_F(RecordBounds, ALargerFileIsMadeSmaller) {
  constexpr int64_t kBound = ksicache::RecordingStore::kSmallestFile;
  std::vector<Moment> moments;
  for (int64_t i = 0; i < 2000; ++i) moments.push_back(NoiseAt(i));
  for (Moment& each : moments) each.host = Host("unknown");
  Record(file_, moments);
  const auto before = static_cast<int64_t>(std::filesystem::file_size(file_));
  ASSERT_GT(before, kBound * 5 / 4);
  const std::unique_ptr<RecordingFile> reader = OpenFile(file_);

  EXPECT_EQ(RecordBy(3000, {"--every", "1s", "--max-size", "4M", "--count", "1"}), "");
  EXPECT_TRUE(std::regex_search(
      out_, std::regex("^" + file_ + ": made smaller, of " + std::to_string(before) +
                       " bytes [0-9]+; removed [0-9]+ moments\n")))
      << out_;
  EXPECT_LE(static_cast<int64_t>(std::filesystem::file_size(file_)), kBound);
  EXPECT_GT(static_cast<int64_t>(std::filesystem::file_size(file_)), kBound / 2);
  EXPECT_FALSE(std::filesystem::exists(file_ + ".smaller"));
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  const int64_t first = file->Parts().front().number;
  EXPECT_EQ(first, file->Parts().front().chunk);
  EXPECT_GT(first, 0);
  EXPECT_EQ(file->Parts().back().End(), 2001);
  ExpectMoments(*file, {moments.begin() + first, moments.end()}, first);
  // Who has it open has all of it still.
  ExpectMoments(*reader, {moments.begin(), moments.begin() + 10});
}

TEST_F(RecordBounds, AFileThatCannotBeMadeSmallerIsRecordedOn) {
  std::vector<Moment> moments;
  for (int64_t i = 0; i < 1500; ++i) moments.push_back(NoiseAt(i));
  for (Moment& each : moments) each.host = Host("unknown");
  Record(file_, moments);
  const auto before = std::filesystem::file_size(file_);
  ASSERT_GT(before, 4u << 20);
  std::filesystem::create_directory(file_ + ".smaller");
  EXPECT_EQ(RecordBy(3000, {"--every", "1s", "--max-size", "4M", "--count", "1"}),
            "ksicache: " + file_ + ".smaller: Is a directory\nksicache: " + file_ +
                ": is larger than --max-size, and stays so\n");
  EXPECT_EQ(std::filesystem::file_size(file_), before);
  ExpectMoments(*OpenFile(file_), {moments.begin() + 1499, moments.end()}, 1499);
}

}  // namespace
}  // namespace ksi
#endif
