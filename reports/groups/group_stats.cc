// group-stats: one row for each scheduler group that passes the filters, with what is configured
// for it, what is reserved and what it consumes; with -t also one row for each tag.
//
// A group's figures are its name, tag, parent and flags, its configured allocation
// (memAllocationInKB), its reservations (stats/capacity) and its memory (stats/memoryStats). All
// are read by the group's id, and memory arrives in kilobytes.

#include <array>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

#include <knvlibs/ksi.h>
#include "framework/fixed_text.h"
#include "framework/report.h"
#include "reports/groups/group_readers.h"
#include "reports/groups/group_walk.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "GROUP STATS",
    .ruleLength = 37,
    .options = "e:g:i:l:s:u:vqt",
    .selectColumnsAt = SelectColumnsAt::afterFilters,
    .filterNames = groupFlagNames,
};

struct GroupRow {
  uint64_t gid;
  int64_t parGid;
  KSI_GroupName name;
  uint32_t flags;
  NameWriter flagNames;
  KSI_GroupAllocation allocation;
  int32_t nChild;
  KSI_GroupCapacity capacity;
  KSI_GroupMemoryStats stats;
  KSI_GroupTag tag;
};

// What a tag's row shows in a column.
// sic: C13
enum class InTag : uint8_t {
  slot,  // of the tag itself: its texts, and 1 as its id
  zero,
  sum,       // of the groups with the tag
  sumTwice,  // each group counts double; sic: C12
  last,      // the last group's figure
  noLimit,   // -1
};

// A column says so where it is not the sum.
struct GroupColumn : Column<GroupRow> {
  constexpr GroupColumn(const Column<GroupRow>& column, InTag shown = InTag::sum)
      : Column<GroupRow>(column), inTag(shown) {}

  InTag inTag;
};

// A limit above so many kilobytes stands for none.
int64_t LimitOrNone(int64_t kilobytes) {
  return kilobytes > KSI_GROUP_LARGEST_LIMIT ? -1 : kilobytes;
}

constexpr GroupColumn kColumns[] = {
    {Id("gid", "Group ID", [](const GroupRow& row) { return row.gid; }).Key().Wide(8).Fixed(),
     InTag::slot},
    {Text("name", "Group name", [](const GroupRow& row) { return FixedText(row.name.text); })
         .Key()
         .Wide(28),
     InTag::slot},
    {Id("parGid", "Parent group ID", [](const GroupRow& row) { return row.parGid; }).Wide(8),
     InTag::zero},
    Count("nChild", "Number of child groups", [](const GroupRow& row) { return row.nChild; })
        .Wide(8),
    Kilobytes("min", "Configured memory reservation",
              [](const GroupRow& row) { return row.allocation.min; }),
    {Kilobytes("max", "Configured memory limit",
               [](const GroupRow& row) { return LimitOrNone(row.allocation.max); }),
     InTag::noLimit},
    {Kilobytes("minLimit", "Configured memory reservation limit",
               [](const GroupRow& row) { return LimitOrNone(row.allocation.minLimit); }),
     InTag::noLimit},
    {Count("shares", "Configured shares", [](const GroupRow& row) { return row.allocation.shares; })
         .As("Ld"),
     InTag::zero},
    Kilobytes("conResv", "Total memory reservation consumed by children",
              [](const GroupRow& row) { return row.capacity.conResv; }),
    Kilobytes("availResv", "Total memory reservation available to group",
              [](const GroupRow& row) { return row.capacity.availResv; }),
    Kilobytes(
        "memSize",
        "Guest physical / Accounted UW virtual / kernel machine address space currently consumed",
        [](const GroupRow& row) { return row.stats.memSize; }),
    Kilobytes("memSizePeak",
              "Peak guest physical / Accounted UW virtual / kernel machine address space currently "
              "consumed (since last reset)",
              [](const GroupRow& row) { return row.stats.memSizePeak; }),
    Kilobytes("iMin", "Implicit memory reservation",
              [](const GroupRow& row) { return row.stats.iMin; }),
    Kilobytes("eMin", "Effective memory reservation",
              [](const GroupRow& row) { return row.stats.eMin; }),
    Kilobytes("eMinPeak", "Peak value for effective memory reservation (since last reset)",
              [](const GroupRow& row) { return row.stats.eMinPeak; }),
    Kilobytes("rMinPeak", "Peak value for requested memory reservation (since last reset)",
              [](const GroupRow& row) { return row.stats.rMinPeak; }),
    Kilobytes("bMin", "Base memory reservation",
              [](const GroupRow& row) { return row.stats.bMin; }),
    {Kilobytes("bMax", "Base memory limit", [](const GroupRow& row) { return row.stats.bMax; }),
     InTag::last},
    {Count("bShares", "Base shares", [](const GroupRow& row) { return row.stats.bShares; }),
     InTag::zero},
    {Count("fShares", "flattened base shares",
           [](const GroupRow& row) { return row.stats.fShares; }),
     InTag::zero},
    Kilobytes("ovhdResv", "Reserved overhead memory",
              [](const GroupRow& row) { return row.stats.ovhdResv; }),
    Kilobytes("ovhd", "Consumed overhead memory",
              [](const GroupRow& row) { return row.stats.ovhd; }),
    Kilobytes("allocTgt", "Memory allocation target for group",
              [](const GroupRow& row) { return row.stats.allocTgt; }),
    {Kilobytes("consumed", "Total memory consumed by group",
               [](const GroupRow& row) { return row.stats.consumed; }),
     InTag::sumTwice},
    Kilobytes("consumedPeak", "Peak value for total memory consumed by group (since last reset)",
              [](const GroupRow& row) { return row.stats.consumedPeak; }),
    Kilobytes("touched", "Estimate of guest memory touched",
              [](const GroupRow& row) { return row.stats.touched; }),
    Kilobytes("bActive", "Base activeness", [](const GroupRow& row) { return row.stats.bActive; }),
    Kilobytes("sharedSaved", "Estimate of memory savings from page sharing",
              [](const GroupRow& row) { return row.stats.sharedSaved; }),
    // sic: C11
    {Kilobytes("mps", "Memory per share (KB)", [](const GroupRow& row) { return row.stats.mps; })
         .Wide(20),
     InTag::noLimit},
    {Percent("throttlePct", "% of possible time the guest is allowed to be executed",
             [](const GroupRow& row) { return row.stats.throttlePct; })
         .Wide(3),
     InTag::zero},
    {Text("flags", "Group flags", [](const GroupRow& row) { return row.flagNames.text(); })
         .Wide(16),
     InTag::slot},
    {Text("tag", "Group Tag", [](const GroupRow& row) { return FixedText(row.tag.text); }).Wide(28),
     InTag::slot},
};
static_assert(IsSound(kColumns));

