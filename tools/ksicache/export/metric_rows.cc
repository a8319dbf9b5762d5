#include "tools/ksicache/export/metric_rows.h"

#include <algorithm>
#include <numeric>
#include <tuple>

namespace ksicache {

void MetricRows::Clear(size_t columns) {
  *this = MetricRows();
  columns_.resize(columns);
}

bool MetricRows::BeginMoment(const std::string& host, int64_t time, int64_t taken) {
  const auto number = static_cast<uint32_t>(moments_.size());
  moments_.push_back({host, taken, true});
  const auto [found, isNew] = momentOf_.try_emplace({host, time}, number);
  if (isNew) return true;
  // The later one counts; of one time that which comes later.
  Moment& other = moments_[found->second];
  const bool isLater = taken >= other.taken;
  (isLater ? other : moments_.back()).counts = false;
  if (isLater) found->second = number;
  return false;
}

void MetricRows::Add(std::string& labels, std::span<const Value> values) {
  const auto moment = static_cast<uint32_t>(moments_.size());
  const uint32_t series = NewSeriesOf(labels, moment);
  series_[series].moment = moment;
  series_[series].repeats = 0;
  rows_.push_back({series, moment - 1});
  for (size_t i = 0; i < values.size(); ++i) {
    Column& column = columns_[i];
    if (!column.isKept) continue;
    const bool isKnown = values[i].type != ValueType::none;
    if (isKnown) column.type = values[i].type;
    column.known.push_back(isKnown);
    column.numbers.push_back(isKnown ? NumberOf(values[i]) : 0);
  }
}

uint32_t MetricRows::SeriesCalled(const std::string& labels) {
  ++lookUps_;
  const auto [found, isNew] = seriesOf_.try_emplace(labels, static_cast<uint32_t>(series_.size()));
  if (isNew) {
    series_.push_back({&found->first, 0, 0});
    textSize_ += found->first.capacity();
  }
  return found->second;
}

// One that the moment has not: its labels, or with one more that counts on from the last time.
uint32_t MetricRows::NewSeriesOf(std::string& labels, uint32_t moment) {
  const uint32_t first = SeriesCalled(labels);
  if (series_[first].moment != moment) return first;
  const size_t size = labels.size();
  for (;;) {
    const std::string nth = std::to_string(++series_[first].repeats + 1);
    labels.resize(size);
    labels += (labels.back() == '{' ? "nth=\"" : ",nth=\"") + nth + '"';
    const uint32_t series = SeriesCalled(labels);
    if (series_[series].moment != moment) return series;
  }
}

uint64_t MetricRows::NumberOf(const Value& value) {
  if (value.type != ValueType::text) return value.number;
  const auto [found, isNew] = textOf_.try_emplace(std::string(value.text), texts_.size());
  if (isNew) {
    texts_.push_back(&found->first);
    textSize_ += found->first.capacity();
  }
  return found->second;
}

void MetricRows::Drop(size_t column) {
  columns_[column] = Column();
  columns_[column].isKept = false;
}

size_t MetricRows::Size() const {
  constexpr size_t kAnyEntry = 100;  // of a map or a vector
  size_t kept = 0;
  for (const Column& column : columns_) kept += column.isKept ? 1 : 0;
  return rows_.size() * (sizeof(Row) + sizeof(uint32_t) + kept * (sizeof(uint64_t) + 1)) +
         moments_.size() * 2 * kAnyEntry + (series_.size() + texts_.size()) * kAnyEntry + textSize_;
}

std::vector<uint32_t> MetricRows::Order() const {
  std::vector<uint32_t> order;
  order.reserve(rows_.size());
  for (uint32_t row = 0; row < rows_.size(); ++row) {
    if (moments_[rows_[row].moment].counts) order.push_back(row);
  }
  std::ranges::stable_sort(
      order, {}, [this](uint32_t row) { return std::pair(rows_[row].series, TakenOf(row)); });
  return order;
}

Value MetricRows::ValueOf(size_t place, uint32_t row) const {
  const Column& column = columns_[place];
  if (!column.known[row]) return {ValueType::none, 0, {}};
  const uint64_t number = column.numbers[row];
  if (column.type == ValueType::text) return {ValueType::text, 0, *texts_[number]};
  return {column.type, number, {}};
}

}  // namespace ksicache
