// A SQLite database that is written, in a transaction.
#ifndef TOOLS_KSICACHE_WRITTEN_DATABASE_H_
#define TOOLS_KSICACHE_WRITTEN_DATABASE_H_

#include <string>

#include "knvlibs/sqlite.h"

namespace ksicache {

// Calls fail with an Error that names the file, or with std::bad_alloc.
class WrittenDatabase {
 public:
  WrittenDatabase(const WrittenDatabase&) = delete;
  WrittenDatabase& operator=(const WrittenDatabase&) = delete;

  void Execute(const std::string& sql);
  void Prepare(const std::string& sql, ksi::Statement& statement);

  // Fails if something that was called on the database did not end well.
  void Require(bool good) const;

  // What to call the file in a message.
  const std::string& Name() const { return name_; }

 protected:
  // `full`: what it means that there is no more room; null: what SQLite says.
  WrittenDatabase(std::string name, const char* full);
  ~WrittenDatabase() = default;

  void Open(const char* fileName, int flags, const char* vfs);
  sqlite3* Handle() const { return database_.get(); }

 private:
  std::string name_;
  const char* full_;
  ksi::Database database_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_WRITTEN_DATABASE_H_
