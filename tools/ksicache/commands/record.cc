// record: takes a moment of this host again and again, into one file.
#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <map>
#include <memory>
#include <new>
#include <string>
#include <vector>

#include "knvlibs/recording/when.h"
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
#include "tools/ksicache/retention.h"
#include "tools/ksicache/sampler.h"
#include "tools/ksicache/shrink.h"

namespace ksicache {
namespace {

constexpr Option kKeep = {"keep", "TIME", "keep moments for TIME instead of 7d"};
constexpr Option kMaxSize = {"max-size", "SIZE", "let FILE grow to SIZE instead of 2G"};
constexpr Option kCount = {"count", "N", "end after N moments"};
constexpr const Option* kOptions[] = {&kEvery, &kKeep, &kMaxSize, &kCount, &kMode, &kRoot};

// So often the file is looked after. A loss of power takes what was recorded since then.
constexpr int64_t kLookEvery = ksi::kMinute;

// A chunk has at most this share of the time for which moments are kept: it leaves as a whole.
constexpr int64_t kChunksKept = 8;

// A moment that is later than this, or than a quarter of the time between two, is left out.
constexpr int64_t kLate = ksi::kSecond;

// Why moments stay that are too old by the clock.
constexpr const char* kWithoutUptime =
    ": files tell no uptime: for an hour the clock makes no moment too old";
constexpr const char* kClockSet =
    ": the clock was set, or the host started: for an hour it makes no moment too old";

// What is the same again and again is said so often.
constexpr int64_t kSayEvery = ksi::kHour;

int64_t Now() { return ksi::ReadClock(CLOCK_REALTIME); }

// Time that passes whatever the clock is set to, sleep included.
int64_t Uptime() { return ksi::ReadClock(CLOCK_BOOTTIME); }

// Who reads the log may go; recording goes on.
void Tell(const std::string& line) {
  try {
    PrintLine(line);
    FlushOutput();
  } catch (const OutputError&) {
    if (std::freopen("/dev/null", "w", stdout) == nullptr) return;  // nobody reads it anyway
  }
}

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

// What the moments of an hour cost. Told when the next one has begun, by the clock.
class HourlyAccount {
 public:
  // That it is `now`.
  void Begin(const std::string& fileName, int64_t now, int64_t size) {
    if (from_ != 0 && now / ksi::kHour != from_ / ksi::kHour) {
      TellHour(fileName, size);
      *this = {};
    }
    if (from_ == 0) from_ = now;
  }
  void Add(const ksi::MomentFacts& facts) {
    ++moments_;
    duration_ += facts.duration;
    cpu_ += facts.cpu;
  }
  void AddSkipped(uint64_t count) { skipped_ += count; }
  void AddDropped() { ++dropped_; }

 private:
  void TellHour(const std::string& fileName, int64_t size) const {
    Tell(fileName + ": " + std::to_string(moments_) + " moments since " + ksi::TextOfTime(from_) +
         ", " + std::to_string(skipped_) + " skipped, " + std::to_string(dropped_) + " dropped; " +
         (moments_ == 0 ? "" : CostText()) + std::to_string(size) + " bytes");
  }

  std::string CostText() const {
    const auto each = [this](uint64_t sum) {
      const uint64_t tenths = sum / moments_ / 100;
      return std::to_string(tenths / 10) + "." + std::to_string(tenths % 10) + " ms";
    };
    return "each took " + each(duration_) + ", " + each(cpu_) + " of CPU; ";
  }

  int64_t from_ = 0;
  uint64_t moments_ = 0;
  uint64_t skipped_ = 0;
  uint64_t dropped_ = 0;
  uint64_t duration_ = 0;
  uint64_t cpu_ = 0;
};

// The moments that leave, for one reason. Told with the first ones, and once an hour.
class Leaving {
 public:
  using Gone = RecordingStore::Gone;

  explicit Leaving(const char* why) : why_(why) {}

  void Add(const std::string& fileName, const Gone& gone) {
    if (gone.moments != 0) {
      sum_.first = sum_.moments == 0 ? gone.first : std::min(sum_.first, gone.first);
      sum_.last = sum_.moments == 0 ? gone.last : std::max(sum_.last, gone.last);
      sum_.moments += gone.moments;
    }
    if (told_ == 0 || Uptime() - told_ >= kSayEvery) TellSum(fileName);
  }

  void TellSum(const std::string& fileName) {
    if (sum_.moments == 0) return;
    Tell(fileName + ": removed " + std::to_string(sum_.moments) + " moments of " +
         ksi::TextOfSpan({sum_.first, sum_.last}) + ", " + why_);
    sum_ = {};
    told_ = Uptime();
  }

 private:
  const char* why_;
  Gone sum_;
  int64_t told_ = 0;
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
        recorder_(store_, Recorder::Singles::kWritten, plan.keep / kChunksKept),
        sampler_(root),
        retention_(plan.keep) {
    if (!store_.Parts().empty()) {
      GoOn(host, BootOf(root));
      store_.TellWhose();
    }
    looked_ = Uptime();
  }

