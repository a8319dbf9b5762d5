// asyncremap-stats: one row for each remap type of each memory client of the user worlds, on the
// pages that the kernel remaps in the background (memClients/remapTypes, by client and type). The
// counts arrive in pages. The walk is always as deep as it can be.

#include <string_view>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "framework/param_list.h"
#include "framework/return_status.h"
#include "reports/clients/client_report.h"
#include "reports/reports.h"

namespace tally {
namespace {

constexpr ReportFrame kFrame = {
    .title = "ASYNC_REMAP STATS",
    .ruleLength = 43,
    .options = "g:s:u:vq",
    .totalRow = true,
};

struct RemapRow {
  std::string_view name;  // of the group
  int32_t grpLeader;      // the memory client
  const char* type;
  KSI_RemapType pages;
};

// No identity column has a cell in the Total row: it bears no label.
constexpr Column<RemapRow> kColumns[] = {
    Text("name", "Group name", [](const RemapRow& row) { return row.name; }).Wide(27),
    Id("grpLeader", "Group leader ID", [](const RemapRow& row) { return row.grpLeader; }),
    Text("type", "Type of remap", [](const RemapRow& row) { return row.type; }).Wide(28).Fixed(),
    Pages("added", "Total number of pages ever added",
          [](const RemapRow& row) { return row.pages.added; }),
    Pages("prepared", "Number of pages ever prepared",
          [](const RemapRow& row) { return row.pages.prepared; }),
    Pages("filtered", "Number of pages ever filtered",
          [](const RemapRow& row) { return row.pages.filtered; }),
    Pages("staged", "Number of pages ever staged",
          [](const RemapRow& row) { return row.pages.staged; }),
    Pages("remapped", "Total number of pages ever remapped",
          [](const RemapRow& row) { return row.pages.remapped; }),
    Pages("canceled", "Total number of pages ever canceled",
          [](const RemapRow& row) { return row.pages.canceled; }),
    Pages("cUnprepared", "Number of pages currently unprepared",
          [](const RemapRow& row) { return row.pages.cUnprepared; }),
    Pages("cPrepared", "Number of pages currently prepared",
          [](const RemapRow& row) { return row.pages.cPrepared; }),
    Pages("cStaged", "Number of pages currently staged",
          [](const RemapRow& row) { return row.pages.cStaged; }),
};
static_assert(IsSound(kColumns));

// A failure is known by its function and number; the number does not move with the source.
Status WarnAt(const char* function, unsigned number, Status status) {
  Warning("%s:%u failure: %s\n", function, number, KNV_ReturnStatusToString(status));
  return status;
}

// A memory client's id is signed and widened with its sign.
Key ClientKey(int32_t client) { return static_cast<uint64_t>(int64_t{client}); }

Status TallyAsyncRemapGetStats(int32_t client, const char* type, KSI_RemapType& pages) {
  return KeyedGet(KSI_NODE_sched_memClients_remapTypes,
                  {.capacity = 2, .first = ClientKey(client), .second = type}, pages,
                  [](ReadStep step, Status status) {
                    constexpr const char* kFunction = "TallyAsyncRemapGetStats";
                    if (step == ReadStep::addFirstKey) WarnAt(kFunction, 137, status);
                    if (step == ReadStep::addSecondKey) WarnAt(kFunction, 138, status);
                    if (step == ReadStep::read) WarnAt(kFunction, 140, status);
                  });
}

// Prints the rows of one memory client.
Status TallyAsyncRemapReportCallbackInt(ReportContext<RemapRow>& context, RemapRow& row) {
  constexpr const char* kFunction = "TallyAsyncRemapReportCallbackInt";
  ParamList types;
  if (Status failed = KeyedList(KSI_NODE_sched_memClients_remapTypes,
                                {.capacity = 1, .first = ClientKey(row.grpLeader)}, types,
                                [](ReadStep step, Status status) {
                                  if (step == ReadStep::addFirstKey) WarnAt(kFunction, 303, status);
                                  if (step == ReadStep::read) WarnAt(kFunction, 305, status);
                                })) {
    return failed;
  }

  const uint32_t count = KSI_ParamListUsedCount(types.get());
  for (uint32_t i = 0; i < count; ++i) {
    if (Status status = KSI_ParamListGetString(types.get(), i, &row.type)) {
      return WarnAt(kFunction, 308, status);
    }
    if (Status status = TallyAsyncRemapGetStats(row.grpLeader, row.type, row.pages)) {
      return WarnAt(kFunction, 310, status);
    }
    context.PrintRow(row);
  }
  return kSuccess;
}

// Prints the rows of one user world's memory clients.
Status TallyAsyncRemapReportCallback(uint64_t gid, uint32_t /*childCount*/, int /*csvMode*/,
                                     void* opaque) {
  constexpr const char* kFunction = "TallyAsyncRemapReportCallback";
  uint32_t flags = 0;
  KSI_GroupName name;
  Status status = kSuccess;
  if ((status = Tally_GroupGetFlags(gid, flags)) || (flags & KSI_GROUP_USER_WORLD) == 0) {
    return status;
  }
  if ((status = Tally_GroupGetName(gid, name))) return status;

  ParamList clients;
  if ((status = KeyedList(KSI_NODE_sched_groups_members_memClients, {.capacity = 1, .first = gid},
                          clients, [](ReadStep step, Status failed) {
                            if (step == ReadStep::addFirstKey) WarnAt(kFunction, 394, failed);
                            if (step == ReadStep::read) WarnAt(kFunction, 396, failed);
                          }))) {
    return status;
  }

  RemapRow row;
  // One character less than the field: the row's name was made for a terminator.
  row.name = FixedText(name.text).substr(0, sizeof name.text - 1);
  const uint32_t count = KSI_ParamListUsedCount(clients.get());
  for (uint32_t i = 0; i < count; ++i) {
    uint32_t client = 0;
    if ((status = KSI_ParamListGetUInt32(clients.get(), i, &client))) {
      return WarnAt(kFunction, 401, status);
    }
    row.grpLeader = static_cast<int32_t>(client);
    if ((status = TallyAsyncRemapReportCallbackInt(*static_cast<ReportContext<RemapRow>*>(opaque),
                                                   row))) {
      return WarnAt(kFunction, 403, status);
    }
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
