#include "tools/ksicache/recording_store.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>
#include <unordered_set>
#include <utility>

#include "knvlibs/cache_format.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/recording_lock.h"
#include "tools/ksicache/recording_structure.h"

namespace ksicache {
namespace {

using ksi::cache::kBlockHead;
using ksi::cache::kBlockSize;

constexpr size_t kPieceSize = kBlockSize - kBlockHead;

// By so many rows the table of parts grows; the first are for three days.
constexpr size_t kFirstParts = 1280;
constexpr size_t kMoreParts = 256;

// A block with what leads to it, in the file.
constexpr int64_t kBlockOnDisk = 4700;

// A free row of parts, with numbers as large as they come.
constexpr const char* kAddPart =
    "INSERT INTO part VALUES(NULL, 0, 140737488355327, 140737488355327, 9223372036854775807, "
    "9223372036854775807, 140737488355327, 140737488355327)";
const std::string kAddBlock =
    "INSERT INTO block VALUES(NULL, zeroblob(" + std::to_string(kBlockSize) + "))";
constexpr const char* kSetPart =
    "UPDATE part SET moments = ?2, number = ?3, chunk = ?4, first = ?5, last = ?6, size = ?7, "
    "block = ?8 WHERE id = ?1";
constexpr const char* kFreePart = "UPDATE part SET moments = 0 WHERE id = ?1";

struct CloseBlob {
  void operator()(sqlite3_blob* blob) const { sqlite3_blob_close(blob); }
};

[[nodiscard]] bool AddRows(sqlite3* database, const std::string& sql, size_t count) {
  ksi::Statement insert;
  int code = insert.Prepare(database, sql.c_str());
  for (size_t i = 0; i < count && (code == SQLITE_OK || code == SQLITE_DONE); ++i) {
    code = insert.Step();
    insert.Reset();
  }
  return code == SQLITE_DONE;
}

void RunInMemory(sqlite3* database, const std::string& sql) {
  // A database in memory fails for want of it.
  if (sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) {
    throw std::bad_alloc();
  }
}

}  // namespace

ksi::Bytes RecordingStore::Empty(const std::string& host, size_t blocks) {
  sqlite3* handle = nullptr;
  const int code =
      sqlite3_open_v2("recording", &handle, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE, "memdb");
  const ksi::Database database(handle);
  if (code != SQLITE_OK) throw std::bad_alloc();
  RunInMemory(handle, "PRAGMA page_size=" + std::to_string(ksi::cache::kPageSize));
  RunInMemory(handle, "PRAGMA application_id=" + std::to_string(ksi::cache::kApplicationId));
  RunInMemory(handle, "PRAGMA user_version=" + std::to_string(ksi::cache::kRecordingVersion));
  RunInMemory(handle, "BEGIN");
  for (const ksi::cache::Table& table : ksi::cache::kRecordingTables) {
    RunInMemory(handle, std::string(table.sql));
    // Before there is a page for blocks: who copies the file from its front has then each row
    // before what leads to its blocks.
    if (table.name == "part" && !AddRows(handle, kAddPart, kFirstParts)) throw std::bad_alloc();
  }
  ksi::Statement insert;
  if (insert.Prepare(handle, "INSERT INTO recording VALUES(?1, strftime('%Y-%m-%dT%H:%M:%SZ'))") !=
          SQLITE_OK ||
      insert.Bind(1, std::string_view(host)) != SQLITE_OK || insert.Step() != SQLITE_DONE) {
    throw std::bad_alloc();
  }
  insert = {};
  if (!AddRows(handle, kAddBlock, blocks)) throw std::bad_alloc();
  RunInMemory(handle, "COMMIT");
  sqlite3_int64 size = 0;
  const auto* content = reinterpret_cast<const std::byte*>(
      sqlite3_serialize(handle, "main", &size, SQLITE_SERIALIZE_NOCOPY));
  if (content == nullptr) throw std::bad_alloc();
  return {content, content + size};
}

RecordingStore::RecordingStore(const std::string& fileName, int64_t maxSize)
    : RecordingStore(
          fileName, open(fileName.c_str(), O_RDWR | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY),
          maxSize) {}

RecordingStore::RecordingStore(std::string name, int file, int64_t maxSize)
    : name_(std::move(name)), maxSize_(maxSize), file_(file) {
  // Whoever may put a link where a recorder writes would choose the file.
  if (!file_ && errno == ELOOP) throw Error(name_ + ": is a symbolic link: record to its target");
  if (!file_) throw SystemError(name_, errno);
  struct stat info = {};
  if (fstat(file_.Get(), &info) != 0) throw SystemError(name_, errno);
  if (!S_ISREG(info.st_mode)) throw Error(name_ + ": is not a regular file");
  Lock();
  TakeStock();
}

void RecordingStore::Lock() {
  if (LockRecording(file_.Get())) return TellWhose();
  if (errno != EAGAIN && errno != EACCES) throw SystemError(name_, errno);
  throw Error(name_ + ": is being recorded by " + RecorderOf(file_.Get()));
}

void RecordingStore::TellWhose() { TellRecorder(file_.Get()); }

std::unique_ptr<ksi::RecordingFile> RecordingStore::Read() const try {
  return OpenRecording("/proc/self/fd/" + std::to_string(file_.Get()));
} catch (const DataError& error) {
  throw DataError(name_ + ": " + error.what());
}

// What there is in the file, and what is free in it.
void RecordingStore::TakeStock() {
  std::unique_ptr<ksi::RecordingFile> recording = Read();
  if (recording->IsWrittenAhead()) throw DataError(name_ + ": " + kIsWrittenAhead);
  parts_ = recording->Parts();
  replaced_.clear();
  blocksOf_.clear();
  std::unordered_set<int64_t> chosen;
  for (const Part& part : parts_) chosen.insert(part.id);
  std::unordered_set<int64_t> used;
  for (const Part& row : recording->Rows()) {
    std::vector<int64_t>& blocks = blocksOf_[row.id];
    // Those of a damaged part that are found; the others nobody finds.
    static_cast<void>(recording->ReadBlocks(row, blocks));
    used.insert(blocks.begin(), blocks.end());
    mostTaken_ = std::max(mostTaken_, 2 * blocks.size());
    if (!chosen.contains(row.id)) replaced_.push_back(row);
  }
  recording.reset();
  TellWhose();
  Connect();
  rows_.clear();
  blocks_.clear();
  ksi::Statement rows;
  Require(rows.Prepare(database_.get(), "SELECT id FROM part WHERE moments = 0 ORDER BY id") ==
          SQLITE_OK);
  int code = SQLITE_OK;
  while ((code = rows.Step()) == SQLITE_ROW) rows_.push_back(rows.Number(0));
  Require(code == SQLITE_DONE &&
          rows.Prepare(database_.get(), "SELECT id FROM block ORDER BY id") == SQLITE_OK);
  while ((code = rows.Step()) == SQLITE_ROW) {
    if (!used.contains(rows.Number(0))) blocks_.push_back(rows.Number(0));
  }
  Require(code == SQLITE_DONE);
}

void RecordingStore::Connect() {
  database_.reset();
  pages_ = std::make_unique<PageFile>(file_.Get());
  Require(pages_->Open(&database_) == SQLITE_OK);
  // Nothing is written before a transaction ends, and nobody else writes.
  for (const char* sql :
       {"PRAGMA locking_mode=EXCLUSIVE", "PRAGMA journal_mode=OFF", "PRAGMA synchronous=OFF",
        "PRAGMA cache_spill=OFF", "PRAGMA cache_size=-4096"}) {
    Execute(sql);
  }
}

void RecordingStore::RequireThere() const {
  struct stat named = {};
  struct stat open = {};
  const bool isNamed = lstat(name_.c_str(), &named) == 0;
  // Where it may not be looked for it may be.
  if (!isNamed && errno != ENOENT && errno != ENOTDIR) return;
  if (!isNamed || fstat(file_.Get(), &open) != 0 || named.st_dev != open.st_dev ||
      named.st_ino != open.st_ino) {
    throw FileLost(name_ + ": was removed or replaced while it was recorded");
  }
  RequireWhole();
}

void RecordingStore::RequireWhole() const {
  if (database_ == nullptr || pages_->IsWhole()) return;
  throw FileLost(name_ + ": was truncated or written by others while it was recorded");
}

void RecordingStore::Ready() {
  RequireWhole();
  if (database_ != nullptr) return;
  try {
    TakeStock();
  } catch (const DataError& error) {
    throw FileLost(error.what());
  }
}

void RecordingStore::Execute(const char* sql) {
  Require(sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr) == SQLITE_OK);
}

