// JSON, one object a line: the names of the columns with their values, null for a figure without
// one. Numbers are written in full, with up to 20 digits.
#include <string>
#include <vector>

#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/text_output.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

class JsonFormat : public RowFormat {
 public:
  explicit JsonFormat(const FormatOptions& options)
      : output_(options.file), hasManyReports_(options.hasManyReports) {}

  void Begin(const RowTable& table) override {
    start_ =
        R"({"host":)" + TextToJson(table.origin->host) + R"(,"time":")" + table.origin->time + '"';
    if (hasManyReports_) start_ += std::string(R"(,"report":")") + table.report->name + '"';
    names_.clear();
    for (const RowColumn& column : table.columns) {
      names_.push_back(std::string(",\"") + column.name + "\":");
    }
  }

  void Row(std::span<const Value> values) override {
    output_.Put(start_);
    for (size_t i = 0; i < values.size(); ++i) {
      output_.Put(names_[i]);
      PutValue(values[i]);
    }
    output_.Put("}\n");
    output_.EndRow();
  }

  void Finish() override { output_.Finish(); }

 private:
  void PutValue(const Value& value) {
    switch (value.type) {
      case ValueType::none:
        output_.Put("null");
        break;
      case ValueType::text:
        PutText(value.text);
        break;
      case ValueType::flag:
        output_.Put(value.number != 0 ? "true" : "false");
        break;
      case ValueType::signedNumber:
      case ValueType::unsignedNumber:
        output_.PutNumber(value);
        break;
    }
  }

  void PutText(std::string_view text) {
    if (!IsSimple(text)) return output_.Put(TextToJson(text));
    output_.Put('"');
    output_.Put(text);
    output_.Put('"');
  }

  TextOutput output_;
  bool hasManyReports_;
  std::string start_;               // of each row
  std::vector<std::string> names_;  // as they stand before their values
};

}  // namespace

std::unique_ptr<RowFormat> MakeJson(const FormatOptions& options) {
  return std::make_unique<JsonFormat>(options);
}

}  // namespace ksicache
