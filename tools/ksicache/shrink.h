// Makes a recording smaller.
#ifndef TOOLS_KSICACHE_SHRINK_H_
#define TOOLS_KSICACHE_SHRINK_H_

#include <cstdint>
#include <string>

namespace ksicache {

// Makes it anew of the latest chunks that fit into `maxSize` bytes, beside it as "FILE.smaller",
// and puts that in its place; whoever reads the old one meanwhile has it as a whole. Gives what is
// to be said of it. Fails with an Error; the file is then as it was.
std::string Shrink(const std::string& fileName, int64_t maxSize);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_SHRINK_H_
