#include "tests/knvlibs/cache_fixture.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>

#include <knvlibs/ksi_records.h>
#include "knvlibs/sqlite.h"

namespace ksi {

TestDirectory::TestDirectory() {
  // In memory where that can be: some tests write a file thousands of times.
  path_ = access("/dev/shm", W_OK) == 0 ? "/dev/shm/" : testing::TempDir();
  path_ += "knvlibs.XXXXXX";
  if (mkdtemp(path_.data()) == nullptr) throw std::runtime_error("no directory for the test");
}

TestDirectory::~TestDirectory() { std::filesystem::remove_all(path_); }

std::vector<std::string> TestDirectory::Names() const {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(path_)) {
    names.push_back(entry.path().filename());
  }
  std::ranges::sort(names);
  return names;
}

std::string FileContent(const std::string& fileName) {
  std::ifstream file(fileName, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

void WriteContent(const std::string& fileName, std::string_view content) {
  // Some file systems bring a file that is written over to the disk at once.
  std::filesystem::remove(fileName);
  std::ofstream file(fileName, std::ios::binary);
  file.write(content.data(), static_cast<std::streamsize>(content.size()));
  ASSERT_TRUE(file.flush()) << fileName;
}

Keys MakeKeys(std::initializer_list<TestKey> list) {
  Keys keys;
  for (const TestKey& key : list) {
    if (const auto* number = std::get_if<int64_t>(&key)) {
      keys.at[keys.count++] = {KeyKind::kNumber, *number, {}};
    } else {
      keys.at[keys.count++] = {KeyKind::kText, 0, std::get<std::string_view>(key)};
    }
  }
  return keys;
}

const Node& NodeAt(std::string_view path) {
  const Node* node = FindNode(path);
  if (node == nullptr) throw std::runtime_error("no node " + std::string(path));
  return *node;
}

std::vector<Key> NumberList(std::initializer_list<uint64_t> numbers) {
  std::vector<Key> list;
  for (const uint64_t number : numbers) {
    list.push_back({KeyKind::kNumber, static_cast<int64_t>(number), {}});
  }
  return list;
}

std::vector<Key> TextList(std::initializer_list<std::string_view> texts) {
  std::vector<Key> list;
  for (const std::string_view text : texts) list.push_back({KeyKind::kText, 0, text});
  return list;
}

CacheFile::Capture TestCapture() {
  return {std::string(kDefinitions.signature), std::string(kDefinitions.built), "test.example.org",
          "2026-11-21T10:00:00Z"};
}

void WriteSmallHost(const std::string& fileName) {
  ksicache::CacheWriter writer(fileName, true);
  const Node& name = NodeAt("sched/groups/groupName");
  KSI_GroupName text = {};
  std::memcpy(text.text, "host", 4);
  writer.AddValue(name, MakeKeys({0}), BytesOf(text));
  std::memcpy(text.text, "web\0", 4);
  writer.AddValue(name, MakeKeys({7}), BytesOf(text));
  writer.AddFailure(name, Kind::kValue, MakeKeys({9}), KSI_STATUS_PERMISSION_DENIED);
  const Node& flags = NodeAt("sched/groups/groupFlags");
  for (const int64_t group : {0, 7, 9}) {
    const auto bits = static_cast<uint32_t>(100 + group);
    writer.AddValue(flags, MakeKeys({group}), BytesOf(bits));
  }
  const Node& groups = NodeAt("sched/groups/members/groups");
  writer.AddList(groups, MakeKeys({0}), NumberList({9, 7}));
  writer.AddList(groups, MakeKeys({7}), NumberList({}));
  writer.AddFailure(groups, Kind::kList, MakeKeys({9}), KSI_STATUS_IO_ERROR);

  const Node& types = NodeAt("sched/memClients/remapTypes");
  writer.AddList(types, MakeKeys({30}), TextList({"small", "large"}));
  KSI_RemapType remap = {};
  remap.added = ~uint64_t{0};
  writer.AddValue(types, MakeKeys({30, "large"}), BytesOf(remap));
  remap.added = 5;
  writer.AddValue(types, MakeKeys({30, "small"}), BytesOf(remap));

  KSI_Comprehensive memory = {};
  memory.total = 4096;
  writer.AddValue(NodeAt("memory/comprehensive"), {}, BytesOf(memory));
  writer.AddList(NodeAt("system/heaps"), {}, TextList({"main", ""}));
  writer.AddList(NodeAt("memory/pmem/volumes"), {}, TextList({}));
  writer.Commit(TestCapture());
}

Database OpenAsOwner(const std::string& fileName) {
  sqlite3* handle = nullptr;
  EXPECT_EQ(sqlite3_open(fileName.c_str(), &handle), SQLITE_OK);
  return Database(handle);
}

void ExecuteSql(sqlite3* database, const std::string& sql) {
  char* message = nullptr;
  EXPECT_EQ(sqlite3_exec(database, sql.c_str(), nullptr, nullptr, &message), SQLITE_OK)
      << (message == nullptr ? "" : message) << ": " << sql;
  sqlite3_free(message);
}

void RunSql(const std::string& fileName, const std::string& sql) {
  ExecuteSql(OpenAsOwner(fileName).get(), sql);
}

}  // namespace ksi
