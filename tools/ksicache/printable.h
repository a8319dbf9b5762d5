// Text from outside, as it may be shown: nothing in it reaches a terminal as a command, turns the
// direction of what is around it, or hides.
#ifndef TOOLS_KSICACHE_PRINTABLE_H_
#define TOOLS_KSICACHE_PRINTABLE_H_

#include <string>
#include <string_view>

namespace ksicache {

// The text with each byte of what is not to be shown, or is not UTF-8, written as "\x1b".
std::string Printable(std::string_view text);

// JSON with each such character of its strings written as "\u202e", which is the same JSON.
std::string PrintableJson(std::string_view json);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PRINTABLE_H_
