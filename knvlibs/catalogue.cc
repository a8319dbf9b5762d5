#include "knvlibs/catalogue.h"

#include <algorithm>
#include <array>
#include <type_traits>

#include <knvlibs/ksi_records.h>
#include "knvlibs/node_table.h"

namespace ksi {
namespace {

template <class T>
constexpr FieldType TypeOf() {
  if constexpr (std::is_array_v<T>) {
    return FieldType::kText;
  } else {
    return std::is_signed_v<T> ? FieldType::kSigned : FieldType::kUnsigned;
  }
}

template <class T>
constexpr Field MakeField(const char* name, const char* unit, size_t offset,
                          FieldType type = TypeOf<T>()) {
  return {name, unit, static_cast<uint16_t>(offset), sizeof(T), type};
}

#define FIELD(record, field, unit) \
  MakeField<decltype(KSI_##record::field)>(#field, unit, offsetof(KSI_##record, field))
#define BITS(record, field)                                                               \
  MakeField<decltype(KSI_##record::field)>(#field, "bits", offsetof(KSI_##record, field), \
                                           FieldType::kBits)

constexpr Field kGroupNameFields[] = {
    FIELD(GroupName, text, ""),
};
constexpr Field kGroupTagFields[] = {
    FIELD(GroupTag, text, ""),
};
constexpr Field kGroupAllocationFields[] = {
    FIELD(GroupAllocation, min, "KB"),
    FIELD(GroupAllocation, max, "KB"),
    FIELD(GroupAllocation, shares, ""),
    FIELD(GroupAllocation, minLimit, "KB"),
};
constexpr Field kGroupCapacityFields[] = {
    FIELD(GroupCapacity, conResv, "KB"),
    FIELD(GroupCapacity, availResv, "KB"),
};
constexpr Field kGroupMemoryStatsFields[] = {
    FIELD(GroupMemoryStats, memSize, "KB"),       FIELD(GroupMemoryStats, ovhdResv, "KB"),
    FIELD(GroupMemoryStats, ovhd, "KB"),          FIELD(GroupMemoryStats, sharedSaved, "KB"),
    FIELD(GroupMemoryStats, consumed, "KB"),      FIELD(GroupMemoryStats, touched, "KB"),
    FIELD(GroupMemoryStats, bMin, "KB"),          FIELD(GroupMemoryStats, bMax, "KB"),
    FIELD(GroupMemoryStats, bShares, ""),         FIELD(GroupMemoryStats, fShares, ""),
    FIELD(GroupMemoryStats, iMin, "KB"),          FIELD(GroupMemoryStats, eMin, "KB"),
    FIELD(GroupMemoryStats, bActive, "KB"),       FIELD(GroupMemoryStats, allocTgt, "KB"),
    FIELD(GroupMemoryStats, mps, "KB per share"), FIELD(GroupMemoryStats, rMinPeak, "KB"),
    FIELD(GroupMemoryStats, eMinPeak, "KB"),      FIELD(GroupMemoryStats, consumedPeak, "KB"),
    FIELD(GroupMemoryStats, memSizePeak, "KB"),   FIELD(GroupMemoryStats, throttlePct, "%"),
};
constexpr Field kVmmTallyFields[] = {
    FIELD(VmmTally, memSizeLimit, "KB"),    FIELD(VmmTally, memSize, "KB"),
    FIELD(VmmTally, touched, "KB"),         FIELD(VmmTally, allocTgt, "KB"),
    FIELD(VmmTally, vpmemRO, "KB"),         FIELD(VmmTally, vpmemUC, "KB"),
    FIELD(VmmTally, llswapped, "KB"),       FIELD(VmmTally, zipSaved, "KB"),
    FIELD(VmmTally, shared, "KB"),          FIELD(VmmTally, zero, "KB"),
    FIELD(VmmTally, llswapUsed, "KB"),      FIELD(VmmTally, mapped, "KB"),
    FIELD(VmmTally, zipped, "KB"),          FIELD(VmmTally, vpmemRW, "KB"),
    FIELD(VmmTally, sharedSaved, "KB"),     FIELD(VmmTally, swapTgt, "KB"),
    FIELD(VmmTally, swapScope, "code"),     FIELD(VmmTally, useReliableMem, "flag"),
    FIELD(VmmTally, balloonActive, "flag"), FIELD(VmmTally, ballooned, "KB"),
    FIELD(VmmTally, balloonTgt, "KB"),
};
constexpr Field kUwTallyFields[] = {
    FIELD(UwTally, min, "KB"),
    FIELD(UwTally, max, "KB"),
    FIELD(UwTally, minLimit, "KB"),
    FIELD(UwTally, shares, ""),
    FIELD(UwTally, memSizeLimit, "KB"),
    FIELD(UwTally, memSize, "KB"),
    FIELD(UwTally, touched, "KB"),
    FIELD(UwTally, allocTgt, "KB"),
    FIELD(UwTally, vpmemUC, "KB"),
    FIELD(UwTally, mapped, "KB"),
    FIELD(UwTally, vpmemRW, "KB"),
    FIELD(UwTally, sharedSaved, "KB"),
    FIELD(UwTally, swapTgt, "KB"),
    FIELD(UwTally, swapScope, "code"),
    FIELD(UwTally, useReliableMem, "flag"),
    FIELD(UwTally, totalResv, "KB"),
    FIELD(UwTally, pinnedResv, "KB"),
    FIELD(UwTally, memBStore, "KB"),
    FIELD(UwTally, swapBStore, "KB"),
    FIELD(UwTally, swappable, "KB"),
    FIELD(UwTally, pinned, "KB"),
    FIELD(UwTally, cow, "KB"),
    FIELD(UwTally, pageable, "KB"),
    FIELD(UwTally, pageableUnacct, "KB"),
    FIELD(UwTally, swapped, "KB"),
    FIELD(UwTally, prealloced, "KB"),
    FIELD(UwTally, shm, "KB"),
};
constexpr Field kGuestTallyFields[] = {
    FIELD(GuestTally, memTotal, "KB"),
    FIELD(GuestTally, lpageTotal, "large pages"),
    FIELD(GuestTally, memNeeded, "KB"),
};
constexpr Field kSwapInfoFields[] = {
    FIELD(SwapInfo, isSwapping, "flag"), FIELD(SwapInfo, swapTgt, "KB"),
    FIELD(SwapInfo, swapped, "KB"),      FIELD(SwapInfo, swapRead, "KB"),
    FIELD(SwapInfo, swapIn, "KB"),       FIELD(SwapInfo, swapOut, "KB"),
    FIELD(SwapInfo, gblSwapRead, "KB"),  FIELD(SwapInfo, gblSwapIn, "KB"),
    FIELD(SwapInfo, gblSwapOut, "KB"),   FIELD(SwapInfo, COWSwapper, "KB"),
    FIELD(SwapInfo, discarded, "KB"),    FIELD(SwapInfo, vmmSwapOn, "times"),
    FIELD(SwapInfo, knvSwapOn, "times"), FIELD(SwapInfo, curSwapper, "code"),
    FIELD(SwapInfo, totalReg, "KB"),     FIELD(SwapInfo, freeReg, "KB"),
    FIELD(SwapInfo, cptTgt, "KB"),       FIELD(SwapInfo, cptRead, "KB"),
    FIELD(SwapInfo, cptWritten, "KB"),   FIELD(SwapInfo, totalMig, "KB"),
    FIELD(SwapInfo, freeMig, "KB"),      FIELD(SwapInfo, cacheUsage, "KB"),
    FIELD(SwapInfo, swapoutReady, ""),
};
constexpr Field kMemzipInfoFields[] = {
    FIELD(MemzipInfo, totalCache, "KB"),
    FIELD(MemzipInfo, usedCache, "KB"),
    FIELD(MemzipInfo, maxCache, "KB"),
    FIELD(MemzipInfo, nrFreeHalf, "half pages"),
    FIELD(MemzipInfo, nrFreeQuarter, "quarter pages"),
    FIELD(MemzipInfo, zipped, "KB"),
    FIELD(MemzipInfo, unZipped, "KB"),
    FIELD(MemzipInfo, zipRejected, "KB"),
    FIELD(MemzipInfo, avgZipTime, "us"),
    FIELD(MemzipInfo, avgUnzipTime, "us"),
};
constexpr Field kRemapTypeFields[] = {
    FIELD(RemapType, added, "pages"),       FIELD(RemapType, filtered, "pages"),
    FIELD(RemapType, prepared, "pages"),    FIELD(RemapType, staged, "pages"),
    FIELD(RemapType, canceled, "pages"),    FIELD(RemapType, remapped, "pages"),
    FIELD(RemapType, cUnprepared, "pages"), FIELD(RemapType, cPrepared, "pages"),
    FIELD(RemapType, cStaged, "pages"),
};
constexpr Field kGlobalTallyFields[] = {
    FIELD(GlobalTally, managedByMemSched, "KB"),
    FIELD(GlobalTally, minFree, "KB"),
    FIELD(GlobalTally, memState, "state"),
};
constexpr Field kStateTransitionsFields[] = {
    FIELD(StateTransitions, up, "times"),
    FIELD(StateTransitions, down, "times"),
};
constexpr Field kComprehensiveFields[] = {
    FIELD(Comprehensive, total, "KB"),
    FIELD(Comprehensive, managedByMemMap, "KB"),
    FIELD(Comprehensive, reliableMem, "KB"),
    FIELD(Comprehensive, discarded, "KB"),
    FIELD(Comprehensive, critical, "KB"),
    FIELD(Comprehensive, buddyOvhd, "KB"),
    FIELD(Comprehensive, kernelCode, "KB"),
    FIELD(Comprehensive, dataAndHeap, "KB"),
    FIELD(Comprehensive, knvClientConsumed, "KB"),
    FIELD(Comprehensive, otherConsumed, "KB"),
    FIELD(Comprehensive, rsvdLow, "KB"),
    FIELD(Comprehensive, free, "KB"),
};
constexpr Field kMemInfoFields[] = {
    FIELD(MemInfo, numNodes, ""),
};
constexpr Field kMemNodeFields[] = {
    FIELD(MemNode, numaNode, ""),
};
constexpr Field kPshareStatsFields[] = {
    FIELD(PshareStats, cow, "pages"),
    FIELD(PshareStats, cow1, "pages"),
    FIELD(PshareStats, zero, "pages"),
    FIELD(PshareStats, used, "pages"),
    FIELD(PshareStats, reclaimed, "pages"),
    FIELD(PshareStats, totAdd, "pages"),
    FIELD(PshareStats, totRemove, "pages"),
    FIELD(PshareStats, hintsActive, "pages"),
    FIELD(PshareStats, hintsAdded, "pages"),
    FIELD(PshareStats, hintsRemoved, "pages"),
    FIELD(PshareStats, lpageHintsAdded, "pages"),
    FIELD(PshareStats, lpageHintsRemoved, "pages"),
    FIELD(PshareStats, peakChainLength, ""),
    FIELD(PshareStats, peakChainIndex, ""),
    FIELD(PshareStats, peakRefCount, ""),
};
constexpr Field kHeapStatsFields[] = {
    FIELD(HeapStats, name, ""),
    FIELD(HeapStats, dynGrow, "flag"),
    FIELD(HeapStats, lowerLimit, ""),
    FIELD(HeapStats, upperLimit, ""),
    FIELD(HeapStats, reserved, ""),
    FIELD(HeapStats, numRanges, ""),
    FIELD(HeapStats, dlMallocOvdh, "bytes"),
    FIELD(HeapStats, size, "bytes"),
    FIELD(HeapStats, initial, "bytes"),
    FIELD(HeapStats, avail, "bytes"),
    FIELD(HeapStats, pctFreeOfCur, "%"),
    FIELD(HeapStats, max, "bytes"),
    FIELD(HeapStats, maxAvail, "bytes"),
    FIELD(HeapStats, pctFreeOfMax, "%"),
    FIELD(HeapStats, lowPctFreeOfMax, "%"),
    FIELD(HeapStats, numSuccAllocs, "times"),
    FIELD(HeapStats, numFailAllocs, "times"),
    FIELD(HeapStats, avgAllocSize, "bytes"),
    FIELD(HeapStats, numReqsPerGrowth, "times"),
    FIELD(HeapStats, numGrowthOps, "times"),
    FIELD(HeapStats, numShrinkOps, "times"),
};
constexpr Field kVmLargePagesFields[] = {
    FIELD(VmLargePages, nrBackings, "large pages"), FIELD(VmLargePages, maxSwapThreshold, "pages"),
    FIELD(VmLargePages, nrAllocSuccess, "times"),   FIELD(VmLargePages, nrFailPinned, "times"),
    FIELD(VmLargePages, nrFailSwapped, "times"),    FIELD(VmLargePages, nrFailPinnedLate, "times"),
    FIELD(VmLargePages, nrFailNoMem, "times"),      FIELD(VmLargePages, nrLocked, "times"),
    FIELD(VmLargePages, nrBroken, "times"),
};
constexpr Field kLargePagePoolFields[] = {
    FIELD(LargePagePool, nrLPages, "2 MB pages"),
    FIELD(LargePagePool, nrFreeSPages, "4 KB pages"),
    FIELD(LargePagePool, nrSPageAllocs, "pages"),
    FIELD(LargePagePool, nrSPageFrees, "pages"),
    FIELD(LargePagePool, nrReapAttempts, "times"),
    FIELD(LargePagePool, nrSPagesReaped, "pages"),
    FIELD(LargePagePool, nrDefragAttempts, "times"),
    FIELD(LargePagePool, nrDefragCancelled, "times"),
    FIELD(LargePagePool, nrDefragReaped, "pages"),
    FIELD(LargePagePool, nrLPagesDefragged, "pages"),
    FIELD(LargePagePool, peakDefragAttempts, "times"),
    FIELD(LargePagePool, nrCachehit, "times"),
};
constexpr Field kPmemRegionStoreFields[] = {
    FIELD(PmemRegionStore, alloc2MBlocks, "2 MB blocks"),
    FIELD(PmemRegionStore, resvd2MBlocks, "2 MB blocks"),
    FIELD(PmemRegionStore, avail2MBlocks, "2 MB blocks"),
    FIELD(PmemRegionStore, totalRegions, ""),
    FIELD(PmemRegionStore, freeRegions, ""),
    FIELD(PmemRegionStore, total2MBlocks, "2 MB blocks"),
};
constexpr Field kPmemRegionFields[] = {
    FIELD(PmemRegion, size, "bytes"),
    FIELD(PmemRegion, reserved, "2 MB blocks"),
    BITS(PmemRegion, flags),
};

// Buffers are named by their size, as "free4KB" and "used4KB".
#define BUFFERS(size, i)                                                                  \
  MakeField<uint32_t>("free" size, "buffers", offsetof(KSI_BuddyStats, buffers[i].free)), \
      MakeField<uint32_t>("used" size, "buffers", offsetof(KSI_BuddyStats, buffers[i].used))

constexpr Field kBuddyStatsFields[] = {
    BUFFERS("4KB", 0),    BUFFERS("8KB", 1),    BUFFERS("16KB", 2),  BUFFERS("32KB", 3),
    BUFFERS("64KB", 4),   BUFFERS("128KB", 5),  BUFFERS("256KB", 6), BUFFERS("512KB", 7),
    BUFFERS("1MB", 8),    BUFFERS("2MB", 9),    BUFFERS("4MB", 10),  BUFFERS("8MB", 11),
    BUFFERS("16MB", 12),  BUFFERS("32MB", 13),  BUFFERS("64MB", 14), BUFFERS("128MB", 15),
    BUFFERS("256MB", 16), BUFFERS("512MB", 17), BUFFERS("1GB", 18),
};
static_assert(std::size(kBuddyStatsFields) == size_t{2} * KSI_BUDDY_SIZES);

// Records of which no field is used yet.
constexpr std::span<const Field> kCommonTallyFields;
constexpr std::span<const Field> kPmemVolumeFields;

// Values that are one number.
using KSI_ParentGroupID = int64_t;
using KSI_GroupFlags = uint32_t;
using KSI_GroupLeaderID = int32_t;
using KSI_VmmLeaderID = int32_t;
using KSI_NumVMs = uint32_t;
using KSI_IsClean = uint8_t;

constexpr Field kParentGroupIDFields[] = {MakeField<KSI_ParentGroupID>("parentGroupID", "", 0)};
constexpr Field kGroupFlagsFields[] = {
    MakeField<KSI_GroupFlags>("groupFlags", "bits", 0, FieldType::kBits)};
constexpr Field kGroupLeaderIDFields[] = {MakeField<KSI_GroupLeaderID>("groupLeaderID", "", 0)};
constexpr Field kVmmLeaderIDFields[] = {MakeField<KSI_VmmLeaderID>("vmmLeaderID", "", 0)};
constexpr Field kNumVMsFields[] = {MakeField<KSI_NumVMs>("numVMs", "", 0)};
constexpr Field kIsCleanFields[] = {MakeField<KSI_IsClean>("isClean", "flag", 0)};

constexpr Keying Keys() { return {}; }
constexpr Keying Keys(Instance first, Instance second = Instance::kNone) {
  return {{first, second}};
}

struct Value {
  uint16_t size;
  std::span<const Field> fields;
  Keying keys;
};
struct List {
  Instance entries;
  Keying keys;
};

// A path is a node's name with '/' for '_'.
template <size_t size>
struct Path {
  char text[size];
};
template <size_t size>
constexpr Path<size> MakePath(const char (&name)[size]) {
  Path<size> path{};
  std::transform(name, name + size, path.text, [](char c) { return c == '_' ? '/' : c; });
  return path;
}
#define PATH(name, value, list) constexpr auto kPath_##name = MakePath(#name);
KSI_NODE_TABLE(PATH)

constexpr Node MakeNode(std::string_view path, const Value& value, const List& list) {
  return {path, value.size, value.fields, value.keys, list.entries, list.keys};
}

using enum Instance;
#define VALUE(record, ...) \
  Value { sizeof(KSI_##record), k##record##Fields, Keys(__VA_ARGS__) }
#define NO_VALUE \
  Value {}
#define LIST(entries, ...) \
  List { entries, Keys(__VA_ARGS__) }
#define NO_LIST \
  List {}
#define ROW(name, value, list) MakeNode(kPath_##name.text, value, list),
constexpr Node kNodes[] = {KSI_NODE_TABLE(ROW)};

static_assert(std::ranges::all_of(kNodes, [](const Node& node) {
  return node.recordSize <= kMaxRecordSize && (node.HasValue() || node.HasList());
}));
// Fields stand in the order of their offsets, inside the record, and do not overlap.
static_assert(std::ranges::all_of(kNodes, [](const Node& node) {
  size_t end = 0;
  for (const Field& field : node.fields) {
    if (field.offset < end) return false;
    end = size_t{field.offset} + field.width;
  }
  return end <= node.recordSize;
}));

}  // namespace

const char* NameOf(Instance instance) {
  static constexpr const char* kNames[] = {"none",       "group",  "client", "memory node",
                                           "remap type", "state",  "buddy",  "heap",
                                           "pool",       "volume", "region"};
  return kNames[static_cast<size_t>(instance)];
}

std::span<const Node> Catalogue() { return kNodes; }

const Node* FindNode(uint16_t id) {
  return id >= 1 && id <= std::size(kNodes) ? &kNodes[id - 1] : nullptr;
}

const Node* FindNode(std::string_view path) {
  const auto* found = std::ranges::find(kNodes, path, &Node::path);
  return found == std::end(kNodes) ? nullptr : found;
}

uint16_t IdOf(const Node& node) { return static_cast<uint16_t>(&node - kNodes + 1); }

}  // namespace ksi
