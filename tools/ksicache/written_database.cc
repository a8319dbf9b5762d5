#include "tools/ksicache/written_database.h"

#include <new>
#include <utility>

#include "tools/ksicache/error.h"

namespace ksicache {

WrittenDatabase::WrittenDatabase(std::string name, const char* full)
    : name_(std::move(name)), full_(full) {}

void WrittenDatabase::Open(const char* fileName, int flags, const char* vfs) {
  sqlite3* handle = nullptr;
  const int code = sqlite3_open_v2(fileName, &handle, flags | SQLITE_OPEN_NOMUTEX, vfs);
  database_.reset(handle);
  Require(code == SQLITE_OK);
}

void WrittenDatabase::Execute(const std::string& sql) {
  Require(sqlite3_exec(Handle(), sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK);
}

void WrittenDatabase::Prepare(const std::string& sql, ksi::Statement& statement) {
  Require(statement.Prepare(Handle(), sql.c_str()) == SQLITE_OK);
}

void WrittenDatabase::Require(bool good) const {
  if (good) return;
  const int code = Handle() == nullptr ? SQLITE_NOMEM : sqlite3_extended_errcode(Handle());
  if (code == SQLITE_NOMEM || code == SQLITE_IOERR_NOMEM) throw std::bad_alloc();
  const bool isFull = code == SQLITE_FULL && full_ != nullptr;
  throw Error(name_ + ": cannot write: " + (isFull ? full_ : sqlite3_errmsg(Handle())));
}

}  // namespace ksicache
