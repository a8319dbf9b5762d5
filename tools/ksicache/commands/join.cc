// join: captures and recordings of one host as one recording.
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <limits>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/moment_builder.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/progress.h"
#include "tools/ksicache/recorder.h"

namespace ksicache {
namespace {

constexpr const Option* kOptions[] = {&kForce, &kMode};

// A moment of one of the files.
struct Place {
  int64_t taken;
  size_t file;
  int64_t number;  // in a recording
};

// One of the files.
struct Input {
  std::unique_ptr<ksi::RecordingFile> recording;  // null for a capture
  ksi::ChunkReader reader;
  int64_t at = ksi::RecordingFile::kNoMoment;  // the moment that the reader has

  void Read(int64_t number, ksi::Moment& moment) {
    const int64_t before = std::exchange(at, number);
    if (recording->ReadWhole(number, reader, moment, before) != ksi::kOk) {
      throw DataError("damaged: " + recording->Why());
    }
  }
};

// The files to join, by the order in which they were given.
class Inputs {
 public:
  explicit Inputs(const std::vector<std::string>& names) : names_(names) {
    for (size_t i = 0; i < names.size(); ++i) Named(i, [&] { Add(i); });
    std::ranges::stable_sort(places_, {}, &Place::taken);
  }

  // All moments, the earliest first.
  const std::vector<Place>& Places() const { return places_; }

  ksi::Moment Read(const Place& place) {
    ksi::Moment moment;
    Named(place.file, [&] {
      Input& input = inputs_[place.file];
      if (input.recording == nullptr) {
        moment = MomentOf(OpenedFile(names_[place.file]).File());
      } else {
        input.Read(place.number, moment);
      }
      if (host_.empty()) host_ = moment.host.name;
      if (moment.host.name != host_) {
        throw DataError("is of the host " + moment.host.name + ", not of " + host_);
      }
    });
    ksi::SortReadings(moment.readings);
    return moment;
  }

 private:
  // What goes wrong is said with the file's name.
  template <class Action>
  void Named(size_t file, Action&& action) const {
    try {
      action();
    } catch (const DataError& error) {
      throw Error(names_[file] + ": " + error.what());
    }
  }

  void Add(size_t file) {
    const std::string& name = names_[file];
    Input& input = inputs_.emplace_back();
    if (!IsRecording(name)) {
      places_.push_back({TakenOf(OpenedFile(name).File()), file, 0});
      return;
    }
    input.recording = OpenRecording(name);
    for (const ksi::RecordingFile::Part& part : input.recording->Parts()) {
      std::vector<ksi::MomentFacts> facts;
      if (input.recording->ReadFacts(part, facts) != ksi::kOk) {
        throw DataError("damaged: " + input.recording->Why());
      }
      for (size_t i = 0; i < facts.size(); ++i) {
        places_.push_back({facts[i].taken, file, part.number + static_cast<int64_t>(i)});
      }
    }
  }

  const std::vector<std::string>& names_;
  std::vector<Input> inputs_;
  std::vector<Place> places_;
  std::string host_;
};

// Whether two files have the same moment.
bool IsSame(const ksi::Moment& a, const ksi::Moment& b) {
  return a.facts.taken == b.facts.taken && a.readings == b.readings;
}

// A file without a name, closed with its owner.
using TemporaryFile = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;

void Commit(std::FILE* file, NewFile& target) {
  const off_t size = lseek(fileno(file), 0, SEEK_END);
  void* content =
      size < 0 ? MAP_FAILED
               : mmap(nullptr, static_cast<size_t>(size), PROT_READ, MAP_PRIVATE, fileno(file), 0);
  if (content == MAP_FAILED) throw SystemError(target.Name(), errno);
  target.Commit({static_cast<const std::byte*>(content), static_cast<size_t>(size)});
  munmap(content, static_cast<size_t>(size));
}

int Join(const CommandLine& line) {
  const std::string& name = line.arguments[0];
  CheckOptionsFor(name, line);
  NewFile target(name, line.Has(kForce), ModeOf(line));
  const std::vector<std::string> names(line.arguments.begin() + 1, line.arguments.end());
  for (const std::string& input : names) target.RefuseInput(FileNameOf(input));
  Inputs inputs(names);
  if (inputs.Places().empty()) throw Error("there are no moments to join");

  const TemporaryFile file(std::tmpfile(), std::fclose);
  ksi::Moment moment = inputs.Read(inputs.Places().front());
  const ksi::Bytes empty = RecordingStore::Empty(moment.host.name);
  if (file == nullptr || std::fwrite(empty.data(), 1, empty.size(), file.get()) != empty.size() ||
      std::fflush(file.get()) != 0) {
    throw SystemError("a temporary file", errno);
  }
  {
    RecordingStore store("a temporary file", dup(fileno(file.get())),
                         std::numeric_limits<int64_t>::max());
    Recorder recorder(store);
    Progress progress("joining");
    recorder.Add(moment.host, moment.facts, moment.readings);
    for (size_t i = 1; i < inputs.Places().size(); ++i) {
      progress.Show(i, inputs.Places().size());
      ksi::Moment next = inputs.Read(inputs.Places()[i]);
      if (IsSame(next, moment)) continue;
      moment = std::move(next);
      recorder.Add(moment.host, moment.facts, moment.readings);
      recorder.Tidy();
    }
    recorder.Pack();
  }
  Commit(file.get(), target);
  return 0;
}

}  // namespace

const Command kJoin = {
    .name = "join",
    .arguments = "OUT IN...",
    .summary = "make a recording of captures and recordings of one host",
    .help = R"(Makes OUT, a recording, of captures and recordings of one host, by the times at
which their moments were taken; "-" is standard output. What several of them
have is there once.
)",
    .options = kOptions,
    .fewest = 2,
    .most = Command::kAnyNumber,
    .run = Join,
};

}  // namespace ksicache
