#include "knvlibs/open_cache.h"

#include <unistd.h>

#include <optional>
#include <string_view>
#include <utility>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_source.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/recording/earlier_moment.h"
#include "knvlibs/recording/moment_source.h"
#include "knvlibs/recording/when.h"
#include "knvlibs/times.h"

namespace ksi {
namespace {

// What a name asks for.
struct Wanted {
  std::string fileName;
  std::optional<std::string> when;
};

Wanted WantedOf(const std::string& name) {
  const size_t at = name.rfind('@');
  // A file of that name wins, even if it cannot be opened.
  if (at == std::string::npos || access(name.c_str(), F_OK) == 0) return {name, {}};
  return {name.substr(0, at), name.substr(at + 1)};
}

Status NotATime(const std::string& when, const Span& times, std::string* why) {
  *why = when + " is no time, as " + kWhenForms + " are: moments are of " + TextOfSpan(times);
  return KSI_STATUS_BAD_PARAM;
}

Status NotSoEarly(const Span& times, std::string* why) {
  *why = "there is no moment so early: moments are of " + TextOfSpan(times);
  return KSI_STATUS_NOT_FOUND;
}

Status CheckTime(const std::string& when, OpenedCache& opened, std::string* why) {
  const int64_t taken = TimeOfText(opened.capture->GetCapture().taken).value_or(0);
  const Span span = {taken, taken};
  if (when == "first" || when == "last") return kOk;
  opened.asked = TimeOf(when, span);
  if (!opened.asked) return NotATime(when, span, why);
  return *opened.asked >= taken ? kOk : NotSoEarly(span, why);
}

// The moment of the time that was asked for. A time of day that is only later than the last moment,
// where the clock was set back, is of that day.
Status FindTime(const std::string& when, OpenedCache& opened) {
  RecordingFile& recording = *opened.recording;
  const Status status = recording.FindMoment(*opened.asked, opened.number);
  if (status != kOk || opened.number >= 0) return status;
  opened.asked = TimeOf(when, recording.Times()).value_or(*opened.asked);
  return recording.FindMoment(*opened.asked, opened.number);
}

Status ChooseMoment(const std::optional<std::string>& when, OpenedCache& opened, std::string* why) {
  RecordingFile& recording = *opened.recording;
  const std::vector<RecordingFile::Part>& parts = recording.Parts();
  if (parts.empty()) {
    *why = "it has no moments yet";
    return KSI_STATUS_NOT_FOUND;
  }
  opened.isLast = !when || *when == "last";
  if (opened.isLast) {
    opened.number = parts.back().End() - 1;
    return kOk;
  }
  if (*when == "first") {
    opened.number = parts.front().number;
    return kOk;
  }
  const Span span = {parts.front().first, parts.back().last};
  opened.asked = TimeOf(*when, span);
  if (!opened.asked) return NotATime(*when, recording.Times(), why);
  const std::optional<int64_t> back = TimeBack(*when);
  const Status status = back ? EarlierMoment(recording).Find(*back, opened.number, *opened.asked)
                             : FindTime(*when, opened);
  if (status != kOk) {
    *why = recording.Why();
    return status;
  }
  return opened.number >= 0 ? kOk : NotSoEarly(recording.Times(), why);
}

Status ReadMomentOf(OpenedCache& opened, ChunkReader& moment) {
  const int64_t wanted = opened.number;
  if (!opened.isLast) return opened.recording->ReadMoment(wanted, moment);
  const Status status = opened.recording->ReadLast(moment, opened.number);
  if (status == kOk && opened.number != wanted) {
    opened.remark =
        "its last moments are damaged; this is the one of " + TextOfTime(moment.Facts().taken);
  }
  return status;
}

}  // namespace

Status OpenCache(const std::string& name, OpenedCache* opened, std::string* why) {
  const Wanted wanted = WantedOf(name);
  auto database = std::make_unique<CacheDatabase>();
  Status status = database->Open(wanted.fileName.c_str());
  if (status != kOk) {
    *why = database->Why();
    return status;
  }
  OpenedCache made;
  opened->isMoment = database->Version() != cache::kSchemaVersion || wanted.when;
  made.isMoment = opened->isMoment;
  made.hasWhen = wanted.when.has_value();
  if (database->Version() == cache::kSchemaVersion) {
    status = CacheFile::Make(std::move(database), &made.capture, why);
    if (status == kOk && wanted.when) status = CheckTime(*wanted.when, made, why);
  } else {
    status = RecordingFile::Make(std::move(database), &made.recording, why);
    if (status == kOk) status = ChooseMoment(wanted.when, made, why);
  }
  if (status == kOk) *opened = std::move(made);
  return status;
}

Status ReadCache(const std::string& name, OpenedCache* opened, ChunkReader* moment,
                 std::string* why) {
  Status status = kOk;
  // Whoever reads while a recorder writes may see the one half of what it does.
  for (int tries = 3; tries != 0; --tries) {
    status = OpenCache(name, opened, why);
    if (status == kOk && opened->recording == nullptr) return kOk;
    if (status == kOk) {
      *moment = {};
      status = ReadMomentOf(*opened, *moment);
      *why = opened->recording->Why();
      if (status == kOk && !opened->remark.empty() && tries != 1) continue;
    }
    if (status != KSI_STATUS_METADATA_READ_ERROR || !opened->isMoment) return status;
  }
  return status;
}

Status OpenCacheSource(const char* name, std::unique_ptr<Source>* source) {
  OpenedCache opened;
  ChunkReader moment;
  std::string why;
  const Status status = ReadCache(name, &opened, &moment, &why);
  if (status != kOk) {
    // Of a damaged capture the program says what the status does.
    if (!why.empty() && opened.isMoment)
      Warning("%s: %s\n", Printable(name).c_str(), Printable(why).c_str());
    return status;
  }
  if (!opened.remark.empty()) {
    Warning("%s: %s\n", Printable(name).c_str(), Printable(opened.remark).c_str());
  }
  if (opened.recording == nullptr) {
    *source = std::make_unique<CacheSource>(name, std::move(opened.capture));
  } else {
    *source = std::make_unique<MomentSource>(name, std::move(opened.recording), opened.number,
                                             std::move(moment));
  }
  return status;
}

}  // namespace ksi
