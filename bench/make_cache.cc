// make_cache FILE SHAPE [COUNT]: a cache file of a host of any size, the same for the same words.
//
//   groups COUNT   COUNT groups below the root, in containers of 1,000
//   deep           a chain of 12 levels, with 2,000 groups beside its sixth
//   vms COUNT      COUNT virtual machines
//   processes COUNT  COUNT user worlds in containers of 1,000, and what the host tells of its
//   memory
//
// Figures come from a generator with a fixed seed: rows differ in their digits, as real ones do.

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <random>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/source.h"
#include "tests/harness/made_host.h"
#include "tools/ksicache/cache_writer.h"

namespace {

constexpr int64_t kRoot = 0;
constexpr int64_t kNoParent = -1;

class Host {
 public:
  explicit Host(const std::string& fileName) : writer_(fileName, true) {}

  // A group with its children, to be added once each.
  void AddGroup(int64_t id, int64_t parent, uint32_t flags, std::span<const int64_t> children) {
    KSI_GroupName name{};
    std::snprintf(name.text, sizeof name.text, "group.%lld", static_cast<long long>(id));
    host_.Value("sched/groups/groupName", name, id);
    KSI_GroupTag tag{};
    std::snprintf(tag.text, sizeof tag.text, "tag%d", static_cast<int>(id % 10));
    host_.Value("sched/groups/groupTag", tag, id);
    host_.Value("sched/groups/parentGroupID", parent, id);
    host_.Value("sched/groups/groupFlags", flags, id);
    host_.Value("sched/groups/memAllocationInKB",
                KSI_GroupAllocation{Amount(), Amount(), 1000, -1, {}}, id);
    KSI_GroupCapacity capacity{};
    capacity.conResv = Unsigned();
    capacity.availResv = Unsigned();
    host_.Value("sched/groups/stats/capacity", capacity, id);
    KSI_GroupMemoryStats stats{};
    stats.memSize = stats.memSizePeak = Unsigned();
    stats.consumed = stats.consumedPeak = Unsigned();
    stats.touched = stats.bActive = stats.allocTgt = Unsigned();
    stats.eMin = stats.bMin = stats.ovhd = Unsigned();
    host_.Value("sched/groups/stats/memoryStats", stats, id);

    host_.List("sched/groups/members/groups", children, id);
  }

  // What the reports on virtual machines read of the world group `client` of group `id`.
  void AddVirtualMachine(int64_t id, int32_t client) {
    host_.Value("sched/groups/groupLeaderID", client, id);
    host_.Value("worldGroups/vmmLeaderID", client, client);
    KSI_VmmTally vmm{};
    vmm.memSizeLimit = vmm.memSize = Unsigned();
    vmm.mapped = vmm.touched = vmm.allocTgt = Unsigned();
    vmm.shared = vmm.sharedSaved = vmm.zero = Unsigned() / 8;
    host_.Value("sched/memClients/tally/vmm", vmm, client);
    KSI_SwapInfo swap{};
    swap.swapped = Unsigned() / 16;
    host_.Value("sched/memClients/swapInfo", swap, client);
  }

  // What the report on user worlds reads of the world group `client` of group `id`.
  void AddUserWorld(int64_t id, int32_t client) {
    host_.Value("sched/groups/groupLeaderID", client, id);
    KSI_UwTally uw{};
    uw.memSize = uw.mapped = uw.pageable = Unsigned();
    host_.Value("sched/memClients/tally/uw", uw, client);
  }

  // The memory of the host, with a heap.
  void AddMemory() {
    KSI_Comprehensive memory{};
    memory.total = memory.managedByMemMap = uint64_t{1} << 30;
    memory.free = Unsigned();
    host_.Value("memory/comprehensive", memory);
    host_.Value("sched/globalStats/memory/tally", KSI_GlobalTally{});
    for (const std::string_view state : ksi::kMemoryStates) {
      host_.Value("sched/globalStats/memory/stateTransitions", KSI_StateTransitions{}, state);
    }
    constexpr std::string_view kHeap = "heap";
    host_.List("system/heaps", std::span(&kHeap, 1));
    KSI_HeapStats stats{};
    std::snprintf(stats.name, sizeof stats.name, "heap");
    stats.size = 1U << 20;
    host_.Value("system/heaps/stats", stats, kHeap);
  }

