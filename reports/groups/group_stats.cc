// group-stats: one row for each scheduler group that passes the filters, with what is configured
// for it, what is reserved and what it consumes; with -t also one row for each tag.
//
// A group's figures are its name, tag, parent and flags, its configured allocation
// (memAllocationInKB), its reservations (stats/capacity) and its memory (stats/memoryStats). All
// are read by the group's id, and memory arrives in kilobytes.

#include <array>
#include <cstdio>
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
enum class InTag : uint8_t {
  slot,  // of the tag itself: its texts, and 1 as its id
  zero,
  sum,       // of the groups with the tag
  sumTwice,  // each group counts double
  last,      // the last group's figure
  noLimit,   // -1
};

struct GroupColumn : Column<GroupRow> {
  InTag inTag;
};

// A limit above so many kilobytes stands for none.
int64_t LimitOrNone(int64_t kilobytes) {
  constexpr int64_t kLargestLimit = 0xFFFFFFFFF0;
  return kilobytes > kLargestLimit ? -1 : kilobytes;
}

constexpr GroupColumn kColumns[] = {
    {{"gid", "Group ID", 8, "Lu", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.gid; }, Fixed::yes},
     InTag::slot},
    {{"name", "Group name", 28, "s", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return FixedText(row.name.text); }},
     InTag::slot},
    {{"parGid", "Parent group ID", 8, "Ld", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.parGid; }},
     InTag::zero},
    {{"nChild", "Number of child groups", 8, "d", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.nChild; }},
     InTag::sum},
    {{"min", "Configured memory reservation", 10, "Ld", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.allocation.min; }},
     InTag::sum},
    {{"max", "Configured memory limit", 10, "Ld", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return LimitOrNone(row.allocation.max); }},
     InTag::noLimit},
    {{"minLimit", "Configured memory reservation limit", 10, "Ld", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return LimitOrNone(row.allocation.minLimit); }},
     InTag::noLimit},
    {{"shares", "Configured shares", 10, "Ld", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.allocation.shares; }},
     InTag::zero},
    {{"conResv", "Total memory reservation consumed by children", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.capacity.conResv; }},
     InTag::sum},
    {{"availResv", "Total memory reservation available to group", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.capacity.availResv; }},
     InTag::sum},
    {{"memSize",
      "Guest physical / Accounted UW virtual / kernel machine address space currently consumed", 10,
      "Lu", kSum, FromKilobytes, [](const GroupRow& row) -> Cell { return row.stats.memSize; }},
     InTag::sum},
    {{"memSizePeak",
      "Peak guest physical / Accounted UW virtual / kernel machine address space currently "
      "consumed (since last reset)",
      10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.memSizePeak; }},
     InTag::sum},
    {{"iMin", "Implicit memory reservation", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.iMin; }},
     InTag::sum},
    {{"eMin", "Effective memory reservation", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.eMin; }},
     InTag::sum},
    {{"eMinPeak", "Peak value for effective memory reservation (since last reset)", 10, "Lu", kSum,
      FromKilobytes, [](const GroupRow& row) -> Cell { return row.stats.eMinPeak; }},
     InTag::sum},
    {{"rMinPeak", "Peak value for requested memory reservation (since last reset)", 10, "Lu", kSum,
      FromKilobytes, [](const GroupRow& row) -> Cell { return row.stats.rMinPeak; }},
     InTag::sum},
    {{"bMin", "Base memory reservation", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.bMin; }},
     InTag::sum},
    {{"bMax", "Base memory limit", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.bMax; }},
     InTag::last},
    {{"bShares", "Base shares", 10, "Lu", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.stats.bShares; }},
     InTag::zero},
    {{"fShares", "flattened base shares", 10, "Lu", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.stats.fShares; }},
     InTag::zero},
    {{"ovhdResv", "Reserved overhead memory", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.ovhdResv; }},
     InTag::sum},
    {{"ovhd", "Consumed overhead memory", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.ovhd; }},
     InTag::sum},
    {{"allocTgt", "Memory allocation target for group", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.allocTgt; }},
     InTag::sum},
    {{"consumed", "Total memory consumed by group", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.consumed; }},
     InTag::sumTwice},
    {{"consumedPeak", "Peak value for total memory consumed by group (since last reset)", 10, "Lu",
      kSum, FromKilobytes, [](const GroupRow& row) -> Cell { return row.stats.consumedPeak; }},
     InTag::sum},
    {{"touched", "Estimate of guest memory touched", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.touched; }},
     InTag::sum},
    {{"bActive", "Base activeness", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.bActive; }},
     InTag::sum},
    {{"sharedSaved", "Estimate of memory savings from page sharing", 10, "Lu", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.sharedSaved; }},
     InTag::sum},
    {{"mps", "Memory per share (KB)", 20, "Ld", kSum, FromKilobytes,
      [](const GroupRow& row) -> Cell { return row.stats.mps; }},
     InTag::noLimit},
    {{"throttlePct", "% of possible time the guest is allowed to be executed", 3, "u", kBlank,
      nullptr, [](const GroupRow& row) -> Cell { return row.stats.throttlePct; }},
     InTag::zero},
    {{"flags", "Group flags", 16, "s", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return row.flagNames.text(); }},
     InTag::slot},
    {{"tag", "Group Tag", 28, "s", kSum, nullptr,
      [](const GroupRow& row) -> Cell { return FixedText(row.tag.text); }},
     InTag::slot},
};

