// Cache files that lead back to themselves: whoever reads them comes to an end.
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "knvlibs/open_cache.h"
#include "knvlibs/work_limit.h"
#include "tests/harness/program.h"
#include "tests/knvlibs/cache_fixture.h"
#include "tests/knvlibs/hostile_pages.h"

namespace ksi {
namespace {

class EndlessCache : public SmallHostTest {
 protected:
  // The number that the file has for the list of a group's groups.
  std::string ListNode() const { return NumberOf("sched/groups/members/groups"); }

  std::string NumberOf(const std::string& path) const {
    const Database database = OpenAsOwner(file_);
    Statement rows;
    rows.Prepare(database.get(), "SELECT id FROM node WHERE path = ?1");
    rows.Bind(1, path);
    EXPECT_EQ(rows.Step(), SQLITE_ROW);
    return std::to_string(rows.Number(0));
  }

  // The pages of one table become a tree of 18 levels in which each row leads to all below it.
  void PlantTree(const std::string& table, const std::string& record) {
    PageFile pages(FileContent(file_));
    pages.PlantTree(PageFile::RootOf(file_, table), 18, record, record);
    WriteContent(file_, pages.Content());
  }

  static harness::Result Run(const std::vector<std::string>& args) {
    harness::Program program;
    program.path = KSICACHE_PROGRAM;
    program.args = {"ksicache"};
    program.args.insert(program.args.end(), args.begin(), args.end());
    program.environment = harness::OwnEnvironment();
    program.outPath = "/dev/null";
    return harness::RunProgram(program);
  }

