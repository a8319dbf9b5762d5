#include "tools/ksicache/diff/steady_memory.h"

#include <algorithm>

#include "tools/ksicache/diff/figure.h"

namespace ksicache {
namespace {

using Growths = std::vector<SteadyGrowth>;

bool HasPart(const Growths& growths, Part part) {
  return std::ranges::any_of(growths,
                             [part](const SteadyGrowth& one) { return one.info->part == part; });
}

// Whether what all user worlds of a name took is what one of them did.
bool IsOfOne(const SteadyGrowth& sum, const Growths& all) {
  return std::ranges::any_of(all, [&](const SteadyGrowth& one) {
    return one.info->part == Part::userWorlds && one.name == sum.name &&
           *one.growth > *sum.growth / 2;
  });
}

// What the host lost of page sharing is what its machines lost.
void LeaveOutRepeated(Growths& things, const Growths& all) {
  const bool hasMachines = HasPart(all, Part::machineSharing);
  std::erase_if(things, [&](const SteadyGrowth& thing) {
    if (thing.info->part == Part::hostSharing) return hasMachines;
    return thing.info->part == Part::worldsOfName && IsOfOne(thing, all);
  });
}

}  // namespace

MemorySampler::MemorySampler() {
  for (const char* figure : {"free", "in use", "kernel", "caches", "others"}) {
    host_.emplace_back().name = figure;
  }
}

void MemorySampler::Take(const Origin& origin, Samples& samples, Complaints& complaints) {
  const Memory memory = ReadMemory(origin, {.isAll = true});
  complaints.SayDiagnostics();
  for (const std::string& complaint : memory.complaints) complaints.Say(complaint);
  TakeHost(memory.host, samples);
  for (const PartInfo& info : kParts) {
    // What a heap uses tells more than its size, which grows in steps.
    if (info.part == Part::heaps) continue;
    PartSeries& part = parts_[static_cast<size_t>(info.part)];
    for (const Amount& amount : memory.Of(info.part).amounts) TakeAmount(amount, samples, part);
    if (memory.Of(info.part).isWhole) part.end = samples.Count();
  }
}

void MemorySampler::TakeHost(const HostMemory& host, Samples& samples) {
  const MaybeFigure figures[] = {host.free, Less(host.total, host.free), host.kernel, host.caches,
                                 host.others};
  for (size_t i = 0; i < host_.size(); ++i) samples.Put(figures[i], host_[i]);
}

void MemorySampler::TakeAmount(const Amount& amount, Samples& samples, PartSeries& part) {
  Series& series = samples.At(amount.identity, part.all);
  if (series.figures.empty()) series.number = amount.number;
  if (series.number != amount.number) series.number = -1;
  series.name = amount.name;
  series.limit = amount.limit;
  samples.Put(amount.bytes, series);
}

void MemorySampler::Finish(const Samples& samples, SteadyGrowths& growths) {
  for (const Series& series : host_) growths.host.push_back(HostGrowth(samples, series));
  SteadyGrowth& free = growths.host.front();
  if (free.now && free.perSecond) {
    TellWhenFull(static_cast<double>(*free.now), -*free.perSecond, free);
  }
  for (const PartInfo& info : kParts) {
    AddPart(samples, info, parts_[static_cast<size_t>(info.part)], growths);
  }
  Growths all = growths.things;
  LeaveOutRepeated(growths.things, all);
  all.insert(all.end(), growths.late.begin(), growths.late.end());
  LeaveOutRepeated(growths.late, all);
}

// It is told whichever way it went.
SteadyGrowth MemorySampler::HostGrowth(const Samples& samples, const Series& series) {
  SteadyGrowth growth;
  growth.name = series.name;
  for (const double sign : {1.0, -1.0}) {
    const std::vector<Point> points = samples.PointsOf(series, sign, samples.Count());
    const std::optional<Course> course = SteadyCourse(points);
    if (course) growth = GrowthOf(series, *course, sign);
  }
  growth.now = series.Now();
  return growth;
}

void MemorySampler::AddPart(const Samples& samples, const PartInfo& info, const PartSeries& part,
                            SteadyGrowths& growths) {
  const bool isGroup = info.part == Part::groups;
  for (const auto& [identity, series] : part.all) {
    // One that had a name to itself all the time is told of by itself.
    if (info.part == Part::worldsOfName && series.number >= 0) continue;
    AddIfGrown(samples, series, &info, part.end, isGroup ? growths.groups : growths.things,
               isGroup ? nullptr : &growths.late);
  }
}

}  // namespace ksicache
