// Metrics, in what OpenMetrics and the text format of Prometheus have in common, so that either
// reads them: a metric for each figure of each report, in bytes, seconds and ratios, called after
// both, with the host and the keys of the row as labels.
//
//   # HELP tally_vm_consumed_bytes Host physical memory consumed by guest
//   # TYPE tally_vm_consumed_bytes gauge
//   tally_vm_consumed_bytes{host="a17",name="web-01",sched_grp="1020"} 6368371712
//
// What counts for ever is a counter, "..._total". Flags are the metric "..._flag", a sample for
// each one; what else a row says in words and identifiers are the labels of "..._info", which is 1.
// A figure without a value has no sample.
//
// All samples of a metric stand together, so all that is exported is kept until the end. Only where
// there is a span of moments samples have their times: what scrapes takes none.
#include <map>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/metric_name.h"
#include "tools/ksicache/export/text_output.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

using tally::Kind;

// What a column is among metrics.
enum class Role : uint8_t { label, info, flag, figure };

Role RoleOf(const RowColumn& column) {
  if (column.isKey) return Role::label;
  if (column.kind == Kind::text || column.kind == Kind::id) return Role::info;
  return column.kind == Kind::flag ? Role::flag : Role::figure;
}

const char* UnitSuffix(Kind kind) {
  switch (kind) {
    case Kind::kilobytes:
    case Kind::pages:
    case Kind::bytes:
      return "_bytes";
    case Kind::microseconds:
      return "_seconds";
    case Kind::percent:
      return "_ratio";
    default:
      return "";
  }
}

// Only counters end in "_total".
std::string FigureName(const RowColumn& column) {
  constexpr std::string_view kTotal = "_total";
  std::string name = SnakeCase(column.name) + UnitSuffix(column.kind);
  if (column.isCounter) return name + std::string(kTotal);
  if (name.ends_with(kTotal)) name.replace(name.size() - kTotal.size(), kTotal.size(), "_all");
  return name;
}

// How many decimals the base unit has that the kernel's own has not.
int DecimalsOf(Kind kind) { return kind == Kind::microseconds ? 6 : kind == Kind::percent ? 2 : 0; }

std::string Trimmed(std::string_view text) {
  return std::string(text.substr(0, text.find_last_not_of(' ') + 1));
}

// The number with so many decimals, "0.07" of 7 with 2.
std::string Scaled(const Value& value, int decimals) {
  const bool isNegative =
      value.type == ValueType::signedNumber && static_cast<int64_t>(value.number) < 0;
  std::string digits = std::to_string(isNegative ? 0 - value.number : value.number);
  if (decimals != 0) {
    const auto places = static_cast<size_t>(decimals);
    if (digits.size() <= places) digits.insert(0, places + 1 - digits.size(), '0');
    digits.insert(digits.size() - places, ".");
    digits.erase(digits.find_last_not_of('0') + 1);
    if (digits.back() == '.') digits.pop_back();
  }
  return isNegative ? "-" + digits : digits;
}

void PutLabel(std::string_view name, std::string_view value, std::string& labels) {
  if (labels.back() != '{') labels += ',';
  labels += name;
  labels += "=\"";
  if (IsSimple(value)) {
    labels += value;
  } else {
    for (const char c : value) {
      if (c == '"' || c == '\\') labels += '\\';
      labels += c == '\n' ? "\\n" : std::string(1, c);
    }
  }
  labels += '"';
}

void PutLabel(std::string_view name, const Value& value, std::string& labels) {
  switch (value.type) {
    case ValueType::text:
      return PutLabel(name, value.text, labels);
    case ValueType::none:
      return PutLabel(name, "", labels);
    default:
      return PutLabel(name, Scaled(value, 0), labels);
  }
}

// A metric and its samples so far.
struct Metric {
  std::string name;
  std::string help;
  const char* type;
  std::string samples;
};

class OpenMetricsFormat : public RowFormat {
 public:
  explicit OpenMetricsFormat(const FormatOptions& options)
      : output_(options.file), hasTimes_(options.hasSpans) {}

  void Begin(const RowTable& table) override {
    const auto [found, isNew] = families_.try_emplace(table.report);
    family_ = &found->second;
    if (isNew) {
      MakeFamily(table, *family_);
      order_.push_back(family_);
    }
    host_ = "{";
    PutLabel("host", table.origin->host, host_);
    ending_ = hasTimes_ ? " " + std::to_string(table.origin->taken / ksi::kSecond) + "\n" : "\n";
  }

