#include "tools/ksicache/page/lines.h"

#include <algorithm>
#include <bit>
#include <string_view>
#include <utility>

#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/page/packing.h"

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

}  // namespace

void Extent::Add(int64_t figure) {
  least = std::min(least, figure);
  greatest = std::max(greatest, figure);
}

void Extent::Add(const Extent& other) {
  least = std::min(least, other.least);
  greatest = std::max(greatest, other.greatest);
}

void Range::Add(int64_t figure, size_t moment) {
  if (figure < extent.least) least = moment;
  if (figure > extent.greatest) greatest = moment;
  extent.Add(figure);
}

uint64_t Range::Size() const {
  return extent.IsEmpty() ? 0 : static_cast<uint64_t>(extent.greatest - extent.least);
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

ReportLines::ReportLines(PageTexts& texts, const char* report, std::vector<const char*> columns,
                         ThingNames& names)
    : texts_(texts),
      role_(roles::ThingsOf(report)),
      columnNames_(std::move(columns)),
      names_(names),
      sums_(columnNames_.size()) {}

void ReportLines::BeginMoment(size_t moment, size_t stretch) {
  moment_ = moment;
  stretch_ = stretch;
  sum_.assign(columnNames_.size(), 0);
  identities_.Restart();
}

void ReportLines::Begin(std::span<const RowColumn> columns) {
  if (!columns_.empty()) return;
  columns_.assign(columns.begin(), columns.end());
  for (const std::string_view name : columnNames_) places_.push_back(PlaceOf(columns_, name));
}

void ReportLines::Row(std::span<const Value> values) {
  const std::optional<size_t> thing = ThingOf(values);
  for (size_t i = 0; i < places_.size(); ++i) {
    const std::optional<int64_t> figure = FigureOf(values[places_[i]]);
    if (figure && thing) AddTo(lines_[*thing * places_.size() + i], *figure);
    sum_[i] = figure && sum_[i] ? Drawable(*sum_[i] + *figure) : std::nullopt;
  }
}

void ReportLines::AddTo(Figure& figure, int64_t number) const {
  if (figure.line.size() <= stretch_) figure.line.resize(stretch_ + 1);
  figure.line[stretch_].Add(number);
  figure.range.Add(number, moment_);
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
  if (thing < things_.size()) return thing;
  // Its name and its number are among what tells it apart, and so they stay.
  Thing named = NamedIn(values);
  names_.Add(named.name, named.number);
  if (thing == kMostThings) {
    leavesOut_ = true;
    return std::nullopt;
  }
  things_.push_back(std::move(named));
  lines_.resize(lines_.size() + places_.size());
  return thing;
}

ReportLines::Thing ReportLines::NamedIn(std::span<const Value> values) const {
  if (role_ == nullptr) return {"", -1};
  const size_t number = PlaceOf(columns_, role_->number);
  const bool hasNumber = number < values.size() && values[number].type != ValueType::none;
  return {std::string(values[PlaceOf(columns_, role_->name)].text),
          hasNumber ? static_cast<int64_t>(values[number].number) : -1};
}

void ReportLines::End(bool isWhole) {
  if (!isWhole) return;
  for (size_t i = 0; i < sum_.size(); ++i) {
    if (sum_[i]) AddTo(sums_[i], *sum_[i]);
  }
}

void ReportLines::Thin() {
  for (std::vector<Figure>* figures : {&sums_, &lines_}) {
    for (Figure& figure : *figures) Halve(figure.line);
  }
}

void ReportLines::Put(size_t stretches, bool isCut, std::string& bytes) const {
  for (size_t column = 0; column < columnNames_.size(); ++column) {
    const auto put = [&](const Line& line) {
      PutLine(line, stretches, isCut ? BitsToCut(line) : 0, bytes);
    };
    put(sums_[column].line);
    for (size_t at = column; at < lines_.size(); at += columnNames_.size()) put(lines_[at].line);
  }
}

std::string ReportLines::ThingsToJson() const {
  JsonWriter things;
  for (const Thing& thing : things_) {
    if (role_ == nullptr) {
      things.None("");
    } else {
      things.Text("", names_.Of(thing.name, thing.number));
    }
  }
  return things.Array();
}

std::vector<size_t> ReportLines::WorstMoments(size_t column, bool isLessWorse,
                                              size_t things) const {
  std::vector<const Range*> ranges;
  for (size_t at = column; at < lines_.size(); at += columnNames_.size()) {
    ranges.push_back(&lines_[at].range);
  }
  std::ranges::stable_sort(ranges, std::ranges::greater(), &Range::Size);
  ranges.resize(std::min(ranges.size(), things));
  ranges.insert(ranges.begin(), &sums_[column].range);
  std::vector<size_t> moments;
  for (const Range* range : ranges) {
    if (range->Size() > 0) moments.push_back(isLessWorse ? range->least : range->greatest);
  }
  return moments;
}

}  // namespace ksicache
