// The rows of a report on many moments, column by column, in as little memory as they take.
#ifndef TOOLS_KSICACHE_EXPORT_METRIC_ROWS_H_
#define TOOLS_KSICACHE_EXPORT_METRIC_ROWS_H_

#include <cstddef>
#include <cstdint>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "tools/ksicache/export/row_format.h"

namespace ksicache {

class MetricRows {
 public:
  // One row: what it is of, and the moment.
  struct Row {
    uint32_t series;
    uint32_t moment;
  };

  // Forgets all, to take rows of so many columns.
  void Clear(size_t columns);

  // Rows of a moment follow. False if there is another one of that host and time, which counts no
  // more if `isLater`, and else instead of this one.
  bool BeginMoment(const std::string& host, int64_t time, int64_t taken);

  // A row of the moment that was begun last, told apart from others by its labels. Labels that the
  // moment has already get one more, which is the label nth.
  void Add(std::string& labels, std::span<const Value> values);

  // Keeps the values of a column no more, nor those to come.
  void Drop(size_t column);

  // How often labels have been looked up.
  uint64_t LookUps() const { return lookUps_; }

  // About the bytes that all this takes.
  size_t Size() const;

  // All rows that count, those of a series together, by their times.
  std::vector<uint32_t> Order() const;

  const Row& At(uint32_t row) const { return rows_[row]; }
  size_t Count() const { return rows_.size(); }
  int64_t TakenOf(uint32_t row) const { return moments_[rows_[row].moment].taken; }
  std::string_view LabelsOf(uint32_t row) const { return *series_[rows_[row].series].labels; }
  Value ValueOf(size_t place, uint32_t row) const;

 private:
  struct Moment {
    std::string host;
    int64_t taken;
    bool counts;
  };

  // The numbers of a column, or of its texts; they have one type.
  struct Column {
    ValueType type = ValueType::none;
    bool isKept = true;
    std::vector<uint64_t> numbers;
    std::vector<bool> known;
  };

  // What is known of a series.
  struct Series {
    const std::string* labels;
    uint32_t moment;   // counted from 1, that had it last
    uint32_t repeats;  // how often that moment had its labels before they got one more
  };

  uint32_t SeriesCalled(const std::string& labels);
  uint32_t NewSeriesOf(std::string& labels, uint32_t moment);
  uint64_t NumberOf(const Value& value);

  std::vector<Column> columns_;
  std::vector<Row> rows_;
  std::vector<Moment> moments_;
  std::map<std::pair<std::string, int64_t>, uint32_t> momentOf_;
  std::unordered_map<std::string, uint32_t> seriesOf_;
  std::vector<Series> series_;
  uint64_t lookUps_ = 0;
  std::unordered_map<std::string, uint64_t> textOf_;
  std::vector<const std::string*> texts_;
  size_t textSize_ = 0;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_METRIC_ROWS_H_
