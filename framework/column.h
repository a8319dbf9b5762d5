// The columns of a report.
//
// A report's table is an array of Column, one entry a column, made by the function that is named
// after what the figure is:
//
//   Kilobytes("touched", "Guest physical memory actively used by VM",
//             [](const VMStatsRow& row) { return row.vmm.touched; }),
//
// The function and the figure's type settle how the figure is converted, printed and added up; what
// differs is said behind the entry: Count(...).Wide(7).As("Lu").Total(kBlank). IsSound() is
// asserted of each table, so that what could not be printed does not compile.
#ifndef FRAMEWORK_COLUMN_H_
#define FRAMEWORK_COLUMN_H_

#include <algorithm>
#include <array>
#include <concepts>
#include <cstdint>
#include <iterator>
#include <span>
#include <string_view>
#include <type_traits>

#include <knvlibs/ksi_records.h>
#include "framework/column_table.h"
#include "framework/computed.h"
#include "framework/display_unit.h"

namespace tally {

// What a figure is, in the measure that the kernel gives it in.
enum class Kind : uint8_t {
  text,
  flag,  // 0 or 1; shown as a letter
  id,
  code,  // one of a few numbers, each with a meaning of its own
  count,
  percent,
  time,  // in a unit that the kernel does not tell
  microseconds,
  kilobytes,
  pages,  // of 4 KB
  bytes,
};

constexpr bool IsMemory(Kind kind) {
  return kind == Kind::kilobytes || kind == Kind::pages || kind == Kind::bytes;
}

// What a column shows in the Total row.
enum class InTotal : uint8_t {
  blank,
  label,     // the word "Total"
  sum,       // of the rows' figures, 64 bits wrapping
  knownSum,  // of those figures that have a value
  mean,      // the sum divided by the number of rows
};

constexpr InTotal kBlank = InTotal::blank;
constexpr InTotal kLabel = InTotal::label;
constexpr InTotal kSum = InTotal::sum;
constexpr InTotal kKnownSum = InTotal::knownSum;
constexpr InTotal kMean = InTotal::mean;

// A column's figure: what there is to know of it beside its ColumnDesc.
struct Figure {
  Kind kind;
  uint8_t bits;   // of the record's number; 0 for a text
  bool isSigned;  // the number is printed with a sign
  InTotal inTotal;
  Conversion toUnit;                         // null for what is shown as it is
  bool isKey = false;                        // tells, with the other keys, what the row is of
  bool isCounter = false;                    // only grows, as long as what it counts is there
  std::span<const char* const> states = {};  // all that a text may be; none: anything

  constexpr bool IsNumber() const { return kind != Kind::text && kind != Kind::flag; }

  // Whether the figure has no value: the cell is not known, or all bits of its number are ones.
  bool IsNone(const Cell& cell) const {
    if (!cell.isKnown()) return true;
    return IsNumber() && (cell.number() & KSI_NO_VALUE_OF(bits)) == KSI_NO_VALUE_OF(bits);
  }

  // Whether the figure is shown as it is in `unit`.
  bool IsShownAsItIs(DisplayUnit unit) const {
    return toUnit == nullptr || (kind == Kind::kilobytes && bits == 64 && unit == DisplayUnit::kb);
  }

  // The figure as it is shown in `unit`.
  Cell Shown(const Cell& cell, DisplayUnit unit) const {
    return toUnit == nullptr ? cell : Cell(toUnit(cell.number(), unit));
  }
};

// A column, whatever the rows.
struct ColumnInfo {
  ColumnDesc desc;
  Figure figure;
};

// One column of a report on `Row`s.
template <class Row>
struct Column : ColumnInfo {
  Cell (*value)(const Row& row);

  constexpr Column Wide(uint8_t width) const {
    Column column = *this;
    column.desc.width = width;
    return column;
  }

  // Printed with another conversion of the same sign than that of the figure's type.
  constexpr Column As(const char* conversion) const {
    Column column = *this;
    column.desc.conversion = conversion;
    return column;
  }

  // The same where the sign is not that of the figure's type.
  constexpr Column AsSigned(const char* conversion) const {
    Column column = As(conversion);
    column.figure.isSigned = true;
    return column;
  }
  constexpr Column AsUnsigned(const char* conversion) const {
    Column column = As(conversion);
    column.figure.isSigned = false;
    return column;
  }

  // Converted to the display unit in another way than others of its kind.
  constexpr Column Through(Conversion toUnit) const {
    Column column = *this;
    column.figure.toUnit = toUnit;
    return column;
  }

