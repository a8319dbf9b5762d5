#include "tools/ksicache/page/roles.h"

#include <knvlibs/ksi_records.h>
#include "tools/ksicache/page/page_json.h"

namespace ksicache::roles {
namespace {

// As reports show the memory states, from best to worst.
#define TITLE(number, identifier, name, title) title,
constexpr const char* kStates[] = {KSI_MEMORY_STATES(TITLE)};
#undef TITLE

std::string StatesToJson() {
  JsonWriter states;
  for (const char* state : kStates) states.Text("", state);
  return states.Array();
}

std::string ToJson(const Part& part) {
  return JsonWriter()
      .Text("key", part.key)
      .Text("title", part.title)
      .Text("column", part.column)
      .Object();
}

std::string ToJson(const Things& things) {
  JsonWriter sizes;
  for (const char* size : things.sizes) {
    if (size != nullptr) sizes.Text("", size);
  }
  return JsonWriter()
      .Text("key", things.key)
      .Text("title", things.title)
      .Text("report", things.report)
      .Text("name", things.name)
      .Text("id", things.id)
      .Text("parent", things.parent)
      .Json("sizes", sizes.Array())
      .Object();
}

std::string ToJson(const Line& line) {
  return JsonWriter()
      .Text("title", line.title)
      .Text("report", line.report)
      .Text("column", line.column)
      .Object();
}

template <class Role, size_t kCount>
std::string AllToJson(const Role (&roles)[kCount]) {
  JsonWriter all;
  for (const Role& role : roles) all.Json("", ToJson(role));
  return all.Array();
}

}  // namespace

std::string ToJson() {
  return JsonWriter()
      .Text("report", kHostReport)
      .Text("total", kTotal)
      .Text("managed", kManaged)
      .Text("state", kState)
      .Json("states", StatesToJson())
      .Json("parts", AllToJson(kParts))
      .Json("startParts", AllToJson(kStartParts))
      .Json("things", AllToJson(kThings))
      .Json("lines", AllToJson(kLines))
      .Object();
}

}  // namespace ksicache::roles
