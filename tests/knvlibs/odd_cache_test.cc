// tally and ksicache with a cache file that others use, change or hold meanwhile, or on a full
// disk: its output is right, or there is a message and a status.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "tests/harness/tally.h"
#include "tests/knvlibs/cache_fixture.h"

namespace ksi {
namespace {

using Names = std::vector<std::string>;

constexpr int64_t kGroups = 10'000;

// A host whose groups are more than a pipe and SQLite's cache hold.
void WriteManyGroups(const std::string& fileName) {
  ksicache::CacheWriter writer(fileName, true);
  const auto add = [&](std::string_view path, int64_t group, const auto& record) {
    writer.AddValue(NodeAt(path), MakeKeys({group}), BytesOf(record));
  };
  std::vector<Key> children;
  for (int64_t group = 0; group < kGroups; ++group) {
    KSI_GroupName name = {};
    std::to_string(group).copy(name.text, sizeof name.text);
    add("sched/groups/groupName", group, name);
    add("sched/groups/groupTag", group, KSI_GroupTag{});
    add("sched/groups/parentGroupID", group, group == 0 ? int64_t{-1} : int64_t{0});
    add("sched/groups/groupFlags", group, KSI_GROUP_CONTAINER);
    add("sched/groups/memAllocationInKB", group, KSI_GroupAllocation{});
    add("sched/groups/stats/capacity", group, KSI_GroupCapacity{});
    add("sched/groups/stats/memoryStats", group, KSI_GroupMemoryStats{});
    if (group != 0) {
      writer.AddList(NodeAt("sched/groups/members/groups"), MakeKeys({group}), {});
      children.push_back({KeyKind::kNumber, group, {}});
    }
  }
  writer.AddList(NodeAt("sched/groups/members/groups"), MakeKeys({0}), children);
  writer.Commit(TestCapture());
}

class OddCache : public testing::Test {
 protected:
  void SetUp() override { WriteManyGroups(file_); }

  harness::Program Report() const {
    return harness::BuiltTally({"-c", file_, "-r", "group-stats", "-q", "-s", "gid:name"});
  }

  static std::string Whole() {
    std::string rows = "gid,name\n";
    for (int64_t group = 0; group < kGroups; ++group) {
      rows += std::to_string(group) + "," + std::to_string(group) + "\n";
    }
    return rows;
  }

  void ExpectWhole(const harness::Result& result) const {
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_TRUE(result.out == Whole()) << result.out.substr(0, 200);
  }

  void ExpectRefused(const std::string& status) const {
    const harness::Result result = harness::RunProgram(Report());
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "Couldn't open cache file " + file_ + ", error code: " + status + "\n");
  }

  // Runs a program into a pipe, does something to its file when the pipe is full and the program in
  // the middle of it, and then reads on.
  harness::Result RunAndMeanwhile(harness::Program program,
                                  const std::function<void()>& meanwhile) {
    const std::string pipe = directory_.Path("pipe");
    EXPECT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const int fd = open(pipe.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    EXPECT_EQ(fcntl(fd, F_SETPIPE_SZ, kPipe), kPipe);
    EXPECT_EQ(fcntl(fd, F_SETFL, 0), 0);
    std::string out;
    std::thread reader([&] {
      WaitUntilFull(fd);
      meanwhile();
      std::array<char, 4096> block;
      for (ssize_t got; (got = read(fd, block.data(), block.size())) > 0;) {
        out.append(block.data(), static_cast<size_t>(got));
      }
    });
    program.outPath = pipe;
    harness::Result result = harness::RunProgram(program);
    reader.join();
    close(fd);
    result.out = out;
    return result;
  }

  TestDirectory directory_;
  const std::string file_ = directory_.Path("host.ksi");

 private:
  static constexpr int kPipe = 4096;

  static void WaitUntilFull(int fd) {
    int held = 0;
    for (int i = 0; i < 3000 && held < kPipe; ++i) {
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
      ASSERT_EQ(ioctl(fd, FIONREAD, &held), 0);
    }
    EXPECT_EQ(held, kPipe);
  }
};

TEST_F(OddCache, LockedByAnotherProcessIsRead) {
  const int fd = open(file_.c_str(), O_RDWR | O_CLOEXEC);
  ASSERT_GE(fd, 0);
  struct flock all = {};
  all.l_type = F_WRLCK;
  ASSERT_EQ(fcntl(fd, F_SETLK, &all), 0);
  ASSERT_EQ(flock(fd, LOCK_EX | LOCK_NB), 0);
  ExpectWhole(harness::RunProgram(Report()));
  close(fd);
}

#ifdef TALLY_SHORT_READS
TEST_F(OddCache, ThatComesInPiecesIsRead) {
  harness::Program report = Report();
  report.environment.emplace_back("LD_PRELOAD=" TALLY_SHORT_READS);
  ExpectWhole(harness::RunProgram(report));
}
#endif

TEST_F(OddCache, WrittenAheadIsReadAndStaysAlone) {
  RunSql(file_, "PRAGMA journal_mode = WAL; UPDATE node SET id = id");
  ExpectWhole(harness::RunProgram(Report()));
  EXPECT_EQ(directory_.Names(), Names{"host.ksi"});
}

TEST_F(OddCache, InTheMiddleOfAChangeIsRefused) {
  const Database other = OpenAsOwner(file_);
  ExecuteSql(other.get(), "PRAGMA cache_size = 10; BEGIN; UPDATE reading SET status = 5");
  ExpectRefused("195887112");
  EXPECT_EQ(directory_.Names(), (Names{"host.ksi", "host.ksi-journal"}));
  ExecuteSql(other.get(), "ROLLBACK");
  ExpectWhole(harness::RunProgram(Report()));
}

TEST_F(OddCache, ReplacedInTheMiddleOfAReportIsReadToItsEnd) {
  ExpectWhole(RunAndMeanwhile(Report(), [&] {
    WriteContent(directory_.Path("other"), std::string(65536, 'x'));
    std::filesystem::rename(directory_.Path("other"), file_);
  }));
}

TEST_F(OddCache, TruncatedInTheMiddleOfAReportIsTold) {
  const harness::Result result =
      RunAndMeanwhile(Report(), [&] { std::filesystem::resize_file(file_, 8192); });
  EXPECT_GE(result.status, 0);
  EXPECT_NE(result.err, "");
  EXPECT_TRUE(Whole().starts_with(result.out)) << result.out;
  EXPECT_LT(result.out.size(), Whole().size());
}

TEST_F(OddCache, DumpOfOneThatIsRewrittenMeanwhileFails) {
  harness::Program dump;
  dump.path = KSICACHE_PROGRAM;
  dump.args = {"ksicache", "dump", file_};
  dump.environment = harness::OwnEnvironment();
  const harness::Result result = RunAndMeanwhile(dump, [&] {
    const std::string content = FileContent(file_);
    std::fstream(file_, std::ios::binary | std::ios::in | std::ios::out) << content;
  });
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + file_ + ": damaged: database disk image is malformed\n");
}

// A limit on the size of files is the full disk that every user can have.
TEST_F(OddCache, ReportThatFillsTheDiskSaysSo) {
  const std::string output = directory_.Path("output");
  harness::Program program = Report();
  program.args.insert(
      program.args.begin(),
      {"sh", "-c", "trap '' XFSZ; ulimit -f 8; exec \"$0\" \"$@\" >" + output, program.path});
  program.args.erase(program.args.begin() + 4);
  program.path = "/bin/sh";
  const harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "tally: cannot write standard output: File too large\n");
  EXPECT_TRUE(Whole().starts_with(FileContent(output)));
}

}  // namespace
}  // namespace ksi
