// Makes a capture, in memory or in a file.
//
// It is made in memory, where it may grow to kLargestFile, and written at once when it is whole:
// its place need not be a file system that SQLite can work on, nor a file at all.
#ifndef TOOLS_KSICACHE_CACHE_WRITER_H_
#define TOOLS_KSICACHE_CACHE_WRITER_H_

#include <cstddef>
#include <span>
#include <string>

#include "knvlibs/cache_file.h"
#include "knvlibs/source.h"
#include "knvlibs/sqlite.h"
#include "tools/ksicache/memory_database.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/reading_sink.h"

namespace ksicache {

// Every call fails with an Error, a DataError if what it was given cannot be written.
class CacheContent : public ReadingSink {
 public:
  static constexpr int64_t kLargestFile = MemoryDatabase::kLargestFile;

  // What to call it in a message.
  explicit CacheContent(std::string name);

  void AddValue(const ksi::Node& node, const ksi::Keys& keys,
                std::span<const std::byte> record) override;
  void AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                  ksi::Status status) override;

  // A list and then, one by one, its `count` entries.
  void StartList(const ksi::Node& node, const ksi::Keys& keys, size_t count);
  void AddEntry(const ksi::Key& entry);
  // All at once.
  void AddList(const ksi::Node& node, const ksi::Keys& keys,
               std::span<const ksi::Key> entries) override;

  // The bytes of the file, which live as long as this. Nothing can be added any more.
  std::span<const std::byte> Finish(const ksi::CacheFile::Capture& capture);

  const std::string& Name() const { return database_.Name(); }
  size_t Values() const { return values_; }
  size_t Lists() const { return lists_; }

 private:
  void Require(bool good) const { database_.Require(good); }
  void WriteNodes();
  void WriteCapture(const ksi::CacheFile::Capture& capture);
  void BindKey(ksi::Statement& statement, int parameter, const ksi::Key& key);
  void BindKeys(ksi::Statement& statement, const ksi::Keys& keys);
  // Adds the row of which the answer is bound already.
  void AddReading(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys, ksi::Status status);

  MemoryDatabase database_;
  ksi::Statement addReading_;
  ksi::Statement addEntry_;
  int64_t position_ = 0;  // of the list's next entry
  size_t values_ = 0;
  size_t lists_ = 0;
};

// The place of a file is looked at before anything is made.
struct CacheWriterFile {
  NewFile file;
};

// The file stands under its name after Commit, and before it nothing does.
class CacheWriter : private CacheWriterFile, public CacheContent {
 public:
  // As for a NewFile.
  CacheWriter(const std::string& fileName, bool replace, mode_t mode = NewFile::kMode)
      : CacheWriterFile{NewFile(fileName, replace, mode)}, CacheContent(file.Name()) {}

  void RefuseInput(const std::string& fileName) const { file.RefuseInput(fileName); }

  void Commit(const ksi::CacheFile::Capture& capture) { file.Commit(Finish(capture)); }
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_CACHE_WRITER_H_
