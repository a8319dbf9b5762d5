#include "tools/ksicache/export/row_sink.h"

#include <algorithm>

namespace ksicache {
namespace {

using tally::DisplayUnit;
using tally::Kind;

bool IsMemory(Kind kind) {
  return kind == Kind::kilobytes || kind == Kind::pages || kind == Kind::bytes;
}

uint8_t BytesShift(Kind kind) {
  return kind == Kind::kilobytes ? 10 : kind == Kind::pages ? 12 : 0;
}

const char* UnitOf(const tally::Figure& figure, DisplayUnit unit) {
  if (IsMemory(figure.kind)) return tally::UnitTitle(unit);
  if (figure.kind == Kind::microseconds) return "us";
  return figure.kind == Kind::percent ? "%" : "";
}

// Those of the level that it goes down to by itself.
std::span<const tally::ColumnInfo> ColumnsOf(const tally::Report& report) {
  const auto variant = std::ranges::find(report.variants, report.frame->defaultLevels,
                                         &tally::ReportVariant::levels);
  return (variant == report.variants.end() ? report.variants.front() : *variant).columns;
}

}  // namespace

void RowSink::Expect(const tally::Report& report, const Origin& origin) {
  if (report_ != &report) TakeColumns(report);
  report_ = &report;
  format_.Begin({report_, columns_, &origin});
}

void RowSink::TakeColumns(const tally::Report& report) {
  shown_ = unit_.value_or(report.frame->allowBytes ? DisplayUnit::b : DisplayUnit::kb);
  places_.clear();
  columns_.clear();
  for (const auto& [desc, figure] : ColumnsOf(report)) {
    places_.push_back(
        {figure, desc.conversion[0] == 'L', BytesShift(figure.kind), figure.IsShownAsItIs(shown_)});
    columns_.push_back({desc.name, desc.description, figure.kind, figure.isKey, figure.isCounter,
                        UnitOf(figure, shown_)});
  }
  values_.resize(columns_.size());
}

void RowSink::Row(tally::RowKind kind, std::span<const tally::Cell> cells) {
  if (kind != tally::RowKind::item) return;
  for (size_t i = 0; i < cells.size(); ++i) values_[i] = ValueOf(places_[i], cells[i]);
  format_.Row(values_);
}

Value RowSink::ValueOf(const Place& place, const tally::Cell& cell) const {
  const tally::Figure& figure = place.figure;
  if (figure.IsNone(cell)) return {ValueType::none, 0, {}};
  if (figure.kind == Kind::text) return {ValueType::text, 0, cell.text()};
  if (figure.kind == Kind::flag) return {ValueType::flag, cell.number(), cell.text()};
  uint64_t number = cell.number();
  if (!place.isAsItIs) {
    // In bytes nothing is cut, whatever the column's own conversion has room for.
    number =
        shown_ == DisplayUnit::b ? number << place.bytesShift : figure.Shown(cell, shown_).number();
  }
  if (!place.isWide) {
    number = figure.isSigned ? static_cast<uint64_t>(static_cast<int32_t>(number))
                             : static_cast<uint32_t>(number);
  }
  return {figure.isSigned ? ValueType::signedNumber : ValueType::unsignedNumber, number, {}};
}

}  // namespace ksicache