void RecordingStore::Require(bool good) {
  if (good) return;
  const int code = database_ == nullptr ? SQLITE_NOMEM : sqlite3_errcode(database_.get());
  const std::string reason = database_ == nullptr ? "" : sqlite3_errmsg(database_.get());
  database_.reset();
  if ((code & 0xff) == SQLITE_NOMEM) throw std::bad_alloc();
  throw Error(name_ + ": cannot be written: " + reason);
}

void RecordingStore::Fail(int error) {
  database_.reset();
  throw SystemError(name_, error);
}

// Ends the transaction, and writes what it changed.
void RecordingStore::Flush() {
  Execute("COMMIT");
  if (!pages_->Flush()) Fail(errno);
  if (pages_->HasMoved()) Connect();
}

void RecordingStore::Sync() {
  if (fdatasync(file_.Get()) != 0) throw SystemError(name_, errno);
}

int64_t RecordingStore::Size() const {
  struct stat info = {};
  return fstat(file_.Get(), &info) == 0 ? info.st_size : 0;
}

void RecordingStore::Add(Part part, ksi::ByteView content) {
  Ready();
  Put(part, content, false);
}

void RecordingStore::Put(Part part, ksi::ByteView content, bool replaces) {
  part.size = static_cast<int64_t>(content.size());
  const size_t count = ksi::cache::BlocksOf(content.size());
  RequireRoom(count, part.chunk);
  if (part.number == part.chunk) taken_ = 0;  // of the one before nothing will be packed
  KeepSpare(count);
  const std::vector<int64_t> blocks = TakeBlocks(count, part.chunk);
  part.block = blocks.front();
  WriteBlocks(blocks, content);
  // Its row hides those of older parts, which are on the disk already.
  if (replaces) Sync();
  part.id = TakeRow();
  Execute("BEGIN");
  WriteRow(part);
  Flush();
  blocksOf_[part.id] = blocks;
  const auto place = std::ranges::upper_bound(parts_, part.number, {}, &Part::number);
  parts_.insert(place, part);
}

