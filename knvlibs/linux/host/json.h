// Strict and bounded reading of the JSON texts that QEMU takes and gives.
#ifndef KNVLIBS_LINUX_HOST_JSON_H_
#define KNVLIBS_LINUX_HOST_JSON_H_

#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <string_view>

#include "knvlibs/linux/host/figure.h"

namespace ksi {

using Json = nlohmann::json;

// The whole of `text` as one value; none if it is anything else, nests deeper than anybody means to
// or is longer than a megabyte.
std::optional<Json> ParseJson(std::string_view text);

// The member of this name; null if `object` is null, no object, or has none.
const Json* FindMember(const Json* object, std::string_view name);

// The text, or the whole number that is not negative; none if it is null or anything else.
const std::string* TextOf(const Json* json);
Figure NumberOf(const Json* json);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_JSON_H_
