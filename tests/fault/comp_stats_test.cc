#include <gtest/gtest.h>

#include "tests/harness/fault_sweep.h"
#include "tests/harness/hosts.h"

namespace harness {
namespace {

TEST(FaultSweep, CompStats) {
  Scenario host;
  AddHostMemory(host, {});
  ExpectFaultSweep({.golden = "fault/comp_stats.txt",
                    .scenario = host,
                    .args = {"-c", "host.ksi", "-r", "comp-stats", "-s", "total:free", "-v"}});
}

}  // namespace
}  // namespace harness