  constexpr Column Total(InTotal inTotal) const {
    Column column = *this;
    column.figure.inTotal = inTotal;
    column.desc.summable = inTotal != InTotal::blank;
    return column;
  }

  // -s cannot hide it.
  constexpr Column Fixed() const {
    Column column = *this;
    column.desc.fixed = 1;
    return column;
  }

  // What the row is of, together with the report's other keys: no two rows of a moment have the
  // same keys, and rows of two moments with the same keys are of the same thing.
  constexpr Column Key() const {
    Column column = *this;
    column.figure.isKey = true;
    return column;
  }

  // One of a few words, which live as long as the table.
  constexpr Column States(std::span<const char* const> states) const {
    Column column = *this;
    column.figure.states = states;
    return column;
  }

  // Counted from when the thing came to be, and never reset.
  constexpr Column Ever() const {
    Column column = *this;
    column.figure.isCounter = true;
    return column;
  }
};

namespace column_internal {

// The row that a figure's function takes, and what it returns.
template <class Function>
struct Signature;
template <class Class, class R, class T>
struct Signature<R (Class::*)(const T&) const> {
  using Row = T;
  using Result = R;
};
template <class Read>
using RowOf = typename Signature<decltype(&Read::operator())>::Row;
template <class Read>
using ResultOf = typename Signature<decltype(&Read::operator())>::Result;

// What a function's result is of, known or not: the `Value` of a Computed, else itself.
template <class Result>
struct Unwrapped {
  using Value = Result;
};
template <class T>
struct Unwrapped<Computed<T>> {
  using Value = T;
};
template <class Read>
using ValueOf = typename Unwrapped<ResultOf<Read>>::Value;

template <class Value>
constexpr Cell CellOf(const Value& value) {
  return value;
}
template <class Value>
constexpr Cell CellOf(const Computed<Value>& computed) {
  return Cell(computed.value).KnownIf(computed.isKnown);
}

// Whether a text of the row can still be read when the function that gave it has returned.
template <class Result>
concept IsKept = std::same_as<Result, std::string_view> || std::is_pointer_v<Result> ||
    std::is_lvalue_reference_v<Result>;

// How a number is printed: memory in 64 bits, others as wide as they are.
template <std::integral Number>
constexpr const char* ConversionOf(Kind kind) {
  if (IsMemory(kind) || sizeof(Number) == sizeof(uint64_t))
    return std::signed_integral<Number> ? "Ld" : "Lu";
  return std::signed_integral<Number> ? "d" : "u";
}

template <class Row>
constexpr Column<Row> Make(const char* name, const char* description, const char* conversion,
                           const Figure& figure, Cell (*value)(const Row& row)) {
  return {{{.name = name,
            .description = description,
            .width = 10,
            .conversion = conversion,
            .summable = figure.inTotal != InTotal::blank,
            .fixed = 0,
            .selected = 1},
           figure},
          value};
}

template <class Read>
constexpr auto Number(Kind kind, const char* name, const char* description, InTotal inTotal,
                      Conversion toUnit) {
  using Row = RowOf<Read>;
  using Value = ValueOf<Read>;
  static_assert(std::integral<Value> && !std::same_as<Value, bool>);
  return Make<Row>(name, description, ConversionOf<Value>(kind),
                   {.kind = kind,
                    .bits = 8 * sizeof(Value),
                    .isSigned = std::signed_integral<Value>,
                    .inTotal = inTotal,
                    .toUnit = toUnit},
                   [](const Row& row) { return CellOf(Read{}(row)); });
}

}  // namespace column_internal

// A text that is the row's for as long as the row is; one that the function makes would be gone.
template <class Read>
requires column_internal::IsKept<column_internal::ValueOf<Read>>
constexpr auto Text(const char* name, const char* description, Read /*read*/) {
  using Row = column_internal::RowOf<Read>;
  return column_internal::Make<Row>(
      name, description, "s",
      {.kind = Kind::text, .bits = 0, .isSigned = false, .inTotal = kBlank, .toUnit = nullptr},
      [](const Row& row) { return column_internal::CellOf(Read{}(row)); });
}

// 'y' or 'n', of a number of the kernel that is 0 for no.
template <class Read>
constexpr auto Flag(const char* name, const char* description, Read /*read*/) {
  using Row = column_internal::RowOf<Read>;
  return column_internal::Make<Row>(
      name, description, "c",
      {.kind = Kind::flag, .bits = 1, .isSigned = false, .inTotal = kBlank, .toUnit = nullptr},
      [](const Row& row) {
        const auto flag = Read{}(row);
        return Cell::YesNo(flag != 0).KnownIf(HasValue(flag));
      });
}

template <class Read>
constexpr auto Id(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::id, name, description, kBlank, nullptr);
}

