#include "knvlibs/recording/earlier_moment.h"

#include <algorithm>
#include <iterator>

#include "knvlibs/times.h"

namespace ksi {

Status EarlierMoment::Find(int64_t before, int64_t& number, int64_t& asked) {
  // Up to the end of the second that is asked for.
  const int64_t time = file_.Parts().back().last - before;
  const int64_t rest = kSecond - 1 - (time - SecondOf(time) * kSecond);
  const Status status = FindPassed(before - rest, number, asked);
  asked -= rest;
  return status;
}

Status EarlierMoment::FindFirst(int64_t before, int64_t& number, int64_t& asked) {
  const Status status = Find(before + kSecond, number, asked);
  asked += kSecond;
  ++number;
  return status;
}

Status EarlierMoment::FindPassed(int64_t before, int64_t& number, int64_t& asked) {
  const size_t end = file_.Parts().size() - 1;
  Known last;
  // Of a last moment that is damaged its row is known.
  const bool hasUptime = Read(end, last) == kOk && last.facts.back().uptime != 0;
  Status status = FindByWall(file_.Parts()[end].last - before, number, asked);
  if (status != kOk || !hasUptime) return status;
  bool isByWall = false;
  if (number >= 0) status = IsByWall(number, last, isByWall);
  return status != kOk || isByWall ? status : FindByUptime(end, before, number, asked);
}

Status EarlierMoment::Read(size_t part, Known& known) {
  HostIdentity host;
  Status status = file_.ReadFacts(file_.Parts()[part], known.facts);
  if (status == kOk) status = file_.ReadHost(file_.Parts()[part], host);
  known.boot = host.boot;
  return status;
}

Status EarlierMoment::FindByWall(int64_t time, int64_t& number, int64_t& asked) {
  asked = time;
  return file_.FindMoment(time, number);
}

// Whether both clocks went alike from a moment to the last one.
Status EarlierMoment::IsByWall(int64_t number, const Known& last, bool& is) {
  const std::vector<Part>& parts = file_.Parts();
  const auto part = std::prev(std::ranges::upper_bound(parts, number, {}, &Part::number));
  Known known;
  const Status status = Read(static_cast<size_t>(part - parts.begin()), known);
  if (status != kOk) return status;
  const MomentFacts& from = known.facts[static_cast<size_t>(number - part->number)];
  const MomentFacts& to = last.facts.back();
  const int64_t step = (to.taken - from.taken) - (to.uptime - from.uptime);
  is = known.boot == last.boot && from.uptime != 0 && step >= -kSecond && step <= kSecond;
  return kOk;
}

// Goes back from the end of a part, boot by boot.
Status EarlierMoment::FindByUptime(size_t part, int64_t before, int64_t& number, int64_t& asked) {
  for (;;) {
    Known known;
    Known first;
    size_t start = 0;
    Status status = Read(part, known);
    if (status != kOk) return status;
    const MomentFacts from = known.facts.back();
    if (from.uptime == 0) return FindByWall(from.taken - before, number, asked);
    status = FindStart(part, known, start);
    if (status == kOk) status = Read(start, first);
    if (status != kOk) return status;
    const MomentFacts to = first.facts.front();
    const int64_t passed = from.uptime - to.uptime;
    if (before <= passed) return FindIn(start, part, from.uptime - before, number, asked);
    number = -1;
    if (start == 0) return kOk;
    before -= passed;
    part = start - 1;
    const Part& earlier = file_.Parts()[part];
    const int64_t down = std::max<int64_t>(to.taken - earlier.last, 0);
    if (before <= down) {
      number = earlier.End() - 1;
      asked = earlier.last + (down - before);
      return kOk;
    }
    before -= down;
  }
}

// The first part of the boot that a part is of.
Status EarlierMoment::FindStart(size_t part, const Known& known, size_t& start) {
  size_t from = 0;
  for (start = part; from < start;) {
    const size_t middle = from + (start - from) / 2;
    Known its;
    const Status status = Read(middle, its);
    if (status != kOk) return status;
    const bool isOfIt = its.boot == known.boot && its.facts.front().uptime != 0 &&
                        its.facts.front().uptime <= known.facts.front().uptime;
    isOfIt ? start = middle : from = middle + 1;
  }
  return kOk;
}

// The last moment of these parts up to an uptime, or the first one.
Status EarlierMoment::FindIn(size_t from, size_t to, int64_t uptime, int64_t& number,
                             int64_t& asked) {
  Known known;
  while (from < to) {
    const size_t middle = from + (to - from + 1) / 2;
    const Status status = Read(middle, known);
    if (status != kOk) return status;
    known.facts.front().uptime <= uptime ? from = middle : to = middle - 1;
  }
  const Status status = Read(from, known);
  if (status != kOk) return status;
  const auto after = std::ranges::upper_bound(known.facts, uptime, {}, &MomentFacts::uptime);
  const auto found = after == known.facts.begin() ? after : std::prev(after);
  number = file_.Parts()[from].number + (found - known.facts.begin());
  asked = found->taken + uptime - found->uptime;
  return kOk;
}

}  // namespace ksi