void RecordingStore::Replace(Part part, ksi::ByteView content) {
  Ready();
  Remove(std::exchange(replaced_, {}));
  Put(part, content, true);
  Sync();
  const auto isReplaced = [&part](const Part& each) {
    return each.number >= part.number && each.End() <= part.End() && each.moments < part.moments;
  };
  std::ranges::copy_if(parts_, std::back_inserter(replaced_), isReplaced);
  std::erase_if(parts_, isReplaced);
  taken_ = 0;
}

// What is free is used in the order in which it became so, and at the bound of the file's size
// there is always as much of it as is written until moments are packed: who copies the file may
// just read what was freed.
void RecordingStore::KeepSpare(size_t count) {
  taken_ += count;
  mostTaken_ = std::max(mostTaken_, taken_);
  const size_t wanted = count + mostTaken_;
  if (blocks_.size() + Room() >= wanted) return;
  Grow(Room());
  while (blocks_.size() < wanted && HasOldChunk()) RemoveFirstChunk();
}

void RecordingStore::RemoveBefore(int64_t chunk) {
  Ready();
  while (HasOldChunk() && parts_.front().chunk < chunk) RemoveFirstChunk();
}

bool RecordingStore::HasOldChunk() const {
  return !parts_.empty() && parts_.front().chunk != parts_.back().chunk;
}

void RecordingStore::RemoveFirstChunk() {
  std::vector<Part> removed;
  const int64_t chunk = parts_.front().chunk;
  CountGone(chunk);
  for (std::vector<Part>* list : {&parts_, &replaced_}) {
    const auto isOfIt = [chunk](const Part& each) { return each.chunk == chunk; };
    std::ranges::copy_if(*list, std::back_inserter(removed), isOfIt);
    std::erase_if(*list, isOfIt);
  }
  Remove(removed);
}

void RecordingStore::CountGone(int64_t chunk) {
  for (const Part& part : parts_) {
    if (part.chunk != chunk) break;
    gone_.first = gone_.moments == 0 ? part.first : std::min(gone_.first, part.first);
    gone_.last = gone_.moments == 0 ? part.last : std::max(gone_.last, part.last);
    gone_.moments += part.moments;
  }
}

void RecordingStore::Remove(const std::vector<Part>& parts) {
  if (parts.empty()) return;
  Execute("BEGIN");
  ksi::Statement update;
  Require(update.Prepare(database_.get(), kFreePart) == SQLITE_OK);
  for (const Part& part : parts) {
    Require(update.Bind(1, part.id) == SQLITE_OK && update.Step() == SQLITE_DONE);
    update.Reset();
  }
  update = {};
  Flush();
  // Else it might come back, after a loss of power, with other blocks.
  Sync();
  for (const Part& part : parts) {
    rows_.push_back(part.id);
    const std::vector<int64_t>& blocks = blocksOf_[part.id];
    blocks_.insert(blocks_.end(), blocks.begin(), blocks.end());
    blocksOf_.erase(part.id);
  }
}

