#include "tools/ksicache/diff/sides_json.h"

#include <string>

namespace ksicache {
namespace {

std::string ToJson(const Origin& origin) {
  return JsonWriter().Text("host", origin.host).Text("time", origin.time).Object();
}

}  // namespace

void PutSides(const Sides& sides, JsonWriter& json) {
  json.Json("before", ToJson(sides.before))
      .Json("after", ToJson(sides.after))
      .Real("seconds", sides.Seconds())
      .Flag("rebooted", sides.isRebooted);
}

}  // namespace ksicache
