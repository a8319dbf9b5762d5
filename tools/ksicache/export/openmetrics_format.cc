// Metrics (export/metric_families.h), as OpenMetrics has them or as the text format of Prometheus:
//
//   # TYPE tally_vm_consumed_bytes gauge
//   # UNIT tally_vm_consumed_bytes bytes
//   # HELP tally_vm_consumed_bytes Host physical memory consumed by guest
//   tally_vm_consumed_bytes{host="a17",name="web-01",sched_grp="1020"} 6368371712
//
// The text format knows no units, no state sets and no infos, and has counters under the names of
// their samples; the samples are the same in both. A figure without a value has none.
//
// The samples of a family stand together, and in it those of the same labels, by their times. So a
// report's rows are kept until there are no more. Where they would take too much memory, half of
// the families are left for another reading of the same rows.
//
// Only where there is a span of moments samples have their times: what scrapes takes none.
#include <algorithm>
#include <charconv>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/metric_families.h"
#include "tools/ksicache/export/metric_rows.h"
#include "tools/ksicache/export/text_output.h"

namespace ksicache {
namespace {

enum class Dialect : uint8_t { openMetrics, text };

using Rows = std::span<const uint32_t>;

// Appends a text as the value of a label.
void PutLabelText(std::string_view text, std::string& to) {
  if (IsSimple(text)) {
    to += text;
    return;
  }
  for (const char c : text) {
    if (c == '"' || c == '\\') to += '\\';
    to += c == '\n' ? "\\n" : std::string_view(&c, 1);
  }
}

// Appends a number with so many decimals, "0.07" of 7 with 2.
void PutScaled(const Value& value, int decimals, std::string& to) {
  const bool isNegative =
      value.type == ValueType::signedNumber && static_cast<int64_t>(value.number) < 0;
  char digits[20];
  const auto [end, error] = std::to_chars(std::begin(digits), std::end(digits),
                                          isNegative ? 0 - value.number : value.number);
  std::string_view text(digits, static_cast<size_t>(end - digits));
  if (isNegative) to += '-';
  if (decimals == 0) {
    to += text;
    return;
  }
  const auto places = static_cast<size_t>(decimals);
  std::string padded(text.size() > places ? 0 : places + 1 - text.size(), '0');
  padded += text;
  padded.insert(padded.size() - places, ".");
  padded.erase(padded.find_last_not_of('0') + 1);
  if (padded.back() == '.') padded.pop_back();
  to += padded;
}

void PutLabel(std::string_view name, const Value& value, std::string& labels) {
  if (!labels.ends_with('{')) labels += ',';
  labels += name;
  labels += "=\"";
  if (value.type == ValueType::text) {
    PutLabelText(value.text, labels);
  } else if (value.type != ValueType::none) {
    PutScaled(value, 0, labels);
  }
  labels += '"';
}

class OpenMetricsFormat : public RowFormat {
 public:
  OpenMetricsFormat(const FormatOptions& options, Dialect dialect)
      : output_(options.file),
        dialect_(dialect),
        hasTimes_(options.hasSpans),
        mostBytes_(options.mostBytes) {}

  void Begin(const RowTable& table) override {
    if (table.report != report_) BeginReport(table);
    host_ = "{";
    PutLabel("host", {ValueType::text, 0, table.origin->host}, host_);
    const int64_t taken = table.origin->taken;
    if (!rows_.BeginMoment(table.origin->host, hasTimes_ ? taken : 0, taken)) {
      complaint_ = "there is another moment of " + table.origin->host +
                   (hasTimes_ ? " at " + table.origin->time : "") + ": metrics have the later one";
    }
  }

  void Row(std::span<const Value> values) override {
    std::string& labels = labels_;
    labels = host_;
    for (const size_t key : metrics_.keys) PutLabel(metrics_.names[key], values[key], labels);
    rows_.Add(labels, values);
    if (rows_.Size() > mostBytes_) LeaveFamilies();
  }

  std::string TakeComplaint() override { return std::exchange(complaint_, {}); }

  bool EndReports() override {
    order_ = rows_.Order();
    times_.clear();
    for (size_t i = first_; i < end_; ++i) PutFamily(metrics_.families[i]);
    first_ = end_;
    const bool isDone = first_ == metrics_.families.size();
    if (isDone) report_ = nullptr;
    if (!isDone) BeginFamilies();
    return !isDone;
  }

  void Finish() override {
    if (dialect_ == Dialect::openMetrics) output_.Put("# EOF\n");
    output_.Finish();
  }

 private:
  void BeginReport(const RowTable& table) {
    report_ = table.report;
    columns_.assign(table.columns.begin(), table.columns.end());
    metrics_ = MetricsOf(report_->name, columns_);
    first_ = 0;
    BeginFamilies();
  }

  // Takes rows for all families that have not been put out.
  void BeginFamilies() {
    end_ = metrics_.families.size();
    rows_.Clear(columns_.size());
    DropOthers();
  }

  // Keeps no columns but those of the families to put out.
  void DropOthers() {
    std::vector<bool> isUsed(columns_.size());
    for (size_t i = first_; i < end_; ++i) {
      for (const size_t column : metrics_.families[i].columns) isUsed[column] = true;
    }
    for (size_t i = 0; i < isUsed.size(); ++i) {
      if (!isUsed[i]) rows_.Drop(i);
    }
  }

  void LeaveFamilies() {
    if (end_ - first_ == 1) {
      throw Error("metrics of too many rows for the memory: export a shorter time, or less often");
    }
    end_ = first_ + (end_ - first_) / 2;
    DropOthers();
  }

