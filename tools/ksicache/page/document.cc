#include "tools/ksicache/page/document.h"

#include <string_view>

#include "tools/ksicache/page/packing.h"
#include "tools/ksicache/page/summary.h"

extern "C" {
// template.S
extern const char ksicache_page_begin[];
extern const char ksicache_page_end[];
}

namespace ksicache {

std::string ToHtml(const PageData& data) {
  const std::string title = HtmlText(data.title);
  std::string html;
  std::string_view rest(ksicache_page_begin,
                        static_cast<size_t>(ksicache_page_end - ksicache_page_begin));
  // In the order of the template, so that nothing of the data is taken for a place.
  const auto fill = [&](std::string_view place, const std::string& text) {
    const size_t at = rest.find(place);
    html.append(rest, 0, at).append(text);
    rest.remove_prefix(at + place.size());
  };
  fill("{{title}}", title);
  fill("{{summary}}", SummaryToHtml(data));
  fill("{{head}}", Base64(Packed(HeadToJson(data))));
  fill("{{points}}", Base64(data.tables.points.bytes));
  fill("{{tables}}", Base64(data.tables.full.bytes));
  fill("{{lines}}", Base64(data.lines.bytes));
  return html.append(rest);
}

}  // namespace ksicache
