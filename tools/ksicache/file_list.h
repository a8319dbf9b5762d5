// The names of files, from a file.
#ifndef TOOLS_KSICACHE_FILE_LIST_H_
#define TOOLS_KSICACHE_FILE_LIST_H_

#include <string>
#include <vector>

namespace ksicache {

// The names in the file `list`, "-" for standard input: one a line, or where it has NUL bytes one
// before each, as find -print0 has them. Fails with an Error; so it does if there are none, because
// without files a command takes this host.
std::vector<std::string> NamesIn(const std::string& list);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_FILE_LIST_H_
