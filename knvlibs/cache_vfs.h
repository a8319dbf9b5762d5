// How SQLite reads a cache file: through the descriptor that was looked at, and no other way.
//
// SQLite by itself opens a file by its name, which somebody may have given to something else since;
// it looks for journals, takes locks, and may map the file, so that a file cut short is a signal.
// Here it only reads. What was written since the file was opened, and what is no longer there, is
// damage; but in a file that grows, which tells itself what of it is good.
#ifndef KNVLIBS_CACHE_VFS_H_
#define KNVLIBS_CACHE_VFS_H_

#include <cstddef>
#include <span>

#include "knvlibs/sqlite.h"

namespace ksi {

// Opens the regular file `descriptor`, which must stay open as long as the database. Gives SQLite's
// result code; `database` is to be asked for its message also on failure.
int OpenDescriptor(int descriptor, bool grows, Database* database);

// The same of the bytes of a file, which must live as long.
int OpenContent(std::span<const std::byte> content, Database* database);

}  // namespace ksi

#endif  // KNVLIBS_CACHE_VFS_H_
