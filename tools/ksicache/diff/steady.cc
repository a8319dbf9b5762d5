#include "tools/ksicache/diff/steady.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <functional>
#include <limits>
#include <memory>
#include <random>
#include <ranges>
#include <span>
#include <tuple>
#include <unordered_map>
#include <utility>

#include "knvlibs/recording/recording_file.h"
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

// When a moment was taken, us since 1970: as the clock said, and as it would have said had it been
// set all the time as at the last moment.
struct Time {
  int64_t taken;
  int64_t even;
};

// The moments that are looked at, in the order in which they were recorded.
struct Stretch {
  std::string fileName;
  std::vector<Time> times;
  bool isSinceBoot = false;
  bool isShort = false;
};

// Finds the moments of one boot that end with a given one.
class Search {
 public:
  Search(const std::string& name, int64_t since)
      : named_(Open(name, FileNameOf(name))), since_(since) {
    stretch_.fileName = FileNameOf(name);
  }

  Stretch Run() {
    const auto& parts = named_.recording->Parts();
    if (parts.empty()) throw DataError("it has no moments yet");
    for (auto part = parts.rbegin(); part != parts.rend() && !isOver_; ++part) {
      if (part->number > named_.number) continue;
      Take(*part);
      // Chunks are of one boot.
      if (part->number == part->chunk) EndChunk(*part);
    }
    stretch_.times.insert(stretch_.times.end(), chunk_.begin(), chunk_.end());
    std::ranges::reverse(stretch_.times);
    TellIfShort();
    return std::move(stretch_);
  }

 private:
  static NamedMoment Open(const std::string& name, const std::string& fileName) {
    if (!IsRecording(fileName)) {
      static_cast<void>(HeadOf(fileName));  // says what is wrong with one that is nothing
      throw DataError("--since takes a recording");
    }
    return OpenNamed(name);
  }

  // What cannot be read is said when it is come to.
  void Take(const ksi::RecordingFile::Part& part) {
    std::vector<ksi::MomentFacts> facts;
    if (named_.recording->ReadFacts(part, facts) != ksi::kOk) return;
    for (size_t i = facts.size(); i-- > 0;) {
      if (part.number + static_cast<int64_t>(i) > named_.number) continue;
      if (last_.taken == 0) last_ = facts[i];
      const Time time = {facts[i].taken, EvenTime(facts[i])};
      isOver_ = time.even < last_.taken - since_;
      if (isOver_) return;
      chunk_.push_back(time);
    }
  }

  int64_t EvenTime(const ksi::MomentFacts& facts) const {
    const bool isKnown = facts.uptime != 0 && last_.uptime != 0;
    return isKnown ? last_.taken - (last_.uptime - facts.uptime) : facts.taken;
  }

  void EndChunk(const ksi::RecordingFile::Part& start) {
    ksi::HostIdentity host;
    const bool isRead = named_.recording->ReadHost(start, host) == ksi::kOk;
    if (isRead && boot_ && *boot_ != host.boot) {
      stretch_.isSinceBoot = isOver_ = true;
      chunk_.clear();
    }
    if (isRead) boot_ = host.boot;
    stretch_.times.insert(stretch_.times.end(), chunk_.begin(), chunk_.end());
    chunk_.clear();
  }

  // Whether much of the time lies before the recording.
  void TellIfShort() {
    if (isOver_ || stretch_.times.empty()) return;
    const int64_t missing = stretch_.times.front().even - (last_.taken - since_);
    stretch_.isShort = missing > since_ / 20;
  }

  NamedMoment named_;
  int64_t since_;
  ksi::MomentFacts last_ = {};
  std::optional<std::string> boot_;
  std::vector<Time> chunk_;  // of the chunk at hand; these and those of `stretch_` backwards
  bool isOver_ = false;      // no earlier moment is wanted
  Stretch stretch_;
};

// The moments of a stretch as they are come to.
std::string SpanOf(const Stretch& stretch) {
  const auto [first, last] = std::ranges::minmax(stretch.times, {}, &Time::taken);
  return stretch.fileName + "@" + ksi::TextOfTime(first.taken) + ".." + ksi::TextOfTime(last.taken);
}

// Which moments are read: all of a few, or one in each of many stretches of the same length,
// anywhere in it. So what goes up and down does not look as if it went slowly up.
class Choice {
 public:
  explicit Choice(const std::vector<Time>& times)
      : from_(static_cast<double>(times.front().even)),
        step_(times.size() <= kFewMoments
                  ? 0
                  : static_cast<double>(times.back().even - times.front().even) / kMostSamples) {}

