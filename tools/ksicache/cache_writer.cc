#include "tools/ksicache/cache_writer.h"

#include "knvlibs/cache_format.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

enum Parameter { kKey1 = 1, kKey2, kNode, kStatus, kAnswer };
enum InstanceParameter { kPosition = 4, kEntry };

// A node's identifier in the file: its value's, and the next for its list.
int64_t RowId(const ksi::Node& node, ksi::Kind kind) {
  return 2 * ksi::IdOf(node) + (kind == ksi::Kind::kList ? 1 : 0);
}

}  // namespace

CacheWriter::CacheWriter(const std::string& fileName, bool replace) : file_(fileName, replace) {
  sqlite3* handle = nullptr;
  const int code = sqlite3_open_v2(file_.Name().c_str(), &handle,
                                   SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
  database_.reset(handle);
  Require(code == SQLITE_OK, "open");

  // The file is nobody's until it is whole, so a failure needs no journal.
  Execute("PRAGMA journal_mode=OFF; PRAGMA synchronous=OFF; PRAGMA locking_mode=EXCLUSIVE");
  Execute("PRAGMA application_id=" + std::to_string(ksi::cache::kApplicationId));
  Execute("PRAGMA user_version=" + std::to_string(ksi::cache::kSchemaVersion));
  Execute("BEGIN");
  for (const ksi::cache::Table& table : ksi::cache::kTables) Execute(std::string(table.sql));
  WriteNodes();
  Require(
      addReading_.Prepare(handle, "INSERT INTO reading VALUES(?1, ?2, ?3, ?4, ?5)") == SQLITE_OK &&
          addInstance_.Prepare(handle, "INSERT INTO instance VALUES(?1, ?2, ?3, ?4, ?5)") ==
              SQLITE_OK,
      "prepare");
}

void CacheWriter::Execute(const std::string& sql) {
  Require(sqlite3_exec(database_.get(), sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK,
          "write");
}

void CacheWriter::Require(bool good, const char* action) {
  if (good) return;
  const int code = sqlite3_errcode(database_.get());
  const std::string reason =
      code == SQLITE_FULL ? "no space left on the device" : sqlite3_errmsg(database_.get());
  throw Error(file_.Target() + ": cannot " + action + ": " + reason);
}

void CacheWriter::WriteNodes() {
  ksi::Statement insert;
  Require(insert.Prepare(database_.get(), "INSERT INTO node VALUES(?1, ?2, ?3)") == SQLITE_OK,
          "prepare");
  const auto write = [&](const ksi::Node& node, ksi::Kind kind, std::string_view name) {
    Require(insert.Bind(1, RowId(node, kind)) == SQLITE_OK &&
                insert.Bind(2, node.path) == SQLITE_OK && insert.Bind(3, name) == SQLITE_OK &&
                insert.Step() == SQLITE_DONE,
            "write");
    insert.Reset();
  };
  for (const ksi::Node& node : ksi::Catalogue()) {
    if (node.HasValue()) write(node, ksi::Kind::kValue, ksi::cache::kValue);
    if (node.HasList()) write(node, ksi::Kind::kList, ksi::cache::kList);
  }
}

void CacheWriter::CheckText(std::string_view text) {
  if (text.size() > ksi::cache::kLongestText) {
    throw DataError("a text is longer than " + std::to_string(ksi::cache::kLongestText) + " bytes");
  }
}

void CacheWriter::BindKeys(ksi::Statement& statement, const ksi::Keys& keys) {
  for (size_t i = 0; i < ksi::kMaxKeys; ++i) {
    const int parameter = static_cast<int>(i) + 1;
    int code = SQLITE_OK;
    if (i >= keys.count) {
      code = statement.Bind(parameter, std::string_view());
    } else if (keys[i].kind == ksi::KeyKind::kNumber) {
      code = statement.Bind(parameter, keys[i].number);
    } else {
      CheckText(keys[i].text);
      code = statement.Bind(parameter, keys[i].text);
    }
    Require(code == SQLITE_OK, "write");
  }
}

void CacheWriter::AddReading(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                             ksi::Status status) {
  BindKeys(addReading_, keys);
  Require(addReading_.Bind(kNode, RowId(node, kind)) == SQLITE_OK &&
              addReading_.Bind(kStatus, int64_t{status}) == SQLITE_OK,
          "write");
  const int code = addReading_.Step();
  addReading_.Reset();
  if ((code & 0xff) == SQLITE_CONSTRAINT) throw DataError("is given twice");
  Require(code == SQLITE_DONE, "write");
}

void CacheWriter::AddValue(const ksi::Node& node, const ksi::Keys& keys,
                           std::span<const std::byte> record) {
  Require(addReading_.Bind(kAnswer, record) == SQLITE_OK, "write");
  AddReading(node, ksi::Kind::kValue, keys, ksi::kOk);
  ++values_;
}

void CacheWriter::AddList(const ksi::Node& node, const ksi::Keys& keys,
                          const ksi::ParamList& instances) {
  Require(addReading_.Bind(kAnswer, static_cast<int64_t>(instances.Count())) == SQLITE_OK, "write");
  AddReading(node, ksi::Kind::kList, keys, ksi::kOk);
  if (instances.Count() != 0) {
    BindKeys(addInstance_, keys);
    Require(addInstance_.Bind(kNode, RowId(node, ksi::Kind::kList)) == SQLITE_OK, "write");
  }
  for (size_t i = 0; i < instances.Count(); ++i) {
    int code = addInstance_.Bind(kPosition, static_cast<int64_t>(i));
    if (code == SQLITE_OK && instances.Kind(i) == ksi::KeyKind::kNumber) {
      code = addInstance_.Bind(kEntry, static_cast<int64_t>(instances.Number(i)));
    } else if (code == SQLITE_OK) {
      CheckText(instances.Text(i));
      code = addInstance_.Bind(kEntry, instances.Text(i));
    }
    if (code == SQLITE_OK) code = addInstance_.Step();
    addInstance_.Reset();
    Require(code == SQLITE_DONE, "write");
  }
  ++lists_;
}

void CacheWriter::AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                             ksi::Status status) {
  Require(addReading_.BindNull(kAnswer) == SQLITE_OK, "write");
  AddReading(node, kind, keys, status);
  ++failures_;
}

void CacheWriter::Commit(const ksi::CacheFile::Capture& capture) {
  ksi::Statement insert;
  Require(
      insert.Prepare(database_.get(), "INSERT INTO capture VALUES(?1, ?2, ?3, ?4)") == SQLITE_OK &&
          insert.Bind(1, capture.signature) == SQLITE_OK &&
          insert.Bind(2, capture.built) == SQLITE_OK && insert.Bind(3, capture.host) == SQLITE_OK &&
          insert.Bind(4, capture.taken) == SQLITE_OK && insert.Step() == SQLITE_DONE,
      "write");
  insert = {};
  addReading_ = {};
  addInstance_ = {};
  Execute("COMMIT");
  Require(sqlite3_close(database_.release()) == SQLITE_OK, "close");
  file_.Commit();
}

}  // namespace ksicache
