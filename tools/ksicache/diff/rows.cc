#include "tools/ksicache/diff/rows.h"

#include <algorithm>

#include "tools/ksicache/error.h"
#include "tools/ksicache/export/row_sink.h"

namespace ksicache {

// Takes them as any format does.
class Rows::Keeper : public RowFormat {
 public:
  Keeper(Rows& rows, const Names& kept) : rows_(rows), kept_(kept) {}

  void Begin(const RowTable& table) override {
    for (size_t i = 0; i < table.columns.size(); ++i) {
      const RowColumn& column = table.columns[i];
      if (!kept_.empty() && std::ranges::find(kept_, column.name) == kept_.end()) continue;
      places_.push_back(i);
      rows_.columns_.push_back(column);
    }
  }

  void Row(std::span<const Value> values) override {
    for (const size_t place : places_) {
      Value& value = rows_.values_.emplace_back(values[place]);
      if (value.type == ValueType::text) value.text = rows_.texts_.emplace_back(value.text);
    }
  }

  void Finish() override {}

 private:
  Rows& rows_;
  const Names& kept_;
  std::vector<size_t> places_;
};

Rows::Rows(const tally::Report& report, const Origin& origin,
           std::optional<tally::DisplayUnit> unit, const Names& kept)
    : report_(&report) {
  Keeper keeper(*this, kept);
  RowSink sink(keeper, unit, kept);
  sink.Expect(report, origin);
  try {
    RunReport(report, sink);
  } catch (const DataError& error) {
    complaint_ = error.what();
  }
}

std::optional<int64_t> NumberOf(const Value& value) {
  const auto number = static_cast<int64_t>(value.number);
  if (value.type == ValueType::signedNumber) return number;
  if (value.type == ValueType::unsignedNumber && number >= 0) return number;
  return std::nullopt;
}

bool IsSame(const Value& a, const Value& b) {
  return a.type == b.type && a.number == b.number && a.text == b.text;
}

}  // namespace ksicache
