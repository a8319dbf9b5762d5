// check: says all that is wrong with a cache file, and where.
#include <algorithm>
#include <string>

#include "tools/ksicache/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {
namespace {

class Checker {
 public:
  Checker(const std::string& fileName, const ksi::CacheFile& file)
      : fileName_(fileName), file_(file), instances_(file) {}

  size_t Run() {
    CheckIntegrity();
    // In a file whose structure is broken the rest may be read twice or never end.
    if (problems_ != 0) return problems_;
    CheckSignature();
    CheckNodes();
    ForEachReading(file_, [&](const Reading& reading) { CheckReading(reading); });
    CheckStrayInstances();
    return problems_;
  }

 private:
  void Report(const std::string& what) {
    Print(fileName_ + ": " + what + "\n");
    ++problems_;
  }
  void Report(const Reading& reading, const std::string& what) {
    Report(reading.Name() + ": " + what);
  }

  void CheckIntegrity() {
    ksi::Statement rows;
    int code = rows.Prepare(file_.Handle(), "PRAGMA integrity_check(20)");
    while (code == SQLITE_OK || code == SQLITE_ROW) {
      code = rows.Step();
      if (code == SQLITE_ROW && rows.Text(0) != "ok") Report(Printable(rows.Text(0)));
    }
    if (code != SQLITE_DONE) Report(sqlite3_errmsg(file_.Handle()));
  }

  void CheckSignature() {
    const std::string& signature = file_.GetCapture().signature;
    if (signature != ksi::kDefinitions.signature) {
      Report("signature " + signature + " is not " + std::string(ksi::kDefinitions.signature) +
             " of this version");
    }
  }

  void CheckNodes() {
    for (const ksi::CacheFile::NodeRow& row : file_.NodeRows()) {
      if (row.node == nullptr) Report("there is no node " + Printable(row.path));
    }
  }

  void CheckReading(const Reading& reading) {
    if (reading.row == nullptr) return Report(reading, "is not in the table of nodes");
    if (reading.row->node == nullptr) return;  // reported with its node
    if (!reading.goodKeys) return Report(reading, "has keys that the node does not take");
    if (reading.status < 0 || reading.status > int64_t{0xffffffff}) {
      return Report(reading, "has no good status");
    }
    if (reading.status != ksi::kOk) {
      if (reading.type != SQLITE_NULL) Report(reading, "failed and has an answer");
    } else if (reading.row->kind == ksi::Kind::kValue) {
      CheckValue(reading);
    } else {
      CheckList(reading);
    }
  }

  void CheckValue(const Reading& reading) {
    const size_t size = reading.row->node->recordSize;
    if (reading.type != SQLITE_BLOB) {
      Report(reading, "has no record");
    } else if (reading.value.size() != size) {
      Report(reading, "has " + std::to_string(reading.value.size()) + " bytes, its record " +
                          std::to_string(size));
    }
  }

  void CheckList(const Reading& reading) {
    if (reading.type != SQLITE_INTEGER || reading.count < 0) {
      return Report(reading, "has no number of instances");
    }
    const int entryType = ksi::KindOf(reading.row->node->entries) == ksi::KeyKind::kNumber
                              ? SQLITE_INTEGER
                              : SQLITE_TEXT;
    int64_t count = 0;
    instances_.ForEach(reading, [&](int64_t position, const ksi::Statement& row) {
      if (position != count) {
        Report(reading, "has entry " + std::to_string(position) + " where entry " +
                            std::to_string(count) + " has to be");
      }
      count = position + 1;
      if (row.Type(1) != entryType) {
        Report(reading, "entry " + std::to_string(position) + " is no " +
                            (entryType == SQLITE_INTEGER ? "number" : "text"));
      } else if (entryType == SQLITE_TEXT && row.Text(1).find('\0') != std::string_view::npos) {
        Report(reading, "entry " + std::to_string(position) + " holds a NUL");
      }
    });
    if (count != reading.count) {
      Report(reading,
             "has " + std::to_string(count) + " entries and says " + std::to_string(reading.count));
    }
  }

  // Entries of a list that no reading tells of.
  void CheckStrayInstances() {
    ksi::Statement rows;
    int code = rows.Prepare(file_.Handle(),
                            "SELECT count(*) FROM instance AS i WHERE NOT EXISTS(SELECT 1 FROM "
                            "reading AS r WHERE r.key1 = i.key1 AND r.key2 = i.key2 AND "
                            "r.node = i.node AND r.status = 0)");
    if (code == SQLITE_OK) code = rows.Step();
    if (code != SQLITE_ROW) return Report(sqlite3_errmsg(file_.Handle()));
    if (rows.Number(0) != 0) {
      Report(std::to_string(rows.Number(0)) + " entries belong to no list");
    }
  }

  const std::string& fileName_;
  const ksi::CacheFile& file_;
  InstanceWalk instances_;
  size_t problems_ = 0;
};

}  // namespace

int Check(const Options& options) {
  if (options.arguments.size() != 1) throw UsageError("check takes one file");
  const std::string& fileName = options.arguments[0];
  const std::unique_ptr<ksi::CacheFile> file = OpenCacheFile(fileName);
  return Checker(fileName, *file).Run() == 0 ? 0 : 1;
}

}  // namespace ksicache
