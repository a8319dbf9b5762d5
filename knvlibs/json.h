// Strict and bounded reading of JSON: what QEMU takes and gives, and what cache files are made
// from.
#ifndef KNVLIBS_JSON_H_
#define KNVLIBS_JSON_H_

#include <cstdint>
#include <cstdio>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace ksi {

// A value. To destroy one takes no memory, so that it may go where there is none left; whoever
// makes them bounds how deep they nest.
struct Json {
  enum class Kind : uint8_t { kWord, kText, kArray, kObject };
  struct Member;

  Kind kind = Kind::kWord;
  // What a text says; a word (a number, true, false, null) as it is written.
  std::string text;
  std::vector<Member> members;  // in their order; those of an array have no names
};

struct Json::Member {
  std::string name;
  Json value;
};

// What happens while JSON is read. A false answer ends it.
class JsonEvents {
 public:
  virtual ~JsonEvents() = default;
  // A word or a text.
  virtual bool OnValue(Json value) = 0;
  // An array or object begins: its members follow, those of an object each after its name.
  virtual bool OnStart(Json::Kind kind) = 0;
  virtual bool OnName(std::string name) = 0;
  virtual bool OnEnd() = 0;
  // The text is no JSON, for this reason.
  virtual void OnError(std::string_view reason) = 0;
};

// Whether the whole of a text or a file is one value, and no answer was false.
bool ReadJson(std::string_view text, JsonEvents& events);
bool ReadJson(std::FILE* file, JsonEvents& events);

// The whole of `text` as one value; none if it is anything else, nests deeper or has more values
// than anybody means to write, or is longer than a megabyte.
std::optional<Json> ParseJson(std::string_view text);

// The first member of this name; null if `object` is null, no object, or has none.
const Json* FindMember(const Json* object, std::string_view name);

// The text, or the whole number that is not negative; none if it is null or anything else.
const std::string* TextOf(const Json* json);
std::optional<uint64_t> NumberOf(const Json* json);

}  // namespace ksi

#endif  // KNVLIBS_JSON_H_
