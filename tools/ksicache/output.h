// Standard output, of which nothing is lost unseen.
#ifndef TOOLS_KSICACHE_OUTPUT_H_
#define TOOLS_KSICACHE_OUTPUT_H_

#include <string>
#include <string_view>

namespace ksicache {

void Print(std::string_view text);

// A line on standard error, after the program's name.
void PrintError(const std::string& message);

// Fails with an Error if not all that was printed got out.
void FinishOutput();

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_OUTPUT_H_
