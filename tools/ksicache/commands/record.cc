// record: takes a moment of this host again and again, into one file.
#include <sys/stat.h>

#include <ctime>
#include <map>
#include <memory>
#include <new>
#include <string>

#include "knvlibs/times.h"
#include "tools/ksicache/alarm.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/diagnostics.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/host_files.h"
#include "tools/ksicache/host_library.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/quantity.h"
#include "tools/ksicache/recorder.h"
#include "tools/ksicache/sampler.h"

namespace ksicache {
namespace {

constexpr Option kEvery = {"every", "TIME", "take a moment each TIME instead of 5s"};
constexpr Option kKeep = {"keep", "TIME", "keep moments for TIME instead of 7d"};
constexpr Option kMaxSize = {"max-size", "SIZE", "let FILE grow to SIZE instead of 2G"};
constexpr Option kCount = {"count", "N", "end after N moments"};
constexpr const Option* kOptions[] = {&kEvery, &kKeep, &kMaxSize, &kCount, &kMode, &kRoot};

// A loss of power takes what was recorded since the last of these.
constexpr int64_t kSyncEvery = ksi::kMinute;

// What is the same again and again is said so often.
constexpr int64_t kSayEvery = ksi::kHour;

int64_t Now() { return ksi::ReadClock(CLOCK_REALTIME); }

// What is said again and again.
class Log {
 public:
  void Say(const std::string& line) {
    const int64_t now = Now();
    int64_t& last = said_[line];
    if (last == 0 || now - last >= kSayEvery || now < last) {
      PrintError(line);
      last = now;
    }
    // Lines that are all different are few in number, or of no use.
    if (said_.size() > kMostLines) said_.clear();
  }

 private:
  static constexpr size_t kMostLines = 1000;

  std::map<std::string, int64_t> said_;
};

// What the moments of an hour cost. Told with the first moment of the next one, by the clock.
class HourlyAccount {
 public:
  void Add(const std::string& fileName, const ksi::MomentFacts& facts, int64_t size) {
    if (moments_ != 0 && facts.taken / ksi::kHour != from_ / ksi::kHour) {
      Tell(fileName, size);
      *this = {};
    }
    if (moments_++ == 0) from_ = facts.taken;
    skipped_ += facts.skipped;
    duration_ += facts.duration;
    cpu_ += facts.cpu;
  }

 private:
  void Tell(const std::string& fileName, int64_t size) const {
    const auto each = [this](uint64_t sum) {
      return std::to_string(sum / moments_ / 1000) + " ms";
    };
    PrintLine(fileName + ": " + std::to_string(moments_) + " moments since " +
              ksi::TextOfTime(from_) + ", " + std::to_string(skipped_) + " skipped; each took " +
              each(duration_) + ", " + each(cpu_) + " of CPU; " + std::to_string(size) + " bytes");
    FlushOutput();
  }

  int64_t from_ = 0;
  uint64_t moments_ = 0;
  uint64_t skipped_ = 0;
  uint64_t duration_ = 0;
  uint64_t cpu_ = 0;
};

struct Plan {
  int64_t every;
  int64_t keep;
  int64_t maxSize;
  int64_t count;  // 0: until it is stopped
};

Plan PlanOf(const CommandLine& line) {
  const Plan plan = {DurationOf(line, kEvery, 5 * ksi::kSecond),
                     DurationOf(line, kKeep, 7 * ksi::kDay),
                     SizeOf(line, kMaxSize, int64_t{2} << 30), CountOf(line, kCount, 0)};
  if (plan.maxSize < RecordingStore::kSmallestFile) {
    throw UsageError("--max-size is at least " +
                     std::to_string(RecordingStore::kSmallestFile >> 20) + "M");
  }
  return plan;
}

class Recording {
 public:
  Recording(const std::string& fileName, const Plan& plan, const std::string* root,
            const std::string& host)
      : fileName_(fileName),
        plan_(plan),
        store_(fileName, plan.maxSize),
        recorder_(store_),
        sampler_(root) {
    if (!store_.Parts().empty()) {
      GoOn(host);
      store_.TellWhose();
    }
    synced_ = Now();
  }

  // Gives the exit status.
  int Run() {
    int64_t taken = 0;
    for (;;) {
      // Moments lie on the clock's grid.
      const Alarm::Event event = alarm_.WaitUntil((Now() / plan_.every + 1) * plan_.every);
      if (event == Alarm::Event::kStopped) break;
      if (event == Alarm::Event::kClockSet) continue;
      CountSkipped();
      TakeMoment();
      if (plan_.count != 0 && ++taken == plan_.count) break;
    }
    Finish();
    return dropped_ == 0 ? 0 : 1;
  }

 private:
  void GoOn(const std::string& host) {
    const std::unique_ptr<ksi::RecordingFile> recording = store_.Read();
    TellOtherHost(*recording, host);
    Adopt(*recording);
  }

