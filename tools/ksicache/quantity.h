// Times and sizes as people write and read them.
#ifndef TOOLS_KSICACHE_QUANTITY_H_
#define TOOLS_KSICACHE_QUANTITY_H_

#include <cstdint>
#include <optional>
#include <string>

#include "framework/display_unit.h"
#include "tools/ksicache/command.h"

namespace ksicache {

// The value of an option, or `standard` if it was not given. Each fails with a UsageError that
// names the option.
//
// "5s", "10m", "6h" or "7d" in us; a number alone is seconds.
int64_t DurationOf(const CommandLine& line, const Option& option, int64_t standard);
// "500M" or "2G" in bytes of 1024; a number alone is bytes.
int64_t SizeOf(const CommandLine& line, const Option& option, int64_t standard);
// The unit of --unit; none if it is not there.
std::optional<tally::DisplayUnit> UnitOf(const CommandLine& line);
// A number that is not 0.
int64_t CountOf(const CommandLine& line, const Option& option, int64_t standard);

// "02:03:04", "1d 02:03:04" or "-00:00:05", of us.
std::string TextOfDuration(int64_t duration);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_QUANTITY_H_
