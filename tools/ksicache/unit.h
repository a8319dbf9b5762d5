#ifndef TOOLS_KSICACHE_UNIT_H_
#define TOOLS_KSICACHE_UNIT_H_

#include <cstdint>

#include "framework/display_unit.h"

namespace ksicache {

// The bytes of one.
constexpr int64_t BytesIn(tally::DisplayUnit unit) {
  switch (unit) {
    case tally::DisplayUnit::mb:
      return int64_t{1} << 20;
    case tally::DisplayUnit::kb:
      return int64_t{1} << 10;
    case tally::DisplayUnit::pg:
      return int64_t{4} << 10;
    case tally::DisplayUnit::b:
      break;
  }
  return 1;
}

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_UNIT_H_