  // Hosts are given other names, and files other hosts.
  void TellOtherHost(ksi::RecordingFile& recording, const std::string& host) const {
    ksi::HostIdentity last;
    if (recording.ReadHost(recording.Parts().back(), last) != ksi::kOk || last.name == host) return;
    PrintError(fileName_ + ": its last moment is of the host " + last.name + ", those to come of " +
               host);
  }

  void Adopt(ksi::RecordingFile& recording) {
    const size_t damaged = recorder_.Adopt(recording);
    if (damaged == 0) return;
    PrintError(fileName_ +
               ": its last moments are damaged, and stay so: " + std::to_string(damaged));
  }

  // What was due while the last one was taken is left out, and not taken late. A clock that was set
  // leaves nothing out.
  void CountSkipped() {
    const int64_t now = ksi::ReadClock(CLOCK_BOOTTIME);
    const int64_t ticks = (now - last_ + plan_.every / 2) / plan_.every;
    if (last_ != 0 && ticks > 1) skipped_ += static_cast<uint64_t>(ticks - 1);
    last_ = now;
  }

  void TakeMoment() {
    Diagnostics diagnostics;
    try {
      ksi::Moment moment = sampler_.Take();
      moment.facts.skipped = skipped_;
      recorder_.Add(moment.host, moment.facts, moment.readings);
      skipped_ = 0;
      ++recorded_;
      account_.Add(fileName_, moment.facts, store_.Size());
      SayAgain();
      Tidy(moment.facts.taken);
    } catch (const Error& error) {
      Drop(error.what());
    } catch (const std::bad_alloc&) {
      Drop(fileName_ + ": out of memory");
    }
    for (const std::string& line : diagnostics.TakeKept()) log_.Say(line);
  }

  // What fails here fails again with the next moment, and loses none.
  void Tidy(int64_t now) {
    try {
      recorder_.Tidy();
      store_.RemoveBefore(now - plan_.keep);
      if (now - synced_ >= kSyncEvery || now < synced_) {
        store_.Sync();
        synced_ = now;
      }
    } catch (const Error& error) {
      log_.Say(error.what());
    }
  }

  // Once for each trouble.
  void Drop(const std::string& why) {
    ++skipped_;
    ++dropped_;
    if (isFailing_) return;
    PrintError(why);
    PrintError(fileName_ + ": moments are dropped until that is over");
    isFailing_ = true;
    failedFrom_ = dropped_ - 1;
  }

  void SayAgain() {
    if (!isFailing_) return;
    PrintError(fileName_ + ": is recorded again; " + std::to_string(dropped_ - failedFrom_) +
               " moments were dropped");
    isFailing_ = false;
  }

  void Finish() {
    try {
      recorder_.Pack();
      store_.Sync();
    } catch (const Error& error) {
      PrintError(error.what());
    }
    PrintLine(fileName_ + ": " + std::to_string(recorded_) + " moments recorded" +
              (dropped_ == 0 ? "" : ", " + std::to_string(dropped_) + " dropped") + ", " +
              std::to_string(store_.Size()) + " bytes");
  }

  std::string fileName_;
  Plan plan_;
  RecordingStore store_;
  Recorder recorder_;
  Sampler sampler_;
  Log log_;
  HourlyAccount account_;
  Alarm alarm_;
  int64_t last_ = 0;  // when a moment was due, by the time since the host started
  int64_t synced_ = 0;
  uint64_t skipped_ = 0;  // since the last moment that was recorded
  uint64_t recorded_ = 0;
  uint64_t dropped_ = 0;
  uint64_t failedFrom_ = 0;
  bool isFailing_ = false;
};

int Record(const CommandLine& line) {
  const std::string& fileName = line.arguments[0];
  const std::string* root = line.ValueOf(kRoot);
  const Plan plan = PlanOf(line);
  if (fileName == "-") throw UsageError("a recording is a file, not standard output");
  if (root != nullptr || HostLibrary::OpensHosts()) CheckRoot(root == nullptr ? "/" : *root);
  bool isNameRead = false;
  const std::string host = HostName(root, isNameRead);
  struct stat info = {};
  if (lstat(fileName.c_str(), &info) != 0) {
    NewFile(fileName, false, ModeOf(line)).Commit(RecordingStore::Empty(host));
  }
  Recording recording(fileName, plan, root, host);
  PrintLine(fileName + ": recording " + host + " every " +
            std::to_string(plan.every / ksi::kSecond) + " s");
  FlushOutput();
  return recording.Run();
}

}  // namespace

const Command kRecord = {
    .name = "record",
    .arguments = "FILE",
    .summary = "record this host over time in FILE",
    .help =
        R"(Takes a moment of this host again and again, as capture does, and adds it to
FILE, which is made if it is not there. Moments lie on the clock's grid; one
that would be late is left out. It ends with SIGINT or SIGTERM, or after --count
moments.

FILE keeps to its bounds: moments older than --keep are removed, and the oldest
ones where it would grow beyond --max-size. Times are such as 5s, 10m, 6h or 7d,
sizes such as 500M or 2G.
)",
    .options = kOptions,
    .fewest = 1,
    .most = 1,
    .run = Record,
};

}  // namespace ksicache
