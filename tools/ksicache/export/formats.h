// The formats that rows are written in.
#ifndef TOOLS_KSICACHE_EXPORT_FORMATS_H_
#define TOOLS_KSICACHE_EXPORT_FORMATS_H_

#include <cstddef>
#include <memory>

#include "tools/ksicache/export/row_format.h"
#include "tools/ksicache/new_file.h"

namespace ksicache {

// What is common to all rows.
struct FormatOptions {
  NewFile* file;                         // null: standard output
  bool hasManyReports;                   // so that each row says of which it is
  bool hasSpans;                         // so that hosts have rows of several times
  size_t mostBytes = size_t{192} << 20;  // of rows that are kept to be put in order
};

struct FormatInfo {
  const char* name;    // the word of --format
  bool isInBaseUnits;  // bytes, whatever -u says
  bool needsFile;      // it is nothing to print
  bool isByReport;     // a report's rows of all moments stand together
  std::unique_ptr<RowFormat> (*make)(const FormatOptions& options);
};

std::unique_ptr<RowFormat> MakeCsv(const FormatOptions& options);
std::unique_ptr<RowFormat> MakeJson(const FormatOptions& options);
std::unique_ptr<RowFormat> MakeSqlite(const FormatOptions& options);  // REQUIRES: a file
std::unique_ptr<RowFormat> MakeOpenMetrics(const FormatOptions& options);
std::unique_ptr<RowFormat> MakePrometheus(const FormatOptions& options);

// The first one is taken if none is named.
inline constexpr FormatInfo kFormats[] = {
    {"csv", false, false, true, MakeCsv},
    {"json", false, false, false, MakeJson},
    {"sqlite", false, true, false, MakeSqlite},
    {"openmetrics", true, false, true, MakeOpenMetrics},
    {"prometheus", true, false, true, MakePrometheus},
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_FORMATS_H_
