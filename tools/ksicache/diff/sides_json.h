#ifndef TOOLS_KSICACHE_DIFF_SIDES_JSON_H_
#define TOOLS_KSICACHE_DIFF_SIDES_JSON_H_

#include "tools/ksicache/diff/moments.h"
#include "tools/ksicache/json_writer.h"

namespace ksicache {

// Which moments are compared, as members of an object.
void PutSides(const Sides& sides, JsonWriter& json);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_SIDES_JSON_H_
