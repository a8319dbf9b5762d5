// CSV as RFC 4180 has it, but that lines end in a line feed alone, as programs for lines of text
// expect; whoever reads CSV takes both. A header with the names of the columns, then the rows;
// where the report is another one than before, an empty line and the header again.
//
// A figure without a value is an empty field; a text that is empty is "", which tells it from that.
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/text_output.h"

namespace ksicache {
namespace {

class CsvFormat : public RowFormat {
 public:
  explicit CsvFormat(const FormatOptions& options)
      : output_(options.file), hasManyReports_(options.hasManyReports) {}

  void Begin(const RowTable& table) override {
    if (table.report != report_) PutHeader(table);
    origin_ = table.origin;
    report_ = table.report;
  }

  void Row(std::span<const Value> values) override {
    PutText(origin_->host);
    output_.Put(',');
    output_.Put(origin_->time);
    if (hasManyReports_) {
      output_.Put(',');
      output_.Put(report_->name);
    }
    for (const Value& value : values) {
      output_.Put(',');
      PutValue(value);
    }
    EndLine();
  }

  void Finish() override { output_.Finish(); }

 private:
  void PutHeader(const RowTable& table) {
    if (report_ != nullptr) EndLine();
    output_.Put("host,time");
    if (hasManyReports_) output_.Put(",report");
    for (const RowColumn& column : table.columns) {
      output_.Put(',');
      output_.Put(column.name);
    }
    EndLine();
  }

  void PutValue(const Value& value) {
    switch (value.type) {
      case ValueType::none:
        break;
      case ValueType::text:
        PutText(value.text);
        break;
      case ValueType::flag:
        output_.Put(value.number != 0 ? 'y' : 'n');
        break;
      case ValueType::signedNumber:
      case ValueType::unsignedNumber:
        output_.PutNumber(value);
        break;
    }
  }

  void PutText(std::string_view text) {
    // Blanks at the ends are part of a field, but not all who read it know.
    const bool isPlain = !text.empty() && text.find_first_of("\",\r\n") == std::string_view::npos &&
                         text.front() != ' ' && text.back() != ' ';
    if (isPlain) return output_.Put(text);
    output_.Put('"');
    for (const char c : text) {
      if (c == '"') output_.Put('"');
      output_.Put(c);
    }
    output_.Put('"');
  }

  void EndLine() {
    output_.Put('\n');
    output_.EndRow();
  }

  TextOutput output_;
  bool hasManyReports_;
  const tally::Report* report_ = nullptr;
  const Origin* origin_ = nullptr;
};

}  // namespace

std::unique_ptr<RowFormat> MakeCsv(const FormatOptions& options) {
  return std::make_unique<CsvFormat>(options);
}

}  // namespace ksicache
