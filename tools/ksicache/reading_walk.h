// Goes through all that a cache file holds.
#ifndef TOOLS_KSICACHE_READING_WALK_H_
#define TOOLS_KSICACHE_READING_WALK_H_

#include <cstddef>
#include <functional>
#include <memory>
#include <span>
#include <string>

#include "knvlibs/cache_file.h"
#include "knvlibs/source.h"
#include "knvlibs/sqlite.h"

namespace ksicache {

// One row of the table of readings; views are good until the next one.
struct Reading {
  const ksi::CacheFile::NodeRow* row;  // null: the file does not define the node
  int64_t node;
  ksi::Keys keys;
  bool goodKeys;  // of the node's number and kinds
  int64_t status;
  int type;  // SQLite's, of the answer
  std::span<const std::byte> value;
  int64_t count;

  // "sched/groups/groupName [5]", for a message.
  std::string Name() const;
};

// Opens a cache file for looking into it; fails with an Error that says what is wrong.
std::unique_ptr<ksi::CacheFile> OpenCacheFile(const std::string& fileName);

// All readings, by keys and then by node. Fails with an Error on damage.
void ForEachReading(const ksi::CacheFile& file, const std::function<void(const Reading&)>& visit);

// The rows of one list: position (-1: not a number) and the statement, of which column 1 is the
// entry.
class InstanceWalk {
 public:
  explicit InstanceWalk(const ksi::CacheFile& file);

  void ForEach(const Reading& list,
               const std::function<void(int64_t position, const ksi::Statement&)>& visit);

 private:
  const ksi::CacheFile& file_;
  ksi::Statement rows_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_READING_WALK_H_
