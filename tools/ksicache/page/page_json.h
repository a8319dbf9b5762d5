// JSON for a page's scripts, put together piece by piece.
#ifndef TOOLS_KSICACHE_PAGE_PAGE_JSON_H_
#define TOOLS_KSICACHE_PAGE_PAGE_JSON_H_

#include <cstdint>
#include <string>
#include <string_view>

#include "tools/ksicache/page/table_stream.h"

namespace ksicache {

// An object or an array that grows; the commas are its own matter.
class JsonWriter {
 public:
  // A member of an object, or an element of an array with an empty name.
  JsonWriter& Text(std::string_view name, std::string_view text);  // any bytes
  JsonWriter& Text(std::string_view name, const char* text);       // null: null
  JsonWriter& Number(std::string_view name, int64_t number);
  JsonWriter& Flag(std::string_view name, bool flag);
  // A text is its number, a number is a text: JSON's own have 53 bits.
  JsonWriter& Value(std::string_view name, const PageValue& value);
  // What is JSON already.
  JsonWriter& Json(std::string_view name, std::string_view json);

  std::string Object() const { return '{' + text_ + '}'; }
  std::string Array() const { return '[' + text_ + ']'; }

 private:
  std::string text_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_PAGE_JSON_H_
