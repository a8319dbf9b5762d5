#include "knvlibs/sqlite_file.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <mutex>

namespace ksi::sqlite_file {
namespace {

int FullName(sqlite3_vfs* /*vfs*/, const char* name, int room, char* fullName) {
  const size_t size = std::strlen(name) + 1;
  if (size > static_cast<size_t>(room)) return SQLITE_CANTOPEN;
  std::memcpy(fullName, name, size);
  return SQLITE_OK;
}

}  // namespace

sqlite3_vfs MakeVfs(const char* name, int handleSize, Open open) {
  sqlite3_vfs vfs = *sqlite3_vfs_find(nullptr);
  vfs.zName = name;
  vfs.szOsFile = std::max(vfs.szOsFile, handleSize);
  vfs.xOpen = open;
  vfs.xFullPathname = FullName;
  return vfs;
}

int OpenOther(const char* name, sqlite3_file* file, int flags, int* outFlags) {
  sqlite3_vfs* const system = sqlite3_vfs_find(nullptr);
  return system->xOpen(system, name, file, flags, outFlags);
}

int ReadAt(int descriptor, void* buffer, int amount, sqlite3_int64 offset, int* got) {
  auto* bytes = static_cast<char*>(buffer);
  for (*got = 0; *got < amount;) {
    const ssize_t size =
        pread(descriptor, bytes + *got, static_cast<size_t>(amount - *got), offset + *got);
    if (size < 0 && errno == EINTR) continue;
    if (size < 0) return errno == ENOMEM ? SQLITE_IOERR_NOMEM : SQLITE_IOERR_READ;
    if (size == 0) break;
    *got += static_cast<int>(size);
  }
  return SQLITE_OK;
}

int OpenDatabase(sqlite3_vfs& vfs, const char* name, int flags, Database* database) {
  // SQLite finds it by its name, and must not know it when the library has been unloaded.
  static std::mutex mutex;
  const std::lock_guard<std::mutex> guard(mutex);
  int code = sqlite3_vfs_register(&vfs, 0);
  if (code != SQLITE_OK) return code;
  sqlite3* handle = nullptr;
  code = sqlite3_open_v2(name, &handle, flags | SQLITE_OPEN_NOMUTEX, vfs.zName);
  sqlite3_vfs_unregister(&vfs);
  database->reset(handle);
  return code;
}

}  // namespace ksi::sqlite_file
