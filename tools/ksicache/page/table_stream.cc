#include "tools/ksicache/page/table_stream.h"

#include <utility>

#include "tools/ksicache/page/packing.h"

namespace ksicache {
namespace {

constexpr uint64_t kSame = 0;
constexpr uint64_t kNone = 1;
constexpr uint64_t kWhole = 2;

bool IsNumber(const PageValue& value) {
  return value.type == ValueType::signedNumber || value.type == ValueType::unsignedNumber;
}

void PutWhole(std::string& bytes, uint64_t number) {
  PutNumber(bytes, kWhole);
  for (int i = 0; i < 8; ++i) bytes += static_cast<char>(number >> (8 * i));
}

void PutValue(std::string& bytes, const PageValue& value, const PageValue& base) {
  if (value.type == ValueType::none) return PutNumber(bytes, kNone);
  if (!IsNumber(value)) {
    return PutNumber(bytes, value == base ? kSame : kWhole + 1 + value.number);
  }
  const uint64_t before = IsNumber(base) ? base.number : 0;
  const uint64_t folded = Folded(static_cast<int64_t>(value.number - before));
  if (folded == 0) return PutNumber(bytes, kSame);
  if (folded > UINT64_MAX - kWhole) return PutWhole(bytes, value.number);
  PutNumber(bytes, kWhole + folded);
}

}  // namespace

uint32_t PageTexts::NumberOf(std::string_view text) {
  const auto found = numbers_.find(text);
  if (found != numbers_.end()) return found->second;
  const auto number = static_cast<uint32_t>(all_.size());
  numbers_.emplace(all_.emplace_back(text), number);
  return number;
}

uint32_t RowIdentities::NumberOf(std::span<const RowColumn> columns, std::span<const PageValue> row,
                                 uint32_t most) {
  key_.clear();
  for (size_t i = 0; i < columns.size(); ++i) {
    if (!columns[i].isKey) continue;
    key_ += static_cast<char>(row[i].type);
    PutNumber(key_, row[i].number);
  }
  // Of those that get no number nothing is kept.
  if (count_ >= most && !known_.contains(key_)) return most;
  auto& [numbers, moment, seen] = known_[key_];
  if (std::exchange(moment, moment_) != moment_) seen = 0;
  const size_t place = seen++;
  if (place < numbers.size()) return numbers[place];
  if (count_ >= most) return most;
  return numbers.emplace_back(count_++);
}

void TableStream::Begin(std::span<const RowColumn> columns) {
  cells_.clear();
  if (!columns_.empty()) return;
  columns_.assign(columns.begin(), columns.end());
}

void TableStream::Row(std::span<const Value> values) {
  for (const Value& value : values) {
    const bool isText = value.type == ValueType::text;
    cells_.push_back({value.type, isText ? texts_.NumberOf(value.text) : value.number});
  }
}

void TableStream::End(bool isWhole, std::string& bytes) {
  const size_t width = columns_.size();
  const size_t rows = width == 0 ? 0 : cells_.size() / width;
  if (!isWhole && rows == 0) return PutNumber(bytes, 0);
  PutNumber(bytes, 1 + rows);
  identities_.Restart();
  ids_.clear();
  for (size_t row = 0; row < rows; ++row) {
    ids_.push_back(identities_.NumberOf(columns_, std::span(cells_).subspan(row * width, width)));
    const int64_t expected = row == 0 ? 0 : int64_t{ids_[row - 1]} + 1;
    PutNumber(bytes, Folded(ids_[row] - expected));
  }
  before_.resize(identities_.Count() * columns_.size());
  for (size_t column = 0; column < columns_.size(); ++column) PutColumn(column, bytes);
}

void TableStream::PutColumn(size_t column, std::string& bytes) {
  PageValue above;
  for (size_t row = 0; row < ids_.size(); ++row) {
    PageValue& before = Before(row, column);
    const PageValue& value = cells_[row * columns_.size() + column];
    PutValue(bytes, value, before.type == ValueType::none ? above : before);
    above = value;
    before = value;
  }
}

}  // namespace ksicache