  void Commit() {
    writer_.Commit({.signature = std::string(ksi::kDefinitions.signature),
                    .built = std::string(ksi::kDefinitions.built),
                    .host = "bench",
                    .taken = "2026-11-21T10:00:00Z"});
  }

 private:
  int64_t Amount() { return static_cast<int64_t>(Unsigned()); }
  uint64_t Unsigned() { return random_() % (1U << (10 + random_() % 18)); }

  ksicache::CacheWriter writer_;
  tally::testing::MadeHost host_{writer_};
  std::mt19937 random_{20261121};
};

std::vector<int64_t> Range(int64_t from, int64_t count) {
  std::vector<int64_t> ids;
  for (int64_t id = from; id < from + count; ++id) ids.push_back(id);
  return ids;
}

// `flags`: of the groups in the containers.
void AddGroups(Host& host, int64_t count, uint32_t flags) {
  constexpr int64_t kContainerSize = 1000;
  // A container's id stands before those of its groups.
  constexpr int64_t kStride = kContainerSize + 1;
  std::vector<int64_t> containers;
  for (int64_t made = 0; made < count; made += kContainerSize) {
    const int64_t container = 1 + static_cast<int64_t>(containers.size()) * kStride;
    containers.push_back(container);
    const std::vector<int64_t> groups =
        Range(container + 1, std::min(kContainerSize, count - made));
    for (const int64_t group : groups) {
      host.AddGroup(group, container, flags, {});
      if ((flags & KSI_GROUP_USER_WORLD) != 0) {
        host.AddUserWorld(group, static_cast<int32_t>(group));
      }
    }
    host.AddGroup(container, kRoot, KSI_GROUP_CONTAINER, groups);
  }
  host.AddGroup(kRoot, kNoParent, KSI_GROUP_PREDEFINED, containers);
}

void AddDeep(Host& host) {
  constexpr int64_t kLevels = 12;
  constexpr int64_t kWideLevel = 6;
  constexpr int64_t kWide = 2000;
  for (int64_t level = 0; level < kLevels; ++level) {
    std::vector<int64_t> children;
    if (level + 1 < kLevels) children.push_back(level + 1);
    if (level + 1 == kWideLevel) {
      for (const int64_t group : Range(kLevels, kWide)) {
        host.AddGroup(group, level, KSI_GROUP_LEAF, {});
        children.push_back(group);
      }
    }
    host.AddGroup(level, level - 1, KSI_GROUP_CONTAINER, children);
  }
}

void AddVirtualMachines(Host& host, int64_t count) {
  std::vector<int64_t> machines;
  for (int64_t i = 0; i < count; ++i) {
    const int64_t machine = 2 + 2 * i;
    const int64_t vmm = machine + 1;
    machines.push_back(machine);
    host.AddGroup(machine, kRoot, KSI_GROUP_VM, std::span(&vmm, 1));
    host.AddGroup(vmm, machine, KSI_GROUP_VMM_SUB_CONTAINER, {});
    host.AddVirtualMachine(machine, static_cast<int32_t>(machine));
  }
  host.AddGroup(kRoot, kNoParent, KSI_GROUP_PREDEFINED, machines);
}

int Make(const std::string& fileName, std::string_view shape, int64_t count) {
  Host host(fileName);
  if (shape == "groups") {
    AddGroups(host, count, KSI_GROUP_LEAF);
  } else if (shape == "deep") {
    AddDeep(host);
  } else if (shape == "vms") {
    AddVirtualMachines(host, count);
  } else if (shape == "processes") {
    AddGroups(host, count, KSI_GROUP_LEAF | KSI_GROUP_USER_WORLD);
    host.AddMemory();
  } else {
    std::fputs("make_cache: SHAPE is groups, deep, vms or processes\n", stderr);
    return 2;
  }
  host.Commit();
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3) {
    std::fputs("Usage: make_cache FILE groups|deep|vms|processes [COUNT]\n", stderr);
    return 2;
  }
  try {
    return Make(argv[1], argv[2], argc > 3 ? std::atoll(argv[3]) : 0);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "make_cache: %s\n", error.what());
    return 1;
  }
}
