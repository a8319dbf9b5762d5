#include "tools/ksicache/diff/steady.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <functional>
#include <limits>
#include <memory>
#include <random>
#include <tuple>
#include <unordered_map>
#include <utility>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/recording/when.h"
#include "knvlibs/times.h"
#include "tools/ksicache/complaints.h"
#include "tools/ksicache/diff/moments.h"
#include "tools/ksicache/diff/slope.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

// So many moments of more than these are read.
constexpr size_t kMostSamples = 200;
constexpr size_t kFewMoments = 400;

// All figures of all samples take no more than this.
constexpr size_t kMostFigures = size_t{32} << 20;

constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

// The moments that are looked at.
struct Stretch {
  int64_t from;
  int64_t to;
  bool isSinceBoot;
  int64_t moments;  // about so many
};

Stretch StretchOf(const std::string& name, int64_t since) {
  const std::string fileName = FileNameOf(name);
  if (!IsRecording(fileName)) throw DataError("--since takes a recording");
  const std::unique_ptr<ksi::RecordingFile> recording = OpenRecording(fileName);
  const auto& parts = recording->Parts();
  if (parts.empty()) throw DataError("it has no moments yet");
  const ksi::Span all = {parts.front().first, parts.back().last};
  Stretch stretch = {0, all.last, false, 0};
  if (name != fileName) {
    const std::string when = name.substr(fileName.size() + 1);
    const std::optional<int64_t> time = ksi::TimeOf(when, all);
    if (!time) throw DataError(when + " is no time");
    stretch.to = std::min(*time, all.last);
  }
  stretch.from = std::max(all.first, stretch.to - std::min(since, stretch.to));
  // Back to where another boot's moments are; chunks are of one boot.
  std::string boot;
  int64_t begin = stretch.to;
  for (auto part = parts.rbegin(); part != parts.rend() && begin > stretch.from; ++part) {
    if (part->first > stretch.to || part->number != part->chunk) continue;
    ksi::HostIdentity host;
    if (recording->ReadHost(*part, host) != ksi::kOk) {
      throw DataError("damaged: " + recording->Why());
    }
    if (begin != stretch.to && host.boot != boot) {
      stretch.from = begin;
      stretch.isSinceBoot = true;
      break;
    }
    boot = host.boot;
    begin = part->first;
  }
  for (const ksi::RecordingFile::Part& part : parts) {
    if (part.last >= stretch.from && part.first <= stretch.to) stretch.moments += part.moments;
  }
  return stretch;
}

// Which moments are read: all of a few, or one in each of many stretches of the same length,
// anywhere in it. So what goes up and down does not look as if it went slowly up.
class Choice {
 public:
  explicit Choice(const Stretch& stretch)
      : from_(static_cast<double>(stretch.from)),
        step_(stretch.moments <= int64_t{kFewMoments}
                  ? 0
                  : static_cast<double>(stretch.to - stretch.from) / kMostSamples) {}

  bool Takes(int64_t taken) {
    const auto time = static_cast<double>(taken);
    if (step_ == 0) return true;
    if (time < due_) return false;
    const double next = std::floor((time - from_) / step_) + 1;
    const double anywhere =
        static_cast<double>(random_()) / static_cast<double>(std::mt19937::max());
    due_ = from_ + (next + anywhere) * step_;
    return true;
  }

 private:
  double from_;
  double step_;
  double due_ = 0;
  std::mt19937 random_;
};

// A figure of a thing, at each sample from its first on.
struct Series {
  const PartInfo* info = nullptr;
  std::string name;
  int64_t number = -1;
  std::optional<int64_t> limit;
  size_t first = 0;
  std::vector<double> figures;
};

class Collector {
 public:
  Collector(const std::string& name, const Stretch& stretch) : choice_(stretch) {
    complaints_.BeginFile(name);
    result_.isSinceBoot = stretch.isSinceBoot;
    for (const char* figure : {"free", "in use", "  kernel", "  caches", "  others"}) {
      host_.emplace_back().name = figure;
    }
  }

  void Visit(const Origin& origin) {
    if (result_.moments++ == 0) result_.first = origin;
    result_.last = origin;
    if (choice_.Takes(origin.taken)) Take(origin);
  }

  // Whether nothing was missing.
  bool IsWhole() const { return complaints_.IsEmpty(); }

  SteadyGrowths Finish() {
    if (times_.size() < kStretches) {
      throw DataError("it has " + std::to_string(times_.size()) +
                      " moments in that time, and a trend takes " + std::to_string(kStretches));
    }
    result_.samples = times_.size();
    for (const Series& series : host_) result_.host.push_back(GrowthOf(series));
    TellWhenFull(result_.host.front());
    for (const auto& part : parts_) {
      for (const auto& [identity, series] : part) Add(series);
    }
    for (auto* growths : {&result_.things, &result_.groups}) {
      std::ranges::sort(*growths, [](const SteadyGrowth& a, const SteadyGrowth& b) {
        return std::tie(*b.growth, a.name, a.number) < std::tie(*a.growth, b.name, b.number);
      });
    }
    return std::move(result_);
  }

