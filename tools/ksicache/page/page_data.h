// What a page shows, read and packed.
#ifndef TOOLS_KSICACHE_PAGE_PAGE_DATA_H_
#define TOOLS_KSICACHE_PAGE_PAGE_DATA_H_

#include <string>

#include "tools/ksicache/page/marks.h"
#include "tools/ksicache/page/moment_reader.h"

namespace ksicache {

struct PageData {
  explicit PageData(const std::string& name) : source{name, {}, problems} {}
  PageData(const PageData&) = delete;
  PageData& operator=(const PageData&) = delete;

  std::string title;
  Problems problems;
  PageSource source;
  Marks marks;
  PageTexts texts;
  MomentTables points;  // of the host's report, the moments that its balance is drawn from
  MomentTables tables;  // of all reports, the moments that are shown in full
  PageLines lines;
};

// Reads what `data` is of. Fails with a DataError when there is nothing to show.
void ReadPage(PageData& data);

// What the page's scripts read first: all of it but for the packed bytes, as JSON.
std::string HeadToJson(const PageData& data);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_PAGE_DATA_H_
