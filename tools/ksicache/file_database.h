// A database file that is added to: all that is written gets into it, or nothing.
#ifndef TOOLS_KSICACHE_FILE_DATABASE_H_
#define TOOLS_KSICACHE_FILE_DATABASE_H_

#include <string>

#include "tools/ksicache/written_database.h"

namespace ksicache {

class FileDatabase : public WrittenDatabase {
 public:
  // A transaction has begun, which goes back unless it is committed. Others may read meanwhile; who
  // writes is waited for, but not for ever. What the file would have done by itself, with triggers
  // and with functions in its schema, is not done.
  explicit FileDatabase(std::string name);

  // REQUIRES: there are no statements.
  void Commit() { Execute("COMMIT"); }
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_FILE_DATABASE_H_
