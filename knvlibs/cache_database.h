// The SQLite database that a file of this library is, of which nothing is trusted.
#ifndef KNVLIBS_CACHE_DATABASE_H_
#define KNVLIBS_CACHE_DATABASE_H_

#include <cstdint>
#include <memory>
#include <span>
#include <string>

#include "knvlibs/cache_format.h"
#include "knvlibs/sqlite.h"
#include "knvlibs/status.h"
#include "knvlibs/work_limit.h"

namespace ksi {

class CacheDatabase {
 public:
  CacheDatabase() = default;
  CacheDatabase(const CacheDatabase&) = delete;
  CacheDatabase& operator=(const CacheDatabase&) = delete;

  // Opens a file. Its cost does not depend on the file's size. The status is
  //   KSI_STATUS_NOT_FOUND, KSI_STATUS_PERMISSION_DENIED, KSI_STATUS_IS_A_DIRECTORY,
  //   KSI_STATUS_INVALID_METADATA: not of this library,
  //   KSI_STATUS_MAJOR_VERSION_MISMATCH: of a newer schema,
  //   KSI_STATUS_METADATA_READ_ERROR: damaged, or somebody is in the middle of changing it.
  [[nodiscard]] Status Open(const char* fileName);

  // The version that a file says its schema is of; 0 if it is none of this library.
  static uint32_t VersionOf(const char* fileName);

  // The same as Open, of the bytes of a file, which must live as long.
  [[nodiscard]] Status OpenBytes(std::span<const std::byte> content);

  // The version of its schema.
  uint32_t Version() const { return version_; }
  uint64_t Size() const { return size_; }
  // Whether SQLite is told to write changes of it into another file first.
  bool IsWrittenAhead() const { return isWrittenAhead_; }
  sqlite3* Handle() const { return database_.get(); }

  // Fails with KSI_STATUS_METADATA_READ_ERROR if the file has other tables than these.
  [[nodiscard]] Status CheckSchema(std::span<const cache::Table> tables);

  // From now on statements may take what a file of this size is worth; before, as much as opening
  // it takes.
  void AllowReads() { limit_.Allow(WorkLimit::StepsFor(size_)); }

  // Statements end with SQLITE_INTERRUPT when, all together since AllowReads or since this was
  // called, they did more than that. Fails with KSI_STATUS_METADATA_READ_ERROR when that has shown
  // that nothing should be read of the file any more.
  [[nodiscard]] Status BeginRead() {
    return limit_.BeginAgain() ? kOk : Status{KSI_STATUS_METADATA_READ_ERROR};
  }

  // Why the latest statement failed, for people.
  const char* ErrorText() const;

  // The status of a failed call of SQLite, and of what is damaged; Why tells the reason.
  [[nodiscard]] Status Failed(int code);
  [[nodiscard]] Status Damaged(std::string why);
  const std::string& Why() const { return why_; }

 private:
  class Descriptor {
   public:
    Descriptor() = default;
    ~Descriptor();
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;

    // The regular file of this name, without waiting for anybody.
    [[nodiscard]] Status Open(const char* fileName);
    int Number() const { return number_; }

   private:
    int number_ = -1;
  };

  [[nodiscard]] Status CheckHead();
  [[nodiscard]] Status CheckChanges(const char* fileName);
  [[nodiscard]] Status Configure();

  // Before the database, which uses them.
  Descriptor descriptor_;
  WorkLimit limit_;
  Database database_;
  uint32_t version_ = 0;
  uint64_t size_ = 0;
  bool isWrittenAhead_ = false;
  std::string why_;
};

// The status for a failed call of SQLite on such a file.
[[nodiscard]] Status StatusOfSqlite(int code);

}  // namespace ksi

#endif  // KNVLIBS_CACHE_DATABASE_H_
