// make_fleet DIRECTORY HOSTS: what was recorded of a fleet in a day, the same for the same words.
//
// A host has a file, host-NNNN.rec, with moments of yesterday 10:00, of 22:00 and of today 10:00, a
// second later for each host; every tenth has a capture of each instead, host-NNNN.H.ksi, and every
// fiftieth is there since today. It has 12 to 27 machines, whose
// memory in use goes up and down by a few percent, and 8 heaps that do likewise. But
//
//   of every 143rd host the free memory is less than its minimum today;
//   a machine of every 97th host, ten at most, grows by 8 GB and more, each by another amount, and
//   another host has one today that was not there before;
//   the heap "netBuf" grows on all hosts of the second of three kernels, and on some of the others,
//   the heap "fsCache" on all but one of each kernel.
//
// What is so is printed, for whoever asks a database about the fleet:
//
//   below HOST, grown HOST MACHINE KILOBYTES, leaks HEAP KERNEL

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <limits>
#include <random>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/node_table.h"
#include "knvlibs/times.h"
#include "tests/harness/made_host.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/moment_builder.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/recorder.h"

namespace {

using tally::testing::MadeHost;

constexpr uint64_t kGigabyte = 1 << 20;  // in KB
constexpr std::array<const char*, 3> kKernels = {"Mar 02 2026 11:20:05", "Jun 17 2026 08:41:52",
                                                 "Oct 05 2026 16:03:30"};
constexpr size_t kLeakyKernel = 1;
constexpr std::array<const char*, 8> kHeaps = {"netBuf",   "fsCache",   "pciDev", "scsiCmd",
                                               "timerMgr", "worldMisc", "shadow", "vsiNodes"};
enum LeakyHeap : size_t { kNetBuf, kFsCache };
constexpr std::array<int64_t, 3> kHours = {10, 22, 34};  // from 2026-11-20T00:00:00Z on
constexpr size_t kLast = kHours.size() - 1;
constexpr size_t kGrownMachines = 10;
constexpr uint64_t kGrownMachine = 2;  // of its host's machines
constexpr int64_t kEveryGrown = 97;
constexpr int64_t kComeMachine = 11;  // the host of the one that came
constexpr uint64_t kCome = 20 * kGigabyte + 7;
constexpr int64_t kEveryBelow = 143;
constexpr int64_t kEveryNew = 50;
constexpr int64_t kEveryCapture = 10;

uint64_t MachinesOf(int64_t host) { return 12 + static_cast<uint64_t>(host) % 16; }
size_t KernelOf(int64_t host) { return static_cast<size_t>(host) % kKernels.size(); }

std::string NameOf(int64_t host) {
  char name[32];
  std::snprintf(name, sizeof name, "host-%04d", static_cast<int>(host));
  return name;
}

std::string MachineName(int64_t host, uint64_t machine) {
  return "vm-" + std::to_string(host) + "-" + std::to_string(machine);
}

// What its third machine grew by until now, in KB; 0 if it is none of those.
uint64_t GrowthOf(int64_t host) {
  const auto place = static_cast<uint64_t>(host / kEveryGrown);
  if (host % kEveryGrown != 0 || place >= kGrownMachines) return 0;
  return (8 + place) * kGigabyte + place;
}

bool IsNew(int64_t host) { return host % kEveryNew == 7; }

bool IsBelow(int64_t host) { return host % kEveryBelow == 5; }

bool Leaks(int64_t host, size_t heap) {
  if (heap == kNetBuf) return KernelOf(host) == kLeakyKernel || host % 5 == 0;
  // The first host of each kernel is the one where it does not.
  return heap == kFsCache && host >= static_cast<int64_t>(kKernels.size());
}

// The readings of a host at one of its moments.
class Fleet {
 public:
  Fleet(int64_t host, ksicache::ReadingSink& sink)
      : host_(host), random_(static_cast<uint32_t>(host)), made_(sink) {}

