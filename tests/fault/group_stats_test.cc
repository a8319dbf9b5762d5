#include <gtest/gtest.h>

#include "tests/harness/fault_sweep.h"
#include "tests/harness/hosts.h"

namespace harness {
namespace {

// Two groups below the first, and one below the first of these.
TEST(FaultSweep, GroupStats) {
  Scenario host;
  AddGroup(host, 4, {.name = "top", .tag = "a", .children = {5, 6}});
  AddGroup(host, 5, {.name = "left", .tag = "b", .parent = 4, .children = {51}});
  AddGroup(host, 51, {.name = "below", .tag = "a", .parent = 5});
  AddGroup(host, 6, {.name = "right", .tag = "b", .parent = 4});
  ExpectFaultSweep(
      {.golden = "fault/group_stats.txt",
       .scenario = host,
       .args = {"-r", "group-stats", "-g", "4", "-q", "-t", "-s", "name:nChild:consumed"},
       .statuses = {0xbad0003, 0xbad0014}});
}

}  // namespace
}  // namespace harness
