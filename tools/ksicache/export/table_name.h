// What databases call the table of a report: as it is called, with '_' for '-'.
#ifndef TOOLS_KSICACHE_EXPORT_TABLE_NAME_H_
#define TOOLS_KSICACHE_EXPORT_TABLE_NAME_H_

#include <algorithm>
#include <string>

#include "framework/report.h"

namespace ksicache {

inline std::string TableName(const tally::Report& report) {
  std::string name = report.name;
  std::ranges::replace(name, '-', '_');
  return name;
}

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_TABLE_NAME_H_
