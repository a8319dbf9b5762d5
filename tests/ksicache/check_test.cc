// check.
#include <utility>
#include <vector>

#include "knvlibs/source.h"
#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {
namespace {

TEST_F(Ksicache, CheckFindsNothingInGoodFiles) {
  WriteSmallHost(Path("host.ksi"));
  EXPECT_EQ(Output({"check", Path("host.ksi")}), "");
}

TEST_F(Ksicache, CheckSaysWhatIsWrongAndWhere) {
  const std::string file = Path("host.ksi");
  WriteSmallHost(file);
  const std::string good = FileContent(file);
  const auto expect = [&](const std::string& sql, const std::string& problem) {
    WriteContent(file, good);
    RunSql(file, sql);
    const harness::Result result = Run({"check", file});
    EXPECT_EQ(result.status, 1) << sql;
    EXPECT_EQ(result.out, file + ": " + problem + "\n");
    EXPECT_EQ(result.err, "");
  };
  const std::string flags = "(SELECT id FROM node WHERE path = 'sched/groups/groupFlags')";
  const std::string groups = "(SELECT id FROM node WHERE path = 'sched/groups/members/groups')";
  const std::string other = "00112233445566778899aabbccddeeff";
  expect(
      "UPDATE capture SET signature = '" + other + "'",
      "signature " + other + " is not " + std::string(kDefinitions.signature) + " of this version");
  expect("INSERT INTO node VALUES(700, 'sched/later', 'list')", "there is no node sched/later");
  expect("UPDATE reading SET answer = zeroblob(5) WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has 5 bytes, its record 4");
  expect("UPDATE reading SET answer = 5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has no record");
  expect("UPDATE reading SET status = -5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has no good status");
  expect("UPDATE reading SET status = 5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: failed and has an answer");
  expect("UPDATE reading SET key1 = 'x' WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [x]: has keys that the node does not take");
  expect("UPDATE reading SET key2 = 5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has keys that the node does not take");
  expect("UPDATE reading SET key1 = 7.5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags: has keys that the node does not take");
  expect("UPDATE reading SET node = 900 WHERE key1 = 7 AND node = " + flags,
         "node 900 [7]: is not in the table of nodes");
  expect("UPDATE reading SET answer = -2 WHERE key1 = 7 AND node = " + groups,
         "sched/groups/members/groups [7]: has no number of instances");
  expect("UPDATE reading SET answer = 1 WHERE key1 = 7 AND node = " + groups,
         "sched/groups/members/groups [7]: has 0 entries and says 1");
  expect(
      "UPDATE instance SET position = 2 WHERE key1 = 0 AND position = 1; UPDATE reading SET "
      "answer = 3 WHERE key1 = 0 AND answer = 2",
      "sched/groups/members/groups [0]: has entry 2 where entry 1 has to be");
  expect("UPDATE instance SET entry = 'x' WHERE key1 = 0 AND position = 1",
         "sched/groups/members/groups [0]: entry 1 is no number");
  expect("UPDATE instance SET entry = 5 WHERE key1 = 30 AND position = 1",
         "sched/memClients/remapTypes [30]: entry 1 is no text");
  expect("INSERT INTO instance VALUES(55, '', " + groups + ", 0, 1)",
         "1 entries belong to no list");
  expect("INSERT INTO instance VALUES(7, '', " + flags + ", 0, 1)", "1 entries belong to no list");
  expect("INSERT INTO node VALUES(700, 'system/heaps', 'list')",
         "node system/heaps is there twice");
  expect(
      "UPDATE instance SET position = 9223372036854775807 WHERE key1 = 0 AND position = 1; "
      "UPDATE reading SET answer = 9223372036854775807 WHERE key1 = 0 AND answer = 2",
      "sched/groups/members/groups [0]: has entry 9223372036854775807 where entry 1 has to be\n" +
          file +
          ": sched/groups/members/groups [0]: has 9223372036854775808 entries and says "
          "9223372036854775807");
  expect("UPDATE instance SET entry = printf('%05000d', 0) WHERE key1 = 30 AND position = 1",
         "sched/memClients/remapTypes [30]: entry 1 is longer than 4096 bytes");
  expect("UPDATE instance SET entry = 'small' WHERE key1 = 30",
         "sched/memClients/remapTypes [30]: entry 1 is the same as entry 0");
  expect("UPDATE capture SET taken = '2026-02-29T10:00:00Z'",
         "taken 2026-02-29T10:00:00Z is no date and time");

  // And what is wrong below the tables.
  std::string bad = good;
  bad[bad.size() - 4096 + 3] = 99;  // the number of cells of a page
  WriteContent(file, bad);
  const harness::Result result = Run({"check", file});
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.out + result.err, "");
}

// What check calls whole, dump writes and load takes.
TEST_F(Ksicache, CheckFindsKeysThatCannotBeAskedFor) {
  const std::string file = Path("host.ksi");
  for (const std::string key : {"CAST(x'610062' AS TEXT)", "printf('%05000d', 0)"}) {
    WriteSmallHost(file);
    RunSql(file, "UPDATE reading SET key2 = " + key + " WHERE key2 = 'large'");
    EXPECT_EQ(Run({"check", file}).status, 1) << key;
    EXPECT_NE(Run({"check", file}).out.find("]: has keys that the node does not take\n"),
              std::string::npos);
    EXPECT_EQ(Run({"dump", file}).status, 1);
  }
}

