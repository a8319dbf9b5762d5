#include "tools/ksicache/reading_walk.h"

#include <new>
#include <optional>
#include <tuple>
#include <utility>

#include "knvlibs/cache_format.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

[[noreturn]] void ThrowDamaged(const char* why) { throw DataError(std::string("damaged: ") + why); }

[[noreturn]] void ThrowFailed(const ksi::CacheFile& file) {
  RequireMemory(file);
  ThrowDamaged(file.ErrorText());
}

// Takes a key column; false if it is no key at all.
bool TakeKey(const ksi::Statement& row, int column, ksi::Key* key) {
  switch (row.Type(column)) {
    case SQLITE_INTEGER:
      *key = {ksi::KeyKind::kNumber, row.Number(column), {}};
      return true;
    case SQLITE_TEXT:
      *key = {ksi::KeyKind::kText, 0, row.Text(column)};
      return true;
    default:
      return false;
  }
}

bool IsAbsent(const ksi::Key& key) { return key.kind == ksi::KeyKind::kText && key.text.empty(); }

// A program asks with texts of C, and a file holds none that are longer.
bool CanBeAsked(const ksi::Key& key) {
  return key.kind == ksi::KeyKind::kNumber || (key.text.find('\0') == std::string_view::npos &&
                                               key.text.size() <= ksi::cache::kLongestText);
}

// Takes the key columns of a row; false if one is no key at all.
bool TakeKeys(const ksi::Statement& row, ksi::Keys* keys) {
  for (size_t i = 0; i < ksi::kMaxKeys; ++i) {
    if (!TakeKey(row, static_cast<int>(i), &keys->at[i])) return false;
  }
  return true;
}

// Counts the keys of a row, as many as its node has, or else as many as there are; false if they
// are not what the node takes.
bool CountKeys(const ksi::CacheFile::NodeRow* nodeRow, ksi::Keys* keys) {
  if (nodeRow == nullptr || nodeRow->node == nullptr) {
    keys->count = IsAbsent(keys->at[0]) ? 0 : IsAbsent(keys->at[1]) ? 1 : 2;
    return true;
  }
  const ksi::Keying& keying =
      nodeRow->kind == ksi::Kind::kValue ? nodeRow->node->valueKeys : nodeRow->node->listKeys;
  keys->count = keying.Count();
  for (size_t i = 0; i < ksi::kMaxKeys; ++i) {
    const ksi::Key& key = keys->at[i];
    const bool good =
        i < keys->count ? key.kind == ksi::KindOf(keying.at[i]) && CanBeAsked(key) : IsAbsent(key);
    if (!good) return false;
  }
  return true;
}

// Where a row stands in its table: numbers before texts, as SQLite has them.
using KeyPlace = std::tuple<bool, int64_t, std::string>;
using Place = std::tuple<KeyPlace, KeyPlace, int64_t>;

Place PlaceOf(const Reading& reading) {
  const auto place = [](const ksi::Key& key) {
    return KeyPlace(key.kind == ksi::KeyKind::kText, key.number, key.text);
  };
  return {place(reading.keys[0]), place(reading.keys[1]), reading.node};
}

}  // namespace

std::string Reading::Name() const {
  return NameOf(row == nullptr ? "node " + std::to_string(node) : row->path, keys);
}

void RequireMemory(const ksi::CacheFile& file) {
  const int code = sqlite3_errcode(file.Handle());
  if (ksi::StatusOfSqlite(code) == KSI_STATUS_NO_MEMORY) throw std::bad_alloc();
}

int ForEachFile(const std::vector<std::string>& fileNames,
                const std::function<bool(const std::string& fileName)>& visit) {
  bool good = true;
  for (const std::string& fileName : fileNames) {
    try {
      good = visit(fileName) && good;
    } catch (const DataError& error) {
      PrintError(fileName + ": " + error.what());
      good = false;
    } catch (const Error& error) {
      PrintError(error.what());
      good = false;
    }
  }
  return good ? 0 : 1;
}

void ForEachReading(const ksi::CacheFile& file, const std::function<void(const Reading&)>& visit) {
  ksi::Statement rows;
  int code = rows.Prepare(file.Handle(),
                          "SELECT key1, key2, node, status, answer FROM reading "
                          "ORDER BY key1, key2, node");
  if (code != SQLITE_OK) ThrowFailed(file);
  std::optional<Place> last;
  while ((code = rows.Step()) == SQLITE_ROW) {
    Reading reading{};
    reading.node = rows.Number(2);
    reading.row = file.FindRow(reading.node);
    if (TakeKeys(rows, &reading.keys)) {
      Place place = PlaceOf(reading);
      if (last && place <= *last) ThrowDamaged("readings are out of order");
      last = std::move(place);
      reading.goodKeys = CountKeys(reading.row, &reading.keys);
    }
    reading.status = rows.Type(3) == SQLITE_INTEGER ? rows.Number(3) : -1;
    reading.type = rows.Type(4);
    if (reading.type == SQLITE_BLOB) reading.value = rows.Blob(4);
    if (reading.type == SQLITE_INTEGER) reading.count = rows.Number(4);
    visit(reading);
  }
  if (code != SQLITE_DONE) ThrowFailed(file);
}

InstanceWalk::InstanceWalk(const ksi::CacheFile& file) : file_(file) {
  if (rows_.Prepare(file.Handle(),
                    "SELECT position, entry FROM instance "
                    "WHERE key1 = ?1 AND key2 = ?2 AND node = ?3 ORDER BY position") != SQLITE_OK) {
    ThrowFailed(file);
  }
}

void InstanceWalk::Require(int code) const {
  if (code != SQLITE_OK) ThrowFailed(file_);
}

void InstanceWalk::ForEach(
    const Reading& list,
    const std::function<void(int64_t position, const ksi::Statement&)>& visit) {
  for (size_t i = 0; i < ksi::kMaxKeys; ++i) {
    const int parameter = static_cast<int>(i) + 1;
    const ksi::Key& key = list.keys[i];
    if (i >= list.keys.count) {
      Require(rows_.Bind(parameter, std::string_view()));
    } else if (key.kind == ksi::KeyKind::kNumber) {
      Require(rows_.Bind(parameter, key.number));
    } else {
      Require(rows_.Bind(parameter, key.text));
    }
  }
  Require(rows_.Bind(3, list.node));
  int code = SQLITE_OK;
  while ((code = rows_.Step()) == SQLITE_ROW) {
    visit(rows_.Type(0) == SQLITE_INTEGER ? rows_.Number(0) : -1, rows_);
  }
  rows_.Reset();
  if (code != SQLITE_DONE) ThrowFailed(file_);
}

}  // namespace ksicache
