// load: makes a cache file from the JSON that dump writes.
//
// Signature and build date may be left out, for files written by hand: they are the library's own
// then. So may fields of a record, which are zero.
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <memory>
#include <string>

#include "knvlibs/cache_format.h"
#include "knvlibs/source.h"
#include "knvlibs/times.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/json_reader.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

ksi::Status StatusFromJson(const Json& json) {
  const std::string* text = ksi::TextOf(&json);
  ksi::Status status = 0;
  if (text != nullptr && text->starts_with("0x")) {
    const char* end = text->data() + text->size();
    const auto [rest, error] = std::from_chars(text->data() + 2, end, status, 16);
    if (error != std::errc() || rest != end) status = 0;
  }
  if (status == 0) throw DataError("status: is not a failure such as \"0xbad0003\"");
  return status;
}

// What the members of a reading are.
struct Members {
  const Json* node = nullptr;
  const Json* keys = nullptr;
  std::string kind;  // "value", "instances" or "status"
  const Json* answer = nullptr;
};

Members MembersOf(const Json& reading) {
  Members members;
  for (const auto& [name, value] : reading.members) {
    if (name == "node") {
      members.node = &value;
    } else if (name == "keys") {
      members.keys = &value;
    } else if (name == "value" || name == "instances" || name == "status") {
      if (members.answer != nullptr) throw DataError("has both " + members.kind + " and " + name);
      members.kind = name;
      members.answer = &value;
    } else {
      throw DataError("\"" + Cut(name) + "\" is no member of a reading");
    }
  }
  return members;
}

const ksi::Node& NodeOf(const Members& members) {
  const std::string* path = ksi::TextOf(members.node);
  if (path == nullptr) throw DataError("has no \"node\"");
  const ksi::Node* node = ksi::FindNode(*path);
  if (node == nullptr) throw DataError("there is no node " + Cut(*path));
  return *node;
}

// Whether a reading is of the node's value or list; a failed one tells by its keys.
ksi::Kind KindOf(const ksi::Node& node, const Members& members) {
  const bool failed = members.kind == "status";
  const bool byKeys = failed && node.HasValue() && node.HasList();
  const bool value = byKeys   ? members.keys->members.size() == node.valueKeys.Count()
                     : failed ? node.HasValue()
                              : members.kind == "value";
  if (value && !node.HasValue()) throw DataError("the node has no value");
  if (!value && !node.HasList()) throw DataError("the node has no instances");
  return value ? ksi::Kind::kValue : ksi::Kind::kList;
}

// `texts` has the texts among the keys.
ksi::Keys TakeKeys(const ksi::Keying& keying, const Json& json, std::string* texts) {
  if (json.members.size() != keying.Count()) {
    throw DataError("keys: the node takes " + std::to_string(keying.Count()));
  }
  ksi::Keys keys;
  for (keys.count = 0; keys.count < keying.Count(); ++keys.count) {
    const size_t i = keys.count;
    const std::string where = "keys[" + std::to_string(i) + "] (" + ksi::NameOf(keying.at[i]) + ")";
    const Json& given = json.members[i].value;
    ksi::Key& key = keys.at[i];
    key.kind = ksi::KindOf(keying.at[i]);
    if (key.kind == ksi::KeyKind::kNumber) {
      key.number = NumberFromJson(given, where);
    } else {
      texts[i] = PlainTextFromJson(given, where);
      key.text = texts[i];
    }
  }
  return keys;
}

void TakeList(const ksi::Node& node, const ksi::Keys& keys, const JsonEntries& entries,
              CacheWriter& writer) {
  writer.StartList(node, keys, entries.Count());
  if (ksi::KindOf(node.entries) == ksi::KeyKind::kNumber) {
    entries.ForEachNumber([&](int64_t entry) {
      writer.AddEntry({ksi::KeyKind::kNumber, entry, {}});
    });
  } else {
    entries.ForEachText([&](std::string_view entry) {
      writer.AddEntry({ksi::KeyKind::kText, 0, entry});
    });
  }
}

