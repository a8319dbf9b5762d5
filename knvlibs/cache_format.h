// The layout of a KSI cache file; ksi-cache(5) describes it.
#ifndef KNVLIBS_CACHE_FORMAT_H_
#define KNVLIBS_CACHE_FORMAT_H_

#include <cstddef>
#include <cstdint>
#include <string_view>

#include <knvlibs/ksi.h>

namespace ksi::cache {

// Header fields of the SQLite file.
constexpr uint32_t kApplicationId = 0x4b534963;  // "KSIc"
constexpr uint32_t kSchemaVersion = 1;

struct Table {
  std::string_view name;
  std::string_view sql;
};

// The tables, in the order in which they are made. A cache file has these and nothing else.
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

// node.kind
constexpr std::string_view kValue = "value";
constexpr std::string_view kList = "list";

// The characters of a signature, and of the dates.
constexpr size_t kSignatureSize = 32;
constexpr size_t kDateSize = KSI_BUILD_DATE_SIZE - 1;

// When a capture was taken, for strftime(3) of UTC.
constexpr const char* kTimeForm = "%Y-%m-%dT%H:%M:%SZ";

// The longest key, entry or other text.
constexpr size_t kLongestText = 4096;

}  // namespace ksi::cache

#endif  // KNVLIBS_CACHE_FORMAT_H_
