#include "tools/ksicache/recording_structure.h"

#include <fcntl.h>

#include <algorithm>
#include <string_view>

#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_database.h"
#include "knvlibs/cache_format.h"
#include "knvlibs/sqlite.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/recording_lock.h"

namespace ksicache {
namespace {

// More would say no more; pages that are never used are not among them.
constexpr size_t kMostLines = 20;

class Structure {
 public:
  explicit Structure(const std::string& fileName) {
    if (database_.Open(fileName.c_str()) != ksi::kOk) throw DataError("cannot be read");
    database_.AllowReads();
  }

  std::vector<std::string> Wrong() {
    CheckIntegrity();
    // In a file whose structure is broken the rest may be read twice or never end.
    if (!lines_.empty()) return lines_;
    if (database_.IsWrittenAhead()) Add(kIsWrittenAhead);
    CheckHead();
    CheckCount("PRAGMA freelist_count", "pages have been freed");
    for (const std::string table : {"part", "block"}) {
      CheckCount("SELECT coalesce(max(id), 0) - count(*) + (count(*) = 0) FROM " + table,
                 "rows of the table " + table + " are missing");
    }
    CheckCount("SELECT count(*) FROM part WHERE typeof(moments) <> 'integer' OR moments < 0",
               "rows have no number of moments");
    const std::string size = std::to_string(ksi::cache::kBlockSize);
    CheckCount("SELECT count(*) FROM block WHERE typeof(data) <> 'blob' OR length(data) <> " + size,
               "blocks have not " + size + " bytes");
    return lines_;
  }

 private:
  void Add(std::string line) {
    if (lines_.size() < kMostLines) lines_.push_back(std::move(line));
  }

  void AddFailure() { Add(database_.ErrorText()); }

  // Pages that a recorder has put elsewhere stay, and are never used.
  void AddIntegrity(std::string_view text) {
    while (!text.empty()) {
      const size_t end = std::min(text.find('\n'), text.size());
      const std::string_view line = text.substr(0, end);
      text.remove_prefix(std::min(end + 1, text.size()));
      if (line != "ok" && !line.starts_with("*** in database") &&
          !(line.starts_with("Page ") && line.ends_with("never used"))) {
        Add(std::string(line));
      }
    }
  }

  void CheckIntegrity() {
    ksi::Statement rows;
    int code = rows.Prepare(database_.Handle(), "PRAGMA integrity_check(1000000)");
    while (code == SQLITE_OK || code == SQLITE_ROW) {
      code = rows.Step();
      if (code == SQLITE_ROW) AddIntegrity(rows.Text(0));
    }
    if (code != SQLITE_DONE) AddFailure();
  }

  // One host, by its name, and one time.
  void CheckHead() {
    ksi::Statement rows;
    int code = rows.Prepare(database_.Handle(), "SELECT host, made FROM recording");
    size_t count = 0;
    while (code == SQLITE_OK || code == SQLITE_ROW) {
      code = rows.Step();
      if (code != SQLITE_ROW) break;
      ++count;
      if (rows.Type(0) != SQLITE_TEXT) Add("the name of its host is no text");
      if (rows.Type(1) != SQLITE_TEXT || !ksi::TimeOfText(std::string(rows.Text(1)))) {
        Add("when it was made is no date and time");
      }
    }
    if (code != SQLITE_DONE) return AddFailure();
    if (count != 1) Add("the table recording has " + std::to_string(count) + " rows");
  }

  // A number that has to be 0.
  void CheckCount(const std::string& sql, const std::string& what) {
    ksi::Statement rows;
    int code = rows.Prepare(database_.Handle(), sql.c_str());
    if (code == SQLITE_OK) code = rows.Step();
    if (code != SQLITE_ROW) return AddFailure();
    if (rows.Number(0) != 0) Add(what + ": " + std::to_string(rows.Number(0)));
  }

  ksi::CacheDatabase database_;
  std::vector<std::string> lines_;
};

bool IsBeingRecorded(const std::string& fileName) {
  const Descriptor file(open(fileName.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  return file && !RecorderOf(file.Get()).empty();
}

}  // namespace

std::vector<std::string> WrongStructure(const std::string& fileName) {
  if (IsBeingRecorded(fileName)) return {};
  std::vector<std::string> lines = Structure(fileName).Wrong();
  return IsBeingRecorded(fileName) ? std::vector<std::string>() : lines;
}

std::vector<std::string> WrongRows(const ksi::RecordingFile& recording) {
  using Part = ksi::RecordingFile::Part;
  std::vector<Part> rows = recording.Rows();
  std::ranges::sort(rows, {}, &Part::block);
  // In a copy that was taken from the front of a file that was being written, a row may be there
  // still whose blocks are those of another one by now; but not of the same moment.
  const auto isSame = [](const Part& a, const Part& b) {
    return a.block == b.block && a.number == b.number && a.moments == b.moments;
  };
  std::vector<std::string> lines;
  for (auto row = rows.begin(); (row = std::adjacent_find(row, rows.end(), isSame)) != rows.end() &&
                                lines.size() < kMostLines;
       ++row) {
    lines.push_back("the part of " + ksi::TextOfTime(row->first) + " is there twice");
  }
  return lines;
}

}  // namespace ksicache