void TakeAnswer(const ksi::Node& node, const Members& members, const JsonEntries& entries,
                CacheWriter& writer) {
  const ksi::Kind kind = KindOf(node, members);
  const bool isValue = kind == ksi::Kind::kValue;
  std::string texts[ksi::kMaxKeys];
  const ksi::Keys keys = TakeKeys(isValue ? node.valueKeys : node.listKeys, *members.keys, texts);
  if (members.kind == "status") {
    writer.AddFailure(node, kind, keys, StatusFromJson(*members.answer));
  } else if (isValue) {
    writer.AddValue(node, keys, RecordFromJson(node, *members.answer));
  } else if (members.answer->kind != Json::Kind::kArray) {
    throw DataError("instances: is not an array");
  } else {
    TakeList(node, keys, entries, writer);
  }
}

void TakeReading(const Json& reading, const JsonEntries& entries, CacheWriter& writer) {
  const Members members = MembersOf(reading);
  const ksi::Node& node = NodeOf(members);
  const std::string path(node.path);
  if (members.keys == nullptr || members.keys->kind != Json::Kind::kArray) {
    throw DataError(path + ": has no \"keys\"");
  }
  if (members.answer == nullptr) {
    throw DataError(path + R"(: has no "value", "instances" or "status")");
  }
  try {
    TakeAnswer(node, members, entries, writer);
  } catch (const DataError& error) {
    throw DataError(path + " " + Cut(ToText(*members.keys)) + ": " + error.what());
  }
}

void TakeMember(const std::string& name, const Json& value, ksi::CacheFile::Capture* capture) {
  if (name == "ksiCache") {
    if (ksi::NumberOf(&value) != uint64_t{ksi::cache::kSchemaVersion}) {
      throw DataError("ksiCache: is not 1");
    }
  } else if (name == "host") {
    capture->host = PlainTextFromJson(value, name);
  } else if (name == "taken") {
    capture->taken = PlainTextFromJson(value, name);
  } else if (name == "built") {
    capture->built = PlainTextFromJson(value, name);
  } else if (name == "signature") {
    capture->signature = PlainTextFromJson(value, name);
  } else if (name != "readings" || value.kind != Json::Kind::kArray) {
    throw DataError("\"" + Cut(name) + "\" is no member of a cache file");
  }
}

// What stands around the readings.
ksi::CacheFile::Capture TakeHead(const Json& document) {
  if (ksi::FindMember(&document, "ksiCache") == nullptr) {
    throw DataError("is not the JSON of a cache file: it has no \"ksiCache\"");
  }
  ksi::CacheFile::Capture capture{
      std::string(ksi::kDefinitions.signature), std::string(ksi::kDefinitions.built), {}, {}};
  for (const auto& [name, value] : document.members) TakeMember(name, value, &capture);
  for (const char* required : {"host", "taken", "readings"}) {
    if (ksi::FindMember(&document, required) == nullptr) {
      throw DataError(std::string("has no ") + required);
    }
  }
  if (const char* bad = ksi::BadMember(capture)) {
    throw DataError(std::string(bad) + ": is not as it is in a cache file");
  }
  if (!ksi::TimeOfText(capture.taken)) throw DataError("taken: is no date and time");
  return capture;
}

constexpr const Option* kOptions[] = {&kForce, &kMode};

int Load(const CommandLine& line) {
  CheckOptionsFor(line.arguments[1], line);
  const mode_t mode = ModeOf(line);
  const std::string& jsonName = line.arguments[0];
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> json(std::fopen(jsonName.c_str(), "r"),
                                                             std::fclose);
  if (json == nullptr) throw SystemError(jsonName, errno);
  CacheWriter writer(line.arguments[1], line.Has(kForce), mode);
  writer.RefuseInput(line.arguments[0]);
  JsonReader reader([&writer](const Json& reading, const JsonEntries& entries) {
    TakeReading(reading, entries, writer);
  });
  try {
    writer.Commit(TakeHead(reader.Read(json.get())));
  } catch (const DataError& error) {
    throw DataError(jsonName + ": " + error.what());
  }
  return 0;
}

}  // namespace

const Command kLoad = {
    .name = "load",
    .arguments = "JSON FILE",
    .summary = "make FILE from JSON, the output of dump --json",
    .help = R"(Makes FILE from JSON, as dump --json writes it. In JSON that is written by hand,
the signature and the build date may be left out, which makes them those of this
version, and so may fields of a record that are 0.
)",
    .options = kOptions,
    .fewest = 2,
    .most = 2,
    .run = Load,
};

}  // namespace ksicache
