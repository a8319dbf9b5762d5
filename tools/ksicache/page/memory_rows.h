// Who has a host's memory at a moment, as `ksicache diff` tells it (diff/memory.h), as rows that
// the page has beside those of the reports. web/memory.js reads them.
#ifndef TOOLS_KSICACHE_PAGE_MEMORY_ROWS_H_
#define TOOLS_KSICACHE_PAGE_MEMORY_ROWS_H_

#include <string>

#include "tools/ksicache/page/names.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/table_stream.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// Puts the rows of the moment that the library answers from into the stream and ends it there.
// `hasPaths`: with the names on the way to groups and processes, because at other moments of the
// page their numbers are those of others. `names`: what things are called.
void PutMemoryRows(const Origin& origin, bool hasPaths, TableStream& stream, std::string& bytes,
                   const Names& names, Problems& problems);

// What the rows' parts are, in the order of their numbers.
std::string PartsToJson();

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_MEMORY_ROWS_H_
