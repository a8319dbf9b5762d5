// Goes through all that a cache file holds.
#ifndef TOOLS_KSICACHE_READING_WALK_H_
#define TOOLS_KSICACHE_READING_WALK_H_

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <vector>

#include "knvlibs/cache_file.h"
#include "knvlibs/source.h"
#include "knvlibs/sqlite.h"

namespace ksicache {

// One row of the table of readings; views are good until the next one.
struct Reading {
  const ksi::CacheFile::NodeRow* row;  // null: the file does not define the node
  int64_t node;
  ksi::Keys keys;
  bool goodKeys;  // of the node's number and kinds, and texts that can be asked for
  int64_t status;
  int type;  // SQLite's, of the answer
  std::span<const std::byte> value;
  int64_t count;

  // "sched/groups/groupName [5]", for a message.
  std::string Name() const;
};

// Fails with std::bad_alloc if that is why the latest statement on the file failed.
void RequireMemory(const ksi::CacheFile& file);

// Does something with each of some cache files. What is wrong with one is said, and the others have
// their turn. Gives the exit status: 0 if `visit` was content with all.
int ForEachFile(const std::vector<std::string>& fileNames,
                const std::function<bool(const std::string& fileName)>& visit);

// All readings, by keys and then by node. Fails with a DataError on damage.
void ForEachReading(const ksi::CacheFile& file, const std::function<void(const Reading&)>& visit);

// The rows of one list: position (-1: not a number) and the statement, of which column 1 is the
// entry.
class InstanceWalk {
 public:
  explicit InstanceWalk(const ksi::CacheFile& file);

  void ForEach(const Reading& list,
               const std::function<void(int64_t position, const ksi::Statement&)>& visit);

 private:
  void Require(int code) const;

  const ksi::CacheFile& file_;
  ksi::Statement rows_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_READING_WALK_H_
