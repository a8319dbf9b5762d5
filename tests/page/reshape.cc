// reshape RECORDING OUT NUMBER:WHAT[:SECONDS]...: the moments of a recording, as if something had
// happened before one of them.
//
//   reboot   the host was started anew
//   gap      nothing was recorded for so much longer
//   clock    the clock was put forward, or back where SECONDS are negative
//   damage   the moments that are packed with it cannot be read
//
// and AGAIN:again, all of them so many times more, each round behind the one before.
#include <sqlite3.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>

#include "knvlibs/times.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/recorder.h"
#include "tools/ksicache/recording_store.h"

namespace {

constexpr int64_t kUnbounded = int64_t{1} << 40;

struct Change {
  std::string what;
  int64_t seconds;
};

using Changes = std::multimap<int64_t, Change>;

Changes ChangesOf(char** words) {
  Changes changes;
  for (; *words != nullptr; ++words) {
    int64_t number = 0;
    char what[16];
    long long seconds = 0;
    if (std::sscanf(*words, "%ld:%15[a-z]:%lld", &number, what, &seconds) < 2) {
      throw std::runtime_error(std::string("no change: ") + *words);
    }
    changes.insert({number, {what, seconds}});
  }
  return changes;
}

void MakeEmpty(const std::string& name) {
  const ksi::Bytes empty = ksicache::RecordingStore::Empty("reshaped");
  std::ofstream(name, std::ios::binary)
      .write(reinterpret_cast<const char*>(empty.data()),
             static_cast<std::streamsize>(empty.size()));
}

// Tells moments when they were taken.
class Clock {
 public:
  explicit Clock(const Changes& changes) : changes_(changes) {}

  void Set(int64_t number, ksi::Moment& moment) {
    const auto [begin, end] = changes_.equal_range(number);
    for (auto at = begin; at != end; ++at) Apply(at->second);
    int64_t step = before_ == 0 ? 0 : moment.facts.taken - before_;
    if (step < 0) {  // the first of another round
      later_ += ksi::kMinute - step;
      step = ksi::kMinute;
    }
    uptime_ += step;
    before_ = moment.facts.taken;
    moment.facts.taken += later_;
    moment.facts.uptime = uptime_;
    moment.host.boot = std::to_string(boot_);
  }

 private:
  void Apply(const Change& change) {
    const int64_t time = change.seconds * ksi::kSecond;
    if (change.what == "gap" || change.what == "clock") later_ += time;
    if (change.what == "gap") uptime_ += time;
    if (change.what != "reboot") return;
    ++boot_;
    uptime_ = ksi::kMinute;
  }

  const Changes& changes_;
  int boot_ = 1;
  int64_t uptime_ = ksi::kDay;
  int64_t later_ = 0;
  int64_t before_ = 0;  // when the last one was taken, as it was recorded
};

int64_t RoundsOf(const Changes& changes) {
  for (const auto& [number, change] : changes) {
    if (change.what == "again") return number + 1;
  }
  return 1;
}

void Copy(ksi::RecordingFile& from, const std::string& out, int64_t rounds, Clock clock) {
  ksicache::RecordingStore store(out, kUnbounded);
  // Some chunks: with one that is damaged the moments behind it in its chunk are lost.
  ksicache::Recorder recorder(store, ksicache::Recorder::Singles::kWritten, 40 * ksi::kMinute);
  ksi::ChunkReader reader;
  const int64_t count = from.Parts().back().End();
  for (int64_t number = 0; number < rounds * count; ++number) {
    ksi::Moment moment;
    if (from.ReadWhole(number % count, reader, moment, number % count - 1) != ksi::kOk) {
      throw std::runtime_error(from.Why());
    }
    clock.Set(number, moment);
    recorder.Add(moment.host, moment.facts, moment.readings);
    recorder.Tidy();
  }
  recorder.Pack();
}

void Damage(const std::string& name, int64_t number) {
  const std::string statement =
      "UPDATE block SET data = zeroblob(length(data)) WHERE id = (SELECT block FROM part WHERE "
      "moments > 0 AND number <= " +
      std::to_string(number) + " ORDER BY number DESC, moments DESC LIMIT 1)";
  sqlite3* database = nullptr;
  const bool isDone =
      sqlite3_open(name.c_str(), &database) == SQLITE_OK &&
      sqlite3_exec(database, statement.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK &&
      sqlite3_changes(database) == 1;
  sqlite3_close(database);
  if (!isDone) throw std::runtime_error(name + ": cannot be damaged");
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3) return 2;
  try {
    const Changes changes = ChangesOf(argv + 3);
    MakeEmpty(argv[2]);
    Copy(*ksicache::OpenRecording(argv[1]), argv[2], RoundsOf(changes), Clock(changes));
    for (const auto& [number, change] : changes) {
      if (change.what == "damage") Damage(argv[2], number);
    }
  } catch (const std::exception& error) {
    static_cast<void>(std::fprintf(stderr, "reshape: %s\n", error.what()));
    return 1;
  }
  return 0;
}