TEST_F(Ksicache, CheckFindsGroupsThatAreNoTree) {
  const auto check = [this](const std::vector<std::pair<int64_t, std::vector<Key>>>& lists) {
    ksicache::CacheWriter writer(Path("a.ksi"), true);
    for (const auto& [group, children] : lists) {
      writer.AddList(NodeAt("sched/groups/members/groups"), MakeKeys({group}), children);
    }
    writer.Commit(TestCapture());
    const harness::Result result = Run({"check", Path("a.ksi")});
    EXPECT_EQ(result.status, result.out.empty() ? 0 : 1);
    EXPECT_EQ(result.err, "");
    return result.out;
  };
  const std::string file = Path("a.ksi") + ": ";
  const std::string groups = file + "sched/groups/members/groups ";
  EXPECT_EQ(check({{0, NumberList({4, 5})}, {4, NumberList({6})}, {6, {}}}), "");
  EXPECT_EQ(check({{0, NumberList({4, 4})}}),
            groups + "[0]: has group 4, which group 0 has already\n");
  EXPECT_EQ(check({{0, NumberList({4, 5})}, {4, NumberList({5})}}),
            groups + "[4]: has group 5, which group 0 has already\n");
  EXPECT_EQ(check({{0, NumberList({0})}}), file + "group 0 stands below itself\n");
  EXPECT_EQ(check({{0, NumberList({4})}, {4, NumberList({5})}, {5, NumberList({0, 6})}}),
            file + "group 0 stands below itself\n");
  EXPECT_EQ(
      check(
          {{0, NumberList({4})}, {8, NumberList({9})}, {9, NumberList({7})}, {7, NumberList({8})}}),
      file + "group 7 stands below itself\n");
}

TEST_F(Ksicache, CheckFindsClientsOfTwoGroups) {
  const char* node = "sched/groups/members/memClients";
  ksicache::CacheWriter writer(Path("a.ksi"), true);
  writer.AddList(NodeAt(node), MakeKeys({4}), NumberList({7, 8, 8}));
  writer.AddList(NodeAt(node), MakeKeys({5}), NumberList({9, 7}));
  writer.AddList(NodeAt(node), MakeKeys({6}), NumberList({7, 10}));
  writer.Commit(TestCapture());
  const harness::Result result = Run({"check", Path("a.ksi")});
  const std::string start = Path("a.ksi") + ": " + node;
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.out, start + " [4]: entry 2 is the same as entry 1\n" +  //
                            start + " [5]: has client 7, which group 4 has already\n" + start +
                            " [6]: has client 7, which group 4 has already\n");
  EXPECT_EQ(result.err, "");
}

TEST_F(Ksicache, CheckFindsWhatAListNamesTwice) {
  const auto check = [this](const char* node, const Keys& keys, const std::vector<Key>& entries) {
    ksicache::CacheWriter writer(Path("a.ksi"), true);
    writer.AddList(NodeAt(node), keys, entries);
    writer.Commit(TestCapture());
    const harness::Result result = Run({"check", Path("a.ksi")});
    EXPECT_EQ(result.status, result.out.empty() ? 0 : 1);
    EXPECT_EQ(result.err, "");
    return result.out;
  };
  const std::string file = Path("a.ksi") + ": ";
  const char* clients = "sched/groups/members/memClients";
  EXPECT_EQ(check(clients, MakeKeys({4}), NumberList({7, 8, 9})), "");
  EXPECT_EQ(check(clients, MakeKeys({4}), NumberList({7, 8, 7, 7})),
            file + clients + " [4]: entry 2 is the same as entry 0\n" + file + clients +
                " [4]: entry 3 is the same as entry 0\n");
  for (const char* node : {"memory/pmem/volumes", "system/heaps", "system/buddy"}) {
    EXPECT_EQ(check(node, MakeKeys({}), TextList({"a", "b", "b"})),
              file + node + ": entry 2 is the same as entry 1\n");
  }
  const char* regions = "memory/pmem/volumes/regionStore/regions";
  EXPECT_EQ(check(regions, MakeKeys({"v"}), TextList({"r", "r"})),
            file + regions + " [v]: entry 1 is the same as entry 0\n");
}

TEST_F(Ksicache, CheckFindsTwoCaptures) {
  WriteSmallHost(Path("host.ksi"));
  RunSql(Path("host.ksi"), "INSERT INTO capture SELECT * FROM capture");
  ExpectFailure({"check", Path("host.ksi")},
                Path("host.ksi") + ": damaged: the table capture has more than one row");
}

TEST_F(Ksicache, CheckTakesSeveralFiles) {
  WriteSmallHost(Path("good.ksi"));
  WriteSmallHost(Path("bad.ksi"));
  RunSql(Path("bad.ksi"), "INSERT INTO node VALUES(700, 'sched/later', 'list')");
  const harness::Result result =
      Run({"check", Path("none"), Path("bad.ksi"), Path("good.ksi"), Path("bad.ksi")});
  EXPECT_EQ(result.status, 1);
  const std::string problem = Path("bad.ksi") + ": there is no node sched/later\n";
  EXPECT_EQ(result.out, problem + problem);
  EXPECT_EQ(result.err, "ksicache: " + Path("none") + ": No such file or directory\n");
  EXPECT_EQ(Output({"check", Path("good.ksi"), Path("good.ksi")}), "");
}

}  // namespace
}  // namespace ksi
