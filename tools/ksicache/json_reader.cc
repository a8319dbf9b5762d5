#include "tools/ksicache/json_reader.h"

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// A text in hexadecimal in a record in a reading is five deep; nothing is deeper.
constexpr size_t kDeepest = 8;

// No record has so many fields, and nothing else so many members but a list.
constexpr size_t kMostMembers = 256;

// How many containers are open around what stands in the array of readings, and in that of a
// list's entries.
constexpr size_t kAroundReading = 2;
constexpr size_t kAroundEntry = 4;

}  // namespace

void JsonEntries::Add(const Json& entry) {
  const std::string where = "instances[" + std::to_string(count_++) + "]";
  if (noNumber_.empty()) {
    try {
      numbers_.push_back(NumberFromJson(entry, where));
    } catch (const DataError& error) {
      noNumber_ = error.what();
      numbers_ = {};
    }
  }
  if (noText_.empty()) {
    try {
      texts_ += PlainTextFromJson(entry, where) + '\0';
    } catch (const DataError& error) {
      noText_ = error.what();
      texts_ = {};
    }
  }
}

void JsonEntries::ForEachNumber(const std::function<void(int64_t)>& visit) const {
  if (!noNumber_.empty()) throw DataError(noNumber_);
  for (const int64_t number : numbers_) visit(number);
}

void JsonEntries::ForEachText(const std::function<void(std::string_view)>& visit) const {
  if (!noText_.empty()) throw DataError(noText_);
  for (size_t at = 0; at < texts_.size();) {
    const std::string_view text = texts_.c_str() + at;
    visit(text);
    at += text.size() + 1;
  }
}

// What the parser calls; a failure leaves it as an exception.
class JsonReader::Events : public nlohmann::json_sax<Json> {
 public:
  explicit Events(JsonReader& reader) : reader_(reader) {}

  bool null() override { return Value(nullptr); }
  bool boolean(bool value) override { return Value(value); }
  bool number_integer(number_integer_t value) override { return Value(value); }
  bool number_unsigned(number_unsigned_t value) override { return Value(value); }
  bool number_float(number_float_t value, const string_t&) override { return Value(value); }
  bool string(string_t& value) override { return Value(std::move(value)); }
  bool binary(binary_t&) override { return false; }  // is not in text
  bool start_object(size_t) override { return Start(Json::object()); }
  bool start_array(size_t) override { return Start(Json::array()); }
  bool end_object() override { return End(); }
  bool end_array() override { return End(); }
  bool key(string_t& key) override {
    reader_.Key(std::move(key));
    return true;
  }
  bool parse_error(size_t, const std::string&, const Json::exception& error) override {
    // "[json.exception.parse_error.101] parse error at line 3, ...": the name of the exception
    // tells a user nothing.
    const std::string what = error.what();
    throw DataError(what.substr(what.find("] ") + 2));
  }

 private:
  bool Value(Json value) {
    reader_.Value(std::move(value));
    return true;
  }
  bool Start(Json container) {
    reader_.Start(std::move(container));
    return true;
  }
  bool End() {
    reader_.End();
    return true;
  }

  JsonReader& reader_;
};

Json JsonReader::Read(std::FILE* file) {
  Events events(*this);
  try {
    Json::sax_parse(file, &events);
  } catch (const DataError&) {
    if (std::ferror(file) != 0) throw DataError("cannot be read");
    throw;
  }
  return std::move(document_);
}

void JsonReader::Start(Json container) {
  if (open_.size() == kDeepest) Fail("is nested too deeply");
  open_.push_back({std::move(container), {}});
}

void JsonReader::Key(std::string key) {
  if (open_.back().json.contains(key)) Fail("\"" + key + "\" is given twice in one object");
  open_.back().key = std::move(key);
}

void JsonReader::End() {
  Json closed = std::move(open_.back().json);
  open_.pop_back();
  Value(std::move(closed));
}

void JsonReader::Value(Json value) {
  if (open_.empty()) {
    document_ = std::move(value);
  } else if (open_.size() == kAroundReading && InReadings()) {
    Take(value);
  } else if (open_.size() == kAroundEntry && InEntries()) {
    entries_.Add(value);
  } else {
    AddToParent(std::move(value));
  }
}

bool JsonReader::InReadings() const {
  return open_.size() >= kAroundReading && open_[0].key == "readings" && open_[1].json.is_array();
}

bool JsonReader::InEntries() const {
  return InReadings() && open_.size() >= kAroundEntry && open_[2].key == "instances" &&
         open_[3].json.is_array();
}

void JsonReader::AddToParent(Json value) {
  Open& parent = open_.back();
  if (parent.json.size() == kMostMembers) {
    Fail("has more than " + std::to_string(kMostMembers) + " members in one place");
  }
  if (parent.json.is_array()) {
    parent.json.push_back(std::move(value));
  } else {
    parent.json[parent.key] = std::move(value);
  }
}

void JsonReader::Fail(const std::string& what) const {
  throw DataError((InReadings() ? "readings[" + std::to_string(count_) + "]: " : "") + what);
}

void JsonReader::Take(const Json& reading) {
  if (!reading.is_object()) Fail("is not an object");
  try {
    take_(reading, entries_);
  } catch (const DataError& error) {
    Fail(error.what());
  }
  entries_ = {};
  ++count_;
}

}  // namespace ksicache
