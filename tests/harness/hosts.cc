#include "tests/harness/hosts.h"

#include <array>
#include <cstring>
#include <initializer_list>

namespace harness {
namespace {

constexpr uint64_t kStep = 1024;  // so that figures differ in every unit

// What "mapped" has more than its number: reports subtract other figures from it.
constexpr uint64_t kMoreMapped = 1000000;

// Puts the next number of the row into the fields at these offsets.
template <class Field, class Record>
void Number(Record& record, uint64_t& next, std::initializer_list<size_t> offsets) {
  for (const size_t offset : offsets) {
    const auto value = static_cast<Field>(next);
    std::memcpy(reinterpret_cast<char*>(&record) + offset, &value, sizeof value);
    next += kStep;
  }
}

}  // namespace

#define AT(field) offsetof(Record, field)

KSI_GroupMemoryStats NumberedMemoryStats(uint64_t first) {
  using Record = KSI_GroupMemoryStats;
  Record record{};
  Number<uint64_t>(
      record, first,
      {AT(memSize), AT(ovhdResv), AT(ovhd), AT(sharedSaved), AT(consumed), AT(touched), AT(bMin),
       AT(bMax), AT(bShares), AT(fShares), AT(iMin), AT(eMin), AT(bActive), AT(allocTgt), AT(mps),
       AT(rMinPeak), AT(eMinPeak), AT(consumedPeak), AT(memSizePeak)});
  record.throttlePct = 99;
  return record;
}

KSI_GroupCapacity NumberedCapacity(uint64_t first) {
  using Record = KSI_GroupCapacity;
  Record record{};
  Number<uint64_t>(record, first, {AT(conResv), AT(availResv)});
  return record;
}

KSI_VmmTally NumberedVmmTally(uint64_t first) {
  using Record = KSI_VmmTally;
  Record record{};
  Number<uint64_t>(
      record, first,
      {AT(memSizeLimit), AT(memSize), AT(touched), AT(allocTgt), AT(vpmemRO), AT(vpmemUC),
       AT(llswapped), AT(zipSaved), AT(shared), AT(zero), AT(llswapUsed), AT(mapped), AT(zipped),
       AT(vpmemRW), AT(sharedSaved), AT(swapTgt), AT(ballooned), AT(balloonTgt)});
  record.mapped += kMoreMapped;
  record.swapScope = 2;
  record.useReliableMem = 1;
  record.balloonActive = 1;
  return record;
}

KSI_UwTally NumberedUwTally(uint64_t first) {
  using Record = KSI_UwTally;
  Record record{};
  Number<uint64_t>(record, first, {AT(min), AT(max), AT(minLimit)});
  Number<uint32_t>(record, first, {AT(shares), AT(memSizeLimit)});
  Number<uint64_t>(
      record, first,
      {AT(memSize),   AT(touched),        AT(allocTgt),  AT(vpmemUC),    AT(mapped),
       AT(vpmemRW),   AT(sharedSaved),    AT(swapTgt),   AT(totalResv),  AT(pinnedResv),
       AT(memBStore), AT(swapBStore),     AT(swappable), AT(pinned),     AT(cow),
       AT(pageable),  AT(pageableUnacct), AT(swapped),   AT(prealloced), AT(shm)});
  record.mapped += kMoreMapped;
  record.swapScope = 2;
  record.useReliableMem = 1;
  return record;
}

KSI_GuestTally NumberedGuestTally(uint64_t first) {
  using Record = KSI_GuestTally;
  Record record{};
  Number<uint64_t>(record, first, {AT(memTotal)});
  Number<uint32_t>(record, first, {AT(lpageTotal)});
  Number<uint64_t>(record, first, {AT(memNeeded)});
  return record;
}

KSI_SwapInfo NumberedSwapInfo(uint64_t first) {
  using Record = KSI_SwapInfo;
  Record record{};
  record.isSwapping = 1;
  Number<uint64_t>(record, first,
                   {AT(swapTgt), AT(swapped), AT(swapRead), AT(swapIn), AT(swapOut),
                    AT(gblSwapRead), AT(gblSwapIn), AT(gblSwapOut), AT(COWSwapper), AT(discarded)});
  Number<uint32_t>(record, first, {AT(vmmSwapOn), AT(knvSwapOn)});
  Number<uint64_t>(record, first,
                   {AT(totalReg), AT(freeReg), AT(cptTgt), AT(cptRead), AT(cptWritten),
                    AT(totalMig), AT(freeMig)});
  Number<uint32_t>(record, first, {AT(cacheUsage)});
  Number<uint64_t>(record, first, {AT(swapoutReady)});
  return record;
}

KSI_MemzipInfo NumberedMemzipInfo(uint64_t first) {
  using Record = KSI_MemzipInfo;
  Record record{};
  Number<uint64_t>(record, first, {AT(totalCache), AT(usedCache), AT(maxCache)});
  Number<uint32_t>(record, first, {AT(nrFreeHalf), AT(nrFreeQuarter)});
  Number<uint64_t>(record, first,
                   {AT(zipped), AT(unZipped), AT(zipRejected), AT(avgZipTime), AT(avgUnzipTime)});
  return record;
}

KSI_RemapType NumberedRemapType(uint64_t first) {
  using Record = KSI_RemapType;
  Record record{};
  Number<uint64_t>(record, first,
                   {AT(added), AT(filtered), AT(prepared), AT(staged), AT(canceled), AT(remapped),
                    AT(cUnprepared), AT(cPrepared), AT(cStaged)});
  return record;
}

KSI_VmLargePages NumberedVmLargePages(uint64_t first) {
  using Record = KSI_VmLargePages;
  Record record{};
  Number<uint32_t>(record, first, {AT(nrBackings), AT(maxSwapThreshold)});
  Number<uint64_t>(record, first,
                   {AT(nrAllocSuccess), AT(nrFailPinned), AT(nrFailSwapped), AT(nrFailPinnedLate),
                    AT(nrFailNoMem)});
  Number<uint32_t>(record, first, {AT(nrLocked)});
  Number<uint64_t>(record, first, {AT(nrBroken)});
  return record;
}

KSI_LargePagePool NumberedLargePagePool(uint64_t first) {
  using Record = KSI_LargePagePool;
  Record record{};
  Number<uint32_t>(record, first, {AT(nrLPages), AT(nrFreeSPages)});
  Number<uint64_t>(record, first,
                   {AT(nrSPageAllocs), AT(nrSPageFrees), AT(nrReapAttempts), AT(nrSPagesReaped),
                    AT(nrDefragAttempts), AT(nrDefragCancelled), AT(nrDefragReaped),
                    AT(nrLPagesDefragged), AT(peakDefragAttempts), AT(nrCachehit)});
  return record;
}

KSI_Comprehensive NumberedComprehensive(uint64_t first) {
  using Record = KSI_Comprehensive;
  Record record{};
  Number<uint64_t>(record, first,
                   {AT(total), AT(managedByMemMap), AT(reliableMem), AT(discarded), AT(critical),
                    AT(buddyOvhd), AT(kernelCode), AT(dataAndHeap), AT(knvClientConsumed),
                    AT(otherConsumed), AT(rsvdLow), AT(free)});
  return record;
}

KSI_PshareStats NumberedPshareStats(uint64_t first) {
  using Record = KSI_PshareStats;
  Record record{};
  Number<uint64_t>(
      record, first,
      {AT(cow), AT(cow1), AT(zero), AT(used), AT(reclaimed), AT(totAdd), AT(totRemove),
       AT(hintsActive), AT(hintsAdded), AT(hintsRemoved), AT(lpageHintsAdded),
       AT(lpageHintsRemoved), AT(peakChainLength), AT(peakChainIndex), AT(peakRefCount)});
  return record;
}

KSI_HeapStats NumberedHeapStats(const std::string& name, uint32_t first) {
  using Record = KSI_HeapStats;
  Record record{};
  std::memcpy(record.name, name.data(), std::min(name.size(), sizeof record.name));
  record.dynGrow = 1;
  uint64_t next = first;
  Number<uint32_t>(
      record, next,
      {AT(lowerLimit), AT(upperLimit), AT(numRanges), AT(dlMallocOvdh), AT(size), AT(initial),
       AT(avail), AT(max), AT(maxAvail), AT(numSuccAllocs), AT(numFailAllocs), AT(avgAllocSize),
       AT(numReqsPerGrowth), AT(numGrowthOps), AT(numShrinkOps)});
  record.pctFreeOfCur = 11;
  record.pctFreeOfMax = 22;
  record.lowPctFreeOfMax = 33;
  return record;
}

#undef AT

void AddGroup(Scenario& scenario, int64_t id, const Group& group) {
  scenario.Value("sched_groups_groupName", {id}, TextRecord<KSI_GroupName>(group.name))
      .Value("sched_groups_groupTag", {id}, TextRecord<KSI_GroupTag>(group.tag))
      .Value("sched_groups_parentGroupID", {id}, group.parent)
      .Value("sched_groups_groupFlags", {id}, group.flags)
      .Value("sched_groups_groupLeaderID", {id}, group.leader)
      .Value("sched_groups_memAllocationInKB", {id}, group.allocation)
      .Value("sched_groups_stats_capacity", {id}, group.capacity)
      .Value("sched_groups_stats_memoryStats", {id}, group.memory)
      .List("sched_groups_members_groups", {id}, group.children)
      .List("sched_groups_members_memClients", {id}, group.clients);
}

void AddVirtualMachine(Scenario& scenario, int64_t id, const VirtualMachine& machine) {
  const int32_t vmmLeader = machine.leader + 1;
  AddGroup(scenario, id,
           {.name = machine.name,
            .parent = machine.parent,
            .flags = machine.flags,
            .leader = machine.leader,
            .allocation = machine.allocation,
            .memory = machine.memory,
            .children = {id + 1},
            .clients = {machine.leader, vmmLeader}});
  AddGroup(scenario, id + 1,
           {.name = "vmm." + machine.name,
            .parent = id,
            .flags = KSI_GROUP_VMM_SUB_CONTAINER,
            .allocation = machine.vmmAllocation});
  scenario.Value("sched_memClients_tally_vmm", {machine.leader}, machine.vmm)
      .Value("sched_memClients_tally_guest", {machine.leader}, machine.guest)
      .Value("sched_memClients_memzipInfo", {machine.leader}, machine.memzip)
      .Value("worldGroups_vmmLeaderID", {machine.leader}, vmmLeader)
      .Value("sched_memClients_swapInfo", {vmmLeader}, machine.swap)
      .Value("memory_lpage_vmLPage", {vmmLeader}, machine.largePages);
}

void AddUserWorld(Scenario& scenario, int64_t id, const UserWorld& world) {
  AddGroup(scenario, id,
           {.name = world.name,
            .parent = world.parent,
            .flags = world.flags,
            .leader = world.leader,
            .clients = {world.leader}});
  scenario.Value("sched_memClients_tally_uw", {world.leader}, world.uw);
}

void AddHostMemory(Scenario& scenario, const HostMemory& host) {
  KSI_GlobalTally global{};
  global.managedByMemSched = host.managedByMemSched;
  global.minFree = host.minFree;
  global.memState = host.memState;
  scenario.Value("memory_comprehensive", {}, host.memory)
      .Value("sched_globalStats_memory_tally", {}, global);
  constexpr std::array kStates = {"high", "clear", "soft", "hard", "low"};
  for (size_t i = 0; i < kStates.size(); ++i) {
    KSI_StateTransitions transitions{};
    transitions.up = host.up[i];
    transitions.down = host.down[i];
    scenario.Value("sched_globalStats_memory_stateTransitions", {kStates[i]}, transitions);
  }
}

}  // namespace harness