// The sums of the groups that bear one tag.
struct TagSlot {
  KSI_GroupName name;
  KSI_GroupTag tag;
  std::array<uint64_t, std::size(kColumns)> figures;
};

class GroupContext : public ReportContext<GroupRow, GroupColumn> {
 public:
  explicit GroupContext(Sink& sink) : ReportContext(kFrame, kColumns, sink) {}

  // Adds a group to the row of its tag; kOutOfMemory after its message when there are too many.
  Status AddToTag(const GroupRow& row);

  void PrintTags();

 private:
  // The slot of the tag, a new one when there is none; null when there is no room for it.
  TagSlot* FindSlot(std::string_view tag);

  static constexpr size_t kMaxTags = 512;

  std::vector<TagSlot> slots_;
};

TagSlot* GroupContext::FindSlot(std::string_view tag) {
  for (TagSlot& slot : slots_) {
    if (FixedText(slot.tag.text) == tag) return &slot;
  }
  if (slots_.size() == kMaxTags) return nullptr;
  TagSlot& slot = slots_.emplace_back();
  const std::string text(tag);
  Str_Strcpy(slot.name.text, text.c_str(), sizeof slot.name.text);
  // sic: C14
  Str_Strcpy(slot.tag.text, text.c_str(), sizeof slot.tag.text);
  return &slot;
}

Status GroupContext::AddToTag(const GroupRow& row) {
  TagSlot* const slot = FindSlot(FixedText(row.tag.text));
  if (slot == nullptr) {
    Warning("Maximum number of VTag exceeded\n");
    return kOutOfMemory;
  }
  for (size_t i = 0; i < std::size(kColumns); ++i) {
    const uint64_t figure = kColumns[i].value(row).number();
    switch (kColumns[i].inTag) {
      case InTag::slot:
      case InTag::zero:
        break;
      case InTag::sum:
        slot->figures[i] += figure;
        break;
      case InTag::sumTwice:
        slot->figures[i] += 2 * figure;
        break;
      case InTag::last:
        slot->figures[i] = figure;
        break;
      case InTag::noLimit:
        slot->figures[i] = KSI_NO_VALUE;
        break;
    }
  }
  return kSuccess;
}

void GroupContext::PrintTags() {
  for (const TagSlot& slot : slots_) {
    GroupRow row = {};
    row.gid = 1;
    row.name = slot.name;
    row.flagNames = FormatFlagMask(0, groupFlagNames);
    row.tag = slot.tag;
    for (size_t i = 0; i < std::size(kColumns); ++i) {
      const GroupColumn& column = kColumns[i];
      cells()[i] = column.inTag == InTag::slot ? column.value(row) : Cell(slot.figures[i]);
    }
    PutCells(RowKind::tag);
  }
}

Status TallyGroupStatsGroup(uint64_t gid, uint32_t childCount, int /*csvMode*/, void* opaque) {
  GroupContext& context = *static_cast<GroupContext*>(opaque);
  GroupRow row;
  if (Status status = Tally_GroupGetFlags(gid, row.flags)) return status;
  if (!context.filter().Passes(row.flags)) return kSuccess;
  row.gid = gid;
  row.nChild = static_cast<int32_t>(childCount);
  if (Status status = Tally_GroupGetName(gid, row.name)) return status;
  if (Status status = Tally_GroupGetTag(gid, row.tag)) return status;
  if (Status status = Tally_GroupGetParentID(gid, row.parGid)) return status;
  if (Status status = Tally_GroupGetAlloc(gid, row.allocation)) return status;
  if (Status status = TallyGroupGetCapacity(gid, row.capacity)) return status;
  if (Status status = TallyGroupGetMemoryStats(gid, row.stats)) return status;
  row.flagNames = FormatFlagMask(row.flags, groupFlagNames);
  if (context.options().tags) {
    if (Status status = context.AddToTag(row)) return status;
  }
  context.PrintRow(row);
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  GroupContext context(sink);
  if (Status status = context.Settle(options)) return status;
  context.Begin();
  const Status status = TallyTraverseGroups(static_cast<uint64_t>(options.startGid), options.levels,
                                            options.csvMode, TallyGroupStatsGroup, &context);
  context.Rule();
  if (options.tags) {
    // sic: C15
    context.Note("Virtual tags report");
    context.PrintTags();
    context.Rule();
  }
  context.PrintDescriptions();
  return status;
}

}  // namespace

const Report groupStats = {
    .name = "group-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyGroupStats,
};

Status TallyGroupStats(int argc, char** argv) { return PrintReport(groupStats, argc, argv); }

}  // namespace tally
