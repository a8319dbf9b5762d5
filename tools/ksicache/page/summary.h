// What a page says where no script runs: whose memory it is, how it divides and what is largest.
#ifndef TOOLS_KSICACHE_PAGE_SUMMARY_H_
#define TOOLS_KSICACHE_PAGE_SUMMARY_H_

#include <string>
#include <string_view>

#include "tools/ksicache/page/page_data.h"

namespace ksicache {

// A text from outside between tags or in an attribute; what is not to be shown is escaped.
std::string HtmlText(std::string_view text);

std::string SummaryToHtml(const PageData& data);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_SUMMARY_H_
