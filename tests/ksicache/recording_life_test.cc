// What recordings must survive: that their recorder is killed, that others read or record
// meanwhile, that the disk is full, and that they go on for ever.
//
// FULL_SWEEP=1 in the environment kills 1000 recorders instead of some.
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <future>
#include <random>
#include <set>
#include <string>
#include <vector>

#include <knvlibs/ksi_status.h>
#include "knvlibs/recording/chunk_writer.h"
#include "knvlibs/times.h"
#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/recording_fixture.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/retention.h"

namespace ksi {
namespace {

using ksicache::Recorder;
using ksicache::RecordingStore;
using Part = RecordingFile::Part;

// A process that is killed in the end.
class Child {
 public:
  explicit Child(const std::function<void()>& run) : id_(fork()) {
    if (id_ != 0) return;
    try {
      run();
    } catch (const std::exception&) {
      _exit(1);
    }
    _exit(0);
  }
  ~Child() { Kill(); }
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;

  pid_t Id() const { return id_; }

  // Gives the wait status.
  int Kill() {
    if (id_ <= 0) return 0;
    kill(id_, SIGKILL);
    return Wait();
  }
  int Wait() {
    int status = 0;
    waitpid(std::exchange(id_, -1), &status, 0);
    return status;
  }

 private:
  pid_t id_;
};

class RecordingLife : public RecordingTest {
 protected:
  RecordingLife()
      : done_(static_cast<std::atomic<int64_t>*>(mmap(nullptr, sizeof(std::atomic<int64_t>),
                                                      PROT_READ | PROT_WRITE,
                                                      MAP_SHARED | MAP_ANONYMOUS, -1, 0))) {
    MakeEmpty(file_);
  }
  ~RecordingLife() override { munmap(done_, sizeof *done_); }

  // The moment of a number: they come again after a while.
  Moment MomentAt(int64_t number) const {
    Moment moment = moments_[static_cast<size_t>(number) % moments_.size()];
    moment.facts.taken = kStart + number * kSecond;
    return moment;
  }

  // Goes on with the recording, as fast as it can; `done_` is the end of the moments that are
  // there.
  void RecordOn(int64_t maxSize, int64_t count = INT64_MAX) const {
    RecordingStore store(file_, maxSize);
    Recorder recorder(store);
    recorder.Adopt(*OpenFile(file_));
    int64_t next = store.Parts().empty() ? 0 : store.Parts().back().End();
    for (; count != 0; --count) {
      const Moment moment = MomentAt(next);
      recorder.Add(moment.host, moment.facts, moment.readings);
      *done_ = ++next;
      recorder.Tidy();
    }
  }

  void ExpectMoment(RecordingFile& file, int64_t number) const {
    ASSERT_NO_FATAL_FAILURE(ExpectMoments(file, {MomentAt(number)}, number));
  }

