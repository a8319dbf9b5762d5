// load: makes a cache file from the JSON that dump writes.
//
// Signature and build date may be left out, for files written by hand: they are the library's own
// then. So may fields of a record, which are zero.
#include <cerrno>
#include <cstdio>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "knvlibs/cache_format.h"
#include "knvlibs/source.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

constexpr const char* kReadings = "readings";

// A text without a NUL.
std::string PlainText(const Json& json, const std::string& where) {
  std::string text = TextFromJson(json, where);
  if (text.find('\0') != std::string::npos) throw DataError(where + ": holds a NUL");
  return text;
}

int64_t WholeNumber(const Json& json, const std::string& where) {
  const bool fits =
      json.is_number_integer() && !(json.is_number_unsigned() && json.get<uint64_t>() > INT64_MAX);
  if (!fits) throw DataError(where + ": is not a whole number of 64 bits");
  return json.get<int64_t>();
}

ksi::Status StatusFromJson(const Json& json) {
  const auto* text = json.get_ptr<const std::string*>();
  char* end = nullptr;
  const unsigned long long status = text != nullptr && text->starts_with("0x") && text->size() <= 10
                                        ? std::strtoull(text->c_str() + 2, &end, 16)
                                        : 0;
  if (status == 0 || *end != '\0') {
    throw DataError("status: is not a failure such as \"0xbad0003\"");
  }
  return static_cast<ksi::Status>(status);
}

class Loader {
 public:
  explicit Loader(CacheWriter& writer) : writer_(writer) {}

  void Run(std::FILE* file) {
    const auto onEvent = [this](int depth, Json::parse_event_t event, Json& parsed) {
      return OnEvent(depth, event, parsed);
    };
    Json document;
    try {
      document = Json::parse(file, onEvent);
    } catch (const Json::parse_error& error) {
      if (std::ferror(file) != 0) throw DataError("cannot be read");
      // "[json.exception.parse_error.101] parse error at line 3, ...": the name of the exception
      // tells a user nothing.
      const std::string what = error.what();
      throw DataError(what.substr(what.find("] ") + 2));
    }
    writer_.Commit(TakeHead(document));
  }

 private:
  // Takes the readings one by one as the parser comes to them, and keeps none.
  bool OnEvent(int depth, Json::parse_event_t event, Json& parsed) {
    switch (event) {
      case Json::parse_event_t::object_start:
        names_.emplace_back();
        break;
      case Json::parse_event_t::key:
        if (!names_.back().insert(parsed.get<std::string>()).second) {
          throw DataError(Where() + "\"" + Printable(parsed.get<std::string>()) +
                          "\" is given twice in one object");
        }
        if (depth == 1) inReadings_ = parsed == kReadings;
        break;
      case Json::parse_event_t::object_end:
        names_.pop_back();
        if (depth == 2 && inReadings_) {
          Take(parsed);
          return false;
        }
        break;
      case Json::parse_event_t::value:
      case Json::parse_event_t::array_end:
        if (depth == 2 && inReadings_) throw DataError(Where() + "is not an object");
        break;
      default:
        break;
    }
    return true;
  }

  std::string Where() const {
    return inReadings_ ? "readings[" + std::to_string(count_) + "]: " : "";
  }

  void Take(const Json& reading) {
    std::string where = Where();
    try {
      TakeReading(reading, &where);
    } catch (const DataError& error) {
      throw DataError(where + error.what());
    }
    ++count_;
  }

  void TakeReading(const Json& reading, std::string* where) {
    const Json* name = nullptr;
    const Json* keys = nullptr;
    const char* kind = nullptr;
    const Json* answer = nullptr;
    for (const auto& [member, value] : reading.items()) {
      if (member == "node") {
        name = &value;
      } else if (member == "keys") {
        keys = &value;
      } else if (member == "value" || member == "instances" || member == "status") {
        if (answer != nullptr) throw DataError("has both " + std::string(kind) + " and " + member);
        kind = member.c_str();
        answer = &value;
      } else {
        throw DataError("\"" + Printable(member) + "\" is no member of a reading");
      }
    }
    if (name == nullptr || !name->is_string()) throw DataError("has no \"node\"");
    const auto path = name->get<std::string>();
    const ksi::Node* node = ksi::FindNode(path);
    if (node == nullptr) throw DataError("there is no node " + Printable(path));
    if (keys == nullptr || !keys->is_array()) throw DataError(path + ": has no \"keys\"");
    if (answer == nullptr) throw DataError(path + R"(: has no "value", "instances" or "status")");
    *where += path + " " + keys->dump() + ": ";

    const bool isValue = KindOf(*node, *keys, kind) == ksi::Kind::kValue;
    std::string texts[ksi::kMaxKeys];
    const ksi::Keys taken = TakeKeys(isValue ? node->valueKeys : node->listKeys, *keys, texts);
    if (std::string_view(kind) == "status") {
      writer_.AddFailure(*node, isValue ? ksi::Kind::kValue : ksi::Kind::kList, taken,
                         StatusFromJson(*answer));
    } else if (isValue) {
      writer_.AddValue(*node, taken, RecordFromJson(*node, *answer));
    } else {
      writer_.AddList(*node, taken, TakeInstances(*node, *answer));
    }
  }