  // Gives the exit status.
  int Run() {
    int64_t taken = 0;
    int64_t due = 0;
    while (Await(due)) {
      if (TakeMoment(due)) ++taken;
      LookAfter();
      if (plan_.count != 0 && taken == plan_.count) break;
    }
    Finish();
    return dropped_ == 0 ? 0 : 1;
  }

 private:
  // Moments lie on the clock's grid. False if it is to end.
  bool Await(int64_t& due) {
    const auto next = [this] { return (Now() / plan_.every + 1) * plan_.every; };
    due = next();
    for (;;) {
      const int64_t until = std::min(due, Now() + kLookEvery);
      const Alarm::Event event = alarm_.WaitUntil(until);
      if (event == Alarm::Event::kStopped) return false;
      if (event == Alarm::Event::kDue && until == due) return true;
      if (event == Alarm::Event::kClockSet) due = next();
      LookAfter();
    }
  }

  void GoOn(const std::string& host, const std::string& boot) {
    const std::unique_ptr<ksi::RecordingFile> recording = store_.Read();
    TakeOver(*recording, host, boot);
    Adopt(*recording);
  }

  // When the last moment of each chunk was. A file of another host is none of this one; but this
  // one may have been given another name since it started, or in the midst of the file.
  void TakeOver(ksi::RecordingFile& recording, const std::string& host, const std::string& boot) {
    const std::vector<ksi::RecordingFile::Part>& parts = recording.Parts();
    bool isOwn = false;
    size_t damaged = 0;
    std::string other;
    for (size_t i = 0; i < parts.size(); ++i) {
      if (i + 1 < parts.size() && parts[i + 1].chunk == parts[i].chunk) continue;
      ksi::HostIdentity its;
      std::vector<ksi::MomentFacts> facts;
      const bool isRead = recording.ReadHost(parts[i], its) == ksi::kOk;
      isOwn = isOwn || (isRead && (its.name == host || (!boot.empty() && its.boot == boot)));
      if (isRead) other = its.name;
      const bool isTold = isRead && recording.ReadFacts(parts[i], facts) == ksi::kOk;
      // What of the last one is damaged is told when it is packed.
      if (!isTold && i + 1 < parts.size()) ++damaged;
      retention_.Add(parts[i].chunk, {its.boot, isTold ? facts.back().uptime : 0, parts[i].last});
    }
    if (damaged != 0) {
      PrintError(fileName_ +
                 ": is damaged, and stays so, which check tells more of; chunks of it: " +
                 std::to_string(damaged));
    }
    if (isOwn || other.empty()) return;
    throw Error(fileName_ + ": is of the host " + other + ", not of " + host);
  }

  void Adopt(ksi::RecordingFile& recording) {
    const size_t damaged = recorder_.Adopt(recording);
    if (damaged == 0) return;
    PrintError(fileName_ +
               ": its last moments are damaged, and stay so: " + std::to_string(damaged));
  }

  // False if it came late.
  bool TakeMoment(int64_t due) {
    Diagnostics diagnostics;
    account_.Begin(fileName_, Now(), store_.Size());
    const bool isInTime = TryMoment(due);
    for (const std::string& line : diagnostics.TakeKept()) log_.Say(line);
    return isInTime;
  }

  bool TryMoment(int64_t due) {
    try {
      ksi::Moment moment = sampler_.Take();
      if (std::abs(moment.facts.taken - due) > std::min(kLate, plan_.every / 4)) return false;
      CountSkipped();
      AccountCpu(moment.facts);
      moment.facts.skipped = skipped_;
      recorder_.Add(moment.host, moment.facts, moment.readings);
      skipped_ = 0;
      ++recorded_;
      account_.Add(moment.facts);
      SayAgain();
      Tidy(moment);
    } catch (const Error& error) {
      Drop(error.what());
    } catch (const std::bad_alloc&) {
      Drop(fileName_ + ": out of memory");
    }
    return true;
  }

  // What was due since the last one was taken is left out, and not taken late. A clock that was set
  // leaves nothing out.
  void CountSkipped() {
    const int64_t now = Uptime();
    const int64_t ticks = (now - last_ + plan_.every / 2) / plan_.every;
    const uint64_t skipped = last_ != 0 && ticks > 1 ? static_cast<uint64_t>(ticks - 1) : 0;
    skipped_ += skipped;
    account_.AddSkipped(skipped);
    last_ = now;
  }

  // A moment costs what was done since the one before it was read: packing and writing that one is
  // part of it.
  void AccountCpu(ksi::MomentFacts& facts) {
    const int64_t now = ksi::ReadClock(CLOCK_PROCESS_CPUTIME_ID);
    if (cpu_ != 0) facts.cpu = static_cast<uint64_t>(now - cpu_);
    cpu_ = now;
  }

  // What fails here fails again with the next moment, and loses none.
  void Tidy(const ksi::Moment& moment) {
    try {
      recorder_.Tidy();
      outgrown_.Add(fileName_, store_.TakeGone());
      RemoveOld(moment);
    } catch (const Error& error) {
      log_.Say(error.what());
    }
  }

