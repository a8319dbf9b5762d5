// This machine under a load that changes, recorded: what reports say of a moment is what they said
// at the time.
//
// No two reads of a machine are of one time. But whatever a report says the same before and after a
// moment was so at it, and the moment has to say that, too, to the last byte: of processes that
// stand still, of the cgroup that they are in and of a guest that is paused, while all around them
// comes and goes.
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/times.h"
#include "tests/harness/tally.h"
#include "tests/ksicache/recording_fixture.h"

namespace ksi {
namespace {

// A process that is killed in the end.
class Load {
 public:
  explicit Load(const std::function<void()>& run) : id_(fork()) {
    if (id_ != 0) return;
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    run();
    _exit(127);
  }
  Load(Load&& other) noexcept : id_(std::exchange(other.id_, -1)) {}
  Load(const Load&) = delete;
  Load& operator=(const Load&) = delete;
  ~Load() {
    if (id_ <= 0) return;
    kill(id_, SIGKILL);
    waitpid(id_, nullptr, 0);
  }

  pid_t Id() const { return id_; }

  // Whether it has ended by itself, which `status` tells then.
  bool HasEnded(int& status) {
    if (id_ > 0 && waitpid(id_, &status, WNOHANG) == id_) id_ = -1;
    return id_ < 0;
  }

