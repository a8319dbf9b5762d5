#include "tools/ksicache/cache_writer.h"

#include <utility>

#include "knvlibs/cache_format.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

enum Parameter { kKey1 = 1, kKey2, kNode, kStatus, kAnswer };
enum EntryParameter { kPosition = 4, kEntry };

// A node's identifier in the file: its value's, and the next for its list.
int64_t RowId(const ksi::Node& node, ksi::Kind kind) {
  return 2 * ksi::IdOf(node) + (kind == ksi::Kind::kList ? 1 : 0);
}

void CheckText(std::string_view text) {
  if (text.size() > ksi::cache::kLongestText) {
    throw DataError("a text is longer than " + std::to_string(ksi::cache::kLongestText) + " bytes");
  }
}

}  // namespace

CacheContent::CacheContent(std::string name)
    : database_(std::move(name),
                "PRAGMA application_id=" + std::to_string(ksi::cache::kApplicationId) +
                    ";PRAGMA user_version=" + std::to_string(ksi::cache::kSchemaVersion)) {
  for (const ksi::cache::Table& table : ksi::cache::kTables) {
    database_.Execute(std::string(table.sql));
  }
  WriteNodes();
  database_.Prepare("INSERT INTO reading VALUES(?1, ?2, ?3, ?4, ?5)", addReading_);
  database_.Prepare("INSERT INTO instance VALUES(?1, ?2, ?3, ?4, ?5)", addEntry_);
}

void CacheContent::WriteNodes() {
  ksi::Statement insert;
  database_.Prepare("INSERT INTO node VALUES(?1, ?2, ?3)", insert);
  const auto write = [&](const ksi::Node& node, ksi::Kind kind, std::string_view name) {
    Require(insert.Bind(1, RowId(node, kind)) == SQLITE_OK);
    Require(insert.Bind(2, node.path) == SQLITE_OK);
    Require(insert.Bind(3, name) == SQLITE_OK);
    Require(insert.Step() == SQLITE_DONE);
    insert.Reset();
  };
  for (const ksi::Node& node : ksi::Catalogue()) {
    if (node.HasValue()) write(node, ksi::Kind::kValue, ksi::cache::kValue);
    if (node.HasList()) write(node, ksi::Kind::kList, ksi::cache::kList);
  }
}

void CacheContent::BindKey(ksi::Statement& statement, int parameter, const ksi::Key& key) {
  if (key.kind == ksi::KeyKind::kNumber) {
    return Require(statement.Bind(parameter, key.number) == SQLITE_OK);
  }
  CheckText(key.text);
  Require(statement.Bind(parameter, key.text) == SQLITE_OK);
}

void CacheContent::BindKeys(ksi::Statement& statement, const ksi::Keys& keys) {
  constexpr ksi::Key kAbsent = {ksi::KeyKind::kText, 0, {}};
  for (size_t i = 0; i < ksi::kMaxKeys; ++i) {
    BindKey(statement, static_cast<int>(i) + 1, i < keys.count ? keys[i] : kAbsent);
  }
}

void CacheContent::AddReading(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                              ksi::Status status) {
  BindKeys(addReading_, keys);
  Require(addReading_.Bind(kNode, RowId(node, kind)) == SQLITE_OK);
  Require(addReading_.Bind(kStatus, int64_t{status}) == SQLITE_OK);
  const int code = addReading_.Step();
  addReading_.Reset();
  if ((code & 0xff) == SQLITE_CONSTRAINT) throw DataError("is given twice");
  Require(code == SQLITE_DONE);
}

void CacheContent::AddValue(const ksi::Node& node, const ksi::Keys& keys,
                            std::span<const std::byte> record) {
  Require(addReading_.Bind(kAnswer, record) == SQLITE_OK);
  AddReading(node, ksi::Kind::kValue, keys, ksi::kOk);
  ++values_;
}

void CacheContent::AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                              ksi::Status status) {
  Require(addReading_.BindNull(kAnswer) == SQLITE_OK);
  AddReading(node, kind, keys, status);
}

void CacheContent::StartList(const ksi::Node& node, const ksi::Keys& keys, size_t count) {
  Require(addReading_.Bind(kAnswer, static_cast<int64_t>(count)) == SQLITE_OK);
  AddReading(node, ksi::Kind::kList, keys, ksi::kOk);
  ++lists_;
  position_ = 0;
  BindKeys(addEntry_, keys);
  Require(addEntry_.Bind(kNode, RowId(node, ksi::Kind::kList)) == SQLITE_OK);
}

void CacheContent::AddEntry(const ksi::Key& entry) {
  Require(addEntry_.Bind(kPosition, position_++) == SQLITE_OK);
  BindKey(addEntry_, kEntry, entry);
  const int code = addEntry_.Step();
  addEntry_.Reset();
  Require(code == SQLITE_DONE);
}

void CacheContent::AddList(const ksi::Node& node, const ksi::Keys& keys,
                           std::span<const ksi::Key> entries) {
  StartList(node, keys, entries.size());
  for (const ksi::Key& entry : entries) AddEntry(entry);
}

void CacheContent::WriteCapture(const ksi::CacheFile::Capture& capture) {
  ksi::Statement insert;
  database_.Prepare("INSERT INTO capture VALUES(?1, ?2, ?3, ?4)", insert);
  int parameter = 0;
  for (const std::string* member :
       {&capture.signature, &capture.built, &capture.host, &capture.taken}) {
    Require(insert.Bind(++parameter, *member) == SQLITE_OK);
  }
  Require(insert.Step() == SQLITE_DONE);
}

std::span<const std::byte> CacheContent::Finish(const ksi::CacheFile::Capture& capture) {
  WriteCapture(capture);
  addReading_ = {};
  addEntry_ = {};
  return database_.Finish();
}

}  // namespace ksicache
