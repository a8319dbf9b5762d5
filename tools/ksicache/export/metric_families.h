// The metrics of a report: which there are, what they are called, and which columns they are of.
//
// What tells rows apart are labels of all of them. A number is a family by itself, in bytes,
// seconds or a ratio; flags are the family "..._flag"; a word of which all states are known is a
// state set; and all words and identifiers together are labels of "..._info", which is 1.
#ifndef TOOLS_KSICACHE_EXPORT_METRIC_FAMILIES_H_
#define TOOLS_KSICACHE_EXPORT_METRIC_FAMILIES_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "tools/ksicache/export/row_format.h"

namespace ksicache {

enum class MetricType : uint8_t { gauge, counter, flags, states, info };

struct MetricFamily {
  std::string name;
  MetricType type;
  std::string unit;             // that the name ends in; empty: none
  std::string help;             // on one line
  std::vector<size_t> columns;  // one, or those of the flags or words
};

struct ReportMetrics {
  std::vector<MetricFamily> families;
  std::vector<size_t> keys;        // the columns that are labels of all samples
  std::vector<std::string> names;  // of all columns, as labels
};

ReportMetrics MetricsOf(const char* report, std::span<const RowColumn> columns);

// What ends the name of the family's samples.
const char* SuffixOf(MetricType type);

// How many decimals a column's base unit has that the kernel's own has not.
int DecimalsOf(const RowColumn& column);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_METRIC_FAMILIES_H_
