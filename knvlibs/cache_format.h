// The layout of KSI cache files: captures and recordings. ksi-cache(5) describes it.
#ifndef KNVLIBS_CACHE_FORMAT_H_
#define KNVLIBS_CACHE_FORMAT_H_

#include <cstddef>
#include <cstdint>
#include <string_view>

#include <knvlibs/ksi.h>

namespace ksi::cache {

// Header fields of the SQLite file.
constexpr uint32_t kApplicationId = 0x4b534963;  // "KSIc"
constexpr uint32_t kSchemaVersion = 1;           // of a capture
constexpr uint32_t kRecordingVersion = 2;

struct Table {
  std::string_view name;
  std::string_view sql;
};

// The tables of a capture, in the order in which they are made. It has these and nothing else.
constexpr Table kTables[] = {
    {"capture",
     "CREATE TABLE capture(signature TEXT NOT NULL, built TEXT NOT NULL, host TEXT NOT NULL, "
     "taken TEXT NOT NULL)"},
    {"node", "CREATE TABLE node(id INTEGER PRIMARY KEY, path TEXT NOT NULL, kind TEXT NOT NULL)"},
    {"reading",
     "CREATE TABLE reading(key1 NOT NULL, key2 NOT NULL, node INTEGER NOT NULL, "
     "status INTEGER NOT NULL, answer, PRIMARY KEY(key1, key2, node)) WITHOUT ROWID"},
    {"instance",
     "CREATE TABLE instance(key1 NOT NULL, key2 NOT NULL, node INTEGER NOT NULL, "
     "position INTEGER NOT NULL, entry NOT NULL, "
     "PRIMARY KEY(key1, key2, node, position)) WITHOUT ROWID"},
};

// The tables of a recording, likewise. All their rows have been there since the file was made or
// grew, at the largest that they can be: what changes later is their content, never the structure
// of the database. So whoever reads or copies the file meanwhile finds a whole one.
constexpr Table kRecordingTables[] = {
    {"recording", "CREATE TABLE recording(host TEXT NOT NULL, made TEXT NOT NULL)"},
    {"part",
     "CREATE TABLE part(id INTEGER PRIMARY KEY, moments INTEGER NOT NULL, number INTEGER NOT NULL, "
     "chunk INTEGER NOT NULL, first INTEGER NOT NULL, last INTEGER NOT NULL, size INTEGER NOT "
     "NULL, "
     "block INTEGER NOT NULL)"},
    {"block", "CREATE TABLE block(id INTEGER PRIMARY KEY, data BLOB NOT NULL)"},
};

// The bytes of block.data: the number of the next block of the part, 4 bytes, little-endian, 0 in
// the last one; then a piece of the part. With them rows of the table fill their pages.
constexpr size_t kPageSize = 4096;
constexpr size_t kBlockSize = 4572;
constexpr size_t kBlockHead = 4;

// How many blocks hold so many bytes of a part.
constexpr size_t BlocksOf(size_t bytes) {
  constexpr size_t kPiece = kBlockSize - kBlockHead;
  return (bytes + kPiece - 1) / kPiece;
}

// node.kind
constexpr std::string_view kValue = "value";
constexpr std::string_view kList = "list";

// The characters of a signature, and of the dates.
constexpr size_t kSignatureSize = 32;
constexpr size_t kDateSize = KSI_BUILD_DATE_SIZE - 1;

// The longest key, entry or other text.
constexpr size_t kLongestText = 4096;

}  // namespace ksi::cache

#endif  // KNVLIBS_CACHE_FORMAT_H_
