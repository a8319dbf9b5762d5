// Which column of a report says who grew.
#ifndef TOOLS_KSICACHE_DIFF_MEASURE_H_
#define TOOLS_KSICACHE_DIFF_MEASURE_H_

#include <cstddef>
#include <optional>
#include <span>
#include <string>

#include "framework/report.h"
#include "tools/ksicache/export/row_format.h"

namespace ksicache {

// Whether there is none of it where there is nothing.
bool IsAmount(tally::Kind kind);

bool CanGrow(tally::Kind kind);

// The place of the column called `by`, or if that is null of the one of what the report's things
// have taken; none if it tells of nothing of the kind. Fails with a UsageError if no column that
// can grow is called so.
std::optional<size_t> MeasureOf(const tally::Report& report, std::span<const RowColumn> columns,
                                const std::string* by);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_MEASURE_H_
