// JSON that is written, put together piece by piece.
#ifndef TOOLS_KSICACHE_JSON_WRITER_H_
#define TOOLS_KSICACHE_JSON_WRITER_H_

#include <concepts>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace ksicache {

// An object or an array that grows; the commas are its own matter.
class JsonWriter {
 public:
  // A member of an object, or an element of an array with an empty name. What there is none of is
  // null.
  JsonWriter& Text(std::string_view name, std::string_view text);  // any bytes
  JsonWriter& Text(std::string_view name, const char* text);       // null: none
  JsonWriter& Number(std::string_view name, std::optional<int64_t> number);
  JsonWriter& Number(std::string_view name, std::unsigned_integral auto number) {
    return Json(name, std::to_string(number));
  }
  JsonWriter& Real(std::string_view name, std::optional<double> number);  // 12 digits
  JsonWriter& Flag(std::string_view name, bool flag);
  JsonWriter& None(std::string_view name) { return Json(name, "null"); }
  // What is JSON already.
  JsonWriter& Json(std::string_view name, std::string_view json);

  // What comes next, if only the end, begins a line.
  JsonWriter& NewLine();

  std::string Object() const { return Within('{', '}'); }
  std::string Array() const { return Within('[', ']'); }

 private:
  std::string Within(char first, char last) const;

  std::string text_;
  bool isLineDue_ = false;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_JSON_WRITER_H_
