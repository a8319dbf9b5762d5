#include "tools/ksicache/diff/moments.h"

#include <optional>

#include "knvlibs/times.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

MomentHead NowOf(const std::string& name) {
  if (!name.empty()) return HeadOf(name);
  const Origin live = LiveOrigin();
  return {live.host, live.taken};
}

Origin OriginOf(const MomentHead& head) {
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

int64_t PassedBetween(const Sides& sides) {
  return sides.ran.value_or(ksi::TimeBetween(sides.before.taken, sides.after.taken));
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

std::optional<double> Sides::Seconds() const {
  const int64_t passed = PassedBetween(*this);
  if (isInOrder && passed != 0 && *isInOrder != (passed > 0)) return std::nullopt;
  return static_cast<double>(passed) / static_cast<double>(ksi::kSecond);
}

bool Sides::IsBackward() const { return isInOrder ? !*isInOrder : PassedBetween(*this) < 0; }

std::string Sides::Title() const {
  std::string title = before.host + ", " + before.time + " to ";
  if (after.host != before.host) title += after.host + ", ";
  title += after.time;
  if (const std::optional<double> seconds = Seconds()) title += ": " + DurationText(*seconds);
  if (IsBackward()) title += ", the later one first";
  if (!IsBackward() && after.taken < before.taken) title += ", the clock was set back";
  return title;
}

Sides SidesOf(const MomentNames& names, bool mayDiffer) {
  const MomentHead from = With(names.before, NowOf);
  const MomentHead to = With(names.after, NowOf);
  Sides sides = {.names = names, .before = OriginOf(from), .after = OriginOf(to)};
  if (!mayDiffer && from.host != to.host) {
    throw Error("they are of two hosts, " + from.host + " and " + to.host +
                ": --across-hosts compares them");
  }
  sides.isRebooted = !from.boot.empty() && !to.boot.empty() && from.boot != to.boot;
  const bool isOneFile = FileNameOf(names.before) == FileNameOf(names.after);
  if (isOneFile && from.number && to.number) sides.isInOrder = *from.number <= *to.number;
  const bool isOneBoot = from.boot == to.boot && (isOneFile || !from.boot.empty());
  if (isOneBoot && from.uptime != 0 && to.uptime != 0) {
    sides.ran = ksi::TimeBetween(from.uptime, to.uptime);
  }
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
