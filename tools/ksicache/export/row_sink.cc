#include "tools/ksicache/export/row_sink.h"

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

}  // namespace

void RowSink::Begin(const tally::Heading& heading) {
  shown_ = unit_.value_or(heading.unit);
  places_.clear();
  columns_.clear();
  for (size_t i = 0; i < heading.columns.size(); ++i) {
    const tally::ColumnDesc& desc = heading.columns[i];
    const tally::Figure& figure = heading.figures[i];
    places_.push_back(
        {figure, desc.conversion[0] == 'L', BytesShift(figure.kind), figure.IsShownAsItIs(shown_)});
    columns_.push_back({desc.name, desc.description, figure.kind, figure.isKey, figure.isCounter,
                        UnitOf(figure, shown_)});
  }
  values_.resize(columns_.size());
  format_.Begin({report_, columns_, origin_});
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
