// What the reports on memory clients share: one row for each client that the walk over the groups
// finds, then the Total row.
#ifndef REPORTS_CLIENTS_CLIENT_REPORT_H_
#define REPORTS_CLIENTS_CLIENT_REPORT_H_

#include <cstdint>
#include <span>
#include <type_traits>

#include <knvlibs/ksi_records.h>
#include "framework/fixed_text.h"
#include "framework/report.h"
#include "reports/groups/group_readers.h"
#include "reports/groups/group_walk.h"

namespace tally {

// Which client a row is about.
struct Client {
  KSI_GroupName name;
  uint64_t schedGrp;
  int64_t parSchedGroup;
  int32_t worldGrp;
};

// Reads which client leads the group `groupId`: its name, its parent group and its world group.
// The status of what failed, after its message.
Status ReadClient(uint64_t groupId, Client& client);

// Reads a record of a memory client; a failure is worded with the reader's name.
template <class Record>
Status ReadClientRecord(const char* reader, int32_t clientId, uint16_t node, Record& record) {
  const Status status = Tally_MemClientKsiGet(clientId, node, &record, sizeof record);
  if (status != kSuccess) Warning("%s() failure, error code: %u\n", reader, status);
  return status;
}

// The host memory that a virtual machine or user world consumes, in kilobytes. Wraps like the
// kernel's own sums.
template <class Tally>
uint64_t Consumed(const Tally& tally) {
  return tally.vpmemUC + tally.mapped - tally.vpmemRW - tally.sharedSaved;
}

// The columns of these figures; a Row has a member `client`.
template <class Row>
constexpr Column<Row> NameColumn(const char* description) {
  return Text("name", description, [](const Row& row) { return FixedText(row.client.name.text); });
}

template <class Row>
constexpr Column<Row> kSchedGrpColumn = Id("schedGrp", "Scheduler group ID",
                                           [](const Row& row) { return row.client.schedGrp; });

template <class Row>
constexpr Column<Row> kParSchedGroupColumn =
    Id("parSchedGroup", "Parent scheduler group ID", [](const Row& row) {
      return row.client.parSchedGroup;
    }).As("Lu");

template <class Row>
constexpr Column<Row> kWorldGrpColumn = Id("worldGrp", "World group ID",
                                           [](const Row& row) { return row.client.worldGrp; });

// The visitor of a report on virtual machines. A group without the flag gives no row, and the walk
// goes on into its children; one of which anything cannot be read gives none either and is passed
// over with all below it. `kRead` reads what the report shows beside the client.
template <class Row, Status (*kRead)(uint64_t groupId, Row& row)>
Status VisitVirtualMachine(uint64_t groupId, uint32_t /*childCount*/, int /*csvMode*/,
                           void* context) {
  Row row;
  uint32_t flags = 0;
  Status status = kSuccess;
  if ((status = Tally_GroupGetFlags(groupId, flags)) || (flags & KSI_GROUP_VM) == 0) return status;
  if ((status = ReadClient(groupId, row.client)) || (status = kRead(groupId, row))) return status;
  static_cast<ReportContext<Row>*>(context)->PrintRow(row);
  return kSuccess;
}

// Runs a report whose visitor prints the rows. The Total row and the closing lines are printed even
// when the walk failed; its status is the report's.
template <class Row>
Status RunClientReport(const ReportFrame& frame,
                       std::type_identity_t<std::span<const Column<Row>>> columns,
                       GroupVisitor visitor, const ReportOptions& options, Sink& sink) {
  ReportContext<Row> context(frame, columns, sink);
  if (Status status = context.Settle(options)) return status;
  context.Begin();
  const Status status = TallyTraverseGroups(static_cast<uint64_t>(options.startGid), options.levels,
                                            options.csvMode, visitor, &context);
  context.PrintTotal();
  context.PrintDescriptions();
  return status;
}

}  // namespace tally

#endif  // REPORTS_CLIENTS_CLIENT_REPORT_H_
