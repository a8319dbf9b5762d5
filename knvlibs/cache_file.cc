#include "knvlibs/cache_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>

#include "knvlibs/cache_format.h"
#include "knvlibs/cache_vfs.h"

namespace ksi {
namespace {

// The header of a SQLite file, numbers big-endian.
constexpr size_t kHeaderSize = 100;
constexpr std::string_view kMagic{"SQLite format 3\0", 16};
constexpr size_t kPageSizeAt = 16;
constexpr size_t kPageCountAt = 28;
constexpr size_t kEncodingAt = 56;
constexpr size_t kUserVersionAt = 60;
constexpr size_t kApplicationIdAt = 68;
constexpr uint32_t kUtf8 = 1;

// A schema that is not the known one may take arbitrarily long to read; the known one takes a few
// hundred steps.
constexpr int64_t kMostOpeningSteps = 100000;

// Twice the nodes of the catalogue, and room for those of a later one.
constexpr size_t kMostNodeRows = 4096;

using Header = std::array<unsigned char, kHeaderSize>;

uint32_t NumberAt(const Header& header, size_t at) {
  return uint32_t{header[at]} << 24 | uint32_t{header[at + 1]} << 16 |
         uint32_t{header[at + 2]} << 8 | header[at + 3];
}

Status CheckHeader(const Header& header, size_t length, uint64_t fileSize) {
  if (length < kApplicationIdAt + 4 ||
      std::memcmp(header.data(), kMagic.data(), kMagic.size()) != 0 ||
      NumberAt(header, kApplicationIdAt) != cache::kApplicationId) {
    return KSI_STATUS_INVALID_METADATA;
  }
  const uint32_t version = NumberAt(header, kUserVersionAt);
  if (version > cache::kSchemaVersion) return KSI_STATUS_MAJOR_VERSION_MISMATCH;
  const uint32_t written = uint32_t{header[kPageSizeAt]} << 8 | header[kPageSizeAt + 1];
  const uint64_t pageSize = written == 1 ? 65536 : written;
  if (version != cache::kSchemaVersion || length < kHeaderSize ||
      NumberAt(header, kEncodingAt) != kUtf8 ||
      fileSize < pageSize * NumberAt(header, kPageCountAt)) {
    return KSI_STATUS_METADATA_READ_ERROR;
  }
  return kOk;
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

bool IsDate(std::string_view text) {
  return text.size() == cache::kDateSize &&
         std::ranges::all_of(text, [](char c) { return c >= ' ' && c <= '~'; });
}

bool IsSignature(std::string_view text) {
  return text.size() == cache::kSignatureSize &&
         text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

bool IsPlain(std::string_view text) {
  return text.size() <= cache::kLongestText && text.find('\0') == std::string_view::npos;
}

}  // namespace

const char* BadMember(const CacheFile::Capture& capture) {
  if (!IsSignature(capture.signature)) return "signature";
  if (!IsDate(capture.built)) return "built";
  if (!IsDate(capture.taken)) return "taken";
  if (!IsPlain(capture.host)) return "host";
  return nullptr;
}

bool IsTime(const std::string& text) {
  struct tm parts = {};
  if (strptime(text.c_str(), cache::kTimeForm, &parts) == nullptr) return false;
  timegm(&parts);  // makes the 30th of February the 2nd of March
  std::array<char, 64> written = {};
  static_cast<void>(strftime(written.data(), written.size(), cache::kTimeForm, &parts));
  return text == written.data();
}

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

CacheFile::Descriptor::~Descriptor() {
  if (number_ >= 0) close(number_);
}

Status CacheFile::Descriptor::Open(const char* fileName) {
  // A device may do something when it is opened, so what it is comes first; what was opened counts.
  struct stat info;
  if (stat(fileName, &info) != 0) return StatusOfErrno(errno);
  Status status = CheckType(info);
  if (status != kOk) return status;
  number_ = open(fileName, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
  if (number_ < 0 || fstat(number_, &info) != 0) return StatusOfErrno(errno);
  return CheckType(info);
}

Status CacheFile::Open(const char* fileName, std::unique_ptr<CacheFile>* file, std::string* why) {
  std::unique_ptr<CacheFile> made(new CacheFile);
  Status status = made->descriptor_.Open(fileName);
  if (status == kOk) status = made->CheckHead();
  if (status == kOk) status = made->CheckChanges(fileName);
  if (status == kOk) status = made->Connect();
  if (status == kOk) status = made->CheckSchema();
  if (status == kOk) status = made->ReadCapture();
  if (status == kOk) status = made->ReadNodes();
  if (status != kOk) {
    if (why != nullptr) *why = made->why_;
    return status;
  }
  made->limit_.Allow(WorkLimit::StepsFor(made->size_));
  *file = std::move(made);
  return kOk;
}

// Looks at the file before SQLite does.
Status CacheFile::CheckHead() {
  struct stat info;
  if (fstat(descriptor_.Number(), &info) != 0) return StatusOfErrno(errno);
  size_ = static_cast<uint64_t>(info.st_size);
  Header header = {};
  const ssize_t length = pread(descriptor_.Number(), header.data(), header.size(), 0);
  if (length < 0) return StatusOfErrno(errno);
  return CheckHeader(header, static_cast<size_t>(length), size_);
}

// A cache file is whole from its first moment. Somebody who changes one all the same leaves, until
// he is done, a part of it in another file, without which figures would be wrong.
Status CacheFile::CheckChanges(const char* fileName) {
  const std::string name = RealName(fileName);
  for (const char* suffix : {"-journal", "-wal"}) {
    if (HoldsChanges(name + suffix)) {
      why_ = "changes of it lie beside it in " + name + suffix;
      return KSI_STATUS_METADATA_READ_ERROR;
    }
  }
  return kOk;
}

Status CacheFile::Connect() {
  const int code = OpenDescriptor(descriptor_.Number(), &database_);
  return code == SQLITE_OK ? Configure() : Failed(code);
}

Status CacheFile::Failed(int code) {
  why_ = ErrorText();
  return StatusOfSqlite(code);
}

const char* CacheFile::ErrorText() const {
  return limit_.Exceeded() ? "its pages lead to each other without end"
                           : sqlite3_errmsg(database_.get());
}

Status CacheFile::Damaged(const char* why) {
  why_ = why;
  return KSI_STATUS_METADATA_READ_ERROR;
}

Status CacheFile::Configure() {
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

Status CacheFile::CheckSchema() {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT type, name, sql FROM sqlite_schema");
  if (code != SQLITE_OK) return Failed(code);
  for (const cache::Table& table : cache::kTables) {
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

Status CacheFile::ReadCapture() {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT signature, built, host, taken FROM capture");
  if (code == SQLITE_OK) code = rows.Step();
  if (code == SQLITE_DONE) return Damaged("the table capture is empty");
  if (code != SQLITE_ROW) return Failed(code);
  capture_.signature = rows.Text(0);
  capture_.built = rows.Text(1);
  capture_.host = rows.Text(2);
  capture_.taken = rows.Text(3);
  if (BadMember(capture_) != nullptr) return Damaged("the table capture is not understood");
  code = rows.Step();
  if (code == SQLITE_ROW) return Damaged("the table capture has more than one row");
  return code == SQLITE_DONE ? kOk : Failed(code);
}

Status CacheFile::ReadNodes() {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT id, path, kind FROM node ORDER BY id");
  if (code != SQLITE_OK) return Failed(code);
  while ((code = rows.Step()) == SQLITE_ROW) {
    const std::string_view kind = rows.Text(2);
    NodeRow row{rows.Number(0), nullptr, kind == cache::kList ? Kind::kList : Kind::kValue,
                std::string(rows.Text(1))};
    if (!IsPlain(row.path) || (kind != cache::kList && kind != cache::kValue) ||
        (!nodes_.empty() && nodes_.back().id >= row.id) || nodes_.size() == kMostNodeRows) {
      return Damaged("the table node is not understood");
    }
    const Node* node = FindNode(row.path);
    if (node != nullptr && (row.kind == Kind::kList ? node->HasList() : node->HasValue())) {
      row.node = node;
    }
    nodes_.push_back(std::move(row));
  }
  return code == SQLITE_DONE ? kOk : Failed(code);
}

const CacheFile::NodeRow* CacheFile::FindRow(const Node& node, Kind kind) const {
  const auto found = std::ranges::find_if(
      nodes_, [&](const NodeRow& row) { return row.node == &node && row.kind == kind; });
  return found == nodes_.end() ? nullptr : &*found;
}

const CacheFile::NodeRow* CacheFile::FindRow(int64_t id) const {
  const auto found = std::ranges::lower_bound(nodes_, id, {}, &NodeRow::id);
  return found == nodes_.end() || found->id != id ? nullptr : &*found;
}

}  // namespace ksi
