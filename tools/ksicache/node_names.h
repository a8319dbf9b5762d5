// Help with the names of nodes.
#ifndef TOOLS_KSICACHE_NODE_NAMES_H_
#define TOOLS_KSICACHE_NODE_NAMES_H_

#include <string_view>

#include "tools/ksicache/error.h"

namespace ksicache {

// The error that there is no node of this name, with those that there are: the ones below it, a
// line each, or the one that is likely to be meant.
UsageError NoNode(std::string_view name);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_NODE_NAMES_H_
