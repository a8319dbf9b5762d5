// info: what cache files are, in a few lines each.
#include <limits>
#include <optional>
#include <utility>

#include "knvlibs/cache_format.h"
#include "knvlibs/times.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/failures.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/quantity.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {
namespace {

struct Contents {
  size_t values = 0;
  size_t lists = 0;
  int64_t instances = 0;
  Failures failures;
};

// A damaged file may say that its lists have any number of instances.
int64_t Sum(int64_t a, int64_t b) {
  int64_t sum = 0;
  return __builtin_add_overflow(a, b, &sum) ? std::numeric_limits<int64_t>::max() : sum;
}

Contents ContentsOf(const ksi::CacheFile& file) {
  Contents contents;
  ForEachReading(file, [&](const Reading& reading) {
    if (reading.status != ksi::kOk) {
      contents.failures.Add(reading.status, [&] { return reading.Name(); });
    } else if (reading.row != nullptr && reading.row->kind == ksi::Kind::kList) {
      ++contents.lists;
      contents.instances = Sum(contents.instances, std::max<int64_t>(reading.count, 0));
    } else {
      ++contents.values;
    }
  });
  return contents;
}

void PrintDefinitions(const std::string& built, const std::string& signature) {
  const bool own = signature == ksi::kDefinitions.signature;
  PrintLine("built      " + built);
  PrintLine("signature  " + signature +
            (own ? "" : ", not " + std::string(ksi::kDefinitions.signature) + " of this version"));
}

// How far a moment is from the time that was asked for, if one was, and from now.
void PrintDistance(int64_t taken, const std::optional<int64_t>& asked) {
  if (asked) {
    PrintLine("asked      " + ksi::TextOfTime(*asked) + ", " + TextOfDuration(*asked - taken) +
              " later");
  }
  PrintLine("age        " + TextOfDuration(ksi::ReadClock(CLOCK_REALTIME) - taken));
}

void PrintCapture(const OpenedFile& opened, const std::string& fileName) {
  const ksi::CacheFile::Capture& capture = opened.File().GetCapture();
  PrintLine("file       " + fileName);
  PrintLine("host       " + capture.host);
  PrintLine("taken      " + capture.taken);
  if (opened.HasWhen()) PrintDistance(TakenOf(opened.File()), opened.Asked());
  if (!opened.IsMoment()) {
    PrintLine("size       " + std::to_string(opened.File().Size()) + " bytes, schema " +
              std::to_string(ksi::cache::kSchemaVersion));
  }
  PrintDefinitions(capture.built, capture.signature);
}

// What the bytes of a recording's file are taken by.
void PrintRoom(ksi::RecordingFile& recording) {
  ksi::RecordingFile::Room room;
  if (recording.ReadRoom(room) != ksi::kOk) throw DataError("damaged: " + recording.Why());
  const auto print = [](const char* what, uint64_t bytes) {
    const uint64_t blocks = bytes / ksi::cache::kBlockSize;
    PrintLine(what + std::to_string(bytes) + " bytes in " + std::to_string(blocks) + " blocks");
  };
  const uint64_t all = room.moments + room.replaced + room.free + room.rest;
  PrintLine("size       " + std::to_string(all) + " bytes, schema " +
            std::to_string(ksi::cache::kRecordingVersion));
  print("  moments  ", room.moments);
  print("  replaced ", room.replaced);
  print("  free     ", room.free);
  PrintLine("  rest     " + std::to_string(room.rest) + " bytes");
}

void PrintRecording(ksi::RecordingFile& recording, const std::string& fileName) {
  const std::vector<ksi::RecordingFile::Part>& parts = recording.Parts();
  int64_t moments = 0;
  size_t chunks = 0;
  for (const ksi::RecordingFile::Part& part : parts) {
    moments += part.moments;
    chunks += part.number == part.chunk ? 1 : 0;
  }
  ksi::HostIdentity host;
  if (!parts.empty() && recording.ReadHost(parts.back(), host) != ksi::kOk) {
    throw DataError("damaged: " + recording.Why());
  }
  PrintLine("file       " + fileName);
  PrintLine("host       " + host.name);
  if (!parts.empty()) {
    PrintLine("from       " + ksi::TextOfTime(recording.Times().first));
    PrintLine("to         " + ksi::TextOfTime(recording.Times().last));
  }
  PrintLine("moments    " + std::to_string(moments) + ", in " + std::to_string(parts.size()) +
            " parts of " + std::to_string(chunks) + " chunks");
  PrintRoom(recording);
  if (!parts.empty()) PrintDefinitions(host.built, host.signature);
}

void PrintContents(const Contents& contents) {
  PrintLine("values     " + std::to_string(contents.values));
  PrintLine("lists      " + std::to_string(contents.lists) + ", with " +
            std::to_string(contents.instances) + " instances");
  PrintLine("absent     " + std::to_string(contents.failures.absent.Count()));
  PrintLine("refused    " + contents.failures.refused.Text());
  PrintLine("failed     " + contents.failures.failed.Text());
}

int Info(const CommandLine& line) {
  bool first = true;
  return ForEachFile(line.arguments, [&first](const std::string& fileName) {
    if (IsRecording(fileName)) {
      const std::unique_ptr<ksi::RecordingFile> recording = OpenRecording(fileName);
      if (!std::exchange(first, false)) PrintLine("");
      PrintRecording(*recording, fileName);
      return true;
    }
    const OpenedFile opened(fileName);
    const Contents contents = ContentsOf(opened.File());
    if (!std::exchange(first, false)) PrintLine("");
    PrintCapture(opened, fileName);
    PrintContents(contents);
    return true;
  });
}

}  // namespace

const Command kInfo = {
    .name = "info",
    .arguments = "FILE[@WHEN]...",
    .summary = "say which host a FILE is of, when it was taken and what it holds",
    .help = R"(Says which host each FILE is of, when it was taken, what definitions it was made
with and how much it holds: values, lists, and the reads that failed. "absent"
are those of nodes that the host, or a thing on it, does not have; "refused"
those that whoever captured it had not the rights for; "failed" all others.
Of FILE@WHEN it says how long before that time the moment was taken that
answers, and how long ago.
)",
    .options = {},
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Info,
};

}  // namespace ksicache
