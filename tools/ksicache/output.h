// Standard output, of which nothing is lost unseen: what cannot be written is an OutputError.
#ifndef TOOLS_KSICACHE_OUTPUT_H_
#define TOOLS_KSICACHE_OUTPUT_H_

#include <string_view>

namespace ksicache {

// As it is; for what holds no text from outside, or holds it escaped.
void Print(std::string_view text);

// A line, escaped.
void PrintLine(std::string_view text);

// A line on standard error, after the program's name, escaped; cut where nobody reads on.
void PrintError(std::string_view message);

// That there is no memory, without any.
void PrintNoMemory();

// Fails if not all that was printed gets out.
void FlushOutput();
// The same, at the end.
void FinishOutput();

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_OUTPUT_H_