 private:
  pid_t id_;
};

// Writes to each page of so much memory.
void* Hold(size_t bytes) {
  void* memory = mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  for (size_t at = 0; at < bytes; at += 4096) static_cast<char*>(memory)[at] = 1;
  return memory;
}

// Grows, shrinks, and starts processes that end.
[[noreturn]] void Change() {
  for (size_t round = 1;; ++round) {
    const size_t bytes = (1 + round % 32) << 20;
    void* memory = Hold(bytes);
    const pid_t child = fork();
    if (child == 0) {
      Hold(1 << 20);
      _exit(0);
    }
    usleep(50'000);
    waitpid(child, nullptr, 0);
    munmap(memory, bytes);
  }
}

[[noreturn]] void StandStill(int number) {
  prctl(PR_SET_NAME, ("still-" + std::to_string(getpid())).c_str());
  Hold(static_cast<size_t>(1 + number) << 20);
  for (;;) raise(SIGSTOP);
}

// A cgroup, where this user may make one; gone with its owner.
class Cgroup {
 public:
  explicit Cgroup(const std::string& name) {
    for (const std::string root : {"/sys/fs/cgroup/", "/sys/fs/cgroup/memory/"}) {
      path_ = root + name;
      isMade_ = access((root + "cgroup.procs").c_str(), W_OK) == 0 &&
                (mkdir(path_.c_str(), 0755) == 0 || errno == EEXIST);
      if (isMade_) break;
    }
  }
  Cgroup(const Cgroup&) = delete;
  Cgroup& operator=(const Cgroup&) = delete;
  ~Cgroup() {
    for (int i = 0; isMade_ && rmdir(path_.c_str()) != 0 && i < 1000; ++i) usleep(1000);
  }

  bool IsMade() const { return isMade_; }

  void Take(pid_t process) const {
    if (isMade_) std::ofstream(path_ + "/cgroup.procs") << process;
  }

 private:
  std::string path_;
  bool isMade_ = false;
};

// What reports say of what stands still: by report, and by the mark of its lines.
using Lines = std::map<std::string, std::string>;
using Reports = std::map<std::string, Lines>;

// What was said from one time to another.
struct Look {
  int64_t begin = 0;
  int64_t end = 0;
  Reports reports;
};

class RecordingLive : public RecordingTest {
 protected:
  static constexpr int kStill = 4;
  static constexpr int kChanging = 3;  // cgroups
  static constexpr int64_t kMoments = 4;

  // Of a cache file, or of this machine. A report that something ended, for what it told of was
  // gone, is left out.
  Reports Read(const std::string& cache) const {
    Reports reports;
    for (const char* report : {"uw-stats", "group-stats", "vm-stats"}) {
      std::vector<std::string> args = {"-r", report, "-q"};
      if (!cache.empty()) args.insert(args.begin(), {"-c", cache});
      const harness::Result result = harness::RunProgram(harness::BuiltTally(args));
      if (result.err.empty()) reports[report] = LinesOf(result.out);
    }
    return reports;
  }

  Lines LinesOf(const std::string& output) const {
    Lines lines;
    std::istringstream out(output);
    for (std::string line; std::getline(out, line);) {
      for (const std::string& mark : marks_) {
        if (("," + line).find(mark) != std::string::npos) lines[mark] += line + "\n";
      }
    }
    return lines;
  }

  Look LookNow() const {
    Look look;
    look.begin = ReadClock(CLOCK_REALTIME);
    look.reports = Read("");
    look.end = ReadClock(CLOCK_REALTIME);
    return look;
  }

  // Looks again and again until there are some moments.
  std::vector<Look> Record() const {
    std::vector<Look> looks = {LookNow()};
    harness::Program record =
        Command({"record", "--every", "1s", "--count", std::to_string(kMoments), file_});
    Load recorder([&record] { _exit(harness::RunProgram(record).status); });
    int status = -1;
    while (!recorder.HasEnded(status)) looks.push_back(LookNow());
    EXPECT_EQ(status, 0);
    looks.push_back(LookNow());
    return looks;
  }

  // Expects of a moment what a report said before and after it; gives the marks of that.
  static std::set<std::string> Compare(const Lines& before, const Lines& after,
                                       const Lines& lines) {
    std::set<std::string> marks;
    for (const auto& [mark, line] : before) {
      const auto still = after.find(mark);
      if (still == after.end() || still->second != line) continue;
      const auto found = lines.find(mark);
      EXPECT_EQ(found == lines.end() ? "nothing" : found->second, line);
      marks.insert(mark);
    }
    return marks;
  }

  // The marks of what a moment could be compared in.
  std::set<std::string> CompareMoment(const MomentFacts& facts,
                                      const std::vector<Look>& looks) const {
    const int64_t end = facts.taken + static_cast<int64_t>(facts.duration);
    std::set<std::string> marks;
    for (const auto& [report, lines] : Read(file_ + "@" + TextOfTime(facts.taken))) {
      SCOPED_TRACE(report + " of " + TextOfTime(facts.taken));
      const auto after = std::ranges::find_if(looks, [&, name = report](const Look& look) {
        return look.begin > end && look.reports.contains(name);
      });
      const auto before =
          std::ranges::find_if(looks.rbegin(), looks.rend(), [&, name = report](const Look& look) {
            return look.end < facts.taken && look.reports.contains(name);
          });
      if (after == looks.end() || before == looks.rend()) continue;
      marks.merge(Compare(before->reports.at(report), after->reports.at(report), lines));
    }
    return marks;
  }

  std::string NameOfChanging(int number) const {
    return "tally-comes-" + own_ + "-" + std::to_string(number);
  }

  const std::string own_ = std::to_string(getpid());
  std::vector<std::string> marks_;
  const std::string file_ = Path("r.ksi");
};

TEST_F(RecordingLive, AMomentSaysWhatWasSaidBeforeAndAfterIt) {
  const Cgroup cgroup("tally-still-" + own_);
  std::vector<Load> loads;
  for (int i = 0; i < kStill; ++i) {
    loads.emplace_back([i] { StandStill(i); });
    cgroup.Take(loads.back().Id());
    marks_.push_back(",still-" + std::to_string(loads.back().Id()) + ",");
  }
  const std::string guest = "guest=tally-paused-" + own_;
  if (std::system("command -v qemu-system-x86_64 >/dev/null") == 0) {
    marks_.push_back(",tally-paused-" + own_ + ",");
    loads.emplace_back([&guest] {
      execlp("qemu-system-x86_64", "qemu-system-x86_64", "-name", guest.c_str(), "-S", "-accel",
             "tcg", "-m", "64", "-display", "none", "-serial", "none", "-monitor", "none", nullptr);
    });
  }
  const std::set<std::string> still(marks_.begin(), marks_.end());
  // What the kernel keeps of a cgroup it settles in its own time.
  if (cgroup.IsMade()) marks_.push_back(",tally-still-" + own_ + ",");
  loads.emplace_back([] { Change(); });
  loads.emplace_back([this] {
    for (int i = 0;; ++i) {
      const Cgroup comesAndGoes(NameOfChanging(i % kChanging));
      usleep(100'000);
    }
  });

  const std::vector<Look> looks = Record();
  loads.clear();
  for (int i = 0; i < kChanging; ++i) const Cgroup last(NameOfChanging(i));

  const std::unique_ptr<RecordingFile> file = OpenFile(file_);
  ASSERT_NE(file, nullptr);
  ASSERT_FALSE(file->Parts().empty());
  ASSERT_EQ(file->Parts().back().End(), kMoments);
  std::set<std::string> compared;
  for (int64_t number = 0; number < kMoments; ++number) {
    ChunkReader moment;
    ASSERT_EQ(file->ReadMoment(number, moment), kOk) << file->Why();
    compared.merge(CompareMoment(moment.Facts(), looks));
  }
  EXPECT_TRUE(std::ranges::includes(compared, still)) << testing::PrintToString(compared);
}

}  // namespace
}  // namespace ksi