  void ExpectThatEveryCommandEnds() {
    for (const char* command : {"info", "dump", "check"}) {
      EXPECT_EQ(Run({command, file_}).status, 1) << command;
    }
  }
};

TEST_F(EndlessCache, Readings) {
  PlantTree("reading", Record({"7", "", NumberOf("sched/groups/groupFlags"), "0", "1"}));
  ExpectThatEveryCommandEnds();
  ASSERT_EQ(Open(), kOk);
  EXPECT_EQ(Flags(7), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(EndlessCache, ReadingsOfUnknownNodes) {
  PlantTree("reading", Record({"7", "", "99", "0", "1"}));
  ExpectThatEveryCommandEnds();
}

TEST_F(EndlessCache, ReadingsOutOfOrder) {
  const std::string flags = NumberOf("sched/groups/groupFlags");
  const std::string name = NumberOf("sched/groups/groupName");
  using Rows = std::vector<std::string>;
  for (const Rows& rows :
       {Rows{Record({"8", "", flags, "5", ""}), Record({"7", "", flags, "5", ""})},
        Rows{Record({"8", "", flags, "5", ""}), Record({"8", "", flags, "5", ""})},
        Rows{Record({"8", "8", name, "5", ""}), Record({"8", "7", name, "5", ""})},
        Rows{Record({"", "", name, "5", ""}), Record({"8", "", name, "5", ""})}}) {
    WriteSmallHost(file_);
    PageFile pages(FileContent(file_));
    pages.Fill(PageFile::RootOf(file_, "reading"), {Cell(0, rows[0]), Cell(0, rows[1])}, 0);
    WriteContent(file_, pages.Content());
    ExpectThatEveryCommandEnds();
    EXPECT_EQ(Run({"info", file_}).err,
              "ksicache: " + file_ + ": damaged: readings are out of order\n");
  }
}

TEST_F(EndlessCache, Lists) {
  RunSql(file_, "UPDATE reading SET answer = 1000000000 WHERE key1 = 0 AND node = " + ListNode());
  PlantTree("instance", Record({"0", "", ListNode(), "0", "9"}));
  for (const char* command : {"dump", "check"}) EXPECT_EQ(Run({command, file_}).status, 1);
  ASSERT_EQ(Open(), kOk);
  EXPECT_EQ(ChildrenOf(0), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(Flags(7), kOk);
}

TEST_F(EndlessCache, ReadingsOfAnObjectThatAreNotInOrder) {
  const std::string list = Record({"7", "", ListNode(), "0", "0"});
  const std::string before = Record({"7", "", "0", "0", "0"});
  const std::string good = FileContent(file_);
  const auto status = [&](const std::string& first, const std::string& second) {
    PageFile pages(good);
    pages.Fill(PageFile::RootOf(file_, "reading"), {Cell(0, first), Cell(0, second)}, 0);
    WriteContent(file_, pages.Content());
    EXPECT_EQ(Open(), kOk);
    return ChildrenOf(7);
  };
  EXPECT_EQ(status(before, list), kOk);
  EXPECT_EQ(status(list, before), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(status(list, list), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(EndlessCache, MoreReadingsOfAnObjectThanThereAreNodes) {
  const auto insert = [](const std::string& count) {
    return "WITH RECURSIVE r(n) AS (SELECT 1000 UNION ALL SELECT n + 1 FROM r LIMIT " + count +
           ") INSERT OR IGNORE INTO reading SELECT 7, '', n, 0, 0 FROM r";
  };
  RunSql(file_, insert("200"));
  ASSERT_EQ(Open(), kOk);
  EXPECT_EQ(ChildrenOf(7), kOk);
  RunSql(file_, insert("300"));
  ASSERT_EQ(Open(), kOk);
  EXPECT_EQ(ChildrenOf(7), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(EndlessCache, Nodes) {
  PageFile pages(FileContent(file_));
  const uint32_t root = PageFile::RootOf(file_, "node");
  pages.PlantTree(root, 18, Record({"1", ""}), Record({"1", ""}));
  WriteContent(file_, pages.Content());
  EXPECT_EQ(Open(), KSI_STATUS_METADATA_READ_ERROR);
}

// SQLite takes in all of the schema before it answers anything.
TEST_F(EndlessCache, Schema) {
  RunSql(
      file_,
      "PRAGMA writable_schema = ON; WITH RECURSIVE r(n) AS (SELECT 1 UNION ALL SELECT n + 1 FROM "
      "r LIMIT 30000) INSERT INTO sqlite_schema SELECT 'table', 't' || n, 't' || n, 2, 'CREATE "
      "TABLE t' || n || '(a)' FROM r");
  std::unique_ptr<CacheFile> file;
  std::string why;
  EXPECT_EQ(CacheFile::Open(file_.c_str(), &file, &why), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(why, "its pages lead to each other without end");
}

// Each comparison with a row reads all of it, and rows go in a circle through one page: a single
// step of a search takes as long as all the file has pages, for each comparison on each level.
TEST_F(EndlessCache, RowsThatLeadBackToThemselves) {
  PageFile pages(FileContent(file_));
  const uint32_t circle = pages.Append();
  pages.Put(circle, 0, circle);
  constexpr size_t kPages = 300;
  const std::string record = Record({"7", "", "99", "0", "1"});
  uint32_t page = PageFile::RootOf(file_, "reading");
  for (int level = 1; level < 18; ++level) {
    const uint32_t next = pages.Append();
    const std::string cell = OverflowingCell(next, record, kPages * PageFile::kPage, circle);
    pages.Fill(page, {(PageFile::kPage - 12) / (cell.size() + 2), cell}, next);
    page = next;
  }
  pages.Fill(page, {Cell(0, record)}, 0);
  for (size_t i = 0; i < kPages; ++i) pages.Append();
  WriteContent(file_, pages.Content());

  ASSERT_EQ(Open(), kOk);
  Status status = kOk;
  for (int64_t group = 1000; group < 2000; ++group) status = Flags(-group);
  EXPECT_EQ(status, KSI_STATUS_METADATA_READ_ERROR);
  ExpectThatEveryCommandEnds();
}

// What every file may take and how it grows, apart from any file.
TEST(WorkLimit, FollowsFromTheSizeOfTheFile) {
  EXPECT_EQ(WorkLimit::StepsFor(0), 100000);
  EXPECT_EQ(WorkLimit::StepsFor(1000000), 8100000);
  EXPECT_EQ(WorkLimit::StepsFor(uint64_t{1} << 62), WorkLimit::StepsFor(uint64_t{16} << 30));
}

class LimitedWork : public testing::Test {
 protected:
  void SetUp() override {
    sqlite3* database = nullptr;
    ASSERT_EQ(sqlite3_open(":memory:", &database), SQLITE_OK);
    database_.reset(database);
    limit_.Watch(database, 0);
  }

  // Counts to a number, which takes some steps for each.
  int CountTo(int64_t number) {
    Statement rows;
    rows.Prepare(database_.get(),
                 "WITH RECURSIVE r(n) AS (SELECT 1 UNION ALL SELECT n + 1 FROM r LIMIT ?1) "
                 "SELECT count(*) FROM r");
    rows.Bind(1, number);
    return rows.Step();
  }

  WorkLimit limit_;
  Database database_;
};

TEST_F(LimitedWork, EndsWhenItIsUsedUp) {
  limit_.Allow(50000);
  EXPECT_EQ(CountTo(1000), SQLITE_ROW);
  EXPECT_FALSE(limit_.Exceeded());
  EXPECT_EQ(CountTo(100000), SQLITE_INTERRUPT);
  EXPECT_TRUE(limit_.Exceeded());
  EXPECT_EQ(CountTo(1000), SQLITE_INTERRUPT);
}

TEST_F(LimitedWork, IsThatOfAllStatementsTogether) {
  limit_.Allow(50000);
  int code = SQLITE_ROW;
  int rounds = 0;
  for (; code == SQLITE_ROW && rounds < 1000; ++rounds) code = CountTo(1000);
  EXPECT_EQ(code, SQLITE_INTERRUPT);
  EXPECT_GT(rounds, 1);
  EXPECT_LT(rounds, 20);
}

TEST_F(LimitedWork, BeginsAgain) {
  limit_.Allow(50000);
  for (int round = 0; round < 100; ++round) {
    EXPECT_EQ(CountTo(1000), SQLITE_ROW);
    EXPECT_TRUE(limit_.BeginAgain());
  }
}

}  // namespace
}  // namespace ksi