  bool Takes(int64_t taken) {
    const auto time = static_cast<double>(taken);
    if (step_ == 0) return true;
    if (time < due_) return false;
    // The stretch after the one that was due, or where there were no moments for long the next.
    place_ = std::max(place_ + 1, std::floor((time - from_) / step_));
    const double anywhere =
        static_cast<double>(random_()) / static_cast<double>(std::mt19937::max());
    due_ = from_ + (place_ + anywhere) * step_;
    return true;
  }

 private:
  double from_;
  double step_;
  double place_ = 0;
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
  explicit Collector(const Stretch& stretch) : wanted_(stretch.times), choice_(stretch.times) {
    complaints_.BeginFile(stretch.fileName);
    result_.isSinceBoot = stretch.isSinceBoot;
    result_.isShort = stretch.isShort;
    for (const char* figure : {"free", "in use", "  kernel", "  caches", "  others"}) {
      host_.emplace_back().name = figure;
    }
  }

  // Moments come as they were recorded, and among them such as are not wanted.
  void Visit(const Origin& origin) {
    const auto found = std::ranges::find(wanted_, origin.taken, &Time::taken);
    if (found == wanted_.end()) return;
    wanted_ = {found + 1, wanted_.end()};
    if (result_.moments++ == 0) {
      result_.first = origin;
      begin_ = found->even;
    }
    result_.last = origin;
    result_.seconds = static_cast<double>(found->even - begin_) / ksi::kSecond;
    if (choice_.Takes(found->even)) Take(origin, found->even);
  }

  void Complain(const std::string& text) {
    complaints_.SayDiagnostics();
    complaints_.Say(text);
  }

  // Whether nothing was missing.
  bool IsWhole() const { return complaints_.IsEmpty(); }

  SteadyGrowths Finish() {
    complaints_.SayDiagnostics();
    if (times_.size() < kStretches) {
      throw DataError("it has " + std::to_string(times_.size()) +
                      " moments in that time, and a trend takes " + std::to_string(kStretches));
    }
    result_.samples = times_.size();
    for (const Series& series : host_) result_.host.push_back(GrowthOf(series));
    SteadyGrowth& free = result_.host.front();
    if (free.now && free.perSecond) {
      TellWhenFull(static_cast<double>(*free.now), -*free.perSecond, free);
    }
    for (const auto& part : parts_) {
      for (const auto& [identity, series] : part) Add(series);
    }
    LeaveOutRepeated();
    for (auto* growths : {&result_.things, &result_.groups}) {
      std::ranges::sort(*growths, [](const SteadyGrowth& a, const SteadyGrowth& b) {
        return std::tie(*b.growth, a.name, a.number) < std::tie(*a.growth, b.name, b.number);
      });
    }
    return std::move(result_);
  }

