#include "tools/ksicache/export/row_sink.h"

#include <algorithm>
#include <bit>
#include <utility>

#include "framework/name_list.h"
#include "tools/ksicache/export/escaped_text.h"
#include "tools/ksicache/unit.h"

namespace ksicache {
namespace {

using tally::DisplayUnit;
using tally::Kind;

// The bits that a number of this measure has more in bytes.
int BitsOf(Kind kind) { return kind == Kind::kilobytes ? 10 : kind == Kind::pages ? 12 : 0; }

int BitsOf(DisplayUnit unit) { return std::countr_zero(static_cast<uint64_t>(BytesIn(unit))); }

const char* UnitOf(const tally::Figure& figure, DisplayUnit unit) {
  if (figure.toUnit != nullptr) return tally::UnitTitle(unit);
  if (figure.kind == Kind::microseconds) return "us";
  return figure.kind == Kind::percent ? "%" : "";
}

}  // namespace

std::span<const tally::ColumnInfo> ColumnsOf(const tally::Report& report) {
  const auto variant = std::ranges::find(report.variants, report.frame->defaultLevels,
                                         &tally::ReportVariant::levels);
  return (variant == report.variants.end() ? report.variants.front() : *variant).columns;
}

DisplayUnit OwnUnitOf(const tally::Report& report) {
  return report.frame->allowBytes ? DisplayUnit::b : DisplayUnit::kb;
}

RowColumn RowColumnOf(const tally::ColumnInfo& column, DisplayUnit unit) {
  const auto& [desc, figure] = column;
  return {desc.name,        desc.description, figure.kind,          figure.isKey,
          figure.isCounter, figure.isSigned,  UnitOf(figure, unit), figure.states};
}

void RowSink::Expect(const tally::Report& report, const Origin& origin) {
  if (report_ != &report) TakeColumns(report);
  report_ = &report;
  origin_ = origin;
  origin_.host = Escaped(origin.host);
  format_.Begin({report_, columns_, &origin_});
}

void RowSink::TakeColumns(const tally::Report& report) {
  shown_ = unit_.value_or(OwnUnitOf(report));
  places_.clear();
  columns_.clear();
  const std::span<const tally::ColumnInfo> all = ColumnsOf(report);
  for (size_t cell = 0; cell < all.size(); ++cell) {
    const tally::ColumnInfo& column = all[cell];
    if (!IsWanted(column)) continue;
    const auto& [desc, figure] = column;
    const int shift = figure.toUnit == nullptr ? 0 : BitsOf(figure.kind) - BitsOf(shown_);
    places_.push_back({figure, cell, desc.conversion[0] == 'L', shift});
    columns_.push_back(RowColumnOf(column, shown_));
  }
  values_.resize(columns_.size());
}

bool RowSink::IsWanted(const tally::ColumnInfo& column) const {
  if (wanted_.empty() || column.figure.isKey) return true;
  return std::ranges::any_of(
      wanted_, [&](std::string_view name) { return tally::SameName(name, column.desc.name); });
}

void RowSink::Row(tally::RowKind kind, std::span<const tally::Cell> cells) {
  if (kind != tally::RowKind::item && kind != tally::RowKind::counted) return;
  escaped_.clear();
  for (size_t i = 0; i < places_.size(); ++i) values_[i] = ValueOf(i, cells[places_[i].cell]);
  format_.Row(values_);
}

std::string RowSink::TakeComplaint() {
  std::string own = std::exchange(complaint_, {});
  std::string ofFormat = format_.TakeComplaint();
  return own.empty() ? ofFormat : own;
}

Value RowSink::ValueOf(size_t place, const tally::Cell& cell) {
  const tally::Figure& figure = places_[place].figure;
  if (figure.IsNone(cell)) return {ValueType::none, 0, {}};
  if (figure.kind == Kind::text) return {ValueType::text, 0, TextOf(cell.text())};
  if (figure.kind == Kind::flag) return {ValueType::flag, cell.number(), cell.text()};
  return NumberOf(place, cell.number());
}

// Nothing is cut or wraps on the way to the unit.
Value RowSink::NumberOf(size_t place, uint64_t number) {
  const auto& [figure, cell, isWide, shift] = places_[place];
  if (!isWide) {
    number = figure.isSigned ? static_cast<uint64_t>(static_cast<int32_t>(number))
                             : static_cast<uint32_t>(number);
  }
  const auto type = figure.isSigned ? ValueType::signedNumber : ValueType::unsignedNumber;
  const auto right = [&figure = figure](uint64_t value, int bits) {
    return figure.isSigned ? static_cast<uint64_t>(static_cast<int64_t>(value) >> bits)
                           : value >> bits;
  };
  if (shift <= 0) return {type, right(number, -shift), {}};
  const uint64_t inUnit = number << shift;
  if (right(inUnit, shift) == number) return {type, inUnit, {}};
  complaint_ = columns_[place].name +
               (" has a figure that is too large in " + std::string(columns_[place].unit));
  return {ValueType::none, 0, {}};
}

std::string_view RowSink::TextOf(std::string_view text) {
  return IsPlain(text) ? text : escaped_.emplace_back(Escaped(text));
}

}  // namespace ksicache
