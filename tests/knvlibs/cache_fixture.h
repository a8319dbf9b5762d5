// Cache files that tests make, read and damage.
#ifndef TESTS_KNVLIBS_CACHE_FIXTURE_H_
#define TESTS_KNVLIBS_CACHE_FIXTURE_H_

#include <gtest/gtest.h>

#include <cstddef>
#include <initializer_list>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "knvlibs/cache_file.h"
#include "knvlibs/open_cache.h"
#include "knvlibs/source.h"
#include "knvlibs/sqlite.h"
#include "tools/ksicache/cache_writer.h"

namespace ksi {

// A directory that is removed with all in it when its owner goes.
class TestDirectory {
 public:
  TestDirectory();
  ~TestDirectory();
  TestDirectory(const TestDirectory&) = delete;
  TestDirectory& operator=(const TestDirectory&) = delete;

  std::string Path(std::string_view name) const { return path_ + "/" + std::string(name); }
  // The names of what is in it, sorted.
  std::vector<std::string> Names() const;

 private:
  std::string path_;
};

std::string FileContent(const std::string& fileName);
void WriteContent(const std::string& fileName, std::string_view content);

// A key is a number or a text, which has to live as long as the keys.
using TestKey = std::variant<int64_t, std::string_view>;
Keys MakeKeys(std::initializer_list<TestKey> keys);

const Node& NodeAt(std::string_view path);

template <class Record>
std::span<const std::byte> BytesOf(const Record& record) {
  return std::as_bytes(std::span(&record, 1));
}

// Entries of a list; the texts have to live as long.
std::vector<Key> NumberList(std::initializer_list<uint64_t> numbers);
std::vector<Key> TextList(std::initializer_list<std::string_view> texts);

// What a file of this library would say of itself.
CacheFile::Capture TestCapture();

// A small host: group 0 "host" with the groups 7 and 9, of which 7 is "web" and 9 cannot be read;
// client 30 with the remap types "large" and "small"; two heaps, no volumes.
void WriteSmallHost(const std::string& fileName);

// A test on the file of that host, and the source that it makes once it is opened.
class SmallHostTest : public testing::Test {
 protected:
  void SetUp() override { WriteSmallHost(file_); }

  Status Open(const std::string& fileName) {
    source_.reset();
    return OpenCacheSource(fileName.c_str(), &source_);
  }
  Status Open() { return Open(file_); }

  Status Flags(int64_t group, uint32_t* flags) {
    return source_->Value(NodeAt("sched/groups/groupFlags"), MakeKeys({group}),
                          std::as_writable_bytes(std::span(flags, 1)));
  }
  Status Flags(int64_t group) {
    uint32_t flags = 0;
    return Flags(group, &flags);
  }

  Status ChildrenOf(int64_t group) {
    ParamList children(ParamList::kNoLimit);
    return source_->Instances(NodeAt("sched/groups/members/groups"), MakeKeys({group}), children);
  }

  TestDirectory directory_;
  std::string file_ = directory_.Path("host.ksi");
  std::unique_ptr<Source> source_;
};

// A connection to a file as its owner could have one, and SQL run on it.
Database OpenAsOwner(const std::string& fileName);
void ExecuteSql(sqlite3* database, const std::string& sql);

// Runs SQL on a file as its owner could.
void RunSql(const std::string& fileName, const std::string& sql);

}  // namespace ksi

#endif  // TESTS_KNVLIBS_CACHE_FIXTURE_H_