  void Add(size_t moment) {
    AddGroup(0, -1, "host", KSI_GROUP_PREDEFINED);
    std::vector<int64_t> groups;
    for (uint64_t i = 0; i < MachinesOf(host_); ++i) groups.push_back(100 + 2 * int64_t(i));
    const size_t before = groups.size();
    if (host_ == kComeMachine && moment == kLast) groups.push_back(100 + 2 * int64_t(before));
    made_.List("sched/groups/members/groups", groups, int64_t{0});
    uint64_t inUse = 0;
    for (uint64_t i = 0; i < before; ++i) inUse += AddMachine(i, groups[i], moment);
    AddBalance(inUse, moment);
    made_.List("system/heaps", kHeaps);
    for (size_t i = 0; i < kHeaps.size(); ++i) AddHeap(i, moment);
    // Nothing else changes by it.
    if (groups.size() > before) AddMachine(before, groups.back(), moment);
  }

 private:
  // A percent or two more or less, another at each moment.
  uint64_t Wobbled(uint64_t figure, size_t moment) {
    std::array<uint64_t, kHours.size()> parts{};
    for (uint64_t& part : parts) part = random_() % 33;
    return figure + figure / 1024 * parts[moment];
  }

  void AddGroup(int64_t id, int64_t parent, const std::string& name, uint32_t flags) {
    KSI_GroupName record{};
    std::snprintf(record.text, sizeof record.text, "%s", name.c_str());
    made_.Value("sched/groups/groupName", record, id);
    made_.Value("sched/groups/groupTag", KSI_GroupTag{}, id);
    made_.Value("sched/groups/parentGroupID", parent, id);
    made_.Value("sched/groups/groupFlags", flags, id);
    made_.Value("sched/groups/memAllocationInKB", KSI_GroupAllocation{0, -1, 1000, -1, {}}, id);
    made_.Value("sched/groups/stats/capacity", KSI_GroupCapacity{}, id);
    made_.Value("sched/groups/stats/memoryStats", KSI_GroupMemoryStats{}, id);
  }

  uint64_t AddMachine(uint64_t number, int64_t group, size_t moment) {
    const int64_t part = group + 1;
    const auto client = static_cast<int32_t>(group);
    AddGroup(group, 0, MachineName(host_, number), KSI_GROUP_VM);
    made_.List("sched/groups/members/groups", std::array{part}, group);
    AddGroup(part, group, "vmm", KSI_GROUP_VMM_SUB_CONTAINER);
    made_.List("sched/groups/members/groups", std::array<int64_t, 0>{}, part);
    made_.Value("sched/groups/groupLeaderID", client, group);
    made_.Value("worldGroups/vmmLeaderID", client, int64_t{client});
    KSI_VmmTally vmm{};
    vmm.memSizeLimit = vmm.memSize = 32 * kGigabyte;
    const uint64_t base = (2 + random_() % 6) * kGigabyte;
    vmm.mapped = Wobbled(base, moment);
    if (number == kGrownMachine && GrowthOf(host_) != 0) {
      vmm.mapped = base + (moment == kLast ? GrowthOf(host_) : 0);
    }
    if (number == MachinesOf(host_)) vmm.mapped = kCome;
    vmm.touched = vmm.mapped / 3;
    made_.Value("sched/memClients/tally/vmm", vmm, int64_t{client});
    made_.Value("sched/memClients/swapInfo", KSI_SwapInfo{}, int64_t{client});
    return vmm.mapped;
  }

  void AddBalance(uint64_t inUse, size_t moment) {
    KSI_Comprehensive host{};
    host.total = host.managedByMemMap = 512 * kGigabyte;
    host.dataAndHeap = 8 * kGigabyte;
    host.knvClientConsumed = inUse;
    host.free = host.total - host.dataAndHeap - inUse;
    KSI_GlobalTally tally{};
    tally.managedByMemSched = host.total - host.dataAndHeap;
    tally.minFree = 4 * kGigabyte;
    tally.memState = KSI_MEMORY_STATE_HIGH;
    if (IsBelow(host_) && moment == kLast) {
      host.otherConsumed = host.free - 3 * kGigabyte;
      host.free = 3 * kGigabyte;
      tally.memState = KSI_MEMORY_STATE_SOFT;
    }
    made_.Value("memory/comprehensive", host);
    made_.Value("sched/globalStats/memory/tally", tally);
    for (const std::string_view state : ksi::kMemoryStates) {
      made_.Value("sched/globalStats/memory/stateTransitions", KSI_StateTransitions{}, state);
    }
  }