  void PutFamily(const MetricFamily& family) {
    hasHead_ = false;
    start_ = family.name + SuffixOf(family.type);
    for (size_t begin = 0; begin < order_.size();) {
      size_t end = begin + 1;
      const auto series = rows_.At(order_[begin]).series;
      while (end < order_.size() && rows_.At(order_[end]).series == series) ++end;
      PutSeries(family, Rows(order_).subspan(begin, end - begin));
      begin = end;
    }
  }

  // The samples of one series.
  void PutSeries(const MetricFamily& family, Rows rows) {
    const std::string_view labels = rows_.LabelsOf(rows.front());
    switch (family.type) {
      case MetricType::gauge:
      case MetricType::counter:
        return PutFigure(family, labels, rows);
      case MetricType::flags:
        return PutFlags(family, labels, rows);
      case MetricType::states:
        return PutStates(family, labels, rows);
      case MetricType::info:
        return PutInfo(family, labels, rows);
    }
  }

  void PutFigure(const MetricFamily& family, std::string_view labels, Rows rows) {
    const size_t column = family.columns.front();
    const int decimals = DecimalsOf(columns_[column]);
    for (const uint32_t row : rows) {
      const Value value = rows_.ValueOf(column, row);
      if (value.type == ValueType::none) continue;
      number_.clear();  // its memory is used again
      PutScaled(value, decimals, number_);
      PutSample(family, labels, "", number_, row);
    }
  }

  void PutFlags(const MetricFamily& family, std::string_view labels, Rows rows) {
    for (const size_t column : family.columns) {
      const std::string flag = std::string(",flag=\"") + columns_[column].name + '"';
      for (const uint32_t row : rows) {
        const Value value = rows_.ValueOf(column, row);
        if (value.type == ValueType::none) continue;
        PutSample(family, labels, flag, value.number != 0 ? "1" : "0", row);
      }
    }
  }

  void PutStates(const MetricFamily& family, std::string_view labels, Rows rows) {
    const size_t column = family.columns.front();
    for (const uint32_t row : rows) {
      const Value value = rows_.ValueOf(column, row);
      if (value.type == ValueType::none) continue;
      for (const char* state : columns_[column].states) {
        const std::string label = "," + family.name + "=\"" + state + '"';
        PutSample(family, labels, label, value.text == state ? "1" : "0", row);
      }
    }
  }

  // Those of the same words stand together.
  void PutInfo(const MetricFamily& family, std::string_view labels, Rows rows) {
    std::vector<std::pair<std::string, uint32_t>> infos;
    for (const uint32_t row : rows) {
      std::string words;
      for (const size_t column : family.columns) {
        PutLabel(metrics_.names[column], rows_.ValueOf(column, row), words);
      }
      infos.emplace_back(std::move(words), row);
    }
    std::ranges::stable_sort(infos, {}, &std::pair<std::string, uint32_t>::first);
    for (const auto& [words, row] : infos) PutSample(family, labels, words, "1", row);
  }

  void PutSample(const MetricFamily& family, std::string_view labels, std::string_view more,
                 std::string_view number, uint32_t row) {
    if (!hasHead_) PutHead(family);
    hasHead_ = true;
    output_.PutAll({start_, labels, more, "} ", number, hasTimes_ ? TimeOf(row) : "", "\n"});
    output_.EndRow();
  }

  // OpenMetrics has seconds, the text format milliseconds.
  std::string_view TimeOf(uint32_t row) {
    const uint32_t moment = rows_.At(row).moment;
    if (times_.size() <= moment) times_.resize(moment + size_t{1});
    std::string& time = times_[moment];
    if (time.empty()) {
      const bool isText = dialect_ == Dialect::text;
      const int64_t taken = isText ? rows_.TakenOf(row) / 1000 : rows_.TakenOf(row);
      time = ' ';
      PutScaled({ValueType::signedNumber, static_cast<uint64_t>(taken), {}}, isText ? 0 : 6, time);
    }
    return time;
  }

  void PutHead(const MetricFamily& family) {
    const bool isText = dialect_ == Dialect::text;
    const std::string name = isText ? start_ : family.name;
    output_.Put("# TYPE " + name + ' ' + TypeOf(family.type, isText) + '\n');
    if (!isText && !family.unit.empty()) {
      output_.Put("# UNIT " + name + ' ' + family.unit + '\n');
    }
    output_.Put("# HELP " + name + ' ' + family.help + '\n');
  }

  static const char* TypeOf(MetricType type, bool isText) {
    if (type == MetricType::counter) return "counter";
    if (type == MetricType::states && !isText) return "stateset";
    return type == MetricType::info && !isText ? "info" : "gauge";
  }

  TextOutput output_;
  Dialect dialect_;
  bool hasTimes_;
  size_t mostBytes_;

  // The report at hand.
  const tally::Report* report_ = nullptr;
  std::vector<RowColumn> columns_;
  ReportMetrics metrics_;
  size_t first_ = 0;  // of the families to put out of these rows
  size_t end_ = 0;
  MetricRows rows_;
  std::string host_;  // of the moment at hand, as its label
  std::string labels_;
  std::string complaint_;

  // The family at hand.
  std::vector<uint32_t> order_;
  std::vector<std::string> times_;  // of the moments, as far as they were needed
  std::string start_;               // of its samples
  bool hasHead_ = false;
  std::string number_;
};

}  // namespace

std::unique_ptr<RowFormat> MakeOpenMetrics(const FormatOptions& options) {
  return std::make_unique<OpenMetricsFormat>(options, Dialect::openMetrics);
}

std::unique_ptr<RowFormat> MakePrometheus(const FormatOptions& options) {
  return std::make_unique<OpenMetricsFormat>(options, Dialect::text);
}

}  // namespace ksicache
