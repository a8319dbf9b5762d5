// The reports on memory clients: two clients each, a group below the first.
#include <gtest/gtest.h>

#include <string>

#include "tests/harness/fault_sweep.h"
#include "tests/harness/hosts.h"
#include "tests/harness/report.h"

namespace harness {
namespace {

void Sweep(const char* report, const std::string& golden, const Scenario& host,
           const std::string& columns) {
  ExpectFaultSweep({.golden = "fault/" + golden + ".txt",
                    .scenario = host,
                    .args = {"-r", report, "-g", "4", "-q", "-s", columns},
                    .statuses = {0xbad0003, 0xbad0014}});
}

TEST(FaultSweep, VmStats) { Sweep("vm-stats", "vm_stats", TwoMachines(), "name:min:swapped:ovhd"); }

TEST(FaultSweep, UwStats) { Sweep("uw-stats", "uw_stats", TwoUserWorlds(), "name:memSize"); }

TEST(FaultSweep, SwapStats) {
  Sweep("swap-stats", "swap_stats", TwoMachines(), "name:swapped:llswapped");
}

TEST(FaultSweep, GuestStats) {
  Sweep("guest-stats", "guest_stats", TwoMachines(), "name:memTotal");
}

TEST(FaultSweep, ZipStats) { Sweep("zip-stats", "zip_stats", TwoMachines(), "name:usedCache"); }

TEST(FaultSweep, LPageStats) {
  Sweep("lpage-stats", "lpage_stats", TwoMachines(), "name:nrLocked");
}

TEST(FaultSweep, AsyncRemapStats) {
  Scenario host = TwoUserWorlds();
  host.List("sched_groups_members_memClients", {10}, {100, 101})
      .List("sched_memClients_remapTypes", {100}, {"numa", "large"})
      .List("sched_memClients_remapTypes", {101}, {})
      .List("sched_memClients_remapTypes", {-300}, {"numa"})
      .Value("sched_memClients_remapTypes", {100, "numa"}, NumberedRemapType(1000))
      .Value("sched_memClients_remapTypes", {100, "large"}, NumberedRemapType(2000))
      .Value("sched_memClients_remapTypes", {-300, "numa"}, NumberedRemapType(3000));
  Sweep("asyncremap-stats", "asyncremap_stats", host, "name:grpLeader:added");
}

}  // namespace
}  // namespace harness