// The sums of the groups that bear one tag.
struct TagSlot {
  KSI_GroupName name;
  KSI_GroupTag tag;
  std::array<uint64_t, std::size(kColumns)> figures;
};

class GroupContext : public ReportContext<GroupRow, GroupColumn> {
 public:
  GroupContext() : ReportContext(kFrame, kColumns) {}

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
  // A tag that fills its field loses its last letter here and so gets a slot for each group.
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
        slot->figures[i] = kNoValue;
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
    PrintCells(false);
  }
}

Status TallyGroupStatsGroup(uint64_t gid, uint32_t childCount, int /*csvMode*/, void* opaque) {
  GroupContext& context = *static_cast<GroupContext*>(opaque);
  GroupRow row;
  Status status = kSuccess;
  if ((status = Tally_GroupGetFlags(gid, row.flags))) return status;
  if (!context.filter().Passes(row.flags)) return kSuccess;
  row.gid = gid;
  row.nChild = static_cast<int32_t>(childCount);
  if ((status = Tally_GroupGetName(gid, row.name)) || (status = Tally_GroupGetTag(gid, row.tag)) ||
      (status = Tally_GroupGetParentID(gid, row.parGid)) ||
      (status = Tally_GroupGetAlloc(gid, row.allocation)) ||
      (status = TallyGroupGetCapacity(gid, row.capacity)) ||
      (status = TallyGroupGetMemoryStats(gid, row.stats))) {
    return status;
  }
  row.flagNames = FormatFlagMask(row.flags, groupFlagNames);
  if (context.options().tags && (status = context.AddToTag(row))) return status;
  context.PrintRow(row);
  return kSuccess;
}

}  // namespace

Status TallyGroupStats(int argc, char** argv) {
  GroupContext context;
  if (Status status = context.Begin(argc, argv)) return status;
  context.PrintTitleBlock();
  context.PrintHead();
  const ReportOptions& options = context.options();
  const Status status = TallyTraverseGroups(static_cast<uint64_t>(options.startGid), options.levels,
                                            options.csvMode, TallyGroupStatsGroup, &context);
  context.PrintDashes();
  if (options.tags) {
    std::puts("Virtual tags report");
    context.PrintTags();
    context.PrintDashes();
  }
  context.PrintDescriptions();
  return status;
}

}  // namespace tally
