#include "tools/ksicache/memory_database.h"

#include <new>
#include <utility>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

constexpr const char* kMain = "main";  // SQLite's name for the database of a connection

}  // namespace

MemoryDatabase::MemoryDatabase(std::string name, const std::string& setup)
    : name_(std::move(name)) {
  sqlite3* handle = nullptr;
  const int code =
      sqlite3_open_v2("capture", &handle,
                      SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX, "memdb");
  database_.reset(handle);
  Require(code == SQLITE_OK);
  sqlite3_int64 limit = kLargestFile;
  Require(sqlite3_file_control(handle, kMain, SQLITE_FCNTL_SIZE_LIMIT, &limit) == SQLITE_OK);
  // The file is nobody's until it is whole, so a failure needs no journal.
  Execute("PRAGMA journal_mode=OFF");
  Execute(setup);
  Execute("BEGIN");
}

void MemoryDatabase::Execute(const std::string& sql) {
  Require(sqlite3_exec(database_.get(), sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK);
}

void MemoryDatabase::Prepare(const std::string& sql, ksi::Statement& statement) {
  Require(statement.Prepare(database_.get(), sql.c_str()) == SQLITE_OK);
}

void MemoryDatabase::Require(bool good) const {
  if (good) return;
  const int code = database_ == nullptr ? SQLITE_NOMEM : sqlite3_extended_errcode(database_.get());
  if (code == SQLITE_NOMEM || code == SQLITE_IOERR_NOMEM) throw std::bad_alloc();
  const std::string reason =
      code == SQLITE_FULL ? "it is larger than 1 GiB" : sqlite3_errmsg(database_.get());
  throw Error(name_ + ": cannot write: " + reason);
}

std::span<const std::byte> MemoryDatabase::Finish() {
  Execute("COMMIT");
  sqlite3_int64 size = 0;
  const auto* content = reinterpret_cast<const std::byte*>(
      sqlite3_serialize(database_.get(), kMain, &size, SQLITE_SERIALIZE_NOCOPY));
  Require(content != nullptr);
  return {content, static_cast<size_t>(size)};
}

}  // namespace ksicache