  // Whether a reading is of the node's value or list; a failed one tells by its keys.
  static ksi::Kind KindOf(const ksi::Node& node, const Json& keys, std::string_view answer) {
    const bool byKeys = answer == "status" && node.HasValue() && node.HasList();
    const bool value = byKeys               ? keys.size() == node.valueKeys.Count()
                       : answer == "status" ? node.HasValue()
                                            : answer == "value";
    if (value && !node.HasValue()) throw DataError("the node has no value");
    if (!value && !node.HasList()) throw DataError("the node has no instances");
    return value ? ksi::Kind::kValue : ksi::Kind::kList;
  }

  static ksi::Keys TakeKeys(const ksi::Keying& keying, const Json& json, std::string* texts) {
    if (json.size() != keying.Count()) {
      throw DataError("keys: the node takes " + std::to_string(keying.Count()));
    }
    ksi::Keys keys;
    for (keys.count = 0; keys.count < keying.Count(); ++keys.count) {
      const size_t i = keys.count;
      const std::string where =
          "keys[" + std::to_string(i) + "] (" + ksi::NameOf(keying.at[i]) + ")";
      ksi::Key& key = keys.at[i];
      key.kind = ksi::KindOf(keying.at[i]);
      if (key.kind == ksi::KeyKind::kNumber) {
        key.number = WholeNumber(json[i], where);
      } else {
        texts[i] = PlainText(json[i], where);
        key.text = texts[i];
      }
    }
    return keys;
  }

  static ksi::ParamList TakeInstances(const ksi::Node& node, const Json& json) {
    if (!json.is_array()) throw DataError("instances: is not an array");
    ksi::ParamList instances(ksi::ParamList::kNoLimit);
    for (size_t i = 0; i < json.size(); ++i) {
      const std::string where = "instances[" + std::to_string(i) + "]";
      const ksi::Status status =
          ksi::KindOf(node.entries) == ksi::KeyKind::kNumber
              ? instances.AddNumber(static_cast<uint64_t>(WholeNumber(json[i], where)))
              : instances.AddText(PlainText(json[i], where));
      if (status != ksi::kOk) throw DataError(where + ": " + Hex(status));
    }
    return instances;
  }

  static ksi::CacheFile::Capture TakeHead(const Json& document) {
    if (!document.is_object() || !document.contains("ksiCache")) {
      throw DataError("is not the JSON of a cache file: it has no \"ksiCache\"");
    }
    ksi::CacheFile::Capture capture{
        std::string(ksi::kDefinitions.signature), std::string(ksi::kDefinitions.built), {}, {}};
    for (const auto& [member, value] : document.items()) {
      if (member == "ksiCache") {
        if (value != ksi::cache::kSchemaVersion) throw DataError("ksiCache: is not 1");
      } else if (member == "host") {
        capture.host = PlainText(value, member);
      } else if (member == "taken") {
        capture.taken = PlainText(value, member);
      } else if (member == "built") {
        capture.built = PlainText(value, member);
      } else if (member == "signature") {
        capture.signature = PlainText(value, member);
      } else if (member != kReadings || !value.is_array()) {
        throw DataError("\"" + Printable(member) + "\" is no member of a cache file");
      }
    }
    for (const char* required : {"host", "taken", kReadings}) {
      if (!document.contains(required)) throw DataError(std::string("has no ") + required);
    }
    if (const char* bad = ksi::BadMember(capture)) {
      throw DataError(std::string(bad) + ": is not as it is in a cache file");
    }
    return capture;
  }

  CacheWriter& writer_;
  std::vector<std::set<std::string>> names_;  // seen in the objects that are open
  bool inReadings_ = false;
  size_t count_ = 0;
};

}  // namespace

int Load(const Options& options) {
  if (options.arguments.size() != 2) throw UsageError("load takes a JSON file and a cache file");
  const std::string& jsonName = options.arguments[0];
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> json(std::fopen(jsonName.c_str(), "r"),
                                                             std::fclose);
  if (json == nullptr) throw SystemError(jsonName, errno);
  CacheWriter writer(options.arguments[1], options.force);
  try {
    Loader(writer).Run(json.get());
  } catch (const DataError& error) {
    throw DataError(jsonName + ": " + error.what());
  }
  return 0;
}

}  // namespace ksicache
