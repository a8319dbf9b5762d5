// A database that is made in memory, to become a file when it is whole.
#ifndef TOOLS_KSICACHE_MEMORY_DATABASE_H_
#define TOOLS_KSICACHE_MEMORY_DATABASE_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

#include "knvlibs/sqlite.h"

namespace ksicache {

// Calls fail with an Error that names the file, or with std::bad_alloc.
class MemoryDatabase {
 public:
  static constexpr int64_t kLargestFile = int64_t{1} << 30;

  // What to call the file in a message. A transaction has begun behind the pragmas `setup`.
  MemoryDatabase(std::string name, const std::string& setup);

  void Execute(const std::string& sql);
  void Prepare(const std::string& sql, ksi::Statement& statement);

  // Fails if something that was called on the database did not end well.
  void Require(bool good) const;

  // The bytes of the file, which live as long as this. Nothing can be added any more.
  // REQUIRES: there are no statements.
  std::span<const std::byte> Finish();

  const std::string& Name() const { return name_; }

 private:
  std::string name_;
  ksi::Database database_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MEMORY_DATABASE_H_
