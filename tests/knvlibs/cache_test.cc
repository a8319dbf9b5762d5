// Cache files, good, bad and hostile.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <map>
#include <random>
#include <set>

#include <knvlibs/ksi_records.h>
#include "knvlibs/cache_file.h"
#include "knvlibs/cache_format.h"
#include "knvlibs/open_cache.h"
#include "tests/knvlibs/cache_fixture.h"

#if defined(__SANITIZE_ADDRESS__)
#define SANITIZED true
#elif defined(__has_feature)
#define SANITIZED __has_feature(address_sanitizer)
#else
#define SANITIZED false
#endif

namespace ksi {
namespace {

// A sanitizer keeps what is freed for a while.
constexpr bool kSanitized = SANITIZED;

class Cache : public SmallHostTest {
 protected:
  // The file after SQL, opened.
  Status OpenAfter(const std::string& sql) {
    RunSql(file_, sql);
    return Open();
  }

  template <class Record>
  Status Value(std::string_view path, std::initializer_list<TestKey> keys, Record* record) {
    return source_->Value(NodeAt(path), MakeKeys(keys),
                          std::as_writable_bytes(std::span(record, 1)));
  }
};

TEST_F(Cache, AnswersValuesInAnyOrder) {
  ASSERT_EQ(Open(), kOk);
  for (const int64_t group : {9, 0, 7, 7, 9, 0}) {
    uint32_t flags = 0;
    EXPECT_EQ(Value("sched/groups/groupFlags", {group}, &flags), kOk);
    EXPECT_EQ(flags, 100 + group);
  }
}

TEST_F(Cache, AnswersMoreObjectsThanItKeeps) {
  {
    ksicache::CacheWriter writer(file_, true);
    for (int64_t group = 0; group < 1000; ++group) {
      const auto bits = static_cast<uint32_t>(3 * group);
      writer.AddValue(NodeAt("sched/groups/groupFlags"), MakeKeys({group - 500}), BytesOf(bits));
      writer.AddList(NodeAt("sched/groups/members/groups"), MakeKeys({group - 500}),
                     NumberList({uint64_t(group)}));
    }
    writer.Commit(TestCapture());
  }
  ASSERT_EQ(Open(), kOk);
  std::mt19937 random(5);
  for (int i = 0; i < 20000; ++i) {
    // Forwards, and now and then to anywhere, there or not.
    const int64_t group = i % 3 == 0 ? static_cast<int64_t>(random() % 1100) - 500 : i % 1000 - 500;
    uint32_t flags = 0;
    const Status status = Value("sched/groups/groupFlags", {group}, &flags);
    ASSERT_EQ(status, group < 500 ? kOk : KSI_STATUS_NOT_FOUND) << group;
    ASSERT_EQ(flags, status == kOk ? 3 * (group + 500) : 0) << group;
    const Status list = i % 7 == 0 ? ChildrenOf(group) : status;
    ASSERT_EQ(list, status) << group;
  }
}

TEST_F(Cache, AnswersNestedKeys) {
  ASSERT_EQ(Open(), kOk);
  KSI_RemapType remap = {};
  EXPECT_EQ(Value("sched/memClients/remapTypes", {30, "large"}, &remap), kOk);
  EXPECT_EQ(remap.added, ~uint64_t{0});
  EXPECT_EQ(Value("sched/memClients/remapTypes", {30, "small"}, &remap), kOk);
  EXPECT_EQ(remap.added, 5u);
  EXPECT_EQ(Value("sched/memClients/remapTypes", {30, ""}, &remap), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(Value("sched/memClients/remapTypes", {31, "small"}, &remap), KSI_STATUS_NOT_FOUND);
}

TEST_F(Cache, KeepsTheOrderOfLists) {
  ASSERT_EQ(Open(), kOk);
  ParamList types(ParamList::kNoLimit);
  EXPECT_EQ(source_->Instances(NodeAt("sched/memClients/remapTypes"), MakeKeys({30}), types), kOk);
  ASSERT_EQ(types.Count(), 2u);
  EXPECT_EQ(types.Text(0), "small");
  EXPECT_EQ(types.Text(1), "large");
}

TEST_F(Cache, TellsEmptyMissingAndFailedListsApart) {
  ASSERT_EQ(Open(), kOk);
  EXPECT_EQ(ChildrenOf(7), kOk);
  EXPECT_EQ(ChildrenOf(8), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(ChildrenOf(9), KSI_STATUS_IO_ERROR);
}

TEST_F(Cache, RepeatsTheStatusOfAFailedRead) {
  ASSERT_EQ(Open(), kOk);
  KSI_GroupName name = {};
  EXPECT_EQ(Value("sched/groups/groupName", {9}, &name), KSI_STATUS_PERMISSION_DENIED);
  EXPECT_EQ(Value("sched/groups/groupName", {10}, &name), KSI_STATUS_NOT_FOUND);
  uint32_t numVMs = 0;
  EXPECT_EQ(Value("sched/globalStats/numVMs", {}, &numVMs), KSI_STATUS_NOT_FOUND);
}

TEST_F(Cache, NamesMayFillTheirField) {
  KSI_GroupName name;
  std::memset(name.text, 'n', sizeof name.text);
  {
    ksicache::CacheWriter writer(file_, true);
    writer.AddValue(NodeAt("sched/groups/groupName"), MakeKeys({INT64_MIN}), BytesOf(name));
    writer.Commit(TestCapture());
  }
  ASSERT_EQ(Open(), kOk);
  KSI_GroupName read = {};
  EXPECT_EQ(Value("sched/groups/groupName", {INT64_MIN}, &read), kOk);
  EXPECT_EQ(std::memcmp(&read, &name, sizeof name), 0);
}

// What is not a cache file, or is one and cannot be used.

TEST_F(Cache, MissingFile) {
  EXPECT_EQ(Open(directory_.Path("none")), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(Open(file_ + "/none"), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(Open(""), KSI_STATUS_NOT_FOUND);
}

TEST_F(Cache, FileWithoutPermission) {
  ASSERT_EQ(chmod(file_.c_str(), 0), 0);
  // Root may read everything, so the check is made as somebody else.
  const bool root = geteuid() == 0;
  if (root) {
    ASSERT_EQ(chmod(directory_.Path("").c_str(), 0755), 0);
    ASSERT_EQ(seteuid(65534), 0);
  }
  const Status status = Open();
  if (root) {
    ASSERT_EQ(seteuid(0), 0);
  }
  EXPECT_EQ(status, KSI_STATUS_PERMISSION_DENIED);
}

TEST_F(Cache, Directory) { EXPECT_EQ(Open(directory_.Path("")), KSI_STATUS_IS_A_DIRECTORY); }

TEST_F(Cache, FilesThatAreNoCacheFiles) {
  const std::string other = directory_.Path("other");
  WriteContent(other, "");
  EXPECT_EQ(Open(other), KSI_STATUS_INVALID_METADATA);
  WriteContent(other, "MemTotal: 1 kB\n" + std::string(4096, 'x'));
  EXPECT_EQ(Open(other), KSI_STATUS_INVALID_METADATA);
  ASSERT_EQ(unlink(other.c_str()), 0);
  RunSql(other, "CREATE TABLE t(a)");
  EXPECT_EQ(Open(other), KSI_STATUS_INVALID_METADATA);
}

TEST_F(Cache, PipesAndDevicesAreRefusedAtOnce) {
  const std::string pipe = directory_.Path("pipe");
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  EXPECT_EQ(Open(pipe), KSI_STATUS_INVALID_METADATA);
  EXPECT_EQ(Open("/dev/zero"), KSI_STATUS_INVALID_METADATA);
}

TEST_F(Cache, NewerSchema) {
  EXPECT_EQ(OpenAfter("PRAGMA user_version = 3"), KSI_STATUS_MAJOR_VERSION_MISMATCH);
  // A capture is no recording, whatever it says.
  EXPECT_EQ(OpenAfter("PRAGMA user_version = 2"), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(OpenAfter("PRAGMA user_version = 0"), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(Cache, NamesThatMeanSomethingInAUri) {
  for (const char* name : {"a?mode=memory", "a#b", "a%41", "a b&c", "\xff\xfe", "?", "%"}) {
    const std::string file = directory_.Path(name);
    WriteContent(file, FileContent(file_));
    EXPECT_EQ(Open(file), kOk) << name;
    EXPECT_EQ(Flags(7), kOk);
  }
  EXPECT_EQ(Open("/" + file_), kOk);
  ASSERT_EQ(chdir(directory_.Path("").c_str()), 0);
  EXPECT_EQ(Open("host.ksi"), kOk);
  EXPECT_EQ(Open("./host.ksi"), kOk);
  ASSERT_EQ(chdir("/"), 0);
}

TEST_F(Cache, IsNotWrittenTo) {
  const std::string before = FileContent(file_);
  ASSERT_EQ(Open(), kOk);
  EXPECT_EQ(Flags(7), kOk);
  source_.reset();
  EXPECT_EQ(FileContent(file_), before);
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"host.ksi"}));
}

// Files that somebody changed: nothing of them is believed.

TEST_F(Cache, ForeignTablesAreRefused) {
  const std::string good = FileContent(file_);
  for (const char* sql : {
           "CREATE TABLE more(a)",
           "CREATE VIEW v AS SELECT 1",
           "CREATE INDEX i ON reading(status)",
           "CREATE TRIGGER t AFTER INSERT ON node BEGIN SELECT 1; END",
           "DROP TABLE instance",
           "ALTER TABLE node RENAME COLUMN kind TO sort",
           // Answers forever.
           "DROP TABLE reading; CREATE VIEW reading AS WITH RECURSIVE r(n) AS (SELECT 1 UNION ALL "
           "SELECT n + 1 FROM r) SELECT n AS key1, '' AS key2, 2 AS node, 0 AS status, "
           "zeroblob(64) AS answer FROM r",
           "DROP TABLE capture; CREATE VIEW capture AS SELECT '' AS signature, '' AS built, '' AS "
           "host, '' AS taken",
       }) {
    WriteContent(file_, good);
    EXPECT_EQ(OpenAfter(sql), KSI_STATUS_METADATA_READ_ERROR) << sql;
  }
}

TEST_F(Cache, TextInAnotherEncodingIsRefused) {
  const std::string other = directory_.Path("wide");
  RunSql(other,
         "PRAGMA encoding = 'UTF-16'; PRAGMA application_id = 0x4b534963; "
         "PRAGMA user_version = 1; CREATE TABLE t(a)");
  EXPECT_EQ(Open(other), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(Cache, HeadThatIsNotUnderstoodIsDamage) {
  const std::string good = FileContent(file_);
  for (const char* sql : {
           "DELETE FROM capture",
           "INSERT INTO capture SELECT * FROM capture",
           "UPDATE capture SET signature = 'x'",
           "UPDATE capture SET built = 'Nov 21 2026 10:00:0' || char(27)",
           "UPDATE capture SET taken = ''",
           "UPDATE capture SET host = 'a' || char(0) || 'b'",
           "UPDATE capture SET host = printf('%.9000c', 'x')",
           "UPDATE node SET kind = 'other' WHERE id = 2",
           "UPDATE node SET path = printf('%.9000c', 'x') WHERE id = 2",
           "WITH RECURSIVE r(n) AS (SELECT 1000 UNION ALL SELECT n + 1 FROM r LIMIT 5000) INSERT "
           "INTO node SELECT n, 'x', 'value' FROM r",
       }) {
    WriteContent(file_, good);
    EXPECT_EQ(OpenAfter(sql), KSI_STATUS_METADATA_READ_ERROR) << sql;
  }
}

TEST_F(Cache, TextsMayBeAsLongAsTheyAreAllowed) {
  ASSERT_EQ(OpenAfter("UPDATE capture SET host = printf('%.4096c', 'x')"), kOk);
  EXPECT_EQ(OpenAfter("UPDATE capture SET host = printf('%.4097c', 'x')"),
            KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(Cache, NodesThatTheLibraryDoesNotKnowAreLeftAlone) {
  ASSERT_EQ(OpenAfter("INSERT INTO node VALUES(500, 'sched/later', 'value'); INSERT INTO reading "
                      "VALUES(7, '', 500, 0, zeroblob(9))"),
            kOk);
  EXPECT_EQ(Flags(7), kOk);
}

TEST_F(Cache, NodesThatTheFileDoesNotKnowAreNotFound) {
  ASSERT_EQ(OpenAfter("DELETE FROM node WHERE path = 'sched/groups/groupFlags'"), kOk);
  EXPECT_EQ(Flags(7), KSI_STATUS_NOT_FOUND);
}

TEST_F(Cache, ValuesOfAnotherSizeAreRefused) {
  const std::string id = "(SELECT id FROM node WHERE path = 'sched/groups/groupFlags')";
  const std::string good = FileContent(file_);
  for (const char* answer : {"zeroblob(3)", "zeroblob(5)", "zeroblob(0)", "zeroblob(9000)", "NULL",
                             "'four'", "1234", "1.5"}) {
    WriteContent(file_, good);
    ASSERT_EQ(OpenAfter(std::string("UPDATE reading SET answer = ") + answer +
                        " WHERE key1 = 7 AND node = " + id),
              kOk);
    EXPECT_EQ(Flags(7), KSI_STATUS_LENGTH_MISMATCH) << answer;
    EXPECT_EQ(Flags(0), kOk);
  }
}

TEST_F(Cache, ValueTooLargeToLookAtIsDamage) {
  ASSERT_EQ(OpenAfter("UPDATE reading SET answer = zeroblob(50000000) WHERE key1 = 7"), kOk);
  EXPECT_EQ(Flags(7), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(Flags(9), kOk);
}

TEST_F(Cache, StatusThatIsNoneIsDamage) {
  const std::string good = FileContent(file_);
  for (const char* status : {"-1", "4294967296", "'x'", "1.5"}) {
    WriteContent(file_, good);
    ASSERT_EQ(OpenAfter(std::string("UPDATE reading SET status = ") + status + " WHERE key1 = 7"),
              kOk);
    EXPECT_EQ(Flags(7), KSI_STATUS_METADATA_READ_ERROR) << status;
  }
}

TEST_F(Cache, ListsThatAreNotWholeAreDamage) {
  const std::string good = FileContent(file_);
  for (const char* sql : {
           "DELETE FROM instance WHERE key1 = 0 AND position = 0",
           "DELETE FROM instance WHERE key1 = 0 AND position = 1",
           "UPDATE instance SET position = 5 WHERE key1 = 0 AND position = 1",
           "UPDATE instance SET position = -1 WHERE key1 = 0 AND position = 0",
           "UPDATE instance SET entry = 'x' WHERE key1 = 0 AND position = 1",
           "UPDATE instance SET entry = 1.5 WHERE key1 = 0 AND position = 1",
           "INSERT INTO instance SELECT key1, key2, node, 2, 8 FROM instance WHERE key1 = 0 LIMIT "
           "1",
           "UPDATE reading SET answer = 3 WHERE key1 = 0 AND answer = 2",
           "UPDATE reading SET answer = -2 WHERE key1 = 0 AND answer = 2",
           "UPDATE reading SET answer = 'two' WHERE key1 = 0 AND answer = 2",
       }) {
    WriteContent(file_, good);
    ASSERT_EQ(OpenAfter(sql), kOk) << sql;
    EXPECT_EQ(ChildrenOf(0), KSI_STATUS_METADATA_READ_ERROR) << sql;
    EXPECT_EQ(Flags(0), kOk);
  }
}

TEST_F(Cache, EntryThatIsNoTextIsDamage) {
  const std::string good = FileContent(file_);
  for (const char* entry : {"5", "x'00'", "'a' || char(0)"}) {
    WriteContent(file_, good);
    ASSERT_EQ(OpenAfter(std::string("UPDATE instance SET entry = ") + entry +
                        " WHERE key1 = 30 AND position = 0"),
              kOk);
    ParamList types(ParamList::kNoLimit);
    EXPECT_EQ(source_->Instances(NodeAt("sched/memClients/remapTypes"), MakeKeys({30}), types),
              KSI_STATUS_METADATA_READ_ERROR)
        << entry;
  }
}

// Reads all that the fixture holds, and more. Gives the statuses.
std::set<Status> ReadAll(Source& source) {
  std::set<Status> statuses;
  std::array<std::byte, kMaxRecordSize> buffer = {};
  for (const Node& node : Catalogue()) {
    for (const int64_t number : {0, 7, 8, 9, 30}) {
      for (const bool value : {true, false}) {
        if (value ? !node.HasValue() : !node.HasList()) continue;
        const Keying& keying = value ? node.valueKeys : node.listKeys;
        Keys keys;
        for (keys.count = 0; keys.count < keying.Count(); ++keys.count) {
          keys.at[keys.count] = {KindOf(keying.at[keys.count]), number, "large"};
        }
        if (value) {
          statuses.insert(source.Value(node, keys, Buffer(buffer).first(node.recordSize)));
        } else {
          ParamList list(ParamList::kNoLimit);
          statuses.insert(source.Instances(node, keys, list));
        }
      }
    }
  }
  return statuses;
}

const std::set<Status> kGoodStatuses = {kOk, KSI_STATUS_NOT_FOUND, KSI_STATUS_PERMISSION_DENIED,
                                        KSI_STATUS_IO_ERROR};

TEST_F(Cache, TruncatedAnywhereIsAStatus) {
  ASSERT_EQ(Open(), kOk);
  ASSERT_EQ(ReadAll(*source_), kGoodStatuses);
  const std::string good = FileContent(file_);
  for (size_t length = good.size(); length-- > 0;) {
    ASSERT_EQ(truncate(file_.c_str(), static_cast<off_t>(length)), 0);
    const Status status = Open();
    ASSERT_EQ(status, length < 72 ? KSI_STATUS_INVALID_METADATA : KSI_STATUS_METADATA_READ_ERROR)
        << length;
  }
}

TEST_F(Cache, FlippedBitsAreAStatusOrAnotherFigure) {
  const std::string good = FileContent(file_);
  const int fd = open(file_.c_str(), O_WRONLY);
  ASSERT_GE(fd, 0);
  std::mt19937_64 random(2026);
  size_t opened = 0;
  size_t round = 0;
  for (size_t flipped = 0; flipped < (kSanitized ? 25000 : 100000); ++round) {
    // One bit or many, and often in the parts of a page that lead to the others.
    std::map<size_t, char> bad;
    for (uint64_t flips = round % 4 == 0 ? 1 + random() % 40 : 1; flips > 0; --flips) {
      const size_t page = random() % (good.size() / 4096) * 4096;
      const size_t at = page + random() % (round % 3 == 0 ? 120 : 4096);
      ++flipped;
      bad[at] = static_cast<char>(good[at] ^ static_cast<char>(1 << random() % 8));
    }
    for (const auto& [at, byte] : bad) {
      ASSERT_EQ(pwrite(fd, &byte, 1, static_cast<off_t>(at)), 1);
    }
    if (Open() == kOk) {
      ++opened;
      ReadAll(*source_);
    }
    for (const auto& [at, byte] : bad) {
      ASSERT_EQ(pwrite(fd, &good[at], 1, static_cast<off_t>(at)), 1);
    }
  }
  close(fd);
  EXPECT_GT(opened, round / 4);
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  if (!kSanitized) {
    EXPECT_LT(usage.ru_maxrss, 200 * 1024);
  }
}

// Every page of a table's tree leads back to its root, so that the rows never end.
TEST_F(Cache, TreesThatLeadBackToThemselvesEnd) {
  const std::string good = FileContent(file_);
  constexpr size_t kPage = 4096;
  ASSERT_EQ(good.size() % kPage, 0u);
  for (size_t page = 1; page < good.size() / kPage; ++page) {
    for (const char type : {'\2', '\5'}) {  // interior pages
      std::string bad = good;
      char* at = bad.data() + page * kPage;
      std::memset(at, 0, kPage);
      at[0] = type;
      // 300 cells that all point to this same page.
      constexpr size_t kCells = 300;
      at[3] = kCells >> 8;
      at[4] = static_cast<char>(kCells & 255);
      const size_t content = kPage - kCells * 6;
      at[5] = static_cast<char>(content >> 8);
      at[6] = static_cast<char>(content & 255);
      const auto number = static_cast<char>(page + 1);
      at[11] = number;
      for (size_t i = 0; i < kCells; ++i) {
        const size_t cell = content + 6 * i;
        at[12 + 2 * i] = static_cast<char>(cell >> 8);
        at[13 + 2 * i] = static_cast<char>(cell & 255);
        at[cell + 3] = number;
        at[cell + 4] = 1;
        at[cell + 5] = 0;
      }
      WriteContent(file_, bad);
      if (Open() == kOk) {
        const std::set<Status> statuses = ReadAll(*source_);
        EXPECT_NE(statuses, kGoodStatuses);
      }
    }
  }
}

TEST_F(Cache, SaysWhatIsWrongWithAFile) {
  RunSql(file_, "CREATE VIEW v AS SELECT 1");
  std::unique_ptr<CacheFile> file;
  std::string why;
  EXPECT_EQ(CacheFile::Open(file_.c_str(), &file, &why), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(why, "it has more than the tables of a cache file");
}

}  // namespace
}  // namespace ksi
