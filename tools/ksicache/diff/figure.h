// Figures that may have no value, added up and compared: what does not fit has none.
#ifndef TOOLS_KSICACHE_DIFF_FIGURE_H_
#define TOOLS_KSICACHE_DIFF_FIGURE_H_

#include <cstdint>
#include <optional>

namespace ksicache {

using MaybeFigure = std::optional<int64_t>;

inline MaybeFigure Less(MaybeFigure a, MaybeFigure b) {
  int64_t difference = 0;
  if (!a || !b || __builtin_sub_overflow(*a, *b, &difference)) return std::nullopt;
  return difference;
}

inline MaybeFigure Sum(MaybeFigure a, MaybeFigure b) {
  int64_t sum = 0;
  if (!a || !b || __builtin_add_overflow(*a, *b, &sum)) return std::nullopt;
  return sum;
}

inline MaybeFigure Times(MaybeFigure number, int64_t size) {
  int64_t product = 0;
  if (!number || __builtin_mul_overflow(*number, size, &product)) return std::nullopt;
  return product;
}

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_FIGURE_H_
