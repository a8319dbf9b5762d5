#include "tests/ksicache/leak_host.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <numbers>

#include <knvlibs/ksi_records.h>
#include "knvlibs/node_table.h"

namespace ksi {
namespace {

constexpr uint64_t kMegabyte = 1024;  // in KB
constexpr uint64_t kTotal = 256 * 1024 * kMegabyte;

constexpr int64_t kRoot = 0;
constexpr int64_t kServices = 1;
constexpr int64_t kMachinesGroup = 2;
constexpr int64_t kFirstMachine = 100;
constexpr int64_t kFirstProcess = 1000;

double Between(double least, double most, std::mt19937_64& random) {
  return std::uniform_real_distribution<double>(least, most)(random);
}

template <size_t kSize>
void PutText(const std::string& text, char (&field)[kSize]) {
  std::memcpy(field, text.data(), std::min(text.size(), kSize - 1));
}

std::string Numbered(const char* name, size_t number) { return name + std::to_string(number); }

}  // namespace

Figure::Figure(double base, double noise, Course course, std::mt19937_64& random)
    : base_(base),
      noise_(base * noise),
      course_(course),
      swing_(base * Between(0.1, 0.5, random)),
      period_(Between(0.05, 0.4, random)),
      phase_(Between(0, 1, random)) {}

uint64_t Figure::At(size_t moment, size_t count, double days, std::mt19937_64& random) {
  const double part = static_cast<double>(moment) / static_cast<double>(count - 1);
  std::normal_distribution<double> normal;
  double figure = base_ + growth_ * part + noise_ * normal(random);
  walked_ += swing_ * normal(random) / std::sqrt(static_cast<double>(count));
  switch (course_) {
    case Course::level:
      break;
    case Course::sawTooth:
      figure += swing_ * std::fmod(part / period_ + phase_, 1);
      break;
    case Course::dailyWave:
      figure += swing_ * std::sin(2 * std::numbers::pi * (days + phase_));
      break;
    case Course::step:
      figure += part > phase_ ? swing_ : 0;
      break;
    case Course::walk:
      figure += walked_;
      break;
  }
  // The kernel counts pages.
  return static_cast<uint64_t>(std::max<int64_t>(0, std::llround(figure / 4))) * 4;
}

LeakHost::LeakHost(uint32_t seed, size_t count) : random_(seed), count_(count) {
  for (Figure& figure : mapped_) figure = MakeFigure(8e6);
  for (Figure& figure : saved_) figure = MakeFigure(1e6);
  for (Figure& figure : overhead_) figure = MakeFigure(2e5);
  for (Figure& figure : resident_) figure = MakeFigure(5e5);
  for (Figure& figure : tables_) figure = MakeFigure(8e3);
  for (Figure& figure : heaps_) figure = MakeFigure(1e5);
  for (Figure& figure : pools_) figure = MakeFigure(1e6);
  kernel_ = MakeFigure(4e6);
  caches_ = MakeFigure(1e7);
}

Figure LeakHost::MakeFigure(double base) {
  const auto course = static_cast<Course>(random_() % 5);
  return {base * Between(0.5, 2, random_), Between(0.005, 0.03, random_), course, random_};
}

// The one that leaks does nothing else but what noise does; all others go on.
void LeakHost::Leak(Kind kind) {
  const auto leak = [this](Figure& figure, double base, double sign) {
    figure = {base, Between(0.005, 0.03, random_), Course::level, random_};
    figure.Leak(sign * Between(4, 30, random_) * figure.Noise());
  };
  const auto guilty = [this](const char* what, const std::string& name) {
    what_ = what;
    name_ = name;
  };
  const size_t number = random_() % kPools;
  switch (kind) {
    case Kind::heap:
      leak(heaps_[number], 1e5, 1);
      return guilty("heaps", Numbered("heap", number));
    case Kind::machine:
      leak(mapped_[number], 8e6, 1);
      // What it shares would come between.
      saved_[number] = {1e5, 0.01, Course::level, random_};
      return guilty("machines", Numbered("vm", number));
    case Kind::process:
      leak(resident_[number], 5e5, 1);
      return guilty("user worlds", Numbered("process", number));
    case Kind::pageTables:
      leak(tables_[number], 8e3, 1);
      return guilty("page tables", Numbered("process", number));
    case Kind::largePages:
      leak(pools_[number], 1e6, 1);
      return guilty("pools of large pages", Numbered("huge", number) + " of node 0");
    case Kind::sharing:
      leak(saved_[number], 4e6, -1);
      return guilty("page sharing", Numbered("vm", number));
  }
}

uint64_t LeakHost::Now(Figure& figure) {
  const double days = static_cast<double>(moment_) * static_cast<double>(Every()) / 86400;
  return figure.At(moment_, count_, days, random_);
}

void LeakHost::AddGroup(int64_t id, const std::string& name, int64_t parent, uint32_t flags,
                        uint64_t consumed, uint64_t overhead,
                        const std::vector<int64_t>& children) {
  KSI_GroupName nameRecord = {};
  PutText(name, nameRecord.text);
  KSI_GroupMemoryStats stats = {};
  stats.consumed = consumed;
  stats.ovhd = overhead;
  made_.Value("sched/groups/groupName", nameRecord, id);
  made_.Value("sched/groups/groupTag", KSI_GroupTag{}, id);
  made_.Value("sched/groups/parentGroupID", parent, id);
  made_.Value("sched/groups/groupFlags", flags, id);
  made_.Value("sched/groups/groupLeaderID", static_cast<int32_t>(id), id);
  made_.Value("sched/groups/memAllocationInKB", KSI_GroupAllocation{0, -1, 0, -1, {}}, id);
  made_.Value("sched/groups/stats/capacity", KSI_GroupCapacity{}, id);
  made_.Value("sched/groups/stats/memoryStats", stats, id);
  made_.List("sched/groups/members/groups", children, id);
}

void LeakHost::AddMachines() {
  std::vector<int64_t> machines;
  uint64_t all = 0;
  for (size_t i = 0; i < kMachines; ++i) {
    const int64_t id = kFirstMachine + 10 * static_cast<int64_t>(i);
    machines.push_back(id);
    KSI_VmmTally tally = {};
    tally.memSizeLimit = tally.memSize = 64 * 1024 * kMegabyte;
    tally.sharedSaved = tally.shared = Now(saved_[i]);
    tally.mapped = Now(mapped_[i]) + 8 * 1024 * kMegabyte;
    const uint64_t overhead = Now(overhead_[i]);
    const uint64_t consumed = tally.mapped - tally.sharedSaved + overhead;
    all += consumed;
    AddGroup(id, Numbered("vm", i), kMachinesGroup, KSI_GROUP_VM, consumed, overhead, {id + 1});
    AddGroup(id + 1, "vmm", id, KSI_GROUP_LEAF | KSI_GROUP_VMM_SUB_CONTAINER, consumed, 0, {});
    made_.Value("sched/memClients/tally/vmm", tally, id);
    made_.Value("sched/memClients/swapInfo", KSI_SwapInfo{}, id);
    made_.Value("worldGroups/vmmLeaderID", static_cast<int32_t>(id), id);
  }
  AddGroup(kMachinesGroup, "machines", kRoot, KSI_GROUP_PREDEFINED, all, 0, machines);
  consumed_ += all;
}

void LeakHost::AddProcesses() {
  std::vector<int64_t> processes;
  uint64_t all = 0;
  for (size_t i = 0; i < kProcesses; ++i) {
    const int64_t id = kFirstProcess + static_cast<int64_t>(i);
    processes.push_back(id);
    KSI_UwTally tally = {};
    tally.max = tally.minLimit = -1;
    tally.mapped = tally.memSize = Now(resident_[i]);
    all += tally.mapped;
    AddGroup(id, Numbered("process", i), kServices, KSI_GROUP_LEAF | KSI_GROUP_USER_WORLD,
             tally.mapped, Now(tables_[i]), {});
    made_.Value("sched/memClients/tally/uw", tally, id);
  }
  AddGroup(kServices, "services", kRoot, KSI_GROUP_PREDEFINED, all, 0, processes);
  consumed_ += all;
}

void LeakHost::AddHost() {
  std::vector<std::string> names;
  for (size_t i = 0; i < kHeaps; ++i) {
    const std::string& name = names.emplace_back(Numbered("heap", i));
    KSI_HeapStats heap = {};
    PutText(name, heap.name);
    heap.max = 2U << 30;
    heap.size = 1U << 30;
    heap.avail = heap.size - static_cast<uint32_t>(Now(heaps_[i])) * 1024;
    made_.Value("system/heaps/stats", heap, name);
  }
  made_.List("system/heaps", names);

  KSI_MemInfo info = {};
  info.numNodes = 1;
  made_.Value("memory/memInfo", info);
  made_.Value("sched/globalStats/numVMs", uint32_t{kMachines});
  constexpr int64_t kNode = 0;
  made_.Value("memory/lpage/nodeList/psharePool", KSI_LargePagePool{}, kNode);
  names.clear();
  for (size_t i = 0; i < kPools; ++i) {
    KSI_LargePagePool pool = {};
    pool.nrLPages = 4096;
    pool.nrFreeSPages = pool.nrLPages * 512 - static_cast<uint32_t>(Now(pools_[i]) / 4);
    made_.Value("memory/lpage/nodeList/vmPools", pool, kNode,
                names.emplace_back(Numbered("huge", i)));
  }
  made_.List("memory/lpage/nodeList/vmPools", names, kNode);
  made_.Value("memory/pshare/stats", KSI_PshareStats{});

  KSI_Comprehensive memory = {};
  memory.total = memory.managedByMemMap = kTotal;
  memory.dataAndHeap = Now(kernel_);
  memory.knvClientConsumed = Now(caches_);
  memory.otherConsumed = consumed_;
  memory.free = kTotal - memory.dataAndHeap - memory.knvClientConsumed - memory.otherConsumed;
  made_.Value("memory/comprehensive", memory);
  made_.Value("sched/globalStats/memory/tally", KSI_GlobalTally{});
  for (const std::string_view state : kMemoryStates) {
    made_.Value("sched/globalStats/memory/stateTransitions", KSI_StateTransitions{}, state);
  }
}

std::vector<MomentReading> LeakHost::Next() {
  consumed_ = 0;
  AddMachines();
  AddProcesses();
  AddGroup(kRoot, "host", -1, KSI_GROUP_PREDEFINED, consumed_, 0, {kServices, kMachinesGroup});
  AddHost();
  ++moment_;
  return builder_.Take();
}

}  // namespace ksi
