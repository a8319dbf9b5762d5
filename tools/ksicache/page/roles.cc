#include "tools/ksicache/page/roles.h"

#include <algorithm>
#include <iterator>

#include <knvlibs/ksi_records.h>
#include "tools/ksicache/json_writer.h"

namespace ksicache::roles {
namespace {

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
  return JsonWriter()
      .Text("report", things.report)
      .Text("name", things.name)
      .Text("size", things.size)
      .Object();
}

std::string ToJson(const Groups& groups) {
  return JsonWriter()
      .Text("report", groups.report)
      .Text("name", groups.name)
      .Text("id", groups.id)
      .Text("parent", groups.parent)
      .Object();
}

std::string ToJson(const Line& line) {
  return JsonWriter()
      .Text("title", line.title)
      .Text("report", line.report)
      .Text("column", line.column)
      .Flag("isLessWorse", line.isLessWorse)
      .Object();
}

template <class Role, size_t kCount>
std::string AllToJson(const Role (&roles)[kCount]) {
  JsonWriter all;
  for (const Role& role : roles) all.Json("", ToJson(role));
  return all.Array();
}

}  // namespace

std::span<const char* const> States() { return kStates; }

size_t StateOf(std::string_view state) {
  return static_cast<size_t>(std::ranges::find(kStates, state) - std::begin(kStates));
}

const Things* ThingsOf(std::string_view report) {
  const auto* const found = std::ranges::find(kThings, report, &Things::report);
  return found == std::end(kThings) ? nullptr : found;
}

std::string ToJson() {
  return JsonWriter()
      .Text("report", kHostReport)
      .Text("total", kTotal)
      .Text("managed", kManaged)
      .Text("state", kState)
      .Text("start", kStart)
      .Text("rest", kRest)
      .Json("states", StatesToJson())
      .Json("parts", AllToJson(kParts))
      .Json("startParts", AllToJson(kStartParts))
      .Json("things", AllToJson(kThings))
      .Json("groups", ToJson(kGroups))
      .Json("lines", AllToJson(kLines))
      .Object();
}

}  // namespace ksicache::roles
