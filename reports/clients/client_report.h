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
[[nodiscard]] Status ReadClient(uint64_t groupId, Client& client);

// The host memory that a virtual machine or user world consumes, in kilobytes.
template <class Tally>
Computed<uint64_t> Consumed(const Tally& tally) {
  return Known(tally.vpmemUC) + Known(tally.mapped) - Known(tally.vpmemRW) -
         Known(tally.sharedSaved);
}

// The columns of these figures; a Row has a member `client`.
template <class Row>
constexpr Column<Row> NameColumn(const char* description) {
  return Text("name", description, [](const Row& row) { return FixedText(row.client.name.text); })
      .Key();
}

template <class Row>
constexpr Column<Row> kSchedGrpColumn = Id("schedGrp", "Scheduler group ID", [](const Row& row) {
                                          return row.client.schedGrp;
                                        }).Key();

template <class Row>
constexpr Column<Row> kParSchedGroupColumn =
    Id("parSchedGroup", "Parent scheduler group ID", [](const Row& row) {
      return row.client.parSchedGroup;
    }).AsUnsigned("Lu");

template <class Row>
constexpr Column<Row> kWorldGrpColumn = Id("worldGrp", "World group ID",
                                           [](const Row& row) { return row.client.worldGrp; });

// The visitor of a report on virtual machines. A group without the flag gives no row, and the walk
// goes on into its children; one of which anything cannot be read gives none either and is passed
// over with all below it. `kRead` reads what the report shows beside the client.
template <class Row, Status (*kRead)(uint64_t groupId, Row& row)>
[[nodiscard]] Status VisitVirtualMachine(uint64_t groupId, uint32_t /*childCount*/, int /*csvMode*/,
                                         void* context) {
  Row row;
  uint32_t flags = 0;
  if (Status status = Tally_GroupGetFlags(groupId, flags)) return status;
  if ((flags & KSI_GROUP_VM) == 0) return kSuccess;
  if (Status status = ReadClient(groupId, row.client)) return status;
  if (Status status = kRead(groupId, row)) return status;
  static_cast<ReportContext<Row>*>(context)->PrintRow(row);
  return kSuccess;
}

// Runs a report whose visitor prints the rows. The Total row and the closing lines are printed even
// when the walk failed; its status is the report's.
template <class Row>
[[nodiscard]] Status RunClientReport(const ReportFrame& frame,
                                     std::type_identity_t<std::span<const Column<Row>>> columns,
                                     GroupVisitor visitor, const ReportOptions& options,
                                     Sink& sink) {
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
