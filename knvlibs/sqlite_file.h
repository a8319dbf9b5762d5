// Files that SQLite reads and writes through this library's own hands: no names, no locks, no
// journals, nothing mapped.
#ifndef KNVLIBS_SQLITE_FILE_H_
#define KNVLIBS_SQLITE_FILE_H_

#include "knvlibs/sqlite.h"

namespace ksi::sqlite_file {

// What differs from one kind of file to another. SQLite asks with the file that xOpen has filled.
struct Calls {
  int (*read)(sqlite3_file* file, void* buffer, int amount, sqlite3_int64 offset);
  int (*write)(sqlite3_file* file, const void* buffer, int amount, sqlite3_int64 offset);
  int (*size)(sqlite3_file* file, sqlite3_int64* size);
  int (*characteristics)(sqlite3_file* file);
};

inline int Nothing(sqlite3_file* /*file*/) { return SQLITE_OK; }
inline int NoSync(sqlite3_file* /*file*/, int /*flags*/) { return SQLITE_OK; }
inline int NoLock(sqlite3_file* /*file*/, int /*level*/) { return SQLITE_OK; }
inline int NoReservedLock(sqlite3_file* /*file*/, int* held) {
  *held = 0;
  return SQLITE_OK;
}
inline int NoTruncate(sqlite3_file* /*file*/, sqlite3_int64 /*size*/) { return SQLITE_READONLY; }
inline int NoControl(sqlite3_file* /*file*/, int /*operation*/, void* /*argument*/) {
  return SQLITE_NOTFOUND;
}
inline int AnySector(sqlite3_file* /*file*/) { return 0; }

// Version 1: without mapping and without shared memory.
constexpr sqlite3_io_methods MethodsOf(const Calls& calls) {
  return {.iVersion = 1,
          .xClose = Nothing,
          .xRead = calls.read,
          .xWrite = calls.write,
          .xTruncate = NoTruncate,
          .xSync = NoSync,
          .xFileSize = calls.size,
          .xLock = NoLock,
          .xUnlock = NoLock,
          .xCheckReservedLock = NoReservedLock,
          .xFileControl = NoControl,
          .xSectorSize = AnySector,
          .xDeviceCharacteristics = calls.characteristics,
          .xShmMap = nullptr,
          .xShmLock = nullptr,
          .xShmBarrier = nullptr,
          .xShmUnmap = nullptr,
          .xFetch = nullptr,
          .xUnfetch = nullptr};
}

// The system's file system, but that names are taken as they are, a file has `handleSize` bytes and
// is opened by `open`.
using Open = int (*)(sqlite3_vfs* vfs, const char* name, sqlite3_file* file, int flags,
                     int* outFlags);
sqlite3_vfs MakeVfs(const char* name, int handleSize, Open open);

// Opens a file that is not the database: a temporary one, as the system does.
int OpenOther(const char* name, sqlite3_file* file, int flags, int* outFlags);

// Reads up to the end of the file, and tells how much.
int ReadAt(int descriptor, void* buffer, int amount, sqlite3_int64 offset, int* got);

// Opens a database by a file system that SQLite knows for that moment only. Gives SQLite's result
// code; `database` is to be asked for its message also on failure.
int OpenDatabase(sqlite3_vfs& vfs, const char* name, int flags, Database* database);

}  // namespace ksi::sqlite_file

#endif  // KNVLIBS_SQLITE_FILE_H_
