#include "tools/ksicache/diff/moments.h"

#include <optional>

#include <knvlibs/ksi.h>
#include "knvlibs/open_cache.h"
#include "knvlibs/times.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

// The boot that a moment is of, and how long the host had run then, in us; empty and 0 if it does
// not tell.
struct Run {
  std::string boot;
  int64_t uptime = 0;
};

Run RunOf(const std::string& name) {
  if (name.empty()) return {};
  ksi::OpenedCache opened;
  ksi::ChunkReader moment;
  std::string why;
  const ksi::Status status = ksi::ReadCache(name, &opened, &moment, &why);
  if (status != ksi::kOk || opened.recording == nullptr) return {};
  return {moment.Host().boot, moment.Facts().uptime};
}

Origin OriginOf(const std::string& name) {
  if (name.empty()) return LiveOrigin();
  const MomentHead head = HeadOf(name);
  return {head.host, ksi::TextOfTime(head.taken), head.taken};
}

void Read(const std::string& name, const std::function<void(const Origin&)>& read) {
  name.empty() ? read(LiveOrigin()) : ForEachMoment(name, read);
}

// Does something with a moment; what is wrong with it is told with its name.
template <class Do>
auto With(const std::string& name, Do&& act) {
  try {
    return act(name);
  } catch (const DataError& error) {
    throw Error(name.empty() ? error.what() : name + ": " + error.what());
  }
}

}  // namespace

MomentNames NamesOf(const std::vector<std::string>& arguments) {
  if (arguments.size() > 1) return {arguments[0], arguments[1]};
  const std::string& name = arguments[0];
  if (const std::optional<NamedSpan> span = SpanOf(name)) {
    return {span->fileName + "@" + (span->from.empty() ? "first" : span->from),
            span->fileName + "@" + (span->to.empty() ? "last" : span->to)};
  }
  const std::string fileName = FileNameOf(name);
  if (!IsRecording(fileName)) return {name, ""};
  return {name == fileName ? fileName + "@first" : name, fileName + "@last"};
}

double Sides::Seconds() const {
  return static_cast<double>(ran.value_or(after.taken - before.taken)) /
         static_cast<double>(ksi::kSecond);
}

std::string Sides::Title() const {
  std::string title = before.host + ", " + before.time + " to ";
  if (after.host != before.host) title += after.host + ", ";
  title += after.time + ": " + DurationText(Seconds());
  if (Seconds() < 0) title += ", the later one first";
  if (Seconds() > 0 && after.taken < before.taken) title += ", the clock was set back";
  return title;
}

Sides SidesOf(const MomentNames& names, bool mayDiffer) {
  Sides sides = {
      .names = names, .before = With(names.before, OriginOf), .after = With(names.after, OriginOf)};
  if (!mayDiffer && sides.before.host != sides.after.host) {
    throw Error("they are of two hosts, " + sides.before.host + " and " + sides.after.host +
                ": --across-hosts compares them");
  }
  const Run from = RunOf(names.before);
  const Run to = RunOf(names.after);
  sides.isRebooted = !from.boot.empty() && !to.boot.empty() && from.boot != to.boot;
  const bool isOneFile = FileNameOf(names.before) == FileNameOf(names.after);
  const bool isOneBoot = from.boot == to.boot && (isOneFile || !from.boot.empty());
  if (isOneBoot && from.uptime != 0 && to.uptime != 0) sides.ran = to.uptime - from.uptime;
  return sides;
}

void ReadBoth(const Sides& sides, const std::function<void(const Origin&, bool isAfter)>& read) {
  const auto readSide = [&](bool isAfter) {
    With(isAfter ? sides.names.after : sides.names.before, [&](const std::string& name) {
      Read(name, [&](const Origin& origin) { read(origin, isAfter); });
    });
  };
  // There is no way back from a file to the host.
  const bool isLive = sides.names.after.empty();
  readSide(isLive);
  readSide(!isLive);
}

}  // namespace ksicache
