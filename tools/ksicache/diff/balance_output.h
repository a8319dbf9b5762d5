// A host's balance on one screen, and for programs.
#ifndef TOOLS_KSICACHE_DIFF_BALANCE_OUTPUT_H_
#define TOOLS_KSICACHE_DIFF_BALANCE_OUTPUT_H_

#include <cstddef>

#include "framework/display_unit.h"
#include "tools/ksicache/diff/balance.h"
#include "tools/ksicache/diff/moments.h"

namespace ksicache {

// Prints it with the first `top` things of each part. Fails with an OutputError.
void PrintBalance(const Sides& sides, const Balance& balance, tally::DisplayUnit unit, size_t top);
void PrintBalanceJson(const Sides& sides, const Balance& balance, tally::DisplayUnit unit,
                      size_t top);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_BALANCE_OUTPUT_H_
