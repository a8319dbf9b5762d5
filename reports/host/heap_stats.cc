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
#include "framework/loss.h"
#include "framework/param_list.h"
#include "framework/report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "HEAP STATS",
    .ruleLength = 36,
    .options = "s:u:vq",
    .longVerbose = 'u',  // sic: C38
    .totalRow = true,
    .allowBytes = true,
};

// sic: C39
constexpr Column<KSI_HeapStats> kColumns[] = {
    Text("name", "heap name", [](const KSI_HeapStats& heap) { return FixedText(heap.name); })
        .Key()
        .Wide(35)
        .Total(kLabel)
        .Fixed(),
    Code("dynGrow", "dynamically growable", [](const KSI_HeapStats& heap) { return heap.dynGrow; })
        .Wide(12)
        .AsSigned("d"),
    Count("lowerLimit", "lower limit", [](const KSI_HeapStats& heap) { return heap.lowerLimit; })
        .Wide(7)
        .AsSigned("d")
        .Total(kBlank),
    Count("upperLimit", "upper limit", [](const KSI_HeapStats& heap) { return heap.upperLimit; })
        .Wide(7)
        .AsSigned("d")
        .Total(kBlank),
    Code("reserved", "reserved", [](const KSI_HeapStats& heap) { return heap.reserved; })
        .Wide(7)
        .AsSigned("d"),
    Count("numRanges", "num ranges", [](const KSI_HeapStats& heap) { return heap.numRanges; })
        .Wide(7)
        .AsSigned("d"),
    Bytes("dlMallocOvdh", "DL malloc overhead",
          [](const KSI_HeapStats& heap) { return heap.dlMallocOvdh; }),
    Bytes("used", "current used",
          [](const KSI_HeapStats& heap) { return Known(heap.size) - Known(heap.avail); }),
    Bytes("avail", "current available", [](const KSI_HeapStats& heap) { return heap.avail; }),
    Bytes("size", "current size", [](const KSI_HeapStats& heap) { return heap.size; }),
    Bytes("initial", "initial size", [](const KSI_HeapStats& heap) { return heap.initial; }),
    Bytes("max", "max size", [](const KSI_HeapStats& heap) { return heap.max; }).Wide(11),
    Percent("pctFreeOfCur", "% free of current",
            [](const KSI_HeapStats& heap) { return heap.pctFreeOfCur; })
        .Wide(12)
        .AsSigned("d"),
    Bytes("maxAvail", "max available", [](const KSI_HeapStats& heap) { return heap.maxAvail; })
        .Wide(12),
    Percent("pctFreeOfMax", "% free of max",
            [](const KSI_HeapStats& heap) { return heap.pctFreeOfMax; })
        .Wide(7)
        .AsSigned("d"),
    Percent("lowPctFreeOfMax", "lowest % free of max",
            [](const KSI_HeapStats& heap) { return heap.lowPctFreeOfMax; })
        .Wide(12)
        .AsSigned("d"),
    Count("numSuccAllocs", "number of succeeded allocations",
          [](const KSI_HeapStats& heap) { return heap.numSuccAllocs; })
        .Ever()
        .Total(kBlank),
    Count("numFailAllocs", "number of succeeded allocations",
          [](const KSI_HeapStats& heap) { return heap.numFailAllocs; })
        .Ever()
        .Total(kBlank),
    Count("numGrowthOps", "number of growth operations",
          [](const KSI_HeapStats& heap) { return heap.numGrowthOps; })
        .Ever(),
    Count("numShrinkOps", "number of shrink operations",
          [](const KSI_HeapStats& heap) { return heap.numShrinkOps; })
        .Ever(),
    Count("numReqsPerGrowth", "number of requests per growth operations",
          [](const KSI_HeapStats& heap) { return heap.numReqsPerGrowth; })
        .Total(kBlank),
    Bytes("avgAllocSize", "average allocation size",
          [](const KSI_HeapStats& heap) { return heap.avgAllocSize; })
        .As("u")
        .Total(kBlank),
};
static_assert(IsSound(kColumns));