template <class Read>
constexpr auto Code(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::code, name, description, kBlank, nullptr);
}

template <class Read>
constexpr auto Count(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::count, name, description, kSum, nullptr);
}

template <class Read>
constexpr auto Percent(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::percent, name, description, kBlank, nullptr);
}

template <class Read>
constexpr auto Time(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::time, name, description, kBlank, nullptr);
}

template <class Read>
constexpr auto Microseconds(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::microseconds, name, description, kBlank, nullptr);
}

// Memory, shown in the display unit. One without a value is shown as it is, ...
template <class Read>
constexpr auto Kilobytes(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::kilobytes, name, description, kSum, FromKilobytes);
}

// ... but is converted like any other where the kernel counts pages or bytes.
template <class Read>
constexpr auto Pages(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::pages, name, description, kSum, FromPages);
}

template <class Read>
constexpr auto Bytes(const char* name, const char* description, Read /*read*/) {
  return column_internal::Number<Read>(Kind::bytes, name, description, kSum, FromBytes);
}

namespace column_internal {

// Whether a label is there and stays on its line.
constexpr bool IsPrintable(const char* label) {
  return label != nullptr && std::ranges::all_of(std::string_view(label), [](char letter) {
           return letter >= ' ' && letter <= '~';
         });
}

// Whether -s, the header and a line of CSV can hold a name.
constexpr bool IsName(const char* name) {
  return IsPrintable(name) && *name != '\0' &&
         std::string_view(name).find_first_of(":,\"") == std::string_view::npos;
}

// Whether the conversion is one of the figure's type and cuts nothing off.
constexpr bool Prints(std::string_view conversion, const Figure& figure) {
  if (figure.kind == Kind::text) return conversion == "s";
  if (figure.kind == Kind::flag) return conversion == "c" || conversion == "s";
  if (conversion == (figure.isSigned ? "Ld" : "Lu")) return true;
  return figure.bits <= 32 && conversion == (figure.isSigned ? "d" : "u");
}

// Whether the Total row can show what the column says.
constexpr bool CanBeTotal(const Figure& figure) {
  if (figure.inTotal == kBlank) return true;
  return (figure.inTotal == kLabel) == (figure.kind == Kind::text);
}

// Whether what the column counts can be counted, what it tells apart can be told, and its words are
// words.
constexpr bool CanBeMarked(const Figure& figure) {
  const bool isName = figure.kind == Kind::text || figure.kind == Kind::id;
  return (!figure.isKey || isName) && (!figure.isCounter || (figure.IsNumber() && !isName)) &&
         (figure.states.empty() || figure.kind == Kind::text);
}

}  // namespace column_internal

// Whether a column can be printed and added up as it says.
constexpr bool IsSound(const ColumnInfo& column) {
  using namespace column_internal;
  const ColumnDesc& desc = column.desc;
  return IsName(desc.name) && IsPrintable(desc.description) && desc.width > 0 &&
         desc.conversion != nullptr && Prints(desc.conversion, column.figure) &&
         CanBeTotal(column.figure) && CanBeMarked(column.figure);
}

// Whether all columns of a table are sound and their names differ, whatever the case.
template <class ColumnOfRow, size_t kCount>
constexpr bool IsSound(const ColumnOfRow (&columns)[kCount]) {
  constexpr auto lower = [](char letter) {
    return letter >= 'A' && letter <= 'Z' ? static_cast<char>(letter - 'A' + 'a') : letter;
  };
  for (size_t i = 0; i < kCount; ++i) {
    if (!IsSound(columns[i])) return false;
    const std::string_view name = columns[i].desc.name;
    for (size_t other = 0; other < i; ++other) {
      if (std::ranges::equal(name, std::string_view(columns[other].desc.name), {}, lower, lower))
        return false;
    }
  }
  return kCount <= UINT8_MAX;
}

// The place of the column called `name`; does not compile where there is none.
template <class ColumnOfRow, size_t kCount>
consteval size_t PlaceOf(const ColumnOfRow (&columns)[kCount], std::string_view name) {
  for (size_t place = 0; place < kCount; ++place) {
    if (name == columns[place].desc.name) return place;
  }
  throw "there is no such column";
}

// A table without its rows.
template <const auto& kColumns>
constexpr auto kColumnInfos = [] {
  std::array<ColumnInfo, std::size(kColumns)> infos{};
  std::copy(std::begin(kColumns), std::end(kColumns), infos.begin());
  return infos;
}();

}  // namespace tally

#endif  // FRAMEWORK_COLUMN_H_
