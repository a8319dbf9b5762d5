#include "tools/ksicache/json_reader.h"

#include <algorithm>

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

Json JsonReader::Read(std::FILE* file) {
  try {
    ksi::ReadJson(file, *this);
  } catch (const DataError&) {
    if (std::ferror(file) != 0) throw DataError("cannot be read");
    throw;
  }
  return std::move(document_);
}

// A quotation of what was read begins with the first quote, if there is one.
void JsonReader::OnError(std::string_view reason) {
  const size_t quote = std::min(reason.find('\''), reason.size());
  throw DataError(std::string(reason.substr(0, quote)) + Cut(reason.substr(quote)));
}

bool JsonReader::OnStart(Json::Kind kind) {
  if (open_.size() == kDeepest) Fail("is nested too deeply");
  open_.push_back({{kind, {}, {}}, {}});
  return true;
}

bool JsonReader::OnName(std::string name) {
  if (ksi::FindMember(&open_.back().json, name) != nullptr) {
    Fail("\"" + Cut(name) + "\" is given twice in one object");
  }
  open_.back().name = std::move(name);
  return true;
}

bool JsonReader::OnEnd() {
  Json closed = std::move(open_.back().json);
  open_.pop_back();
  return OnValue(std::move(closed));
}

bool JsonReader::OnValue(Json value) {
  if (open_.empty()) {
    document_ = std::move(value);
  } else if (open_.size() == kAroundReading && InReadings()) {
    Take(value);
  } else if (open_.size() == kAroundEntry && InEntries()) {
    entries_.Add(value);
  } else {
    AddToParent(std::move(value));
  }
  return true;
}

bool JsonReader::InReadings() const {
  return open_.size() >= kAroundReading && open_[0].name == "readings" &&
         open_[1].json.kind == Json::Kind::kArray;
}

bool JsonReader::InEntries() const {
  return InReadings() && open_.size() >= kAroundEntry && open_[2].name == "instances" &&
         open_[3].json.kind == Json::Kind::kArray;
}

void JsonReader::AddToParent(Json value) {
  Open& parent = open_.back();
  if (parent.json.members.size() == kMostMembers) {
    Fail("has more than " + std::to_string(kMostMembers) + " members in one place");
  }
  parent.json.members.push_back({std::move(parent.name), std::move(value)});
}

void JsonReader::Fail(const std::string& what) const {
  throw DataError((InReadings() ? "readings[" + std::to_string(count_) + "]: " : "") + what);
}

void JsonReader::Take(const Json& reading) {
  if (reading.kind != Json::Kind::kObject) Fail("is not an object");
  try {
    take_(reading, entries_);
  } catch (const DataError& error) {
    Fail(error.what());
  }
  entries_ = {};
  ++count_;
}

}  // namespace ksicache
