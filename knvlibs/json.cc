#include "knvlibs/json.h"

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>
#include <utility>

namespace ksi {
namespace {

constexpr size_t kDeepest = 32;
constexpr size_t kMostValues = 10'000;
constexpr size_t kLongest = size_t{1} << 20;

// The parser's own values take memory when they are destroyed: only what it meets is used.
class Parsed : public nlohmann::json_sax<nlohmann::json> {
 public:
  explicit Parsed(JsonEvents& events) : events_(events) {}

  bool null() override { return Word("null"); }
  bool boolean(bool value) override { return Word(value ? "true" : "false"); }
  bool number_integer(number_integer_t value) override { return Word(std::to_string(value)); }
  bool number_unsigned(number_unsigned_t value) override { return Word(std::to_string(value)); }
  bool number_float(number_float_t, const string_t& written) override { return Word(written); }
  bool string(string_t& value) override {
    return events_.OnValue({Json::Kind::kText, std::move(value), {}});
  }
  bool binary(binary_t&) override { return false; }  // is not in text
  bool start_object(size_t) override { return events_.OnStart(Json::Kind::kObject); }
  bool start_array(size_t) override { return events_.OnStart(Json::Kind::kArray); }
  bool key(string_t& name) override { return events_.OnName(std::move(name)); }
  bool end_object() override { return events_.OnEnd(); }
  bool end_array() override { return events_.OnEnd(); }
  bool parse_error(size_t, const std::string&, const nlohmann::json::exception& error) override {
    // "[json.exception.parse_error.101] parse error at line 3, ...": the name of the exception
    // tells a user nothing.
    const std::string_view what = error.what();
    events_.OnError(what.substr(what.find("] ") + 2));
    return false;
  }

 private:
  bool Word(std::string text) { return events_.OnValue({Json::Kind::kWord, std::move(text), {}}); }

  JsonEvents& events_;
};

// Keeps all of a value.
class Whole : public JsonEvents {
 public:
  bool OnValue(Json value) override {
    if (++count_ > kMostValues) return false;
    if (open_.empty()) {
      value_ = std::move(value);
    } else {
      open_.back()->members.push_back({std::exchange(name_, {}), std::move(value)});
    }
    return true;
  }

  bool OnStart(Json::Kind kind) override {
    if (open_.size() == kDeepest || !OnValue({kind, {}, {}})) return false;
    // It stays where it is: what is around it gets no member before it ends.
    open_.push_back(open_.empty() ? &value_ : &open_.back()->members.back().value);
    return true;
  }

  bool OnName(std::string name) override {
    name_ = std::move(name);
    return true;
  }

  bool OnEnd() override {
    open_.pop_back();
    return true;
  }

  void OnError(std::string_view /*reason*/) override {}

  Json Take() { return std::move(value_); }

 private:
  Json value_;
  std::vector<Json*> open_;
  std::string name_;  // of the member that comes
  size_t count_ = 0;
};

template <class Input>
bool Read(Input&& input, JsonEvents& events) {
  Parsed parsed(events);
  return nlohmann::json::sax_parse(input, &parsed);
}

}  // namespace

bool ReadJson(std::string_view text, JsonEvents& events) { return Read(text, events); }
bool ReadJson(std::FILE* file, JsonEvents& events) { return Read(file, events); }

std::optional<Json> ParseJson(std::string_view text) {
  Whole whole;
  if (text.size() > kLongest || !ReadJson(text, whole)) return std::nullopt;
  return whole.Take();
}

const Json* FindMember(const Json* object, std::string_view name) {
  if (object == nullptr || object->kind != Json::Kind::kObject) return nullptr;
  const auto member = std::ranges::find(object->members, name, &Json::Member::name);
  return member == object->members.end() ? nullptr : &member->value;
}

const std::string* TextOf(const Json* json) {
  return json == nullptr || json->kind != Json::Kind::kText ? nullptr : &json->text;
}

std::optional<uint64_t> NumberOf(const Json* json) {
  if (json == nullptr || json->kind != Json::Kind::kWord) return std::nullopt;
  uint64_t number = 0;
  const char* end = json->text.data() + json->text.size();
  const auto [rest, error] = std::from_chars(json->text.data(), end, number);
  if (error != std::errc() || rest != end) return std::nullopt;
  return number;
}

}  // namespace ksi
