// An open cache file, of which nothing is trusted.
#ifndef KNVLIBS_CACHE_FILE_H_
#define KNVLIBS_CACHE_FILE_H_

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/sqlite.h"
#include "knvlibs/status.h"
#include "knvlibs/work_limit.h"

namespace ksi {

enum class Kind : uint8_t { kValue, kList };

class CacheFile {
 public:
  // What the file says of itself.
  struct Capture {
    std::string signature;  // of the kernel's definitions
    std::string built;      // when they were built
    std::string host;
    std::string taken;  // "2026-11-21T10:00:00Z"
  };

  // A row of the table of nodes; `node` is null for one that the catalogue does not know.
  struct NodeRow {
    int64_t id;
    const Node* node;
    Kind kind;
    std::string path;
  };

  // Opens a file. Its cost does not depend on the file's size. The status is
  //   KSI_STATUS_NOT_FOUND, KSI_STATUS_PERMISSION_DENIED, KSI_STATUS_IS_A_DIRECTORY,
  //   KSI_STATUS_INVALID_METADATA: not a cache file,
  //   KSI_STATUS_MAJOR_VERSION_MISMATCH: of a newer schema,
  //   KSI_STATUS_METADATA_READ_ERROR: damaged, or somebody is in the middle of changing it.
  // `why`, if not null, receives what is wrong with a damaged file.
  [[nodiscard]] static Status Open(const char* fileName, std::unique_ptr<CacheFile>* file,
                                   std::string* why = nullptr);

  const Capture& GetCapture() const { return capture_; }
  const std::vector<NodeRow>& NodeRows() const { return nodes_; }

  // The file's row for a node, null if it has none.
  const NodeRow* FindRow(const Node& node, Kind kind) const;
  const NodeRow* FindRow(int64_t id) const;

  sqlite3* Handle() const { return database_.get(); }

  // Statements on Handle() end with SQLITE_INTERRUPT when, all together since the file was opened
  // or since this was called, they did more than a file of this size is worth. Fails with
  // KSI_STATUS_METADATA_READ_ERROR when that has shown that nothing should be read of it any more.
  [[nodiscard]] Status BeginRead() {
    return limit_.BeginAgain() ? kOk : Status{KSI_STATUS_METADATA_READ_ERROR};
  }

  // Why the latest statement failed, for people.
  const char* ErrorText() const;

  uint64_t Size() const { return size_; }

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

  CacheFile() = default;

  [[nodiscard]] Status Connect();
  [[nodiscard]] Status CheckHead();
  [[nodiscard]] Status CheckChanges(const char* fileName);
  [[nodiscard]] Status Configure();
  [[nodiscard]] Status CheckSchema();
  [[nodiscard]] Status ReadCapture();
  [[nodiscard]] Status ReadNodes();
  [[nodiscard]] Status Failed(int code);
  [[nodiscard]] Status Damaged(const char* why);

  // Before the database, which uses them.
  Descriptor descriptor_;
  WorkLimit limit_;
  Database database_;
  uint64_t size_ = 0;
  std::string why_;
  Capture capture_;
  std::vector<NodeRow> nodes_;  // in the order of their identifiers
};

// The member of a capture that is not as it has to be, null if all are: a signature has 32
// hexadecimal digits, dates have their 20 characters, and no text a NUL or more than kLongestText.
const char* BadMember(const CacheFile::Capture& capture);

// Whether it is a date and time that there is, such as "2026-11-21T10:00:00Z".
bool IsTime(const std::string& text);

// The status for a failed call of SQLite on a cache file.
[[nodiscard]] Status StatusOfSqlite(int code);

}  // namespace ksi

#endif  // KNVLIBS_CACHE_FILE_H_
