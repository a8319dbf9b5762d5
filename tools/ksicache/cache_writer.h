// Writes a cache file.
#ifndef TOOLS_KSICACHE_CACHE_WRITER_H_
#define TOOLS_KSICACHE_CACHE_WRITER_H_

#include <cstddef>
#include <span>
#include <string>

#include "knvlibs/cache_file.h"
#include "knvlibs/param_list.h"
#include "knvlibs/source.h"
#include "knvlibs/sqlite.h"
#include "tools/ksicache/temporary_file.h"

namespace ksicache {

// Every call fails with an Error, a DataError if what it was given cannot be written. The file
// stands under its name after Commit, and before it nothing does.
class CacheWriter {
 public:
  // `replace`: the file may exist already.
  CacheWriter(const std::string& fileName, bool replace);

  void AddValue(const ksi::Node& node, const ksi::Keys& keys, std::span<const std::byte> record);
  void AddList(const ksi::Node& node, const ksi::Keys& keys, const ksi::ParamList& instances);
  void AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys, ksi::Status status);

  void Commit(const ksi::CacheFile::Capture& capture);

  size_t Values() const { return values_; }
  size_t Lists() const { return lists_; }
  size_t Failures() const { return failures_; }

 private:
  void Execute(const std::string& sql);
  void Require(bool good, const char* action);
  void WriteNodes();
  static void CheckText(std::string_view text);
  void BindKeys(ksi::Statement& statement, const ksi::Keys& keys);
  // Adds the row of which the answer is bound already.
  void AddReading(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys, ksi::Status status);

  TemporaryFile file_;
  ksi::Database database_;
  ksi::Statement addReading_;
  ksi::Statement addInstance_;
  size_t values_ = 0;
  size_t lists_ = 0;
  size_t failures_ = 0;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_CACHE_WRITER_H_
