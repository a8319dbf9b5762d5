// How SQLite writes a file that others read and copy meanwhile, and that may end at any time.
//
// What SQLite writes is kept in memory until Flush, which writes first the pages by which the file
// grows, of which nobody knows yet, then the header that counts them, and then the others from the
// front. With a database that only grows at the end of its tables, and whose rows keep their size,
// it is whole after each of these writes, without a journal and without locks.
//
// But for one case: as a table grows, SQLite spreads what leads to its rows evenly over the pages
// that do so, and what it moves from one to the other is for a while in neither. Those pages are
// then written as new ones, and the one above, by a single write, leads to them. The old ones are
// of no use any more: two for each 17 MB.
#ifndef TOOLS_KSICACHE_PAGE_FILE_H_
#define TOOLS_KSICACHE_PAGE_FILE_H_

#include <cstdint>
#include <map>
#include <string>

#include "knvlibs/sqlite.h"

namespace ksicache {

class PageFile {
 public:
  // The descriptor must stay open as long.
  explicit PageFile(int descriptor);
  PageFile(const PageFile&) = delete;
  PageFile& operator=(const PageFile&) = delete;

  // Opens it as a database, which must not outlive this. Gives SQLite's result code.
  int Open(ksi::Database* database);

  // Writes what SQLite has written. What cannot be written, errno says why, is forgotten: the
  // database is to be opened anew.
  [[nodiscard]] bool Flush();

  // Whether pages stand elsewhere than where SQLite wrote them: it has to be opened anew.
  bool HasMoved() const { return hasMoved_; }

  // Whether the file is still as long as it was left, and begins as it did: its header, which
  // SQLite changes whenever it writes, and the page of the table that is made with the file alone.
  [[nodiscard]] bool IsWhole() const;

  // Brings what has been flushed to the disk; false, errno says why.
  [[nodiscard]] bool Sync() const;

 private:
  struct Handle;

  static PageFile& Of(sqlite3_file* file);
  static int OpenFile(sqlite3_vfs* vfs, const char* name, sqlite3_file* file, int flags,
                      int* outFlags);
  static int Read(sqlite3_file* file, void* buffer, int amount, sqlite3_int64 offset);
  static int Write(sqlite3_file* file, const void* buffer, int amount, sqlite3_int64 offset);
  static int FileSize(sqlite3_file* file, sqlite3_int64* size);

  void MoveInner();
  [[nodiscard]] bool WritePages(int64_t from, int64_t to) const;
  int64_t SizeOnDisk() const;
  std::string StartOnDisk() const;

  int descriptor_;
  sqlite3_vfs vfs_;
  bool hasMoved_ = false;
  int64_t end_ = 0;                       // of the pages that the header on the disk knows
  std::string start_;                     // what the file begins with, as far as IsWhole looks
  std::map<int64_t, std::string> pages_;  // not yet written, by offset
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_FILE_H_
