// A figure of the kernel: a number, or none where it exists and cannot be told.
//
// What is made of figures cannot be told if one of them cannot, or if it has no room in 64 bits. An
// optional has no operators for arithmetic, so that nothing but these functions makes figures.
#ifndef KNVLIBS_LINUX_HOST_FIGURE_H_
#define KNVLIBS_LINUX_HOST_FIGURE_H_

#include <algorithm>
#include <cstdint>
#include <initializer_list>
#include <optional>
#include <utility>

#include <knvlibs/ksi_records.h>

namespace ksi {

using Figure = std::optional<uint64_t>;

// The field of a record whose figure cannot be told: all ones.
constexpr uint64_t kNoValue = KSI_NO_VALUE;

// A figure as a record's field has it. One that does not fit cannot be told.
template <class Field = uint64_t>
constexpr Field FieldOf(Figure figure) {
  return figure && std::in_range<Field>(*figure)
             ? static_cast<Field>(*figure)
             : static_cast<Field>(KSI_NO_VALUE_OF(8 * sizeof(Field)));
}

constexpr Figure SumOf(std::initializer_list<Figure> parts) {
  uint64_t sum = 0;
  for (const Figure& part : parts) {
    if (!part || __builtin_add_overflow(sum, *part, &sum)) return std::nullopt;
  }
  return sum;
}

// 0 at least: figures that belong together are not always read at the same moment.
constexpr uint64_t Less(uint64_t value, uint64_t part) { return value - std::min(value, part); }

constexpr Figure DifferenceOf(Figure figure, Figure part) {
  if (!figure || !part) return std::nullopt;
  return Less(*figure, *part);
}

constexpr Figure LesserOf(Figure one, Figure other) {
  if (!one || !other) return std::nullopt;
  return std::min(*one, *other);
}

constexpr Figure ProductOf(Figure figure, uint64_t factor) {
  uint64_t product = 0;
  if (!figure || __builtin_mul_overflow(*figure, factor, &product)) return std::nullopt;
  return product;
}

// REQUIRES: divisor is not 0.
constexpr Figure QuotientOf(Figure figure, uint64_t divisor) {
  if (!figure) return std::nullopt;
  return *figure / divisor;
}

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_FIGURE_H_