 private:
  void Take(const Origin& origin) {
    const Memory memory = ReadMemory(origin, {.isAll = true});
    complaints_.SayDiagnostics();
    for (const std::string& complaint : memory.complaints) complaints_.Say(complaint);
    const auto& host = memory.host;
    const bool isKnown = host.total && host.free;
    const std::optional<int64_t> used =
        isKnown ? std::make_optional(*host.total - *host.free) : std::nullopt;
    const std::optional<int64_t> figures[] = {host.free, used, host.kernel, host.caches,
                                              host.others};
    for (size_t i = 0; i < host_.size(); ++i) Put(figures[i], host_[i]);
    for (const PartInfo& info : kParts) {
      // What a heap uses tells more than its size, which grows in steps.
      if (info.part == Part::heaps || !memory.Of(info.part)) continue;
      for (const Amount& amount : *memory.Of(info.part)) TakeAmount(info, amount);
    }
    times_.push_back(static_cast<double>(origin.taken) / ksi::kSecond);
  }

  void TakeAmount(const PartInfo& info, const Amount& amount) {
    auto& part = parts_[static_cast<size_t>(info.part)];
    const auto [found, isNew] = part.try_emplace(amount.identity);
    Series& series = found->second;
    if (isNew) series = {&info, amount.name, amount.number, {}, times_.size(), {}};
    series.limit = amount.limit;
    Put(amount.bytes, series);
  }

  // The figure of the sample at hand.
  void Put(std::optional<int64_t> bytes, Series& series) {
    const size_t place = times_.size() - series.first;
    if (place < series.figures.size()) return;  // one identity twice
    if (figures_ += place + 1 - series.figures.size(); figures_ > kMostFigures) {
      throw DataError("there is too much in it for one look: a shorter time takes less memory");
    }
    series.figures.resize(place, kNone);
    series.figures.push_back(bytes ? static_cast<double>(*bytes) : kNone);
  }

  // The figure of its thing, or what is lost of it. Whoever has it no more, or has not had it for
  // half of the time, is told nothing of.
  std::vector<Point> PointsOf(const Series& series, double sign) const {
    std::vector<Point> points;
    const bool isThere = series.first + series.figures.size() == times_.size();
    if (!isThere || series.figures.size() < times_.size() / 2) return points;
    for (size_t i = 0; i < series.figures.size(); ++i) {
      if (std::isnan(series.figures[i])) continue;
      points.push_back({times_[series.first + i], sign * series.figures[i]});
    }
    if (!std::ranges::is_sorted(points, {}, &Point::x)) std::ranges::sort(points, {}, &Point::x);
    return points;
  }

  SteadyGrowth GrowthOf(const Series& series) const {
    SteadyGrowth growth = {series.name, series.number, series.info, {}, {}, {}, {}};
    if (!series.figures.empty() && !std::isnan(series.figures.back())) {
      growth.now = static_cast<int64_t>(series.figures.back());
    }
    // Things that grow are sought; the host's own figures are told whichever way they go.
    for (const double sign : {1.0, -1.0}) {
      const bool isSaved = series.info != nullptr && series.info->isSaved;
      if (series.info != nullptr && isSaved == (sign > 0)) continue;
      const std::vector<Point> points = PointsOf(series, sign);
      const std::optional<Trend> trend = TrendOf(points);
      if (!trend || !trend->IsSteady()) continue;
      const double direction = isSaved ? 1 : sign;
      growth.perSecond = direction * MedianSlope(points);
      growth.growth = direction * trend->grown;
    }
    return growth;
  }

  void Add(const Series& series) {
    SteadyGrowth growth = GrowthOf(series);
    if (growth.growth.value_or(0) <= 0) return;
    if (growth.now && series.limit && *series.limit > *growth.now) {
      growth.fullIn = static_cast<double>(*series.limit - *growth.now) / *growth.perSecond;
    }
    const bool isGroup = series.info->part == Part::groups;
    (isGroup ? result_.groups : result_.things).push_back(std::move(growth));
  }

  static void TellWhenFull(SteadyGrowth& free) {
    if (!free.now || free.perSecond.value_or(0) >= 0) return;
    free.fullIn = static_cast<double>(*free.now) / -*free.perSecond;
  }

  Complaints complaints_;
  Choice choice_;
  SteadyGrowths result_;
  std::vector<double> times_;  // of the samples, s since 1970
  std::vector<Series> host_;
  std::array<std::unordered_map<std::string, Series>, std::size(kParts)> parts_;
  size_t figures_ = 0;
};

}  // namespace

double SteadyGrowths::Largest() const {
  double largest = 0;
  for (const auto* growths : {&host, &things, &groups}) {
    for (const SteadyGrowth& growth : *growths) {
      // More free memory is no growth.
      if (&growth == &host.front()) continue;
      largest = std::max(largest, growth.growth.value_or(0));
    }
  }
  return largest;
}

SteadyGrowths FindSteady(const std::string& name, int64_t since, bool& isWhole) {
  try {
    const Stretch stretch = StretchOf(name, since);
    Collector collector(name, stretch);
    ForEachMoment(
        FileNameOf(name) + "@" + ksi::TextOfTime(stretch.from) + ".." + ksi::TextOfTime(stretch.to),
        [&](const Origin& origin) { collector.Visit(origin); });
    isWhole = collector.IsWhole();
    return collector.Finish();
  } catch (const DataError& error) {
    throw Error(name + ": " + error.what());
  }
}

}  // namespace ksicache