 private:
  void Take(const Origin& origin, int64_t time) {
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
      if (info.part == Part::heaps) continue;
      const Things& things = memory.Of(info.part);
      for (const Amount& amount : things.amounts) TakeAmount(info, amount);
      if (things.isWhole) wholeEnds_[static_cast<size_t>(info.part)] = times_.size() + 1;
    }
    times_.push_back(static_cast<double>(time) / ksi::kSecond);
  }

  void TakeAmount(const PartInfo& info, const Amount& amount) {
    auto& part = parts_[static_cast<size_t>(info.part)];
    const auto [found, isNew] = part.try_emplace(amount.identity);
    Series& series = found->second;
    if (isNew) series = {&info, {}, amount.number, {}, times_.size(), {}};
    if (series.number != amount.number) series.number = -1;
    series.name = amount.name;
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

  // Whether it has been there for half of the time, and still is as far as can be told.
  bool IsThere(const Series& series) const {
    if (series.figures.size() < times_.size() / 2) return false;
    const size_t end = series.first + series.figures.size();
    if (series.info == nullptr) return end == times_.size();
    return end >= wholeEnds_[static_cast<size_t>(series.info->part)];
  }

  // The figure of its thing, or what is lost of it.
  std::vector<Point> PointsOf(const Series& series, double sign) const {
    std::vector<Point> points;
    if (!IsThere(series)) return points;
    for (size_t i = 0; i < series.figures.size(); ++i) {
      if (std::isnan(series.figures[i])) continue;
      points.push_back({times_[series.first + i], sign * series.figures[i]});
    }
    if (!std::ranges::is_sorted(points, {}, &Point::x)) std::ranges::sort(points, {}, &Point::x);
    return points;
  }

  SteadyGrowth GrowthOf(const Series& series) const {
    SteadyGrowth growth;
    growth.name = series.name;
    growth.number = series.number;
    growth.info = series.info;
    const auto known = std::find_if_not(series.figures.rbegin(), series.figures.rend(),
                                        [](double figure) { return std::isnan(figure); });
    const bool isNow = series.info != nullptr || known == series.figures.rbegin();
    if (isNow && known != series.figures.rend()) growth.now = static_cast<int64_t>(*known);
    // Things that grow are sought; the host's own figures are told whichever way they go.
    for (const double sign : {1.0, -1.0}) {
      const bool isSaved = series.info != nullptr && series.info->isSaved;
      if (series.info != nullptr && isSaved == (sign > 0)) continue;
      const std::vector<Point> points = PointsOf(series, sign);
      const std::optional<Trend> trend = TrendOf(points);
      if (!trend || !trend->IsSteady()) continue;
      const double direction = isSaved ? 1 : sign;
      growth.growth = direction * trend->grown;
      TellWhen(points, direction, growth);
    }
    return growth;
  }

  // How fast it grew while it did, and when that was.
  static void TellWhen(const std::vector<Point>& points, double direction, SteadyGrowth& growth) {
    const Ramp ramp = RampOf(points);
    const auto begin = std::ranges::lower_bound(points, ramp.begin, {}, &Point::x);
    const auto end = std::ranges::upper_bound(points, ramp.end, {}, &Point::x);
    growth.perSecond = direction * MedianSlope(std::span(begin, end));
    const auto time = [](double x) { return static_cast<int64_t>(x * ksi::kSecond); };
    if (ramp.begin > points.front().x) growth.begun = time(ramp.begin);
    if (ramp.end < points.back().x) growth.stopped = time(ramp.end);
  }

  void Add(const Series& series) {
    SteadyGrowth growth = GrowthOf(series);
    if (growth.growth.value_or(0) <= 0) return;
    // One that had a name to itself all the time is told of by itself.
    if (series.info->part == Part::worldsOfName && series.number >= 0) return;
    if (growth.now && series.limit && *series.limit > *growth.now) {
      TellWhenFull(static_cast<double>(*series.limit - *growth.now), *growth.perSecond, growth);
    }
    const bool isGroup = series.info->part == Part::groups;
    (isGroup ? result_.groups : result_.things).push_back(std::move(growth));
  }

  // `room`: so much more fits in.
  static void TellWhenFull(double room, double perSecond, SteadyGrowth& growth) {
    if (growth.stopped || perSecond <= 0) return;
    constexpr double kFarOff = 10 * 365 * 86400.0;
    if (room / perSecond < kFarOff) growth.fullIn = room / perSecond;
  }

  // What the host lost of page sharing is what its machines lost, and what all processes of a name
  // took may be what one of them did.
  void LeaveOutRepeated() {
    const auto isOf = [](Part part) {
      return [part](const SteadyGrowth& thing) { return thing.info->part == part; };
    };
    auto& things = result_.things;
    if (std::ranges::any_of(things, isOf(Part::machineSharing))) {
      std::erase_if(things, isOf(Part::hostSharing));
    }
    const std::vector<SteadyGrowth> all = things;
    std::erase_if(things, [&](const SteadyGrowth& sum) {
      return sum.info->part == Part::worldsOfName &&
             std::ranges::any_of(all, [&](const SteadyGrowth& one) {
               return one.info->part == Part::userWorlds && one.name == sum.name &&
                      *one.growth > *sum.growth / 2;
             });
    });
  }

  Complaints complaints_;
  std::span<const Time> wanted_;  // those that are still to come
  Choice choice_;
  int64_t begin_ = 0;
  SteadyGrowths result_;
  std::vector<double> times_;  // of the samples, s since 1970
  std::vector<Series> host_;
  std::array<std::unordered_map<std::string, Series>, std::size(kParts)> parts_;
  std::array<size_t, std::size(kParts)> wholeEnds_ =
      {};  // behind the last sample that has it whole
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
    const Stretch stretch = Search(name, since).Run();
    if (stretch.times.empty()) throw DataError("none of its moments can be read");
    Collector collector(stretch);
    try {
      ForEachMoment(SpanOf(stretch), [&](const Origin& origin) { collector.Visit(origin); });
    } catch (const DataError& error) {
      collector.Complain(error.what());
    }
    SteadyGrowths growths = collector.Finish();
    isWhole = collector.IsWhole();
    return growths;
  } catch (const DataError& error) {
    throw Error(name + ": " + error.what());
  }
}

}  // namespace ksicache
