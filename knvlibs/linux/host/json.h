// Strict reading of the JSON texts that QEMU takes and gives.
#ifndef KNVLIBS_LINUX_HOST_JSON_H_
#define KNVLIBS_LINUX_HOST_JSON_H_

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace ksi {

struct Json {
  using Elements = std::vector<Json>;

  // The members of an object: the value at an index is that of the name there.
  struct Object {
    std::vector<std::string> names;
    Elements values;
  };

  // Numbers are kept as they are written.
  struct Number {
    std::string text;
  };

  std::variant<std::nullptr_t, bool, Number, std::string, Object, Elements> value = nullptr;

  // The member of this name; null if this is no object or has none.
  const Json* Find(std::string_view name) const;

  const std::string* Text() const { return std::get_if<std::string>(&value); }

  // A whole number that is not negative and fits.
  std::optional<uint64_t> Unsigned() const;
};

// The whole of `text` as one value; none if it is anything else.
std::optional<Json> ParseJson(std::string_view text);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_JSON_H_
