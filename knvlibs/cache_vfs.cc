#include "knvlibs/cache_vfs.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <mutex>
#include <string>
#include <string_view>
#include <system_error>

namespace ksi {
namespace {

constexpr const char* kVfsName = "ksi-cache";

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
  auto* bytes = static_cast<char*>(buffer);
  const auto wanted = static_cast<size_t>(amount);
  for (size_t done = 0; done < wanted;) {
    const ssize_t got = pread(handle.descriptor, bytes + done, wanted - done,
                              offset + static_cast<sqlite3_int64>(done));
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) return errno == ENOMEM ? SQLITE_IOERR_NOMEM : SQLITE_IOERR_READ;
    // The file was long enough for all its pages when it was opened.
    if (got == 0) return SQLITE_CORRUPT;
    done += static_cast<size_t>(got);
  }
  if (handle.grows) DoubtPageCount(bytes, wanted, offset);
  return handle.grows || IsUnchanged(handle) ? SQLITE_OK : SQLITE_CORRUPT;
}

int FileSize(sqlite3_file* file, sqlite3_int64* size) {
  *size = HandleOf(file).opened.st_size;
  return SQLITE_OK;
}

int Nothing(sqlite3_file* /*file*/) { return SQLITE_OK; }
int NoLock(sqlite3_file* /*file*/, int /*level*/) { return SQLITE_OK; }
int NoSync(sqlite3_file* /*file*/, int /*flags*/) { return SQLITE_OK; }
int NoControl(sqlite3_file* /*file*/, int /*operation*/, void* /*argument*/) {
  return SQLITE_NOTFOUND;
}
int NoWrite(sqlite3_file* /*file*/, const void* /*buffer*/, int /*amount*/,
            sqlite3_int64 /*offset*/) {
  return SQLITE_READONLY;
}
int NoTruncate(sqlite3_file* /*file*/, sqlite3_int64 /*size*/) { return SQLITE_READONLY; }
int NoReservedLock(sqlite3_file* /*file*/, int* held) {
  *held = 0;
  return SQLITE_OK;
}
int SectorSize(sqlite3_file* /*file*/) { return 0; }
// SQLite takes no locks on, and looks for no journal of, what nobody can change.
int Characteristics(sqlite3_file* /*file*/) { return SQLITE_IOCAP_IMMUTABLE; }

// Version 1: without mapping and without shared memory.
constexpr sqlite3_io_methods kMethods = {.iVersion = 1,
                                         .xClose = Nothing,
                                         .xRead = Read,
                                         .xWrite = NoWrite,
                                         .xTruncate = NoTruncate,
                                         .xSync = NoSync,
                                         .xFileSize = FileSize,
                                         .xLock = NoLock,
                                         .xUnlock = NoLock,
                                         .xCheckReservedLock = NoReservedLock,
                                         .xFileControl = NoControl,
                                         .xSectorSize = SectorSize,
                                         .xDeviceCharacteristics = Characteristics,
                                         .xShmMap = nullptr,
                                         .xShmLock = nullptr,
                                         .xShmBarrier = nullptr,
                                         .xShmUnmap = nullptr,
                                         .xFetch = nullptr,
                                         .xUnfetch = nullptr};

// A cache file is called by the number of its descriptor, and a "+" if it grows; any other file is
// a temporary one.
int Open(sqlite3_vfs* /*vfs*/, const char* name, sqlite3_file* file, int flags, int* outFlags) {
  if ((flags & SQLITE_OPEN_MAIN_DB) == 0) {
    sqlite3_vfs* const system = sqlite3_vfs_find(nullptr);
    return system->xOpen(system, name, file, flags, outFlags);
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

int FullName(sqlite3_vfs* /*vfs*/, const char* name, int room, char* fullName) {
  const size_t size = std::strlen(name) + 1;
  if (size > static_cast<size_t>(room)) return SQLITE_CANTOPEN;
  std::memcpy(fullName, name, size);
  return SQLITE_OK;
}

// The system's, but for what concerns the one file.
sqlite3_vfs MakeVfs() {
  sqlite3_vfs vfs = *sqlite3_vfs_find(nullptr);
  vfs.zName = kVfsName;
  vfs.szOsFile = std::max(vfs.szOsFile, static_cast<int>(sizeof(CacheHandle)));
  vfs.xOpen = Open;
  vfs.xFullPathname = FullName;
  return vfs;
}

}  // namespace

int OpenDescriptor(int descriptor, bool grows, Database* database) {
  int code = sqlite3_initialize();
  if (code != SQLITE_OK) return code;
  static sqlite3_vfs vfs = MakeVfs();
  // SQLite finds it by its name, and must not know it when the library has been unloaded.
  static std::mutex mutex;
  const std::lock_guard<std::mutex> guard(mutex);
  code = sqlite3_vfs_register(&vfs, 0);
  if (code != SQLITE_OK) return code;
  sqlite3* handle = nullptr;
  const std::string name = std::to_string(descriptor) + (grows ? "+" : "");
  code =
      sqlite3_open_v2(name.c_str(), &handle, SQLITE_OPEN_READONLY | SQLITE_OPEN_NOMUTEX, kVfsName);
  sqlite3_vfs_unregister(&vfs);
  database->reset(handle);
  return code;
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
