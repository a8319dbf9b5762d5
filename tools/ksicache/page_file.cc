#include "tools/ksicache/page_file.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <limits>
#include <new>
#include <utility>
#include <vector>

#include "knvlibs/cache_format.h"
#include "knvlibs/sqlite_file.h"

namespace ksicache {
namespace {

// Numbers in pages: that of the pages in the header of a database, and those of pages that pages of
// a table lead to.
constexpr size_t kCountAt = 28;
constexpr size_t kLastChildAt = 8;

// The header of a database.
constexpr size_t kHeaderSize = 100;

uint32_t NumberAt(const std::string& page, size_t at) {
  uint32_t number = 0;
  for (size_t i = 0; i < 4 && at + 4 <= page.size(); ++i) {
    number = number << 8 | static_cast<unsigned char>(page[at + i]);
  }
  return number;
}

void PutNumber(uint32_t number, size_t at, std::string& page) {
  for (size_t i = 4; i-- > 0; number >>= 8) page[at + i] = static_cast<char>(number);
}

int64_t OffsetOf(uint32_t page) {
  return (int64_t{page} - 1) * static_cast<int64_t>(ksi::cache::kPageSize);
}

// Where the pages end that the header of a database counts.
int64_t EndIn(const std::string& header) { return OffsetOf(NumberAt(header, kCountAt) + 1); }

// Whether it is a page of a table that leads to others; the first one never is.
bool IsInner(const std::pair<const int64_t, std::string>& entry) {
  constexpr char kInner = 5;
  const auto& [offset, page] = entry;
  return offset != 0 && page.size() == ksi::cache::kPageSize && page[0] == kInner;
}

// Where in such a page the numbers stand of those that it leads to.
std::vector<size_t> ChildrenIn(const std::string& page) {
  constexpr size_t kCellsAt = 3;
  constexpr size_t kFirstCellAt = 12;
  std::vector<size_t> places = {kLastChildAt};
  const size_t cells = NumberAt(page, kCellsAt) >> 16;
  for (size_t i = 0; i < cells; ++i) places.push_back(NumberAt(page, kFirstCellAt + 2 * i) >> 16);
  return places;
}

bool WriteAll(int descriptor, const std::string& bytes, int64_t offset) {
  for (size_t done = 0; done < bytes.size();) {
    const ssize_t size = pwrite(descriptor, bytes.data() + done, bytes.size() - done,
                                offset + static_cast<int64_t>(done));
    if (size < 0 && errno == EINTR) continue;
    if (size <= 0) {
      if (size == 0) errno = ENOSPC;
      return false;
    }
    done += static_cast<size_t>(size);
  }
  return true;
}

int NoCharacteristics(sqlite3_file* /*file*/) { return 0; }

int NoDelete(sqlite3_vfs* /*vfs*/, const char* /*name*/, int /*sync*/) { return SQLITE_OK; }
int NoAccess(sqlite3_vfs* /*vfs*/, const char* /*name*/, int /*flags*/, int* found) {
  *found = 0;
  return SQLITE_OK;
}
}  // namespace

// An open file as SQLite knows it.
struct PageFile::Handle {
  sqlite3_file base;
  PageFile* file;
};

PageFile& PageFile::Of(sqlite3_file* file) { return *reinterpret_cast<Handle*>(file)->file; }

PageFile::PageFile(int descriptor) : descriptor_(descriptor), vfs_() {}

int PageFile::Open(ksi::Database* database) {
  const int code = sqlite3_initialize();
  if (code != SQLITE_OK) return code;
  pages_.clear();
  start_ = StartOnDisk();
  end_ = EndIn(start_);
  vfs_ = ksi::sqlite_file::MakeVfs("ksi-recording", static_cast<int>(sizeof(Handle)), OpenFile);
  vfs_.pAppData = this;
  vfs_.xDelete = NoDelete;
  vfs_.xAccess = NoAccess;
  return ksi::sqlite_file::OpenDatabase(vfs_, "recording", SQLITE_OPEN_READWRITE, database);
}

int PageFile::OpenFile(sqlite3_vfs* vfs, const char* name, sqlite3_file* file, int flags,
                       int* outFlags) {
  if ((flags & SQLITE_OPEN_MAIN_DB) == 0) {
    return ksi::sqlite_file::OpenOther(name, file, flags, outFlags);
  }
  static constexpr sqlite3_io_methods kMethods = ksi::sqlite_file::MethodsOf(
      {.read = Read, .write = Write, .size = FileSize, .characteristics = NoCharacteristics});
  auto& handle = *reinterpret_cast<Handle*>(file);
  handle.file = static_cast<PageFile*>(vfs->pAppData);
  handle.base.pMethods = &kMethods;
  if (outFlags != nullptr) *outFlags = flags;
  return SQLITE_OK;
}

int PageFile::Read(sqlite3_file* file, void* buffer, int amount, sqlite3_int64 offset) {
  const PageFile& self = Of(file);
  auto* bytes = static_cast<char*>(buffer);
  const auto wanted = static_cast<size_t>(amount);
  // SQLite reads a page, or a part of one.
  auto page = self.pages_.upper_bound(offset);
  if (page != self.pages_.begin()) {
    --page;
    const auto at = static_cast<size_t>(offset - page->first);
    if (at + wanted <= page->second.size()) {
      std::memcpy(bytes, page->second.data() + at, wanted);
      return SQLITE_OK;
    }
  }
  int got = 0;
  const int code = ksi::sqlite_file::ReadAt(self.descriptor_, buffer, amount, offset, &got);
  if (code != SQLITE_OK || got == amount) return code;
  std::memset(bytes + got, 0, wanted - static_cast<size_t>(got));
  return SQLITE_IOERR_SHORT_READ;
}

int PageFile::Write(sqlite3_file* file, const void* buffer, int amount, sqlite3_int64 offset) {
  try {
    Of(file).pages_[offset].assign(static_cast<const char*>(buffer), static_cast<size_t>(amount));
    return SQLITE_OK;
  } catch (const std::bad_alloc&) {
    return SQLITE_IOERR_NOMEM;
  }
}

int PageFile::FileSize(sqlite3_file* file, sqlite3_int64* size) {
  const PageFile& self = Of(file);
  *size = self.SizeOnDisk();
  if (!self.pages_.empty()) {
    const auto& [offset, bytes] = *self.pages_.rbegin();
    *size = std::max<sqlite3_int64>(*size, offset + static_cast<int64_t>(bytes.size()));
  }
  return SQLITE_OK;
}

int64_t PageFile::SizeOnDisk() const {
  struct stat info = {};
  return fstat(descriptor_, &info) == 0 ? info.st_size : 0;
}

bool PageFile::WritePages(int64_t from, int64_t to) const {
  const auto end = pages_.lower_bound(to);
  return std::all_of(pages_.lower_bound(from), end, [this](const auto& page) {
    return WriteAll(descriptor_, page.second, page.first);
  });
}

void PageFile::MoveInner() {
  std::map<uint32_t, uint32_t> moved;
  std::vector<std::string*> inner;
  for (auto& entry : pages_) {
    if (IsInner(entry)) inner.push_back(&entry.second);
  }
  const auto header = pages_.find(0);
  if (header == pages_.end()) return;
  uint32_t count = NumberAt(header->second, kCountAt);
  for (std::string* page : inner) {
    for (const size_t place : ChildrenIn(*page)) {
      const uint32_t child = NumberAt(*page, place);
      const auto changed = pages_.find(OffsetOf(child));
      if (changed == pages_.end() || changed->first >= end_ || !IsInner(*changed)) continue;
      moved[child] = ++count;
      PutNumber(count, place, *page);
    }
  }
  for (const auto& [from, to] : moved) {
    auto page = pages_.extract(OffsetOf(from));
    page.key() = OffsetOf(to);
    pages_.insert(std::move(page));
  }
  PutNumber(count, kCountAt, header->second);
  hasMoved_ = !moved.empty();
}

bool PageFile::Flush() {
  const bool grows = !pages_.empty() && pages_.rbegin()->first >= end_;
  if (grows) MoveInner();
  const auto header = pages_.find(0);
  const int64_t end = header == pages_.end() ? end_ : EndIn(header->second);
  // What leads to new pages, or counts them, must not be on the disk before them.
  const bool isWritten = (!grows || (WritePages(end_, std::numeric_limits<int64_t>::max()) &&
                                     Sync() && WritePages(0, 1) && Sync())) &&
                         WritePages(grows ? 1 : 0, end_);
  if (isWritten && header != pages_.end()) {
    end_ = end;
    start_.replace(0, kHeaderSize, header->second, 0, kHeaderSize);
  }
  pages_.clear();
  return isWritten;
}

// The header and the second page; shorter in a file that is.
std::string PageFile::StartOnDisk() const {
  constexpr auto kSize = static_cast<size_t>(ksi::cache::kPageSize);
  std::string start(2 * kSize, '\0');
  const ssize_t size = pread(descriptor_, start.data(), start.size(), 0);
  start.resize(static_cast<size_t>(std::max<ssize_t>(size, 0)));
  // The schema stands in the rest of the first page.
  start.erase(std::min(kHeaderSize, start.size()), kSize - kHeaderSize);
  return start;
}

bool PageFile::IsWhole() const { return SizeOnDisk() >= end_ && StartOnDisk() == start_; }

bool PageFile::Sync() const { return fdatasync(descriptor_) == 0; }

}  // namespace ksicache
