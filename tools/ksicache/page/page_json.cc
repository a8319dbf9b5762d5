#include "tools/ksicache/page/page_json.h"

#include "tools/ksicache/record_json.h"

namespace ksicache {

JsonWriter& JsonWriter::Json(std::string_view name, std::string_view json) {
  if (!text_.empty()) text_ += ',';
  if (!name.empty()) text_ += TextToJson(name) + ':';
  text_ += json;
  return *this;
}

JsonWriter& JsonWriter::Text(std::string_view name, std::string_view text) {
  return Json(name, TextToJson(text));
}

JsonWriter& JsonWriter::Text(std::string_view name, const char* text) {
  return text == nullptr ? Json(name, "null") : Text(name, std::string_view(text));
}

JsonWriter& JsonWriter::Number(std::string_view name, int64_t number) {
  return Json(name, std::to_string(number));
}

JsonWriter& JsonWriter::Flag(std::string_view name, bool flag) {
  return Json(name, flag ? "true" : "false");
}

JsonWriter& JsonWriter::Value(std::string_view name, const PageValue& value) {
  switch (value.type) {
    case ValueType::none:
      return Json(name, "null");
    case ValueType::text:
      return Number(name, static_cast<int64_t>(value.number));
    case ValueType::signedNumber:
      return Text(name, std::to_string(static_cast<int64_t>(value.number)));
    case ValueType::flag:
    case ValueType::unsignedNumber:
      break;
  }
  return Text(name, std::to_string(value.number));
}

}  // namespace ksicache