  const std::string file_ = Path("r.ksi");
  const std::vector<Moment> moments_ = MakeMoments(1, 100);
  std::atomic<int64_t>* const done_;  // shared with children
};

TEST_F(RecordingLife, AKilledRecorderLosesAtMostTheMomentBeingWritten) {
  std::mt19937 random(1);
  const int kills = std::getenv("FULL_SWEEP") == nullptr ? 12 : 1000;
  int64_t gained = 0;
  for (int i = 0; i < kills; ++i) {
    const int64_t before = *done_;
    Child recorder([this] { RecordOn(2 * RecordingStore::kSmallestFile); });
    while (*done_ == before) usleep(100);
    usleep(static_cast<useconds_t>(random() % 50'000));
    ASSERT_TRUE(WIFSIGNALED(recorder.Kill()));
    SCOPED_TRACE("kill " + std::to_string(i) + " after " + std::to_string(*done_));

    const std::unique_ptr<RecordingFile> file = OpenFile(file_);
    ASSERT_NE(file, nullptr);
    const std::vector<Part>& parts = file->Parts();
    ASSERT_FALSE(parts.empty());
    ASSERT_GE(parts.back().End(), *done_);
    ASSERT_LE(parts.back().End(), *done_ + 1);
    int64_t at = parts.front().number;
    for (const Part& part : parts) {
      ASSERT_EQ(part.number, at);
      at = part.End();
    }
    for (const int64_t number :
         {at - 1, at - 2, parts.front().number,
          parts.front().number +
              static_cast<int64_t>(random() % static_cast<uint64_t>(at - parts.front().number))}) {
      if (number < parts.front().number) continue;
      ASSERT_NO_FATAL_FAILURE(ExpectMoment(*file, number));
    }
    gained += *done_ - before;
    *done_ = at;
  }
  EXPECT_GT(gained, kills);
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  for (const Part& part : file->Parts()) {
    ASSERT_NO_FATAL_FAILURE(ExpectMoment(*file, part.End() - 1));
  }
}

TEST_F(RecordingLife, ReadersMeanwhileSeeWholeMoments) {
  Child recorder([this] { RecordOn(kUnbounded); });
  while (*done_ < 10) usleep(100);
  std::mt19937 random(2);
  for (int i = 0; i < 60; ++i) {
    const int64_t end = *done_;
    const int64_t wanted =
        i % 3 == 0 ? end - 1 : static_cast<int64_t>(random() % static_cast<uint64_t>(end));
    OpenedCache opened;
    ChunkReader reader;
    Moment moment;
    std::string why;
    const std::string when = TextOfTime(kStart + wanted * kSecond);
    ASSERT_EQ(ReadCache(file_ + "@" + when, &opened, &reader, &why), kOk) << when << ": " << why;
    ASSERT_EQ(reader.ReadAll(moment), kOk) << when;
    const Moment expected = MomentAt(wanted);
    SortReadings(moment.readings);
    ASSERT_EQ(moment.facts, expected.facts) << when;
    ASSERT_EQ(moment.readings, expected.readings) << when;
  }
  // And it went on.
  const int64_t then = *done_;
  const std::unique_ptr<RecordingFile> open = OpenFile(file_);
  while (*done_ < then + 100) usleep(100);
}

TEST_F(RecordingLife, CheckPassesOverWhatLeavesMeanwhile) {
  Child recorder([this] { RecordOn(RecordingStore::kSmallestFile); });
  while (*done_ < 10 || OpenFile(file_)->Parts().front().number == 0) usleep(10'000);
  for (int i = 0; i < 12; ++i) {
    // Hosts of noise have much that is wrong, and nothing that is damaged.
    const harness::Result result = Run({"check", file_});
    ASSERT_EQ(result.out.find("damaged"), std::string::npos) << result.out;
    ASSERT_EQ(result.err, "");
  }
}

TEST_F(RecordingLife, ASecondRecorderIsToldTheFirstsProcess) {
  std::filesystem::create_hard_link(file_, Path("hard.ksi"));
  std::filesystem::create_directory(Path("other"));
  std::filesystem::create_directory_symlink(directory_.Path("."), Path("other/way"));
  Child recorder([this] {
    std::filesystem::current_path(Path("other"));
    const int out = open(Path("out").c_str(), O_WRONLY | O_CREAT, 0600);
    dup2(out, STDOUT_FILENO);
    execl(KSICACHE_PROGRAM, "ksicache", "record", "--root", RecordedHost("systemd-server").c_str(),
          "way/hard.ksi", nullptr);
  });
  // What it says when it has begun.
  while (access(Path("out").c_str(), F_OK) != 0 || FileContent(Path("out")).empty()) usleep(1000);
  for (const std::string& name : {file_, Path("hard.ksi"), Path("other/way/r.ksi")}) {
    ExpectFailure({"record", "--root", RecordedHost("systemd-server"), name},
                  name + ": is being recorded by process " + std::to_string(recorder.Id()));
  }
  recorder.Kill();
  RecordOn(kUnbounded, 1);
}

// Whoever makes the file, the others find it recorded, or go on with it.
TEST_F(RecordingLife, RecordersThatBeginAtOnceAgreeOnTheFile) {
  std::filesystem::remove(file_);
  std::vector<std::future<harness::Result>> recorders;
  for (int i = 0; i < 6; ++i) {
    recorders.push_back(std::async(std::launch::async, [this] {
      return Run({"record", "--root", RecordedHost("systemd-server"), "--every", "1s", "--count",
                  "1", file_});
    }));
  }
  int recorded = 0;
  for (std::future<harness::Result>& each : recorders) {
    const harness::Result result = each.get();
    const std::string refused = "ksicache: " + file_ + ": is being recorded by ";
    EXPECT_TRUE(result.err.empty() || result.err.starts_with(refused)) << result.err;
    recorded += result.status == 0 ? 1 : 0;
  }
  EXPECT_GE(recorded, 1);
}

TEST_F(RecordingLife, TheProgramRecordsGoesOnAndChecks) {
  const std::string root = RecordedHost("systemd-server");
  std::filesystem::remove(file_);
  for (const char* count : {"1", "2"}) {
    const harness::Result result =
        Run({"record", "--root", root, "--every", "1s", "--count", count, file_});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
  }
  Output({"check", file_});
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  ASSERT_NE(file, nullptr);
  ASSERT_FALSE(file->Parts().empty());
  EXPECT_EQ(file->Parts().back().End(), 3);
  // The time at which a capture is taken is the one line that differs.
  Output({"capture", "--root", root, Path("capture.ksi")});
  const auto withoutTime = [](std::string dump) {
    const size_t at = dump.find("\ntaken ");
    return dump.erase(at, dump.find('\n', at + 1) - at);
  };
  EXPECT_EQ(withoutTime(Output({"dump", file_ + "@first"})),
            withoutTime(Output({"dump", Path("capture.ksi")})));
}

// A file that may not grow is a disk that is full.
TEST_F(RecordingLife, AFullDiskHarmsNothingAndRecordingGoesOnAfterIt) {
  Child child([this] {
    signal(SIGXFSZ, SIG_IGN);
    RecordingStore store(file_, kUnbounded);
    Recorder recorder(store);
    int64_t next = 0;
    const auto add = [&] {
      const Moment moment = MomentAt(next);
      recorder.Add(moment.host, moment.facts, moment.readings);
      ++next;
      recorder.Tidy();
    };
    for (int i = 0; i < 150; ++i) add();
    struct rlimit limit = {};
    getrlimit(RLIMIT_FSIZE, &limit);
    limit.rlim_cur = static_cast<rlim_t>(store.Size()) + 10'000;
    setrlimit(RLIMIT_FSIZE, &limit);
    int failures = 0;
    for (int i = 0; i < 3000 && failures < 100; ++i) {
      try {
        add();
      } catch (const ksicache::Error& error) {
        if (std::string(error.what()).find("File too large") == std::string::npos) _exit(2);
        ++failures;
      }
    }
    if (failures < 100) _exit(3);
    limit.rlim_cur = limit.rlim_max;
    setrlimit(RLIMIT_FSIZE, &limit);
    for (int i = 0; i < 100; ++i) add();
    *done_ = next;
  });
  ASSERT_EQ(child.Wait(), 0);
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  ASSERT_NE(file, nullptr);
  int64_t at = 0;
  for (const Part& part : file->Parts()) {
    ASSERT_EQ(part.number, at);
    at = part.End();
    ASSERT_NO_FATAL_FAILURE(ExpectMoment(*file, at - 1));
  }
  EXPECT_EQ(at, *done_);
}

TEST_F(RecordingLife, TheBoundOfTheSizeHoldsForEver) {
  constexpr int64_t kBound = RecordingStore::kSmallestFile;
  {
    RecordingStore store(file_, kBound);
    Recorder recorder(store);
    std::set<int64_t> chunks;
    for (int64_t next = 0; next < 3000; ++next) {
      const Moment moment = NoiseAt(next);
      recorder.Add(moment.host, moment.facts, moment.readings);
      recorder.Tidy();
      ASSERT_LE(store.Size(), kBound) << next;
      // Old ones leave in whole chunks.
      ASSERT_EQ(store.Parts().front().number, store.Parts().front().chunk);
      chunks.insert(store.Parts().front().chunk);
    }
    EXPECT_GT(chunks.size(), 3u);
  }
  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  ASSERT_NE(file, nullptr);
  EXPECT_GT(file->Parts().back().End() - file->Parts().front().number, 240);
  for (const Part& part : file->Parts()) {
    const int64_t last = part.End() - 1;
    ASSERT_NO_FATAL_FAILURE(ExpectMoments(*file, {NoiseAt(last)}, last));
  }
}

// Moments that are large beside the file, such that fewer of them fit than are packed together.
TEST_F(RecordingLife, LargeMomentsGoOnForEverInASmallFile) {
  constexpr int64_t kBound = RecordingStore::kSmallestFile;
  // How large, and how many are there at least.
  for (const auto& [groups, wanted] :
       {std::pair<int64_t, int64_t>{300, 12}, {1500, 2}, {4000, 2}, {8000, 1}}) {
    SCOPED_TRACE(groups);
    MakeEmpty(file_);
    RecordingStore store(file_, kBound);
    Recorder recorder(store);
    int64_t fewest = INT64_MAX;
    for (int64_t next = 0; next < 18'000 / groups + 8; ++next) {
      const Moment moment = NoiseAt(next, groups);
      recorder.Add(moment.host, moment.facts, moment.readings);
      recorder.Tidy();
      ASSERT_LE(store.Size(), kBound) << next;
      ASSERT_EQ(store.Parts().back().End(), next + 1);
      if (next > wanted + 6) fewest = std::min(fewest, next + 1 - store.Parts().front().number);
    }
    EXPECT_GE(fewest, wanted);
    const std::unique_ptr<RecordingFile> file = OpenFile(file_);
    for (const Part& part : file->Parts()) {
      const int64_t last = part.End() - 1;
      ASSERT_NO_FATAL_FAILURE(ExpectMoments(*file, {NoiseAt(last, groups)}, last));
    }
  }
}

// A chunk that fills the file, as moments that were small before may leave it.
TEST_F(RecordingLife, AFileFullOfOneChunkIsGoneOnWith) {
  constexpr int64_t kBound = RecordingStore::kSmallestFile;
  ChunkWriter chunk(Host());
  int64_t next = 0;
  {
    RecordingStore store(file_, kBound);
    const auto add = [&] {
      const Moment moment = NoiseAt(next, 300);
      chunk.Add(moment.facts, moment.readings);
      store.Add({0, 1, next, 0, moment.facts.taken, moment.facts.taken, 0, 0},
                chunk.PartFrom(static_cast<size_t>(next)));
      ++next;
    };
    ASSERT_THROW(for (;;) add(), ksicache::NoRoom);
    // None left for one for which there is no room.
    ASSERT_EQ(store.Parts().front().number, 0);
    ASSERT_GT(next, 10);
  }
  RecordingStore store(file_, kBound);
  Recorder recorder(store);
  EXPECT_EQ(recorder.Adopt(*OpenFile(file_)), 0u);
  ASSERT_EQ(store.Parts().back().End(), next);
  for (int64_t end = next + 50; next < end; ++next) {
    const Moment moment = NoiseAt(next, 300);
    recorder.Add(moment.host, moment.facts, moment.readings);
    recorder.Tidy();
    ASSERT_LE(store.Size(), kBound);
  }
  EXPECT_EQ(store.Parts().back().End(), next);
}

TEST_F(RecordingLife, WhatOthersWriteIntoItEndsIt) {
  const std::function<void()> changes[] = {
      // Another recording, which is as long.
      [this] {
        const Bytes other = RecordingStore::Empty("other");
        ASSERT_EQ(other.size(), std::filesystem::file_size(file_));
        std::fstream(file_, std::ios::in | std::ios::out | std::ios::binary)
            .write(reinterpret_cast<const char*>(other.data()),
                   static_cast<std::streamsize>(other.size()));
      },
      [this] { RunSql(file_, "UPDATE part SET moments = 0 WHERE id = 1"); },
      [this] { RunSql(file_, "DELETE FROM block"); },
      [this] { std::filesystem::resize_file(file_, 8192); },
  };
  for (const std::function<void()>& change : changes) {
    MakeEmpty(file_);
    RecordingStore store(file_, kUnbounded);
    Recorder recorder(store);
    const auto add = [&recorder](int64_t number) {
      const Moment moment = NoiseAt(number);
      recorder.Add(moment.host, moment.facts, moment.readings);
    };
    add(0);
    add(1);
    change();
    EXPECT_THROW(add(2), ksicache::FileLost);
    EXPECT_THROW(store.RequireThere(), ksicache::FileLost);
  }
}

TEST_F(RecordingLife, TheBoundOfAgeHoldsForEver) {
  constexpr int64_t kKeep = 500 * kSecond;
  RecordingStore store(file_, kUnbounded);
  Recorder recorder(store);
  ksicache::Retention retention(kKeep);
  int64_t size = 0;
  for (int64_t next = 0; next < 2000; ++next) {
    const Moment moment = MomentAt(next);
    recorder.Add(moment.host, moment.facts, moment.readings);
    recorder.Tidy();
    retention.Add(store.Parts().back().chunk, {"", (next + 1) * kSecond, moment.facts.taken});
    store.RemoveBefore(retention.FirstKept(store.Parts().front().chunk));
    const Part& first = store.Parts().front();
    ASSERT_EQ(first.number, first.chunk);
    // All of the first chunk but a moment may be too old.
    ASSERT_GT(first.first + (240 + 500) * kSecond, moment.facts.taken - kSecond) << next;
    ASSERT_LE(first.first, std::max(kStart, moment.facts.taken - kKeep)) << next;
    if (next == 1200) size = store.Size();
  }
  EXPECT_EQ(store.Size(), size);
}

}  // namespace
}  // namespace ksi