constexpr size_t kNumRanges = PlaceOf(kColumns, "numRanges");
constexpr size_t kUsed = PlaceOf(kColumns, "used");
constexpr size_t kAvail = PlaceOf(kColumns, "avail");
constexpr size_t kSize = PlaceOf(kColumns, "size");

// The heaps that were read.
struct Heaps {
  std::unique_ptr<KSI_HeapStats[]> records;
  size_t count = 0;
};

constexpr Complaint kNotListed = {
    Style::plain, "TallyHeapGetMemMapStats: KSI_GetInstanceListAlloc() for heapList failure"};
constexpr Complaint kNoHeaps = {Style::plain,
                                "TallyHeapGetMemMapStats: KSI_ParamListUsedCount() returned 0"};
constexpr Complaint kNoRoom = {Style::plain, "TallyHeapGetMemMapStats: malloc() for stats failure"};
constexpr Complaint kNoName = {Style::plain,
                               "TallyHeapGetMemMapStats: KSI_ParamListGetString() failure"};
constexpr ReaderTexts kHeapTexts = {
    .create = {Style::plain,
               "TallyHeapGetMemMapStats: KSI_ParamListCreate() for heapParam failure"},
    .firstKey = {Style::plain, "TallyHeapGetMemMapStats: KSI_ParamListAddString() failure"},
    .read = {Style::plain, "TallyHeapGetMemMapStats: KSI_Get() failure"},
};

// Reads a heap behind those that were read; one that is gone is passed over.
Status ReadHeap(KSI_ParamList* key, const char* name, Heaps& heaps) {
  if (Status status = kHeapTexts.firstKey.Of(KSI_ParamListAddString(key, name))) return status;
  const Status status =
      KSI_Get(KSI_NODE_system_heaps_stats, key, &heaps.records[heaps.count], sizeof(KSI_HeapStats));
  KSI_ParamListRemoveLastParam(key);
  if (status == kNotFound) return kSuccess;
  if (status == kSuccess) ++heaps.count;
  return kHeapTexts.read.Of(status);
}

// Reads the `count` heaps of a list.
Status ReadHeaps(const ParamList& names, uint32_t count, Heaps& heaps) {
  heaps.records.reset(new (std::nothrow) KSI_HeapStats[count]);
  if (!heaps.records) return kNoRoom.Of(kFailure);
  // One list serves all reads.
  const ParamList key(KSI_ParamListCreate(1, 1));
  if (!key) return kHeapTexts.create.Of(kFailure);
  return ForEachName(names, count, kNoName,
                     [&](const char* name) { return ReadHeap(key.get(), name, heaps); });
}

// Reads the heaps; fails, after its message, when anything but a single heap was missing.
Status TallyHeapGetMemMapStats(Heaps& heaps) {
  ParamList names;
  if (Status status = kNotListed.Of(ListInstances(KSI_NODE_system_heaps, nullptr, names))) {
    return status;
  }
  const uint32_t count = KSI_ParamListUsedCount(names.get());
  if (count > 0) return ReadHeaps(names, count, heaps);
  kNoHeaps.Say(kSuccess);
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  ReportContext<KSI_HeapStats> context(kFrame, kColumns, sink);
  if (Status status = context.Settle(options)) return status;
  Heaps heaps;
  // sic: C42
  if (NoteLoss(TallyHeapGetMemMapStats(heaps)) != kSuccess) return kSuccess;
  context.Begin();
  for (const KSI_HeapStats& heap : std::span(heaps.records.get(), heaps.count)) {
    context.PrintRow(heap);
  }
  // sic: C40
  context.total(kUsed) = context.total(kSize) - context.total(kAvail);
  // sic: C41
  context.total(kNumRanges) >>= 32;
  context.PrintTotal();
  context.PrintDescriptions();
  return kSuccess;
}

}  // namespace

const Report heapStats = {
    .name = "heap-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyHeapStats,
};

Status TallyHeapStats(int argc, char** argv) { return PrintReport(heapStats, argc, argv); }

}  // namespace tally
