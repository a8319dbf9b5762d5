#ifndef TOOLS_KSICACHE_EXPORT_METRIC_NAME_H_
#define TOOLS_KSICACHE_EXPORT_METRIC_NAME_H_

#include <string>
#include <string_view>

namespace ksicache {

// The name of a column or a report as metrics have theirs: "memSizeLimit" as mem_size_limit. A word
// begins at a capital behind a small letter, and at the last capital of several, "COWSwapper" as
// cow_swapper; digits belong to the capitals behind them, "alloc2MBlocks" as alloc_2m_blocks. A
// single letter is no word of its own, "nrSPages" as nr_spages: it would be read as a unit.
std::string SnakeCase(std::string_view name);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_METRIC_NAME_H_