// What does not fit whatever leaves is nothing to leave for.
void RecordingStore::RequireRoom(size_t count, int64_t chunk) const {
  size_t room = blocks_.size() + Room();
  for (const std::vector<Part>* list : {&parts_, &replaced_}) {
    for (const Part& each : *list) {
      if (room >= count) return;
      if (each.chunk != chunk) room += blocksOf_.at(each.id).size();
    }
  }
  if (room >= count) return;
  ThrowNoRoom();
}

void RecordingStore::ThrowNoRoom() const {
  throw NoRoom(name_ + ": there is no room for a moment in " + std::to_string(maxSize_) + " bytes");
}

size_t RecordingStore::Room() const {
  return static_cast<size_t>(std::max(maxSize_ - Size(), int64_t{0}) / kBlockOnDisk);
}

// The last room of a disk is for moments, not for what may come.
size_t RecordingStore::RoomOnDisk() const {
  struct statvfs info = {};
  if (fstatvfs(file_.Get(), &info) != 0) return 0;
  return info.f_bavail * info.f_frsize / kBlockOnDisk;
}

void RecordingStore::Grow(size_t count) {
  if (count == 0) return;
  Execute("BEGIN");
  Require(AddRows(database_.get(), kAddBlock, count));
  const int64_t last = sqlite3_last_insert_rowid(database_.get());
  Flush();
  for (auto id = last - static_cast<int64_t>(count) + 1; id <= last; ++id) blocks_.push_back(id);
}

void RecordingStore::Reserve(size_t count) {
  // What SQLite writes at once is held in memory.
  constexpr size_t kAtOnce = 1024;
  Ready();
  for (count = std::min(count, Room()); blocks_.size() < count;) {
    Grow(std::min(kAtOnce, count - blocks_.size()));
  }
}

std::vector<int64_t> RecordingStore::TakeBlocks(size_t count, int64_t chunk) {
  while (blocks_.size() < count) {
    const size_t wanting = count - blocks_.size();
    if (Room() >= wanting) {
      Grow(std::min(Room(), std::max(wanting, std::min(moreBlocks_, RoomOnDisk()))));
    } else if (!parts_.empty() && parts_.front().chunk != chunk) {
      RemoveFirstChunk();
    } else {
      ThrowNoRoom();
    }
  }
  const auto end = blocks_.begin() + static_cast<ptrdiff_t>(count);
  std::vector<int64_t> taken(blocks_.begin(), end);
  blocks_.erase(blocks_.begin(), end);
  return taken;
}

int64_t RecordingStore::TakeRow() {
  if (rows_.empty()) {
    Execute("BEGIN");
    Require(AddRows(database_.get(), kAddPart, kMoreParts));
    const int64_t last = sqlite3_last_insert_rowid(database_.get());
    Flush();
    for (auto id = last - static_cast<int64_t>(kMoreParts) + 1; id <= last; ++id) {
      rows_.push_back(id);
    }
  }
  const int64_t row = rows_.front();
  rows_.pop_front();
  return row;
}

void RecordingStore::WriteBlocks(const std::vector<int64_t>& blocks, ksi::ByteView content) {
  Execute("BEGIN");
  sqlite3_blob* handle = nullptr;
  const int code =
      sqlite3_blob_open(database_.get(), "main", "block", "data", blocks.front(), 1, &handle);
  std::unique_ptr<sqlite3_blob, CloseBlob> blob(handle);
  Require(code == SQLITE_OK);
  ksi::Bytes data;
  for (size_t i = 0; i < blocks.size(); ++i) {
    const ksi::ByteView piece =
        content.subspan(i * kPieceSize, std::min(kPieceSize, content.size() - i * kPieceSize));
    const auto next = static_cast<uint32_t>(i + 1 < blocks.size() ? blocks[i + 1] : 0);
    data.resize(kBlockHead);
    std::memcpy(data.data(), &next, kBlockHead);
    data.insert(data.end(), piece.begin(), piece.end());
    Require((i == 0 || sqlite3_blob_reopen(handle, blocks[i]) == SQLITE_OK) &&
            sqlite3_blob_write(handle, data.data(), static_cast<int>(data.size()), 0) == SQLITE_OK);
  }
  blob.reset();
  Flush();
}

void RecordingStore::WriteRow(const Part& part) {
  ksi::Statement update;
  Require(update.Prepare(database_.get(), kSetPart) == SQLITE_OK);
  int parameter = 0;
  for (const int64_t number : {part.id, part.moments, part.number, part.chunk, part.first,
                               part.last, part.size, part.block}) {
    Require(update.Bind(++parameter, number) == SQLITE_OK);
  }
  Require(update.Step() == SQLITE_DONE);
}

}  // namespace ksicache