  void AddHeap(size_t number, size_t moment) {
    KSI_HeapStats heap{};
    std::snprintf(heap.name, sizeof heap.name, "%s", kHeaps[number]);
    heap.dynGrow = 1;
    heap.size = heap.max = 64 << 20;
    const uint64_t base = (4 + random_() % 8) << 20;
    uint64_t used = Wobbled(base, moment);
    if (Leaks(host_, number)) {
      used = base + base / 10 * moment;
    } else if (moment == kLast && number <= kFsCache) {
      used = base - base / 100;
    }
    heap.avail = heap.size - static_cast<uint32_t>(used);
    made_.Value("system/heaps/stats", heap, std::string_view(kHeaps[number]));
  }

  int64_t host_;
  std::mt19937 random_;
  MadeHost made_;
};

int64_t TimeOf(int64_t host, size_t moment) {
  return *ksi::TimeOfText("2026-11-20T00:00:00Z") + kHours[moment] * ksi::kHour +
         host * ksi::kSecond;
}

size_t FirstOf(int64_t host) { return IsNew(host) ? kLast : 0; }

void MakeCaptures(const std::string& directory, int64_t host) {
  for (size_t moment = FirstOf(host); moment < kHours.size(); ++moment) {
    ksicache::CacheWriter writer(
        directory + "/" + NameOf(host) + "." + std::to_string(moment) + ".ksi", true);
    Fleet(host, writer).Add(moment);
    writer.Commit({.signature = std::string(ksi::kDefinitions.signature),
                   .built = kKernels[KernelOf(host)],
                   .host = NameOf(host),
                   .taken = ksi::TextOfTime(TimeOf(host, moment))});
  }
}

void MakeRecording(const std::string& directory, int64_t host) {
  const std::string file = directory + "/" + NameOf(host) + ".rec";
  ksicache::NewFile(file, true, ksicache::NewFile::kMode)
      .Commit(ksicache::RecordingStore::Empty(NameOf(host)));
  ksicache::RecordingStore store(file, std::numeric_limits<int64_t>::max());
  ksicache::Recorder recorder(store);
  const ksi::HostIdentity identity = {std::string(ksi::kDefinitions.signature),
                                      kKernels[KernelOf(host)], NameOf(host), "boot",
                                      ksi::RecordedNodes()};
  for (size_t moment = FirstOf(host); moment < kHours.size(); ++moment) {
    ksicache::MomentBuilder builder;
    Fleet(host, builder).Add(moment);
    ksi::MomentFacts facts;
    facts.taken = facts.uptime = TimeOf(host, moment);
    recorder.Add(identity, facts, builder.Take());
  }
  recorder.Pack();
}

void Tell(int64_t hosts) {
  for (int64_t host = 0; host < hosts; ++host) {
    if (IsBelow(host)) std::printf("below %s\n", NameOf(host).c_str());
  }
  for (int64_t host = 0; host < hosts; ++host) {
    if (GrowthOf(host) == 0) continue;
    std::printf("grown %s %s %lu\n", NameOf(host).c_str(), MachineName(host, kGrownMachine).c_str(),
                GrowthOf(host));
  }
  if (hosts > kComeMachine) {
    std::printf("grown %s %s %lu\n", NameOf(kComeMachine).c_str(),
                MachineName(kComeMachine, MachinesOf(kComeMachine)).c_str(), kCome);
  }
  for (size_t heap = 0; heap < kHeaps.size(); ++heap) {
    for (size_t kernel = 0; kernel < kKernels.size(); ++kernel) {
      bool leaksOnAll = true;
      for (int64_t host = 0; host < hosts; ++host) {
        leaksOnAll = leaksOnAll && (KernelOf(host) != kernel || IsNew(host) || Leaks(host, heap));
      }
      if (leaksOnAll) std::printf("leaks %s %s\n", kHeaps[heap], kKernels[kernel]);
    }
  }
}

}  // namespace

int main(int argc, char** argv) {
  const int64_t hosts = argc == 3 ? std::atoll(argv[2]) : 0;
  if (hosts <= 0) {
    static_cast<void>(std::fputs("Usage: make_fleet DIRECTORY HOSTS\n", stderr));
    return 2;
  }
  try {
    for (int64_t host = 0; host < hosts; ++host) {
      (host % kEveryCapture == 0 ? MakeCaptures : MakeRecording)(argv[1], host);
    }
    Tell(hosts);
    return 0;
  } catch (const std::exception& error) {
    static_cast<void>(std::fprintf(stderr, "make_fleet: %s\n", error.what()));
    return 1;
  }
}
