// A capture: an open cache file of one moment, of which nothing is trusted.
#ifndef KNVLIBS_CACHE_FILE_H_
#define KNVLIBS_CACHE_FILE_H_

#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/cache_database.h"
#include "knvlibs/catalogue.h"
#include "knvlibs/status.h"

namespace ksi {

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

  // Opens a file, or what has been opened. The statuses are those of CacheDatabase::Open. `why`, if
  // not null, receives what is wrong with a damaged file.
  [[nodiscard]] static Status Open(const char* fileName, std::unique_ptr<CacheFile>* file,
                                   std::string* why = nullptr);
  [[nodiscard]] static Status Make(std::unique_ptr<CacheDatabase> database,
                                   std::unique_ptr<CacheFile>* file, std::string* why = nullptr);

  const Capture& GetCapture() const { return capture_; }
  const std::vector<NodeRow>& NodeRows() const { return nodes_; }

  // The file's row for a node, null if it has none.
  const NodeRow* FindRow(const Node& node, Kind kind) const;
  const NodeRow* FindRow(int64_t id) const;

  // The limits of CacheDatabase hold.
  sqlite3* Handle() const { return database_->Handle(); }
  [[nodiscard]] Status BeginRead() { return database_->BeginRead(); }
  const char* ErrorText() const { return database_->ErrorText(); }
  uint64_t Size() const { return database_->Size(); }

 private:
  explicit CacheFile(std::unique_ptr<CacheDatabase> database) : database_(std::move(database)) {}

  [[nodiscard]] Status ReadCapture();
  [[nodiscard]] Status ReadNodes();

  std::unique_ptr<CacheDatabase> database_;
  Capture capture_;
  std::vector<NodeRow> nodes_;  // in the order of their identifiers
};

// The member of a capture that is not as it has to be, null if all are: a signature has 32
// hexadecimal digits, dates have their 20 characters, and no text a NUL or more than kLongestText.
const char* BadMember(const CacheFile::Capture& capture);

}  // namespace ksi

#endif  // KNVLIBS_CACHE_FILE_H_
