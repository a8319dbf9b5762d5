// extract: one moment of a recording as a capture.
#include <string>

#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/moment_builder.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

constexpr const Option* kOptions[] = {&kForce, &kMode};

int Extract(const CommandLine& line) try {
  const std::string& target = line.arguments[1];
  CheckOptionsFor(target, line);
  const mode_t mode = ModeOf(line);
  ksi::Moment moment = ReadMoment(line.arguments[0]);
  // The same moment is the same file, however the recording keeps it.
  ksi::SortReadings(moment.readings);
  CacheWriter writer(target, line.Has(kForce), mode);
  writer.RefuseInput(FileNameOf(line.arguments[0]));
  PutReadings(moment, writer);
  writer.Commit(CaptureOf(moment));
  return 0;
} catch (const DataError& error) {
  throw Error(line.arguments[0] + ": " + error.what());
}

}  // namespace

const Command kExtract = {
    .name = "extract",
    .arguments = "FILE@WHEN OUT",
    .summary = "make a capture of one moment of a recording",
    .help = R"(Makes OUT, a capture, of one moment of the recording FILE; "-" is standard
output. WHEN is such as 2026-11-21T10:05, 10:05, -10m, first and last; without
it the last one is meant.
)",
    .options = kOptions,
    .fewest = 2,
    .most = 2,
    .run = Extract,
};

}  // namespace ksicache
