#include "tests/harness/report.h"

#include <gtest/gtest.h>

#include <utility>

#include "tests/harness/hosts.h"

namespace harness {
namespace {

constexpr char kChildren[] = "sched_groups_members_groups";

constexpr uint32_t kNotFound = 0xbad0003;

}  // namespace

TallyRun Report::Run(const Scenario& scenario, Args args) const {
  args.insert(args.begin(), {"-r", name_, "-g", "4"});
  return RunTally(scenario, args);
}

std::string Report::Rows(const Scenario& scenario, const std::string& columns,
                         const Args& args) const {
  Args all = {"-q"};
  if (!columns.empty()) all.insert(all.end(), {"-s", columns});
  all.insert(all.end(), args.begin(), args.end());
  const TallyRun run = Run(scenario, all);
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(run.err, "");
  return run.out.substr(run.out.find('\n') + 1);
}

Scenario TwoMachines() {
  Scenario host;
  AddGroup(host, 4, {.name = "top", .children = {10, 20}});
  AddVirtualMachine(host, 10, {.name = "web", .parent = 4, .leader = 100});
  AddVirtualMachine(host, 20,
                    {.name = "a database in its 28 letters", .parent = -1, .leader = -300});
  AddGroup(host, 12, {.name = "below", .parent = 10});
  return host.List(kChildren, {10}, {11, 12});
}

Scenario TwoUserWorlds() {
  Scenario host;
  AddGroup(host, 4, {.name = "top", .children = {10, 20}});
  AddUserWorld(host, 10, {.name = "hostd", .parent = 4, .leader = 100});
  AddUserWorld(host, 20, {.name = "a helper of many letters", .parent = -1, .leader = -300});
  AddGroup(host, 12, {.name = "below", .parent = 10});
  return host.List(kChildren, {10}, {12});
}

std::string ReadsOfClient20() {
  return "CheckSig() "
         "Create(1,2) AddInt(20) GetInstanceListAlloc(sched_groups_members_groups,[20]) "
         "RemoveLast() Destroy() UsedCount(sched_groups_members_groups,[20]) "
         "Create(1,2) AddInt(20) Get(sched_groups_groupFlags,[20]) RemoveLast() Destroy() "
         "Create(1,2) AddInt(20) Get(sched_groups_groupName,[20]) RemoveLast() Destroy() "
         "Create(1,2) AddInt(20) Get(sched_groups_parentGroupID,[20]) RemoveLast() Destroy() "
         "Create(1,2) AddInt(20) Get(sched_groups_groupFlags,[20]) RemoveLast() Destroy() "
         "Create(1,2) AddInt(20) Get(sched_groups_groupLeaderID,[20]) RemoveLast() Destroy() ";
}

void ExpectFailuresHideGroup10(const Report& report, const Scenario& host,
                               std::vector<FailedRead> reads) {
  const std::pair<const char*, const char*> common[] = {
      {"sched_groups_groupFlags", "Tally_GroupGetFlags"},
      {"sched_groups_groupName", "Tally_GroupGetName"},
      {"sched_groups_parentGroupID", "Tally_GroupGetParentID"},
      {"sched_groups_groupLeaderID", "Tally_GroupGetGroupLeaderID"}};
  for (const auto& [node, reader] : common) {
    reads.push_back({node, {10}, std::string(reader) + "() failure, error code: 195887107\n"});
  }

  Scenario without10 = host;
  without10.List(kChildren, {4}, {20});
  const std::string others = report.Run(without10).out;
  Scenario bare10 = host;
  bare10.Value("sched_groups_groupFlags", {10}, uint32_t{0}).List(kChildren, {10}, {});
  const std::string none = report.Run(bare10, {"-g", "10"}).out;

  for (const FailedRead& read : reads) {
    Scenario failing = host;
    failing.Fails(read.node, read.keys, kNotFound);
    const TallyRun below = report.Run(failing);
    EXPECT_EQ(below.out, others) << read.node;
    EXPECT_EQ(below.err, read.warnings) << read.node;
    EXPECT_EQ(below.status, 0) << read.node;
    EXPECT_EQ(below.Calls().find("[12]"), std::string::npos) << read.node;

    const TallyRun start = report.Run(failing, {"-g", "10"});
    EXPECT_EQ(start.out, none) << read.node;
    EXPECT_EQ(start.err, read.warnings) << read.node;
    EXPECT_EQ(start.status, 1) << read.node;
  }
}

}  // namespace harness
