// Groups of a cache file that contain each other, and those that do not.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <memory>
#include <numeric>
#include <string>
#include <utility>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/open_cache.h"
#include "knvlibs/walk_limit.h"
#include "tests/harness/program.h"
#include "tests/harness/tally.h"
#include "tests/knvlibs/cache_fixture.h"

namespace ksi {
namespace {

// A walk in a file without bytes may take 2048 lists and entries.
class WalkLimitTest : public testing::Test {
 protected:
  Status Ask(int64_t group, const std::vector<uint64_t>& groups = {}) {
    const Status status = limit_.Ask(group);
    ParamList list(ParamList::kNoLimit);
    EXPECT_EQ(list.AddNumber(0), kOk);  // of somebody else
    for (const uint64_t each : groups) EXPECT_EQ(list.AddNumber(each), kOk);
    if (status == kOk) limit_.Answer(list, 1);
    return status;
  }

  // Asks for lists without entries until one fails; gives the number of those that did not.
  size_t CountToTheEnd(int64_t group) {
    size_t count = 0;
    while (count < 10000 && Ask(group) == kOk) ++count;
    return count;
  }

  WalkLimit limit_{0};
};

TEST_F(WalkLimitTest, CountsLists) {
  EXPECT_EQ(Ask(0), kOk);
  EXPECT_EQ(CountToTheEnd(1), 2047u);
  EXPECT_EQ(limit_.WalkStatus(), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(Ask(2), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(WalkLimitTest, CountsEntries) {
  std::vector<uint64_t> many(2000);
  std::iota(many.begin(), many.end(), 5);
  EXPECT_EQ(Ask(0, many), kOk);
  EXPECT_EQ(CountToTheEnd(1), 47u);
}

TEST_F(WalkLimitTest, FollowsFromTheSizeOfTheFile) {
  limit_ = WalkLimit(8000);
  EXPECT_EQ(Ask(0), kOk);
  EXPECT_EQ(CountToTheEnd(1), 3047u);
}

TEST_F(WalkLimitTest, BeginsAgainWithItsFirstGroup) {
  for (int walk = 0; walk < 10; ++walk) {
    EXPECT_EQ(Ask(0, {1, 2}), kOk);
    for (int64_t group = 1; group < 1000; ++group) EXPECT_EQ(Ask(group), kOk);
  }
  CountToTheEnd(1);
  EXPECT_EQ(Ask(0), kOk);
  EXPECT_EQ(limit_.WalkStatus(), kOk);
}

TEST_F(WalkLimitTest, EndsWhereAGroupListsOneThatItStandsBelow) {
  EXPECT_EQ(Ask(0, {1, 2}), kOk);
  EXPECT_EQ(Ask(1, {3}), kOk);
  EXPECT_EQ(Ask(3, {4}), kOk);
  EXPECT_EQ(Ask(4, {5, 1}), kOk);
  EXPECT_EQ(limit_.WalkStatus(), KSI_STATUS_METADATA_READ_ERROR);
  EXPECT_EQ(Ask(5), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(WalkLimitTest, EndsWhereAGroupListsItselfOrTheFirst) {
  EXPECT_EQ(Ask(0, {0}), kOk);
  EXPECT_EQ(Ask(0), KSI_STATUS_METADATA_READ_ERROR);
  limit_.Restart();
  EXPECT_EQ(Ask(0, {1}), kOk);
  EXPECT_EQ(Ask(1, {0}), kOk);
  EXPECT_EQ(Ask(0), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(WalkLimitTest, EndsWhereAGroupListsOneTwice) {
  EXPECT_EQ(Ask(0, {3, 1, 2, 3}), kOk);
  EXPECT_EQ(Ask(3), KSI_STATUS_METADATA_READ_ERROR);
}

TEST_F(WalkLimitTest, AGroupThatWasMovedMeanwhileStandsInTwoPlaces) {
  EXPECT_EQ(Ask(0, {1, 2}), kOk);
  EXPECT_EQ(Ask(1, {3}), kOk);
  EXPECT_EQ(Ask(3, {4}), kOk);
  EXPECT_EQ(Ask(4), kOk);
  EXPECT_EQ(Ask(2, {3}), kOk);
  EXPECT_EQ(Ask(3, {4}), kOk);
  EXPECT_EQ(Ask(4), kOk);
  EXPECT_EQ(limit_.WalkStatus(), kOk);
}

TEST_F(WalkLimitTest, CountsOnFromAnotherGroup) {
  EXPECT_EQ(Ask(0, {1}), kOk);
  for (int i = 0; i < 2000; ++i) ASSERT_EQ(Ask(1), kOk);
  EXPECT_EQ(CountToTheEnd(2), 46u);
}

TEST_F(WalkLimitTest, BeginsAgainWhenItIsTold) {
  EXPECT_EQ(Ask(0, {0}), kOk);
  CountToTheEnd(1);
  EXPECT_EQ(Ask(0), KSI_STATUS_METADATA_READ_ERROR);
  limit_.Restart();
  EXPECT_EQ(limit_.WalkStatus(), kOk);
  EXPECT_EQ(Ask(1), kOk);
  EXPECT_EQ(CountToTheEnd(2), 2047u);
}

TEST_F(WalkLimitTest, CountsOtherListsOfAWalk) {
  limit_.PassList(5000);
  EXPECT_EQ(Ask(0), kOk) << "before, there was no walk";
  limit_.PassList(1000);
  limit_.PassList(0);
  EXPECT_EQ(CountToTheEnd(1), 1045u);
}

// Files and reports.

class WalkedCache : public testing::Test {
 protected:
  // Adds a group with all that group-stats reads.
  static void AddGroup(ksicache::CacheWriter& writer, int64_t id,
                       const std::vector<uint64_t>& groups) {
    const auto add = [&](const char* path) {
      const Node& node = NodeAt(path);
      // All bits, for reports that look for one of some.
      const bool flags = node.path == "sched/groups/groupFlags";
      const std::vector<std::byte> record(node.recordSize, std::byte(flags ? 255 : 0));
      writer.AddValue(node, MakeKeys({id}), record);
    };
    for (const char* path :
         {"sched/groups/groupName", "sched/groups/groupTag", "sched/groups/parentGroupID",
          "sched/groups/groupFlags", "sched/groups/memAllocationInKB",
          "sched/groups/stats/capacity", "sched/groups/stats/memoryStats"}) {
      add(path);
    }
    std::vector<Key> list;
    for (const uint64_t group : groups) {
      list.push_back({KeyKind::kNumber, static_cast<int64_t>(group), {}});
    }
    writer.AddList(NodeAt("sched/groups/members/groups"), MakeKeys({id}), list);
  }

  harness::Result Run(const std::string& report, std::vector<std::string> options) {
    harness::Args args = {"-c", file_, "-r", report, "-q"};
    args.insert(args.end(), options.begin(), options.end());
    return harness::RunProgram(harness::BuiltTally(args));
  }

  harness::Result Report(std::vector<std::string> options) {
    options.insert(options.begin(), {"-s", "gid"});
    return Run("group-stats", std::move(options));
  }

  static size_t Lines(const std::string& text) {
    return static_cast<size_t>(std::ranges::count(text, '\n'));
  }

  // Expects the report to end with some rows and with the message.
  void ExpectEnd(const std::vector<std::string>& options) {
    const harness::Result result = Report(options);
    EXPECT_EQ(result.status, 1);
    EXPECT_GT(Lines(result.out), 1u);
    EXPECT_LT(Lines(result.out), 20000u);
    EXPECT_LT(Lines(result.err), 20000u);
    EXPECT_NE(result.err.find("tally: groups contain each other, rows are missing: "),
              std::string::npos);
  }

  TestDirectory directory_;
  std::string file_ = directory_.Path("host.ksi");
};

TEST_F(WalkedCache, GroupsInCirclesEnd) {
  {
    ksicache::CacheWriter writer(file_, true);
    AddGroup(writer, 0, {1, 2, 1, 2});
    AddGroup(writer, 1, {0, 2});
    AddGroup(writer, 2, {1, 0});
    writer.Commit(TestCapture());
  }
  ExpectEnd({});
  ExpectEnd({"-l", "1000"});
  ExpectEnd({"-g", "2"});
  ExpectEnd({"-l", "2"});
}

TEST_F(WalkedCache, AGroupInItselfIsDamageHoweverFewRowsItMakes) {
  {
    ksicache::CacheWriter writer(file_, true);
    AddGroup(writer, 0, {1});
    AddGroup(writer, 1, {1});
    writer.Commit(TestCapture());
  }
  ExpectEnd({});
}

TEST_F(WalkedCache, LayersOfGroupsEnd) {
  {
    ksicache::CacheWriter writer(file_, true);
    // 50 groups a layer, each of which lists all of the next.
    std::vector<uint64_t> next(50);
    for (int64_t id = 0; id < 12 * 50; ++id) {
      std::iota(next.begin(), next.end(), id == 0 ? 1 : ((id - 1) / 50 + 1) * 50 + 1);
      AddGroup(writer, id, next);
    }
    writer.Commit(TestCapture());
  }
  ExpectEnd({});
  EXPECT_GT(Lines(Report({}).out), 1000u);
}

// A process that moved while the host was captured stands in two groups.
TEST_F(WalkedCache, GroupsThatMovedAreShownTwice) {
  {
    ksicache::CacheWriter writer(file_, true);
    AddGroup(writer, 0, {1, 2});
    AddGroup(writer, 1, {3});
    AddGroup(writer, 2, {3});
    AddGroup(writer, 3, {});
    writer.Commit(TestCapture());
  }
  const harness::Result result = Report({});
  EXPECT_EQ(result.status, 0);
  EXPECT_EQ(result.out, "gid\n0\n1\n3\n2\n3\n");
  EXPECT_EQ(result.err, "");
}

TEST_F(WalkedCache, VolumesThatAreListedOverAndOverEnd) {
  {
    ksicache::CacheWriter writer(file_, true);
    const std::vector<Key> names(2000, Key{KeyKind::kText, 0, "v"});
    const std::string path = "memory/pmem/volumes";
    const KSI_PmemRegion region = {};
    writer.AddList(NodeAt(path), {}, names);
    writer.AddList(NodeAt(path + "/regionStore/regions"), MakeKeys({"v"}), names);
    writer.AddValue(NodeAt(path + "/regionStore/regions/info"), MakeKeys({"v", "v"}),
                    BytesOf(region));
    writer.Commit(TestCapture());
  }
  const harness::Result result = Run("pmem-stats", {"-l", "2"});
  EXPECT_EQ(result.status, 0);
  EXPECT_GT(Lines(result.out), 2000u);
  EXPECT_LT(Lines(result.out), 20000u);
  EXPECT_EQ(result.err,
            file_ +
                ": memory/pmem/volumes/regionStore/regions: volumes are listed over and "
                "over\n");
}

// A program that goes over the volumes again begins anew.
TEST_F(WalkedCache, VolumesAreWalkedOverAgainAndAgain) {
  {
    ksicache::CacheWriter writer(file_, true);
    writer.AddList(NodeAt("memory/pmem/volumes"), {}, TextList({"v", "w"}));
    writer.AddList(NodeAt("memory/pmem/volumes/regionStore/regions"), MakeKeys({"v"}),
                   TextList({"1", "2"}));
    writer.Commit(TestCapture());
  }
  std::unique_ptr<Source> source;
  ASSERT_EQ(OpenCacheSource(file_.c_str(), &source), kOk);
  for (int walk = 0; walk < 10000; ++walk) {
    ParamList list(ParamList::kNoLimit);
    ASSERT_EQ(source->Instances(NodeAt("memory/pmem/volumes"), {}, list), kOk);
    ASSERT_EQ(
        source->Instances(NodeAt("memory/pmem/volumes/regionStore/regions"), MakeKeys({"v"}), list),
        kOk);
  }
}

TEST_F(WalkedCache, ClientsThatAreListedOverAndOverEnd) {
  {
    ksicache::CacheWriter writer(file_, true);
    AddGroup(writer, 0, {});
    const std::vector<Key> clients(2000, Key{KeyKind::kNumber, 7, {}});
    const std::vector<Key> types(2000, Key{KeyKind::kText, 0, "t"});
    const KSI_RemapType pages = {};
    writer.AddList(NodeAt("sched/groups/members/memClients"), MakeKeys({0}), clients);
    writer.AddList(NodeAt("sched/memClients/remapTypes"), MakeKeys({7}), types);
    writer.AddValue(NodeAt("sched/memClients/remapTypes"), MakeKeys({7, "t"}), BytesOf(pages));
    writer.Commit(TestCapture());
  }
  const harness::Result result = Run("asyncremap-stats", {});
  EXPECT_EQ(result.status, 1);
  EXPECT_GT(Lines(result.out), 2000u);
  EXPECT_LT(Lines(result.out), 20000u);
  EXPECT_NE(result.err.find("tally: groups contain each other, rows are missing: "),
            std::string::npos);
}

TEST_F(WalkedCache, LargeHostsAreWalkedOverAgainAndAgain) {
  constexpr int64_t kGroups = 5000;
  {
    ksicache::CacheWriter writer(file_, true);
    std::vector<uint64_t> groups;
    for (int64_t id = 1; id <= kGroups; ++id) groups.push_back(static_cast<uint64_t>(id));
    AddGroup(writer, 0, groups);
    for (int64_t id = 1; id <= kGroups; ++id) AddGroup(writer, id, {});
    writer.Commit(TestCapture());
  }
  std::unique_ptr<Source> source;
  ASSERT_EQ(OpenCacheSource(file_.c_str(), &source), kOk);
  for (int walk = 0; walk < 200; ++walk) {
    for (int64_t id = 0; id <= kGroups; id += walk == 0 ? 1 : 10) {
      ParamList list(ParamList::kNoLimit);
      ASSERT_EQ(source->Instances(NodeAt("sched/groups/members/groups"), MakeKeys({id}), list),
                kOk);
    }
  }
  EXPECT_EQ(source->WalkStatus(), kOk);
  EXPECT_EQ(Lines(Report({}).out), 5002u);
}

}  // namespace
}  // namespace ksi
