#include "knvlibs/linux/host/json.h"

namespace ksi {
namespace {

constexpr int kDeepest = 32;
constexpr size_t kLongest = size_t{1} << 20;

}  // namespace

std::optional<Json> ParseJson(std::string_view text) {
  if (text.size() > kLongest) return std::nullopt;
  bool isTooDeep = false;
  const auto keep = [&](int depth, Json::parse_event_t /*event*/, Json& /*parsed*/) {
    if (depth > kDeepest) isTooDeep = true;
    return !isTooDeep;
  };
  Json json = Json::parse(text, keep, /*allow_exceptions=*/false);
  if (isTooDeep || json.is_discarded()) return std::nullopt;
  return json;
}

const Json* FindMember(const Json* object, std::string_view name) {
  if (object == nullptr || !object->is_object()) return nullptr;
  const auto member = object->find(name);
  return member == object->end() ? nullptr : &*member;
}

const std::string* TextOf(const Json* json) {
  return json == nullptr ? nullptr : json->get_ptr<const Json::string_t*>();
}

Figure NumberOf(const Json* json) {
  if (json == nullptr || !json->is_number_unsigned()) return std::nullopt;
  return json->get<uint64_t>();
}

}  // namespace ksi
