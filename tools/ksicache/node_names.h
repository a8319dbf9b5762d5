// Help with the names of nodes.
#ifndef TOOLS_KSICACHE_NODE_NAMES_H_
#define TOOLS_KSICACHE_NODE_NAMES_H_

#include <string>
#include <string_view>

namespace ksicache {

// Says that there is no node of this name, and which there are: those below it, or the one that is
// likely to be meant.
std::string WhyNoNode(std::string_view name);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_NODE_NAMES_H_
