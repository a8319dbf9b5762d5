#include "tools/ksicache/diff/samples.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// All figures of all samples take no more than this.
constexpr size_t kMostFigures = size_t{32} << 20;

constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

}  // namespace

std::optional<int64_t> Series::Last() const {
  const auto known = std::find_if_not(figures.rbegin(), figures.rend(),
                                      [](double figure) { return std::isnan(figure); });
  if (known == figures.rend()) return std::nullopt;
  return static_cast<int64_t>(*known);
}

std::optional<int64_t> Series::Now() const {
  return figures.empty() || std::isnan(figures.back()) ? std::nullopt : Last();
}

Series& Samples::At(const std::string& identity, SeriesByIdentity& all) const {
  const auto [found, isNew] = all.try_emplace(identity);
  if (isNew) found->second.first = times_.size() - 1;
  return found->second;
}

void Samples::Put(std::optional<int64_t> figure, Series& series) {
  const size_t place = times_.size() - 1 - series.first;
  if (place < series.figures.size()) return;
  if (figures_ += place + 1 - series.figures.size(); figures_ > kMostFigures) {
    throw DataError("there is too much in it for one look: a shorter time takes less memory");
  }
  series.figures.resize(place, kNone);
  series.figures.push_back(figure ? static_cast<double>(*figure) : kNone);
}

std::vector<Point> Samples::PointsOf(const Series& series, double sign, size_t end) const {
  std::vector<Point> points;
  const size_t count = series.figures.size();
  if (count < times_.size() / 2 || series.first + count < end) return points;
  for (size_t i = 0; i < count; ++i) {
    if (std::isnan(series.figures[i])) continue;
    points.push_back({times_[series.first + i], sign * series.figures[i]});
  }
  if (!std::ranges::is_sorted(points, {}, &Point::x)) std::ranges::sort(points, {}, &Point::x);
  return points;
}

}  // namespace ksicache
