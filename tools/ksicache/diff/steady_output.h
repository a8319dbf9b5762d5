// Who grows steadily, for people and for programs.
#ifndef TOOLS_KSICACHE_DIFF_STEADY_OUTPUT_H_
#define TOOLS_KSICACHE_DIFF_STEADY_OUTPUT_H_

#include <cstddef>

#include "framework/display_unit.h"
#include "tools/ksicache/diff/steady.h"

namespace ksicache {

// Prints the first `top` things, and the first `top` groups. Fails with an OutputError.
void PrintSteady(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top);
void PrintSteadyJson(const SteadyGrowths& growths, tally::DisplayUnit unit, size_t top);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_STEADY_OUTPUT_H_
