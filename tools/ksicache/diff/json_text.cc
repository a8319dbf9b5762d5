#include "tools/ksicache/diff/json_text.h"

#include <array>
#include <charconv>
#include <cmath>

#include "tools/ksicache/output.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {

void JsonText::Separate() {
  if (!isFirst_) text_ += ',';
  if (isLineDue_) text_ += '\n';
  isFirst_ = false;
  isLineDue_ = false;
}

void JsonText::Put(std::string_view text) {
  Separate();
  text_ += text;
}

void JsonText::Begin(char bracket) {
  Separate();
  text_ += bracket;
  isFirst_ = true;
}

void JsonText::End(char bracket) {
  if (isLineDue_) text_ += '\n';
  isLineDue_ = false;
  text_ += bracket;
  isFirst_ = false;
}

void JsonText::Name(std::string_view name) {
  Separate();
  text_ += TextToJson(name) + ":";
  isFirst_ = true;
}

void JsonText::PutNumber(std::optional<int64_t> number) {
  number ? Put(std::to_string(*number)) : PutNone();
}

void JsonText::PutReal(std::optional<double> number) {
  if (!number || !std::isfinite(*number)) return PutNone();
  std::array<char, 32> text = {};
  const auto [end, error] = std::to_chars(text.data(), text.data() + text.size(), *number,
                                          std::chars_format::general, 12);
  Put({text.data(), end});
}

void JsonText::PutText(std::string_view text) { Put(TextToJson(text)); }

void JsonText::Flush() {
  if (isLineDue_) text_ += '\n';
  isLineDue_ = false;
  Print(text_);
  text_.clear();
}

namespace {

void PutSide(const char* name, const Origin& origin, JsonText& json) {
  json.Name(name);
  json.Begin('{');
  json.Name("host");
  json.PutText(origin.host);
  json.Name("time");
  json.PutText(origin.time);
  json.End('}');
}

}  // namespace

void PutSides(const Sides& sides, JsonText& json) {
  PutSide("before", sides.before, json);
  PutSide("after", sides.after, json);
  json.Name("seconds");
  json.PutReal(sides.Seconds());
  json.Name("rebooted");
  json.PutFlag(sides.isRebooted);
}

}  // namespace ksicache
