// What is wrong with a recording as a database (ksi-cache(5)), whatever its parts hold.
#ifndef TOOLS_KSICACHE_RECORDING_STRUCTURE_H_
#define TOOLS_KSICACHE_RECORDING_STRUCTURE_H_

#include <string>
#include <vector>

#include "knvlibs/recording/recording_file.h"

namespace ksicache {

// Of a file that nobody can go on with.
inline constexpr const char* kIsWrittenAhead =
    "is in SQLite's write-ahead (WAL) mode, which PRAGMA journal_mode=DELETE ends";

// In a line each, for people. Nothing of a file that is being recorded: who reads its tables as
// they grow sees the one half of what the recorder does. Fails with a DataError if it cannot be
// opened.
std::vector<std::string> WrongStructure(const std::string& fileName);

// The same of rows that have the same blocks for the same moments.
std::vector<std::string> WrongRows(const ksi::RecordingFile& recording);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_RECORDING_STRUCTURE_H_
