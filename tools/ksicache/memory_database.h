// A database that is made in memory, to become a file when it is whole.
#ifndef TOOLS_KSICACHE_MEMORY_DATABASE_H_
#define TOOLS_KSICACHE_MEMORY_DATABASE_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

#include "tools/ksicache/written_database.h"

namespace ksicache {

class MemoryDatabase : public WrittenDatabase {
 public:
  static constexpr int64_t kLargestFile = int64_t{1} << 30;

  // A transaction has begun behind the pragmas `setup`.
  MemoryDatabase(std::string name, const std::string& setup);

  // The bytes of the file, which live as long as this. Nothing can be added any more.
  // REQUIRES: there are no statements.
  std::span<const std::byte> Finish();
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MEMORY_DATABASE_H_
