// asyncremap-stats: one row for each remap type of each memory client of the user worlds, on the
// pages that the kernel remaps in the background (memClients/remapTypes, by client and type). The
// counts arrive in pages. The walk is always as deep as it can be.

#include <string_view>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "ASYNC_REMAP STATS",
    .ruleLength = 43,
    // sic: C26
    .options = "g:s:u:vq",
    .totalRow = true,
};

struct RemapRow {
  std::string_view name;  // of the group
  int32_t grpLeader;      // the memory client
  const char* type;
  KSI_RemapType pages;
};

// sic: C23
constexpr Column<RemapRow> kColumns[] = {
    Text("name", "Group name", [](const RemapRow& row) { return row.name; }).Key().Wide(27),
    Id("grpLeader", "Group leader ID", [](const RemapRow& row) { return row.grpLeader; }).Key(),
    Text("type", "Type of remap", [](const RemapRow& row) { return row.type; })
        .Key()
        .Wide(28)
        .Fixed(),
    Pages("added", "Total number of pages ever added",
          [](const RemapRow& row) { return row.pages.added; })
        .Ever(),
    Pages("prepared", "Number of pages ever prepared",
          [](const RemapRow& row) { return row.pages.prepared; })
        .Ever(),
    Pages("filtered", "Number of pages ever filtered",
          [](const RemapRow& row) { return row.pages.filtered; })
        .Ever(),
    Pages("staged", "Number of pages ever staged",
          [](const RemapRow& row) { return row.pages.staged; })
        .Ever(),
    Pages("remapped", "Total number of pages ever remapped",
          [](const RemapRow& row) { return row.pages.remapped; })
        .Ever(),
    Pages("canceled", "Total number of pages ever canceled",
          [](const RemapRow& row) { return row.pages.canceled; })
        .Ever(),
    Pages("cUnprepared", "Number of pages currently unprepared",
          [](const RemapRow& row) { return row.pages.cUnprepared; }),
    Pages("cPrepared", "Number of pages currently prepared",
          [](const RemapRow& row) { return row.pages.cPrepared; }),
    Pages("cStaged", "Number of pages currently staged",
          [](const RemapRow& row) { return row.pages.cStaged; }),
};
static_assert(IsSound(kColumns));

// sic: C24
constexpr ReaderTexts kRecordTexts = {
    .firstKey = {Style::message, "TallyAsyncRemapGetStats:137 failure"},
    .secondKey = {Style::message, "TallyAsyncRemapGetStats:138 failure"},
    .read = {Style::message, "TallyAsyncRemapGetStats:140 failure"},
};
constexpr ReaderTexts kTypeListTexts = {
    .firstKey = {Style::message, "TallyAsyncRemapReportCallbackInt:303 failure"},
    .read = {Style::message, "TallyAsyncRemapReportCallbackInt:305 failure"},
};
constexpr Complaint kTypeName = {Style::message, "TallyAsyncRemapReportCallbackInt:308 failure"};
constexpr Complaint kType = {Style::message, "TallyAsyncRemapReportCallbackInt:310 failure"};
constexpr ReaderTexts kClientListTexts = {
    .firstKey = {Style::message, "TallyAsyncRemapReportCallback:394 failure"},
    .read = {Style::message, "TallyAsyncRemapReportCallback:396 failure"},
};
constexpr Complaint kClientId = {Style::message, "TallyAsyncRemapReportCallback:401 failure"};
constexpr Complaint kClient = {Style::message, "TallyAsyncRemapReportCallback:403 failure"};

Status TallyAsyncRemapGetStats(int32_t client, const char* type, KSI_RemapType& pages) {
  return ReadRecord(KSI_NODE_sched_memClients_remapTypes,
                    {.capacity = 2, .first = client, .second = type}, kRecordTexts, pages);
}

// Prints the rows of one memory client.
Status TallyAsyncRemapReportCallbackInt(ReportContext<RemapRow>& context, RemapRow& row) {
  ParamList types;
  if (Status status =
          ListInstances(KSI_NODE_sched_memClients_remapTypes,
                        {.capacity = 1, .first = row.grpLeader}, kTypeListTexts, types)) {
    return status;
  }
  return ForEachName(types, kTypeName, [&](const char* type) {
    row.type = type;
    if (Status status = kType.Of(TallyAsyncRemapGetStats(row.grpLeader, type, row.pages))) {
      return status;
    }
    context.PrintRow(row);
    return kSuccess;
  });
}

// Prints the rows of one user world's memory clients.
Status TallyAsyncRemapReportCallback(uint64_t gid, uint32_t /*childCount*/, int /*csvMode*/,
                                     void* opaque) {
  auto& context = *static_cast<ReportContext<RemapRow>*>(opaque);
  uint32_t flags = 0;
  KSI_GroupName name;
  if (Status status = Tally_GroupGetFlags(gid, flags)) return status;
  if ((flags & KSI_GROUP_USER_WORLD) == 0) return kSuccess;
  if (Status status = Tally_GroupGetName(gid, name)) return status;

  ParamList clients;
  if (Status status = ListInstances(KSI_NODE_sched_groups_members_memClients,
                                    {.capacity = 1, .first = gid}, kClientListTexts, clients)) {
    return status;
  }
  RemapRow row;
  row.name = FixedText(name.text).substr(0, sizeof name.text - 1);  // sic: C25
  const uint32_t count = KSI_ParamListUsedCount(clients.get());
  for (uint32_t i = 0; i < count; ++i) {
    uint32_t client = 0;
    if (Status status = kClientId.Of(KSI_ParamListGetUInt32(clients.get(), i, &client))) {
      return status;
    }
    row.grpLeader = static_cast<int32_t>(client);
    if (Status status = kClient.Of(TallyAsyncRemapReportCallbackInt(context, row))) return status;
  }
  return kSuccess;
}

Status Run(const ReportOptions& options, Sink& sink) {
  return RunClientReport<RemapRow>(kFrame, kColumns, TallyAsyncRemapReportCallback, options, sink);
}

}  // namespace

const Report asyncRemapStats = {
    .name = "asyncremap-stats",
    .frame = &kFrame,
    .variants = kOnlyVariant<kColumns>,
    .run = Run,
    .entry = TallyAsyncRemapStats,
};

Status TallyAsyncRemapStats(int argc, char** argv) {
  return PrintReport(asyncRemapStats, argc, argv);
}

}  // namespace tally
