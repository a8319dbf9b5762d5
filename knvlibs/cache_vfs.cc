#include "knvlibs/cache_vfs.h"

#include <sys/stat.h>

#include <charconv>
#include <string>
#include <string_view>
#include <system_error>

#include "knvlibs/sqlite_file.h"

namespace ksi {
namespace {

// An open file as SQLite knows it.
struct CacheHandle {
  sqlite3_file base;
  int descriptor;
  bool grows;
  struct stat opened;
};

CacheHandle& HandleOf(sqlite3_file* file) { return *reinterpret_cast<CacheHandle*>(file); }

bool IsUnchanged(const CacheHandle& handle) {
  struct stat now;
  return fstat(handle.descriptor, &now) == 0 && now.st_size == handle.opened.st_size &&
         now.st_mtim.tv_sec == handle.opened.st_mtim.tv_sec &&
         now.st_mtim.tv_nsec == handle.opened.st_mtim.tv_nsec;
}

// The number of pages in the header may be older than the pages. SQLite asks for the file's size
// instead where the header seems to be by a version that did not know of that number.
void DoubtPageCount(char* bytes, size_t size, sqlite3_int64 offset) {
  constexpr size_t kChangesAt = 24;
  constexpr size_t kCountValidForAt = 92;
  if (offset != 0 || size < kCountValidForAt + 4) return;
  bytes[kCountValidForAt] = static_cast<char>(~bytes[kChangesAt]);
}

int Read(sqlite3_file* file, void* buffer, int amount, sqlite3_int64 offset) {
  const CacheHandle& handle = HandleOf(file);
  int got = 0;
  const int code = sqlite_file::ReadAt(handle.descriptor, buffer, amount, offset, &got);
  if (code != SQLITE_OK) return code;
  // The file was long enough for all its pages when it was opened.
  if (got < amount) return SQLITE_CORRUPT;
  if (handle.grows) DoubtPageCount(static_cast<char*>(buffer), static_cast<size_t>(amount), offset);
  return handle.grows || IsUnchanged(handle) ? SQLITE_OK : SQLITE_CORRUPT;
}

int FileSize(sqlite3_file* file, sqlite3_int64* size) {
  *size = HandleOf(file).opened.st_size;
  return SQLITE_OK;
}

int NoWrite(sqlite3_file* /*file*/, const void* /*buffer*/, int /*amount*/,
            sqlite3_int64 /*offset*/) {
  return SQLITE_READONLY;
}

// SQLite takes no locks on, and looks for no journal of, what nobody can change.
int Characteristics(sqlite3_file* /*file*/) { return SQLITE_IOCAP_IMMUTABLE; }

constexpr sqlite3_io_methods kMethods = sqlite_file::MethodsOf(
    {.read = Read, .write = NoWrite, .size = FileSize, .characteristics = Characteristics});

// A cache file is called by the number of its descriptor, and a "+" if it grows; any other file is
// a temporary one.
int Open(sqlite3_vfs* /*vfs*/, const char* name, sqlite3_file* file, int flags, int* outFlags) {
  if ((flags & SQLITE_OPEN_MAIN_DB) == 0) {
    return sqlite_file::OpenOther(name, file, flags, outFlags);
  }
  CacheHandle& handle = HandleOf(file);
  handle.base.pMethods = nullptr;
  const std::string_view text(name);
  if (std::from_chars(text.data(), text.data() + text.size(), handle.descriptor).ec !=
          std::errc() ||
      fstat(handle.descriptor, &handle.opened) != 0) {
    return SQLITE_CANTOPEN;
  }
  handle.grows = text.ends_with('+');
  handle.base.pMethods = &kMethods;
  if (outFlags != nullptr) *outFlags = flags;
  return SQLITE_OK;
}

}  // namespace

int OpenDescriptor(int descriptor, bool grows, Database* database) {
  const int code = sqlite3_initialize();
  if (code != SQLITE_OK) return code;
  static sqlite3_vfs vfs =
      sqlite_file::MakeVfs("ksi-cache", static_cast<int>(sizeof(CacheHandle)), Open);
  const std::string name = std::to_string(descriptor) + (grows ? "+" : "");
  return sqlite_file::OpenDatabase(vfs, name.c_str(), SQLITE_OPEN_READONLY, database);
}

int OpenContent(std::span<const std::byte> content, Database* database) {
  sqlite3* handle = nullptr;
  int code =
      sqlite3_open_v2(":memory:", &handle, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
  database->reset(handle);
  if (code != SQLITE_OK) return code;
  // It is read only, whatever the type of the pointer.
  auto* bytes = const_cast<unsigned char*>(reinterpret_cast<const unsigned char*>(content.data()));
  const auto size = static_cast<sqlite3_int64>(content.size());
  return sqlite3_deserialize(handle, "main", bytes, size, size, SQLITE_DESERIALIZE_READONLY);
}

}  // namespace ksi
