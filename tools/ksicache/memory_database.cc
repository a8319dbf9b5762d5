#include "tools/ksicache/memory_database.h"

#include <utility>

namespace ksicache {
namespace {

constexpr const char* kMain = "main";  // SQLite's name for the database of a connection

}  // namespace

MemoryDatabase::MemoryDatabase(std::string name, const std::string& setup)
    : WrittenDatabase(std::move(name), "it is larger than 1 GiB") {
  Open("capture", SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, "memdb");
  sqlite3_int64 limit = kLargestFile;
  Require(sqlite3_file_control(Handle(), kMain, SQLITE_FCNTL_SIZE_LIMIT, &limit) == SQLITE_OK);
  // The file is nobody's until it is whole, so a failure needs no journal.
  Execute("PRAGMA journal_mode=OFF");
  Execute(setup);
  Execute("BEGIN");
}

std::span<const std::byte> MemoryDatabase::Finish() {
  Execute("COMMIT");
  sqlite3_int64 size = 0;
  const auto* content = reinterpret_cast<const std::byte*>(
      sqlite3_serialize(Handle(), kMain, &size, SQLITE_SERIALIZE_NOCOPY));
  Require(content != nullptr);
  return {content, static_cast<size_t>(size)};
}

}  // namespace ksicache
