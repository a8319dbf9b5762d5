#include "tools/ksicache/json_writer.h"

#include <array>
#include <charconv>
#include <cmath>
#include <utility>

#include "tools/ksicache/record_json.h"

namespace ksicache {

JsonWriter& JsonWriter::Json(std::string_view name, std::string_view json) {
  if (!text_.empty()) text_ += ',';
  if (std::exchange(isLineDue_, false)) text_ += '\n';
  if (!name.empty()) text_ += TextToJson(name) + ':';
  text_ += json;
  return *this;
}

JsonWriter& JsonWriter::Text(std::string_view name, std::string_view text) {
  return Json(name, TextToJson(text));
}

JsonWriter& JsonWriter::Text(std::string_view name, const char* text) {
  return text == nullptr ? None(name) : Text(name, std::string_view(text));
}

JsonWriter& JsonWriter::Number(std::string_view name, std::optional<int64_t> number) {
  return number ? Json(name, std::to_string(*number)) : None(name);
}

JsonWriter& JsonWriter::Real(std::string_view name, std::optional<double> number) {
  if (!number || !std::isfinite(*number)) return None(name);
  std::array<char, 32> text = {};
  const auto [end, error] = std::to_chars(text.data(), text.data() + text.size(), *number,
                                          std::chars_format::general, 12);
  return Json(name, {text.data(), static_cast<size_t>(end - text.data())});
}

JsonWriter& JsonWriter::Flag(std::string_view name, bool flag) {
  return Json(name, flag ? "true" : "false");
}

JsonWriter& JsonWriter::NewLine() {
  isLineDue_ = true;
  return *this;
}

std::string JsonWriter::Within(char first, char last) const {
  return first + text_ + (isLineDue_ ? "\n" : "") + last;
}

}  // namespace ksicache