  void Row(std::span<const Value> values) override {
    std::string labels = host_;
    for (size_t i = 0; i < values.size(); ++i) {
      const Place& place = family_->places[i];
      if (place.role == Role::label) PutLabel(place.name, values[i], labels);
    }
    if (!family_->rows.insert(labels + ending_).second) {
      complaint_ = "there are two rows of " + labels + "}, of which metrics have one";
      return;
    }
    std::string info = labels;
    for (size_t i = 0; i < values.size(); ++i)
      PutValue(family_->places[i], values[i], labels, info);
    if (family_->hasInfo) AddSample(family_->info, info, "1");
  }

  std::string TakeComplaint() override { return std::exchange(complaint_, {}); }

  void Finish() override {
    for (Family* family : order_) {
      for (const Place& place : family->places) PutMetric(place.metric);
      PutMetric(family->flag);
      PutMetric(family->info);
    }
    output_.Put("# EOF\n");
    output_.Finish();
  }

 private:
  struct Place {
    Role role;
    std::string name;  // of a label
    int decimals;
    Metric metric;  // of a figure
  };

  // The metrics of a report.
  struct Family {
    std::vector<Place> places;  // one for each column
    Metric flag;
    Metric info;
    bool hasInfo = false;
    std::unordered_set<std::string> rows;  // their labels
  };

  static void MakeFamily(const RowTable& table, Family& family) {
    constexpr std::string_view kStats = "-stats";
    std::string_view report = table.report->name;
    if (report.ends_with(kStats)) report.remove_suffix(kStats.size());
    const std::string start = "tally_" + SnakeCase(report) + "_";
    family.flag = {start + "flag", "", "gauge", ""};
    family.info = {start + "info", "", "gauge", ""};
    for (const RowColumn& column : table.columns) AddPlace(column, start, family);
  }

  static void AddPlace(const RowColumn& column, const std::string& start, Family& family) {
    const Role role = RoleOf(column);
    const std::string name = SnakeCase(column.name);
    const std::string help = Trimmed(column.description);
    Place& place = family.places.emplace_back(Place{role, name, DecimalsOf(column.kind), {}});
    const auto explain = [&](Metric& metric, const std::string& label) {
      metric.help += (metric.help.empty() ? "" : "; ") + label + ": " + help;
    };
    switch (role) {
      case Role::label:
        break;
      case Role::info:
        family.hasInfo = true;
        explain(family.info, name);
        break;
      case Role::flag:
        place.name = column.name;
        explain(family.flag, column.name);
        break;
      case Role::figure:
        place.metric = {start + FigureName(column), help, column.isCounter ? "counter" : "gauge",
                        ""};
        break;
    }
  }

  void PutValue(Place& place, const Value& value, const std::string& labels, std::string& info) {
    switch (place.role) {
      case Role::label:
        break;
      case Role::info:
        PutLabel(place.name, value, info);
        break;
      case Role::flag: {
        if (value.type == ValueType::none) break;
        std::string flag = labels;
        PutLabel("flag", place.name, flag);
        AddSample(family_->flag, flag, value.number != 0 ? "1" : "0");
        break;
      }
      case Role::figure:
        if (value.type == ValueType::none) break;
        AddSample(place.metric, labels, Scaled(value, place.decimals));
        break;
    }
  }

  void AddSample(Metric& metric, const std::string& labels, std::string_view value) {
    const size_t before = metric.samples.size();
    metric.samples += metric.name;
    metric.samples += labels;
    metric.samples += "} ";
    metric.samples += value;
    metric.samples += ending_;
    size_ += metric.samples.size() - before;
    if (size_ > TextOutput::kLargestFile) {
      throw Error("metrics of more than 1 GiB: export a shorter time, or fewer hosts");
    }
  }

  void PutMetric(const Metric& metric) {
    if (metric.samples.empty()) return;
    output_.Put("# HELP " + metric.name + ' ' + metric.help + "\n# TYPE " + metric.name + ' ' +
                metric.type + '\n');
    output_.Put(metric.samples);
    output_.EndRow();
  }

  TextOutput output_;
  bool hasTimes_;
  std::map<const tally::Report*, Family> families_;
  std::vector<Family*> order_;
  Family* family_ = nullptr;  // of the table that was begun last
  std::string host_;          // its labels before those of the row
  std::string ending_;        // of its samples
  size_t size_ = 0;
  std::string complaint_;
};

}  // namespace

std::unique_ptr<RowFormat> MakeOpenMetrics(const FormatOptions& options) {
  return std::make_unique<OpenMetricsFormat>(options);
}

}  // namespace ksicache
