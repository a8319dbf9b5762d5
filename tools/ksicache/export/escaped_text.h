// Texts of a host as UTF-8, so that no two of them become one: a byte that is not part of a
// character is "%" and its two digits, "%ff", and so is a "%" before two such digits, "%25".
#ifndef TOOLS_KSICACHE_EXPORT_ESCAPED_TEXT_H_
#define TOOLS_KSICACHE_EXPORT_ESCAPED_TEXT_H_

#include <string>
#include <string_view>

namespace ksicache {

// Whether the text stands for itself.
bool IsPlain(std::string_view text);

std::string Escaped(std::string_view text);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_ESCAPED_TEXT_H_
