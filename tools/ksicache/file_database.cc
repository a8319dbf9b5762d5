#include "tools/ksicache/file_database.h"

#include <sys/stat.h>

#include <cerrno>
#include <utility>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

constexpr int kLongestWait = 10'000;  // ms

}  // namespace

FileDatabase::FileDatabase(std::string name) : WrittenDatabase(std::move(name), nullptr) {
  struct stat info = {};
  if (stat(Name().c_str(), &info) != 0) throw SystemError(Name(), errno);
  if (!S_ISREG(info.st_mode)) throw Error(Name() + ": is not a regular file");
  // Some names without a directory mean no file to SQLite.
  const bool hasDirectory = Name().find('/') != std::string::npos;
  Open(((hasDirectory ? "" : "./") + Name()).c_str(), SQLITE_OPEN_READWRITE, nullptr);
  for (const auto& [option, isOn] :
       {std::pair(SQLITE_DBCONFIG_DEFENSIVE, 1), std::pair(SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0),
        std::pair(SQLITE_DBCONFIG_ENABLE_TRIGGER, 0)}) {
    Require(sqlite3_db_config(Handle(), option, isOn, nullptr) == SQLITE_OK);
  }
  Require(sqlite3_busy_timeout(Handle(), kLongestWait) == SQLITE_OK);
  Execute("BEGIN IMMEDIATE");
}

}  // namespace ksicache
