// What a column makes of the kernel's numbers.
//
//   return Known(tally.mapped) - Known(tally.sharedSaved);
//
// The value is what a table shows, come what may: sums wrap like the kernel's own. It is known if
// all the numbers have a value, and no sum was cut.
#ifndef FRAMEWORK_COMPUTED_H_
#define FRAMEWORK_COMPUTED_H_

#include <concepts>

#include <knvlibs/ksi_records.h>

namespace tally {

template <class Value>
struct Computed {
  Value value;
  bool isKnown;
};

// Whether the kernel has a value for a number: it has not if all bits are ones.
template <std::integral Number>
requires(!std::same_as<Number, bool>) constexpr bool HasValue(Number number) {
  return number != static_cast<Number>(KSI_NO_VALUE);
}

template <std::unsigned_integral Number>
constexpr Computed<Number> Known(Number number) {
  return {number, HasValue(number)};
}

// A number as one of a narrower type.
template <std::integral Narrow, std::integral Number>
constexpr Computed<Narrow> Cut(Number number) {
  const auto narrow = static_cast<Narrow>(number);
  return {narrow, static_cast<Number>(narrow) == number};
}

template <std::unsigned_integral Number>
constexpr Computed<Number> operator+(Computed<Number> a, Computed<Number> b) {
  const auto sum = static_cast<Number>(a.value + b.value);
  return {sum, a.isKnown && b.isKnown && sum >= a.value};
}

template <std::unsigned_integral Number>
constexpr Computed<Number> operator-(Computed<Number> a, Computed<Number> b) {
  return {static_cast<Number>(a.value - b.value), a.isKnown && b.isKnown && a.value >= b.value};
}

}  // namespace tally

#endif  // FRAMEWORK_COMPUTED_H_
