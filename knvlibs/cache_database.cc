#include "knvlibs/cache_database.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <new>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_vfs.h"

namespace ksi {
namespace {

// The header of a SQLite file, numbers big-endian.
constexpr size_t kHeaderSize = 100;
constexpr std::string_view kMagic{"SQLite format 3\0", 16};
constexpr size_t kPageSizeAt = 16;
constexpr size_t kWriterAt = 18;  // of how it is written, and then of how it is read
constexpr size_t kPageCountAt = 28;
constexpr size_t kEncodingAt = 56;
constexpr size_t kUserVersionAt = 60;
constexpr size_t kApplicationIdAt = 68;
constexpr uint32_t kUtf8 = 1;
constexpr unsigned char kAhead = 2;

// A schema that is not the known one may take arbitrarily long to read; the known one takes a few
// hundred steps.
constexpr int64_t kMostOpeningSteps = 100000;

using Header = std::array<unsigned char, kHeaderSize>;

uint32_t NumberAt(const Header& header, size_t at) {
  return uint32_t{header[at]} << 24 | uint32_t{header[at + 1]} << 16 |
         uint32_t{header[at + 2]} << 8 | header[at + 3];
}

Status CheckHeader(const Header& header, size_t length, uint64_t fileSize, uint32_t& version) {
  if (length < kApplicationIdAt + 4 ||
      std::memcmp(header.data(), kMagic.data(), kMagic.size()) != 0 ||
      NumberAt(header, kApplicationIdAt) != cache::kApplicationId) {
    return KSI_STATUS_INVALID_METADATA;
  }
  version = NumberAt(header, kUserVersionAt);
  if (version > cache::kRecordingVersion) return KSI_STATUS_MAJOR_VERSION_MISMATCH;
  const uint32_t written = uint32_t{header[kPageSizeAt]} << 8 | header[kPageSizeAt + 1];
  const uint64_t pageSize = written == 1 ? 65536 : written;
  // A recording may be growing, and tells itself what of it is good.
  const bool isWhole =
      version == cache::kRecordingVersion || fileSize >= pageSize * NumberAt(header, kPageCountAt);
  const bool isGood =
      version != 0 && length == kHeaderSize && NumberAt(header, kEncodingAt) == kUtf8 && isWhole;
  return isGood ? kOk : Status{KSI_STATUS_METADATA_READ_ERROR};
}

Status CheckType(const struct stat& info) {
  if (S_ISDIR(info.st_mode)) return KSI_STATUS_IS_A_DIRECTORY;
  return S_ISREG(info.st_mode) ? kOk : KSI_STATUS_INVALID_METADATA;
}

// The name that SQLite derives those of its journals from: without links.
std::string RealName(const char* fileName) {
  struct Free {
    void operator()(char* text) const { std::free(text); }
  };
  const std::unique_ptr<char, Free> real(realpath(fileName, nullptr));
  if (real == nullptr && errno == ENOMEM) throw std::bad_alloc();
  return real == nullptr ? fileName : real.get();
}

// Whether a file holds changes; one that was made invalid starts with a NUL.
bool HoldsChanges(const std::string& journal) {
  struct stat info;
  // What cannot be looked at may hold them, unless its name is too long for a file.
  if (lstat(journal.c_str(), &info) != 0) return errno != ENOENT && errno != ENAMETOOLONG;
  if (!S_ISREG(info.st_mode) || info.st_size == 0) return false;
  const int fd = open(journal.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW);
  if (fd < 0) return true;
  char first = 0;
  const ssize_t length = pread(fd, &first, 1, 0);
  close(fd);
  return length < 0 || first != '\0';
}

}  // namespace

Status StatusOfSqlite(int code) {
  switch (code & 0xff) {
    case SQLITE_OK:
    case SQLITE_ROW:
    case SQLITE_DONE:
      return kOk;
    case SQLITE_NOMEM:
      return KSI_STATUS_NO_MEMORY;
    case SQLITE_PERM:
    case SQLITE_AUTH:
      return KSI_STATUS_PERMISSION_DENIED;
    case SQLITE_IOERR:
    case SQLITE_CANTOPEN:
      return KSI_STATUS_IO_ERROR;
    default:
      return KSI_STATUS_METADATA_READ_ERROR;
  }
}

CacheDatabase::Descriptor::~Descriptor() {
  if (number_ >= 0) close(number_);
}

Status CacheDatabase::Descriptor::Open(const char* fileName) {
  // A device may do something when it is opened, so what it is comes first; what was opened counts.
  struct stat info;
  if (stat(fileName, &info) != 0) return StatusOfErrno(errno);
  Status status = CheckType(info);
  if (status != kOk) return status;
  number_ = open(fileName, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
  if (number_ < 0 || fstat(number_, &info) != 0) return StatusOfErrno(errno);
  return CheckType(info);
}

Status CacheDatabase::Open(const char* fileName) {
  Status status = descriptor_.Open(fileName);
  if (status == kOk) status = CheckHead();
  if (status == kOk && version_ != cache::kRecordingVersion) status = CheckChanges(fileName);
  if (status != kOk) return status;
  const int code =
      OpenDescriptor(descriptor_.Number(), version_ == cache::kRecordingVersion, &database_);
  return code == SQLITE_OK ? Configure() : Failed(code);
}

uint32_t CacheDatabase::VersionOf(const char* fileName) {
  CacheDatabase database;
  Status status = database.descriptor_.Open(fileName);
  if (status == kOk) status = database.CheckHead();
  return status == kOk ? database.version_ : 0;
}

Status CacheDatabase::OpenBytes(std::span<const std::byte> content) {
  version_ = cache::kSchemaVersion;
  size_ = content.size();
  int code = OpenContent(content, &database_);
  return code == SQLITE_OK ? Configure() : Failed(code);
}

// Looks at the file before SQLite does.
Status CacheDatabase::CheckHead() {
  struct stat info;
  if (fstat(descriptor_.Number(), &info) != 0) return StatusOfErrno(errno);
  size_ = static_cast<uint64_t>(info.st_size);
  Header header = {};
  const ssize_t length = pread(descriptor_.Number(), header.data(), header.size(), 0);
  if (length < 0) return StatusOfErrno(errno);
  isWrittenAhead_ = header[kWriterAt] == kAhead || header[kWriterAt + 1] == kAhead;
  return CheckHeader(header, static_cast<size_t>(length), size_, version_);
}

// A cache file is whole from its first moment. Somebody who changes one all the same leaves, until
// he is done, a part of it in another file, without which figures would be wrong.
Status CacheDatabase::CheckChanges(const char* fileName) {
  const std::string name = RealName(fileName);
  for (const char* suffix : {"-journal", "-wal"}) {
    if (HoldsChanges(name + suffix)) {
      why_ = "changes of it lie beside it in " + name + suffix;
      return KSI_STATUS_METADATA_READ_ERROR;
    }
  }
  return kOk;
}

Status CacheDatabase::Failed(int code) {
  const Status status = StatusOfSqlite(code);
  // The status says it all, and SQLite no more.
  if (status != KSI_STATUS_NO_MEMORY) why_ = ErrorText();
  return status;
}

const char* CacheDatabase::ErrorText() const {
  return limit_.Exceeded() ? "its pages lead to each other without end"
                           : sqlite3_errmsg(database_.get());
}

Status CacheDatabase::Damaged(std::string why) {
  why_ = std::move(why);
  return KSI_STATUS_METADATA_READ_ERROR;
}

Status CacheDatabase::Configure() {
  sqlite3* database = database_.get();
  sqlite3_limit(database, SQLITE_LIMIT_LENGTH, 4 * static_cast<int>(cache::kLongestText));
  sqlite3_limit(database, SQLITE_LIMIT_ATTACHED, 0);
  sqlite3_db_config(database, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  limit_.Watch(database, size_);
  limit_.Allow(kMostOpeningSteps);
  const int code = sqlite3_exec(database, "PRAGMA cell_size_check=ON", nullptr, nullptr, nullptr);
  return code == SQLITE_OK ? kOk : Failed(code);
}

Status CacheDatabase::CheckSchema(std::span<const cache::Table> tables) {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT type, name, sql FROM sqlite_schema");
  if (code != SQLITE_OK) return Failed(code);
  for (const cache::Table& table : tables) {
    code = rows.Step();
    if (code != SQLITE_ROW && code != SQLITE_DONE) return Failed(code);
    if (code == SQLITE_DONE || rows.Text(0) != "table" || rows.Text(1) != table.name ||
        rows.Text(2) != table.sql) {
      return Damaged("its tables are not those of a cache file");
    }
  }
  code = rows.Step();
  if (code == SQLITE_ROW) return Damaged("it has more than the tables of a cache file");
  return code == SQLITE_DONE ? kOk : Failed(code);
}

}  // namespace ksi
