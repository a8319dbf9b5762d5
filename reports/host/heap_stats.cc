// heap-stats: one row for each heap of the kernel (system/heaps, system/heaps/stats by the heap's
// name), with its limits, its size and its allocations. Sizes arrive in bytes, which are the
// default unit too; percentages and averages are the kernel's own. All heaps are read before any is
// printed.

#include <memory>
#include <new>
#include <span>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/fixed_text.h"
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "HEAP STATS",
    .ruleLength = 36,
    .options = "s:u:vq",
    .longVerbose = 'u',  // --verbose is a -u without a unit: bytes, and no descriptions
    .allowBytes = true,
};

uint64_t FromBytes(uint64_t bytes, DisplayUnit unit) {
  switch (unit) {
    case DisplayUnit::mb:
      return bytes >> 20;
    case DisplayUnit::kb:
      return bytes >> 10;
    case DisplayUnit::pg:
      return bytes >> 12;
    case DisplayUnit::b:
      return bytes;
  }
  return 0;
}

constexpr Column<KSI_HeapStats> kColumns[] = {
    {"name", "heap name", 35, "s", kSum, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return FixedText(heap.name); }, Fixed::yes},
    {"dynGrow", "dynamically growable", 12, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.dynGrow; }},
    {"lowerLimit", "lower limit", 7, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.lowerLimit; }},
    {"upperLimit", "upper limit", 7, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.upperLimit; }},
    {"reserved", "reserved", 7, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.reserved; }},
    {"numRanges", "num ranges", 7, "d", kSum, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.numRanges; }},
    {"dlMallocOvdh", "DL malloc overhead", 10, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.dlMallocOvdh; }},
    {"used", "current used", 10, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.size - heap.avail; }},
    {"avail", "current available", 10, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.avail; }},
    {"size", "current size", 10, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.size; }},
    {"initial", "initial size", 10, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.initial; }},
    {"max", "max size", 11, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.max; }},
    {"pctFreeOfCur", "% free of current", 12, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.pctFreeOfCur; }},
    {"maxAvail", "max available", 12, "Lu", kSum, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.maxAvail; }},
    {"pctFreeOfMax", "% free of max", 7, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.pctFreeOfMax; }},
    {"lowPctFreeOfMax", "lowest % free of max", 12, "d", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.lowPctFreeOfMax; }},
    {"numSuccAllocs", "number of succeeded allocations", 10, "u", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.numSuccAllocs; }},
    {"numFailAllocs", "number of succeeded allocations", 10, "u", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.numFailAllocs; }},
    {"numGrowthOps", "number of growth operations", 10, "u", kSum, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.numGrowthOps; }},
    {"numShrinkOps", "number of shrink operations", 10, "u", kSum, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.numShrinkOps; }},
    {"numReqsPerGrowth", "number of requests per growth operations", 10, "u", kBlank, nullptr,
     [](const KSI_HeapStats& heap) -> Cell { return heap.numReqsPerGrowth; }},
    {"avgAllocSize", "average allocation size", 10, "u", kBlank, FromBytes,
     [](const KSI_HeapStats& heap) -> Cell { return heap.avgAllocSize; }},
};

// The heaps that were read.
struct Heaps {
  std::unique_ptr<KSI_HeapStats[]> records;
  size_t count = 0;
};

// Reads the heaps; false, after its message, when anything but a single heap was missing.
bool TallyHeapGetMemMapStats(Heaps& heaps) {
  ParamList names;
  if (ListInstances(KSI_NODE_system_heaps, nullptr, names) != kSuccess) {
    Warning("TallyHeapGetMemMapStats: KSI_GetInstanceListAlloc() for heapList failure\n");
    return false;
  }
  const uint32_t count = KSI_ParamListUsedCount(names.get());
  if (count == 0) {
    Warning("TallyHeapGetMemMapStats: KSI_ParamListUsedCount() returned 0\n");
    return true;
  }
  heaps.records.reset(new (std::nothrow) KSI_HeapStats[count]);
  if (!heaps.records) {
    Warning("TallyHeapGetMemMapStats: malloc() for stats failure\n");
    return false;
  }
  // One list serves all reads.
  const ParamList heapParam(KSI_ParamListCreate(1, 1));
  if (!heapParam) {
    Warning("TallyHeapGetMemMapStats: KSI_ParamListCreate() for heapParam failure\n");
    return false;
  }
  for (uint32_t i = 0; i < count; ++i) {
    const char* name = nullptr;
    if (KSI_ParamListGetString(names.get(), i, &name) != kSuccess) {
      Warning("TallyHeapGetMemMapStats: KSI_ParamListGetString() failure\n");
      return false;
    }
    if (KSI_ParamListAddString(heapParam.get(), name) != kSuccess) {
      Warning("TallyHeapGetMemMapStats: KSI_ParamListAddString() failure\n");
      return false;
    }
    const Status status = KSI_Get(KSI_NODE_system_heaps_stats, heapParam.get(),
                                  &heaps.records[heaps.count], sizeof(KSI_HeapStats));
    KSI_ParamListRemoveLastParam(heapParam.get());
    if (status == kNotFound) continue;  // the heap is gone
    if (status != kSuccess) {
      Warning("TallyHeapGetMemMapStats: KSI_Get() failure\n");
      return false;
    }
    ++heaps.count;
  }
  return true;
}

}  // namespace

// Once the unit is accepted the report succeeds, whatever could be read.
Status TallyHeapStats(int argc, char** argv) {
  ReportContext<KSI_HeapStats> context(kFrame, kColumns);
  if (Status status = context.Begin(argc, argv)) return status;
  Heaps heaps;
  if (!TallyHeapGetMemMapStats(heaps)) return kSuccess;
  context.PrintTitleBlock();
  context.PrintHead();
  for (const KSI_HeapStats& heap : std::span(heaps.records.get(), heaps.count)) {
    context.PrintRow(heap);
  }
  // What is in use wraps at 32 bits in a heap's row, but not here.
  context.total("used") = context.total("size") - context.total("avail");
  // The sum takes the places of two 32-bit figures: the blank cell before it has its low half.
  context.total("numRanges") >>= 32;
  context.PrintTotal();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace tally
