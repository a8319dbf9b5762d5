#include "knvlibs/linux/host/json.h"

#include <algorithm>
#include <cstddef>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

class Parser {
 public:
  explicit Parser(std::string_view text) : rest_(text) {}

  bool Whole(Json* json) {
    if (!Value(json, 0)) return false;
    SkipBlanks();
    return rest_.empty();
  }

 private:
  // Nobody nests deeper, and a hostile text shall not use up the stack.
  static constexpr int kDeepest = 32;

  void SkipBlanks() {
    rest_.remove_prefix(std::min(rest_.find_first_not_of(" \t\r\n"), rest_.size()));
  }

  bool Take(std::string_view token) {
    SkipBlanks();
    return TakePrefix(&rest_, token);
  }

  bool Value(Json* json, int depth) {
    if (depth > kDeepest) return false;
    if (Take("{")) return Object(&json->value.emplace<Json::Object>(), depth);
    if (Take("[")) return Array(&json->value.emplace<Json::Elements>(), depth);
    if (Take("\"")) return String(&json->value.emplace<std::string>());
    if (Take("true")) return json->value.emplace<bool>(true);
    if (Take("null")) return true;
    if (Take("false")) {
      json->value = false;
      return true;
    }
    return Number(&json->value.emplace<Json::Number>().text);
  }

  bool Object(Json::Object* object, int depth) {
    if (Take("}")) return true;
    do {
      if (!Take("\"") || !String(&object->names.emplace_back()) || !Take(":") ||
          !Value(&object->values.emplace_back(), depth + 1)) {
        return false;
      }
    } while (Take(","));
    return Take("}");
  }

  bool Array(Json::Elements* elements, int depth) {
    if (Take("]")) return true;
    do {
      if (!Value(&elements->emplace_back(), depth + 1)) return false;
    } while (Take(","));
    return Take("]");
  }

  bool Number(std::string* text) {
    const size_t end = std::min(rest_.find_first_not_of("+-.0123456789eE"), rest_.size());
    *text = rest_.substr(0, end);
    rest_.remove_prefix(end);
    return end != 0;
  }

  // The text up to the closing quotation mark.
  bool String(std::string* text) {
    while (!rest_.empty()) {
      const char c = rest_.front();
      rest_.remove_prefix(1);
      if (c == '"') return true;
      if (c != '\\') {
        text->push_back(c);
      } else if (!Escape(text)) {
        return false;
      }
    }
    return false;
  }

  bool Escape(std::string* text) {
    constexpr std::string_view kLetters = "\"\\/bfnrt";
    constexpr std::string_view kMeanings = "\"\\/\b\f\n\r\t";
    if (rest_.empty()) return false;
    const size_t letter = kLetters.find(rest_.front());
    if (letter != std::string_view::npos) {
      text->push_back(kMeanings[letter]);
      rest_.remove_prefix(1);
      return true;
    }
    uint64_t code = 0;
    if (rest_.size() < 5 || rest_.front() != 'u' || !ParseHex(rest_.substr(1, 4), &code)) {
      return false;
    }
    // No name or path that is looked for here has such a character.
    text->push_back(code < 0x80 ? static_cast<char>(code) : '?');
    rest_.remove_prefix(5);
    return true;
  }

  std::string_view rest_;
};

}  // namespace

const Json* Json::Find(std::string_view name) const {
  const auto* object = std::get_if<Object>(&value);
  if (object == nullptr) return nullptr;
  const auto found = std::ranges::find(object->names, name);
  if (found == object->names.end()) return nullptr;
  return &object->values[static_cast<size_t>(found - object->names.begin())];
}

std::optional<uint64_t> Json::Unsigned() const {
  const auto* number = std::get_if<Number>(&value);
  uint64_t result = 0;
  if (number == nullptr || !ParseNumber(number->text, &result)) return std::nullopt;
  return result;
}

std::optional<Json> ParseJson(std::string_view text) {
  Json json;
  if (!Parser(text).Whole(&json)) return std::nullopt;
  return json;
}

}  // namespace ksi
