#include "knvlibs/cache_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

#include "knvlibs/cache_format.h"

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
constexpr int kMostOpeningSteps = 100000;

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

// Looks at a file before SQLite does.
Status CheckFile(const char* fileName) {
  struct stat info;
  if (stat(fileName, &info) != 0) return StatusOfErrno(errno);
  if (S_ISDIR(info.st_mode)) return KSI_STATUS_IS_A_DIRECTORY;
  if (!S_ISREG(info.st_mode)) return KSI_STATUS_INVALID_METADATA;
  const int fd = open(fileName, O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (fd < 0) return StatusOfErrno(errno);
  Header header = {};
  const ssize_t length = pread(fd, header.data(), header.size(), 0);
  const Status status = length < 0 ? StatusOfErrno(errno)
                                   : CheckHeader(header, static_cast<size_t>(length),
                                                 static_cast<uint64_t>(info.st_size));
  close(fd);
  return status;
}

// The file as a URI that tells SQLite that nobody writes to it.
std::string UriOf(std::string_view fileName) {
  std::string uri = fileName.starts_with('/') ? "file://" : "file:";
  for (const char c : fileName) {
    constexpr char kDigits[] = "0123456789abcdef";
    const bool plain = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
                       c == '/' || c == '.' || c == '-' || c == '_';
    if (plain) {
      uri += c;
    } else {
      const auto byte = static_cast<unsigned char>(c);
      uri += '%';
      uri += kDigits[byte >> 4];
      uri += kDigits[byte & 15];
    }
  }
  return uri + "?immutable=1";
}

// Text of a column as the writer puts it: of bounded length and without a NUL.
bool TakeText(const Statement& row, int column, std::string* text) {
  if (row.Type(column) != SQLITE_TEXT) return false;
  *text = row.Text(column);
  return text->size() <= cache::kLongestText && text->find('\0') == text->npos;
}

bool IsPrintable(std::string_view text) {
  return std::ranges::all_of(text, [](char c) { return c >= ' ' && c <= '~'; });
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

Status CacheFile::Open(const char* fileName, std::unique_ptr<CacheFile>* out) {
  Status status = CheckFile(fileName);
  if (status != kOk) return status;

  std::unique_ptr<CacheFile> file(new CacheFile);
  sqlite3* handle = nullptr;
  const int code =
      sqlite3_open_v2(UriOf(fileName).c_str(), &handle,
                      SQLITE_OPEN_READONLY | SQLITE_OPEN_URI | SQLITE_OPEN_NOMUTEX, nullptr);
  file->database_.reset(handle);
  if (code != SQLITE_OK) return StatusOfSqlite(code);

  status = file->Configure();
  if (status == kOk) status = file->CheckSchema();
  if (status == kOk) status = file->ReadCapture();
  if (status == kOk) status = file->ReadNodes();
  if (status != kOk) return status;
  sqlite3_progress_handler(handle, 0, nullptr, nullptr);
  *out = std::move(file);
  return kOk;
}

Status CacheFile::Configure() {
  sqlite3* database = database_.get();
  sqlite3_limit(database, SQLITE_LIMIT_LENGTH, 4 * static_cast<int>(cache::kLongestText));
  sqlite3_limit(database, SQLITE_LIMIT_ATTACHED, 0);
  sqlite3_db_config(database, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(database, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  sqlite3_progress_handler(
      database, kMostOpeningSteps, [](void*) { return 1; }, nullptr);
  return StatusOfSqlite(
      sqlite3_exec(database, "PRAGMA cell_size_check=ON", nullptr, nullptr, nullptr));
}

Status CacheFile::CheckSchema() {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT type, name, sql FROM sqlite_schema");
  if (code != SQLITE_OK) return StatusOfSqlite(code);
  for (const cache::Table& table : cache::kTables) {
    code = rows.Step();
    if (code != SQLITE_ROW && code != SQLITE_DONE) return StatusOfSqlite(code);
    if (code == SQLITE_DONE || rows.Text(0) != "table" || rows.Text(1) != table.name ||
        rows.Text(2) != table.sql) {
      return KSI_STATUS_METADATA_READ_ERROR;
    }
  }
  code = rows.Step();
  return code == SQLITE_ROW ? KSI_STATUS_METADATA_READ_ERROR : StatusOfSqlite(code);
}

Status CacheFile::ReadCapture() {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT signature, built, host, taken FROM capture");
  if (code == SQLITE_OK) code = rows.Step();
  if (code != SQLITE_ROW) {
    return code == SQLITE_DONE ? KSI_STATUS_METADATA_READ_ERROR : StatusOfSqlite(code);
  }
  // The dates and the signature go into diagnostics as they are.
  const bool good = TakeText(rows, 0, &capture_.signature) && TakeText(rows, 1, &capture_.built) &&
                    TakeText(rows, 2, &capture_.host) && TakeText(rows, 3, &capture_.taken) &&
                    IsPrintable(capture_.signature) && IsPrintable(capture_.built) &&
                    IsPrintable(capture_.taken);
  return good ? kOk : KSI_STATUS_METADATA_READ_ERROR;
}

Status CacheFile::ReadNodes() {
  Statement rows;
  int code = rows.Prepare(database_.get(), "SELECT id, path, kind FROM node ORDER BY id");
  if (code != SQLITE_OK) return StatusOfSqlite(code);
  while ((code = rows.Step()) == SQLITE_ROW) {
    NodeRow row{rows.Number(0), nullptr, Kind::kValue, {}};
    const bool list = rows.Text(2) == cache::kList;
    if (!TakeText(rows, 1, &row.path) || (!list && rows.Text(2) != cache::kValue) ||
        (!nodes_.empty() && nodes_.back().id >= row.id) || nodes_.size() == kMostNodeRows) {
      return KSI_STATUS_METADATA_READ_ERROR;
    }
    row.kind = list ? Kind::kList : Kind::kValue;
    const Node* node = FindNode(row.path);
    if (node != nullptr && (list ? node->HasList() : node->HasValue())) row.node = node;
    nodes_.push_back(std::move(row));
  }
  return StatusOfSqlite(code);
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