  void RemoveOld(const ksi::Moment& moment) {
    const ksi::MomentFacts& facts = moment.facts;
    // Of a host whose files were recorded nobody knows how long it had been up.
    retention_.Add(store_.Parts().back().chunk,
                   {moment.host.boot, facts.uptime == 0 ? Uptime() : facts.uptime, facts.taken});
    store_.RemoveBefore(retention_.FirstKept(store_.Parts().front().chunk));
    outdated_.Add(fileName_, store_.TakeGone());
    const bool holdsBack = retention_.HoldsBack();
    if (holdsBack && !saidHoldsBack_) {
      PrintError(fileName_ + (facts.uptime == 0 ? kWithoutUptime : kClockSet));
    }
    saidHoldsBack_ = holdsBack;
  }

  void LookAfter() {
    const int64_t now = Uptime();
    if (now - looked_ < kLookEvery) return;
    looked_ = now;
    store_.RequireThere();
    try {
      store_.Sync();
    } catch (const Error& error) {
      log_.Say(error.what());
    }
  }

  // Once for each trouble.
  void Drop(const std::string& why) {
    ++skipped_;
    ++dropped_;
    account_.AddDropped();
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
    store_.RequireThere();
    try {
      recorder_.Pack();
      store_.Sync();
    } catch (const Error& error) {
      PrintError(error.what());
    }
    outgrown_.TellSum(fileName_);
    outdated_.TellSum(fileName_);
    Tell(fileName_ + ": " + std::to_string(recorded_) + " moments recorded" +
         (dropped_ == 0 ? "" : ", " + std::to_string(dropped_) + " dropped") + ", " +
         std::to_string(store_.Size()) + " bytes");
  }

  std::string fileName_;
  Plan plan_;
  RecordingStore store_;
  Recorder recorder_;
  Sampler sampler_;
  Retention retention_;
  Log log_;
  HourlyAccount account_;
  Leaving outgrown_{"for --max-size"};
  Leaving outdated_{"older than --keep"};
  Alarm alarm_;
  int64_t last_ = 0;      // when a moment was due, by the time since the host started
  int64_t looked_ = 0;    // after the file, likewise
  int64_t cpu_ = 0;       // that this process had taken when the last moment was read
  uint64_t skipped_ = 0;  // since the last moment that was recorded
  uint64_t recorded_ = 0;
  uint64_t dropped_ = 0;
  uint64_t failedFrom_ = 0;
  bool isFailing_ = false;
  bool saidHoldsBack_ = false;
};

// Whether a file of that name would stand before moments of another one: "host.rec@last".
bool IsMomentOfAnother(const std::string& fileName) {
  const size_t at = fileName.rfind('@');
  if (at == std::string::npos) return false;
  const auto isTime = [](const std::string& text) {
    return ksi::TimeOf(text, {0, Now()}).has_value();
  };
  const std::string when = fileName.substr(at + 1);
  const size_t dots = when.find("..");
  if (dots == std::string::npos) return isTime(when);
  const std::string from = when.substr(0, dots);
  const std::string to = when.substr(dots + 2);
  return (from.empty() || isTime(from)) && (to.empty() || isTime(to));
}

// Where that fails, for example for want of room beside it, the file at least grows no more.
void MakeSmaller(const std::string& fileName, int64_t maxSize) {
  try {
    Tell(Shrink(fileName, maxSize));
  } catch (const Error& error) {
    PrintError(error.what());
    PrintError(fileName + ": is larger than --max-size, and stays so");
  }
}

// What another recorder has made meanwhile is a recording, too.
void MakeRecording(const std::string& fileName, mode_t mode, const std::string& host) {
  try {
    NewFile(fileName, false, mode).Commit(RecordingStore::Empty(host));
  } catch (const Error&) {
    struct stat info = {};
    if (lstat(fileName.c_str(), &info) != 0) throw;
  }
}

int Record(const CommandLine& line) {
  const std::string& fileName = line.arguments[0];
  const std::string* root = line.ValueOf(kRoot);
  const Plan plan = PlanOf(line);
  if (fileName == "-") throw UsageError("a recording is a file, not standard output");
  if (IsMomentOfAnother(fileName)) {
    throw UsageError(fileName + ": such a name means a moment of another file");
  }
  static_cast<void>(std::signal(SIGPIPE, SIG_IGN));
  if (root != nullptr || HostLibrary::OpensHosts()) CheckRoot(root == nullptr ? "/" : *root);
  bool isNameRead = false;
  const std::string host = HostName(root, isNameRead);
  struct stat info = {};
  if (lstat(fileName.c_str(), &info) != 0) {
    MakeRecording(fileName, ModeOf(line), host);
  } else if (S_ISREG(info.st_mode) && info.st_size > plan.maxSize) {
    MakeSmaller(fileName, plan.maxSize);
  }
  Recording recording(fileName, plan, root, host);
  Tell(fileName + ": recording " + host + " every " + std::to_string(plan.every / ksi::kSecond) +
       " s");
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
