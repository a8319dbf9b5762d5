// Hosts for scenarios: groups, virtual machines, user worlds and a whole host, with figures that
// tell the fields of a record apart.
#ifndef TESTS_HARNESS_HOSTS_H_
#define TESTS_HARNESS_HOSTS_H_

#include <cstdint>
#include <string>

#include <knvlibs/ksi_records.h>
#include "tests/harness/scenario.h"

namespace harness {

// Records whose memory figures, in the order of the record, are `first` KB and each next one
// 1024 KB more; counts go on in the same row. `mapped` has another 1000000 KB, since reports
// subtract from it. Flags are set.
KSI_GroupMemoryStats NumberedMemoryStats(uint64_t first);
KSI_GroupCapacity NumberedCapacity(uint64_t first);
KSI_VmmTally NumberedVmmTally(uint64_t first);
KSI_UwTally NumberedUwTally(uint64_t first);
KSI_GuestTally NumberedGuestTally(uint64_t first);
KSI_SwapInfo NumberedSwapInfo(uint64_t first);
KSI_MemzipInfo NumberedMemzipInfo(uint64_t first);
KSI_RemapType NumberedRemapType(uint64_t first);
KSI_VmLargePages NumberedVmLargePages(uint64_t first);
KSI_LargePagePool NumberedLargePagePool(uint64_t first);
KSI_Comprehensive NumberedComprehensive(uint64_t first);
KSI_PshareStats NumberedPshareStats(uint64_t first);
KSI_HeapStats NumberedHeapStats(const std::string& name, uint32_t first);

// A scheduler group: all that is read of one by its id.
struct Group {
  std::string name = "group";
  std::string tag = "tag";
  int64_t parent = 0;
  uint32_t flags = KSI_GROUP_CONTAINER;
  int32_t leader = 0;
  KSI_GroupAllocation allocation = {
      .min = 1024, .max = -1, .shares = 1000, .minLimit = -1, .unused28 = {}};
  KSI_GroupCapacity capacity = NumberedCapacity(10240);
  KSI_GroupMemoryStats memory = NumberedMemoryStats(100000);
  Items children = {};
  Items clients = {};
};
void AddGroup(Scenario& scenario, int64_t id, const Group& group);

// A virtual machine: the group `id`, its "vmm" child group `id` + 1, its world group `leader` and
// the leader's records, and the VMM leader `leader` + 1 and its records.
struct VirtualMachine {
  std::string name = "vm";
  int64_t parent = 0;
  uint32_t flags = KSI_GROUP_VM | KSI_GROUP_CONTAINER;
  int32_t leader = 0;
  KSI_GroupAllocation allocation = {
      .min = 2048, .max = 4096, .shares = 2000, .minLimit = -1, .unused28 = {}};
  KSI_GroupAllocation vmmAllocation = {
      .min = 512, .max = 8192, .shares = 3000, .minLimit = 9216, .unused28 = {}};
  KSI_GroupMemoryStats memory = NumberedMemoryStats(200000);
  KSI_VmmTally vmm = NumberedVmmTally(300000);
  KSI_GuestTally guest = NumberedGuestTally(400000);
  KSI_MemzipInfo memzip = NumberedMemzipInfo(500000);
  KSI_SwapInfo swap = NumberedSwapInfo(600000);
  KSI_VmLargePages largePages = NumberedVmLargePages(700000);
};
void AddVirtualMachine(Scenario& scenario, int64_t id, const VirtualMachine& machine);

// A user world: the group `id` and its world group `leader`.
struct UserWorld {
  std::string name = "world";
  int64_t parent = 0;
  uint32_t flags = KSI_GROUP_USER_WORLD | KSI_GROUP_LEAF;
  int32_t leader = 0;
  KSI_UwTally uw = NumberedUwTally(800000);
};
void AddUserWorld(Scenario& scenario, int64_t id, const UserWorld& world);

// What comp-stats reads.
struct HostMemory {
  KSI_Comprehensive memory = NumberedComprehensive(1000000);
  uint64_t managedByMemSched = 2000000;  // KB
  uint64_t minFree = 2001024;            // KB
  uint32_t memState = 0;
  // Departures from high, clear, soft, hard and low.
  uint32_t up[5] = {1000000, 10, 20, 30, 40};
  uint32_t down[5] = {1, 2, 3, 4, 5000000};
};
void AddHostMemory(Scenario& scenario, const HostMemory& host);

}  // namespace harness

#endif  // TESTS_HARNESS_HOSTS_H_
