// The formats that rows are written in.
#ifndef TOOLS_KSICACHE_EXPORT_FORMATS_H_
#define TOOLS_KSICACHE_EXPORT_FORMATS_H_

#include <cstddef>
#include <memory>
#include <string>

#include "tools/ksicache/export/row_format.h"
#include "tools/ksicache/new_file.h"

namespace ksicache {

// What is common to all rows.
struct FormatOptions {
  NewFile* file;                         // null: standard output
  bool hasManyReports;                   // so that each row says of which it is
  bool hasSpans;                         // so that hosts have rows of several times
  size_t mostBytes = size_t{192} << 20;  // of rows that are kept to be put in order
  std::string cluster = {};              // of a schema
  std::string database = {};             // to add to, instead of making a file
};

struct FormatInfo {
  const char* name;    // the word of --format
  bool isInBaseUnits;  // bytes, whatever -u says
  bool needsFile;      // it is nothing to print
  bool isByReport;     // a report's rows of all moments stand together
  bool isSchema;       // it has no rows
  bool isDatabase;     // a file of it can be added to
  std::unique_ptr<RowFormat> (*make)(const FormatOptions& options);
};

std::unique_ptr<RowFormat> MakeCsv(const FormatOptions& options);
std::unique_ptr<RowFormat> MakeJson(const FormatOptions& options);
std::unique_ptr<RowFormat> MakeSqlite(const FormatOptions& options);  // REQUIRES: a file
std::unique_ptr<RowFormat> MakeOpenMetrics(const FormatOptions& options);
std::unique_ptr<RowFormat> MakePrometheus(const FormatOptions& options);
std::unique_ptr<RowFormat> MakeClickHouseSchema(const FormatOptions& options);

// The first one is taken if none is named.
inline constexpr FormatInfo kFormats[] = {
    {"csv", false, false, true, false, false, MakeCsv},
    {"json", false, false, false, false, false, MakeJson},
    {"sqlite", false, true, false, false, true, MakeSqlite},
    {"openmetrics", true, false, true, false, false, MakeOpenMetrics},
    {"prometheus", true, false, true, false, false, MakePrometheus},
    {"clickhouse-schema", false, false, true, true, false, MakeClickHouseSchema},
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_FORMATS_H_
