#include "tools/ksicache/diff/steady.h"

#include <algorithm>
#include <span>
#include <tuple>
#include <utility>

#include "knvlibs/times.h"
#include "tools/ksicache/diff/stretch.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// Goes through the moments of a stretch and takes samples of some.
class Walk {
 public:
  Walk(const Stretch& stretch, Sampler& sampler)
      : sampler_(sampler), wanted_(stretch.times), choice_(stretch.times) {
    complaints_.BeginFile(stretch.fileName);
    result_.isSinceBoot = stretch.isSinceBoot;
    result_.isShort = stretch.isShort;
  }

  void Run(const std::string& name) {
    try {
      ForEachMoment(name, [this](const Origin& origin) { Visit(origin); });
    } catch (const DataError& error) {
      complaints_.SayDiagnostics();
      complaints_.Say(error.what());
    }
    complaints_.SayDiagnostics();
  }

  SteadyGrowths Finish() {
    if (samples_.Count() < kStretches) {
      throw DataError("it has " + std::to_string(samples_.Count()) +
                      " moments in that time, and a trend takes " + std::to_string(kStretches));
    }
    result_.samples = samples_.Count();
    sampler_.Finish(samples_, result_);
    for (auto* growths : {&result_.things, &result_.late, &result_.groups}) {
      std::ranges::sort(*growths, [](const SteadyGrowth& a, const SteadyGrowth& b) {
        return std::tie(*b.growth, a.name, a.number) < std::tie(*a.growth, b.name, b.number);
      });
    }
    return std::move(result_);
  }

  // Whether nothing was missing.
  bool IsWhole() const { return complaints_.IsEmpty(); }

 private:
  // Moments come as they were recorded, and among them such as are not wanted.
  void Visit(const Origin& origin) {
    const auto found = std::ranges::find(wanted_, origin.taken, &MomentTime::taken);
    if (found == wanted_.end()) return;
    wanted_ = {found + 1, wanted_.end()};
    if (result_.moments++ == 0) {
      result_.first = origin;
      begin_ = found->even;
    }
    result_.last = origin;
    result_.seconds = static_cast<double>(found->even - begin_) / ksi::kSecond;
    if (!choice_.Takes(found->even)) return;
    samples_.Begin(static_cast<double>(found->even) / ksi::kSecond);
    sampler_.Take(origin, samples_, complaints_);
  }

  Sampler& sampler_;
  Complaints complaints_;
  std::span<const MomentTime> wanted_;  // those that are still to come
  Choice choice_;
  int64_t begin_ = 0;
  Samples samples_;
  SteadyGrowths result_;
};

}  // namespace

double SteadyGrowths::Largest() const {
  double largest = 0;
  for (const auto* growths : {&host, &things, &groups}) {
    for (const SteadyGrowth& growth : *growths) {
      // More free memory is no growth.
      if (growths == &host && &growth == &host.front()) continue;
      largest = std::max(largest, growth.growth.value_or(0));
    }
  }
  return largest;
}

SteadyGrowth GrowthOf(const Series& series, const Course& course, double sign) {
  const auto time = [](std::optional<double> x) {
    return x ? std::make_optional(static_cast<int64_t>(*x * ksi::kSecond)) : std::nullopt;
  };
  SteadyGrowth growth;
  growth.name = series.name;
  growth.number = series.number;
  growth.now = series.Last();
  growth.growth = sign * course.growth;
  growth.perSecond = sign * course.perSecond;
  growth.begun = time(course.begun);
  growth.stopped = time(course.stopped);
  growth.steps = course.steps;
  if (course.steps != 0) growth.lastStep = time(course.lastStep);
  return growth;
}

void TellWhenFull(double room, double perSecond, SteadyGrowth& growth) {
  if (growth.stopped || perSecond <= 0) return;
  constexpr double kFarOff = 10 * 365 * 86400.0;
  if (room / perSecond < kFarOff) growth.fullIn = room / perSecond;
}

void AddIfGrown(const Samples& samples, const Series& series, const PartInfo* info, size_t end,
                std::vector<SteadyGrowth>& steady, std::vector<SteadyGrowth>* late) {
  // What is lost of what was saved grows elsewhere.
  const double sign = info != nullptr && info->isSaved ? -1 : 1;
  const std::vector<Point> points = samples.PointsOf(series, sign, end);
  std::optional<Course> course = SteadyCourse(points);
  const bool isSteady = course.has_value();
  if (!isSteady && late != nullptr) course = LateCourse(points);
  if (!course && late != nullptr) course = SteppedCourse(points);
  if (!course || course->growth <= 0) return;
  SteadyGrowth growth = GrowthOf(series, *course, 1);
  growth.info = info;
  if (growth.now && series.limit && *series.limit > *growth.now) {
    const double room = static_cast<double>(*series.limit) - static_cast<double>(*growth.now);
    TellWhenFull(room, *growth.perSecond, growth);
  }
  (isSteady ? steady : *late).push_back(std::move(growth));
}

SteadyGrowths FindSteady(const std::string& name, int64_t since, Sampler& sampler, bool& isWhole) {
  try {
    const Stretch stretch = FindStretch(name, since);
    Walk walk(stretch, sampler);
    walk.Run(NameOf(stretch));
    SteadyGrowths growths = walk.Finish();
    isWhole = walk.IsWhole();
    return growths;
  } catch (const DataError& error) {
    throw Error(name + ": " + error.what());
  }
}

}  // namespace ksicache
