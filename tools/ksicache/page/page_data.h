// What a page shows, read and packed.
#ifndef TOOLS_KSICACHE_PAGE_PAGE_DATA_H_
#define TOOLS_KSICACHE_PAGE_PAGE_DATA_H_

#include <string>
#include <vector>

#include "tools/ksicache/page/lines_reader.h"
#include "tools/ksicache/page/marks.h"
#include "tools/ksicache/page/names.h"
#include "tools/ksicache/page/problems.h"
#include "tools/ksicache/page/survey.h"
#include "tools/ksicache/page/table_stream.h"
#include "tools/ksicache/page/tables_reader.h"

namespace ksicache {

struct PageData {
  std::string title;
  std::string zone;  // the name of the host's time zone; empty if it is not told
  Problems problems;
  Survey survey;
  Marks marks;
  PageTexts texts;
  Names names;
  PageTables tables;
  PageLines lines;
};

// Reads what "FILE", "FILE@WHEN" or "FILE@FROM..TO" is, into an empty `data`. Fails with a
// DataError when there is nothing to show.
void ReadPage(const std::string& name, PageData& data);

// What was wrong, and with which moments if there are several.
std::vector<std::string> ProblemsOf(const PageData& data);

// What the page's scripts read first: all of it but for the packed bytes, as JSON.
std::string HeadToJson(const PageData& data);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_PAGE_DATA_H_
