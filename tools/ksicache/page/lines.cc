#include "tools/ksicache/page/lines.h"

#include <algorithm>
#include <bit>
#include <string_view>

#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/roles.h"

namespace ksicache {
namespace {

// A line's height on a screen.
constexpr int kBitsOfScreen = 9;

// What the page's scripts have as a number.
std::optional<int64_t> Drawable(int64_t figure) {
  constexpr int64_t kMost = int64_t{1} << 53;
  return figure < -kMost || figure > kMost ? std::nullopt : std::make_optional(figure);
}

// None if the figure is not known or cannot be drawn. A state of the memory is drawn as its place
// among them.
std::optional<int64_t> FigureOf(const Value& value) {
  if (value.type == ValueType::text) {
    const size_t state = roles::StateOf(value.text);
    return state < roles::States().size() ? std::make_optional<int64_t>(state) : std::nullopt;
  }
  const auto number = static_cast<int64_t>(value.number);
  const bool isNumber = value.type == ValueType::signedNumber ||
                        (value.type == ValueType::unsignedNumber && number >= 0);
  return isNumber ? Drawable(number) : std::nullopt;
}

int BitsToCut(const Line& line) {
  Extent all;
  for (const Extent& extent : line) all.Add(extent);
  if (all.IsEmpty()) return 0;
  const auto range = static_cast<uint64_t>(all.greatest - all.least);
  return std::max(0, static_cast<int>(std::bit_width(range)) - kBitsOfScreen);
}

// Divided by 2^bits and rounded up.
int64_t CutUpward(int64_t figure, int bits) {
  const int64_t cut = figure >> bits;
  return cut << bits == figure ? cut : cut + 1;
}

// A text is its number, a number is a text: JSON's own have 53 bits.
void PutKey(const PageValue& key, JsonWriter& keys) {
  switch (key.type) {
    case ValueType::none:
      keys.None("");
      break;
    case ValueType::text:
      keys.Number("", key.number);
      break;
    case ValueType::signedNumber:
      keys.Text("", std::to_string(static_cast<int64_t>(key.number)));
      break;
    case ValueType::flag:
    case ValueType::unsignedNumber:
      keys.Text("", std::to_string(key.number));
      break;
  }
}

}  // namespace

void Extent::Add(int64_t figure) {
  least = std::min(least, figure);
  greatest = std::max(greatest, figure);
}

void Extent::Add(const Extent& other) {
  least = std::min(least, other.least);
  greatest = std::max(greatest, other.greatest);
}

void Halve(Line& line) {
  for (size_t i = 0; i < line.size(); i += 2) {
    if (i + 1 < line.size()) line[i].Add(line[i + 1]);
    line[i / 2] = line[i];
  }
  line.resize((line.size() + 1) / 2);
}

void PutLine(const Line& line, size_t stretches, int bits, std::string& bytes) {
  PutNumber(bytes, static_cast<uint64_t>(bits));
  int64_t before = 0;
  for (const Extent& extent : line) {
    const int64_t least = extent.least >> bits;
    PutNumber(bytes, extent.IsEmpty() ? 0 : 1 + Folded(least - before));
    if (!extent.IsEmpty()) before = least;
  }
  bytes.append(stretches - line.size(), '\0');
  for (const Extent& extent : line) {
    if (extent.IsEmpty()) continue;
    const int64_t greatest = CutUpward(extent.greatest, bits);
    PutNumber(bytes, static_cast<uint64_t>(greatest - (extent.least >> bits)));
  }
}

ReportLines::ReportLines(PageTexts& texts, std::vector<const char*> columns)
    : texts_(texts), names_(std::move(columns)), sums_(names_.size()) {}

void ReportLines::BeginMoment(size_t stretch) {
  stretch_ = stretch;
  sum_.assign(names_.size(), 0);
  identities_.Restart();
}

void ReportLines::Begin(std::span<const RowColumn> columns) {
  if (!columns_.empty()) return;
  columns_.assign(columns.begin(), columns.end());
  for (const std::string_view name : names_) places_.push_back(PlaceOf(columns_, name));
}

void ReportLines::Row(std::span<const Value> values) {
  const std::optional<size_t> thing = ThingOf(values);
  for (size_t i = 0; i < places_.size(); ++i) {
    const std::optional<int64_t> figure = FigureOf(values[places_[i]]);
    if (figure && thing) AddTo(lines_[*thing * names_.size() + i], *figure);
    sum_[i] = figure && sum_[i] ? Drawable(*sum_[i] + *figure) : std::nullopt;
  }
}

void ReportLines::AddTo(Line& line, int64_t figure) const {
  if (line.size() <= stretch_) line.resize(stretch_ + 1);
  line[stretch_].Add(figure);
}

// None for one that has no lines.
std::optional<size_t> ReportLines::ThingOf(std::span<const Value> values) {
  row_.assign(columns_.size(), {});
  for (size_t i = 0; i < columns_.size(); ++i) {
    if (!columns_[i].isKey) continue;
    const bool isText = values[i].type == ValueType::text;
    row_[i] = {values[i].type, isText ? texts_.NumberOf(values[i].text) : values[i].number};
  }
  const uint32_t thing = identities_.NumberOf(columns_, row_, kMostThings);
  if (thing == kMostThings) {
    leavesOut_ = true;
    return std::nullopt;
  }
  if (thing == keys_.size()) AddThing();
  return thing;
}

// That of the row at hand.
void ReportLines::AddThing() {
  std::vector<PageValue>& keys = keys_.emplace_back();
  for (size_t i = 0; i < columns_.size(); ++i) {
    if (columns_[i].isKey) keys.push_back(row_[i]);
  }
  lines_.resize(lines_.size() + names_.size());
}

void ReportLines::End(bool isWhole) {
  if (!isWhole) return;
  for (size_t i = 0; i < sum_.size(); ++i) {
    if (sum_[i]) AddTo(sums_[i], *sum_[i]);
  }
}

void ReportLines::Thin() {
  std::ranges::for_each(sums_, Halve);
  std::ranges::for_each(lines_, Halve);
}

void ReportLines::Put(size_t stretches, bool isCut, std::string& bytes) const {
  for (size_t column = 0; column < names_.size(); ++column) {
    const auto put = [&](const Line& line) {
      PutLine(line, stretches, isCut ? BitsToCut(line) : 0, bytes);
    };
    put(sums_[column]);
    for (size_t at = column; at < lines_.size(); at += names_.size()) put(lines_[at]);
  }
}

std::string ReportLines::ThingsToJson() const {
  JsonWriter things;
  for (const std::vector<PageValue>& keys : keys_) {
    JsonWriter thing;
    for (const PageValue& key : keys) PutKey(key, thing);
    things.Json("", thing.Array());
  }
  return things.Array();
}

}  // namespace ksicache
