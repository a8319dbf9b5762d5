// A page as it is written: the template that the build makes of web/, with the data in it.
#ifndef TOOLS_KSICACHE_PAGE_DOCUMENT_H_
#define TOOLS_KSICACHE_PAGE_DOCUMENT_H_

#include <string>

#include "tools/ksicache/page/page_data.h"

namespace ksicache {

// No text of `data` is markup or script in it.
std::string ToHtml(const PageData& data);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_DOCUMENT_H_
