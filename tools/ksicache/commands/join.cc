// join: captures and recordings of one host as one recording.
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/join_inputs.h"
#include "tools/ksicache/mapped_file.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/progress.h"
#include "tools/ksicache/recorder.h"

namespace ksicache {
namespace {

constexpr const Option* kOptions[] = {&kForce, &kMode};

// Whether two files have the same moment.
bool IsSame(const ksi::Moment& a, const ksi::Moment& b) {
  return a.facts.taken == b.facts.taken && a.readings == b.readings;
}

// A file without a name, closed with its owner.
using TemporaryFile = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;

int Join(const CommandLine& line) {
  const std::string& name = line.arguments[0];
  CheckOptionsFor(name, line);
  NewFile target(name, line.Has(kForce), ModeOf(line));
  const std::vector<std::string> names(line.arguments.begin() + 1, line.arguments.end());
  for (const std::string& input : names) target.RefuseInput(FileNameOf(input));
  JoinInputs inputs(names);
  std::optional<ksi::Moment> moment = inputs.Take();
  if (!moment) throw Error("there are no moments to join");

  const TemporaryFile file(std::tmpfile(), std::fclose);
  const ksi::Bytes empty = RecordingStore::Empty(moment->host.name, 1);
  if (file == nullptr || std::fwrite(empty.data(), 1, empty.size(), file.get()) != empty.size() ||
      std::fflush(file.get()) != 0) {
    throw SystemError("a temporary file", errno);
  }
  {
    RecordingStore store("a temporary file", dup(fileno(file.get())),
                         std::numeric_limits<int64_t>::max());
    store.GrowBy(1);
    Recorder recorder(store, Recorder::Singles::kLeftOut);
    Progress progress("joining");
    ksi::Moment last;
    for (size_t i = 0; moment; moment = inputs.Take()) {
      progress.Show(i++, inputs.Count());
      if (i > 1 && IsSame(*moment, last)) continue;
      last = *std::move(moment);
      recorder.Add(last.host, last.facts, last.readings);
      recorder.Tidy();
    }
    recorder.Pack();
  }
  target.Commit(MappedFile(fileno(file.get())).Content());
  return inputs.IsDamaged() ? 1 : 0;
}

}  // namespace

const Command kJoin = {
    .name = "join",
    .arguments = "OUT IN...",
    .summary = "make a recording of captures and recordings of one host",
    .help = R"(Makes OUT, a recording, of captures and recordings of one host, by the times at
which their moments were taken; "-" is standard output. Those of a recording
stay in their order, wherever the clock was set. What several of them have is
there once, and what is damaged is said and left out.
)",
    .options = kOptions,
    .fewest = 2,
    .most = Command::kAnyNumber,
    .run = Join,
};

}  // namespace ksicache
