#include "reports/clients/client_report.h"

namespace tally {

Status ReadClient(uint64_t groupId, Client& client) {
  client.schedGrp = groupId;
  if (Status status = Tally_GroupGetName(groupId, client.name)) return status;
  if (Status status = Tally_GroupGetParentID(groupId, client.parSchedGroup)) return status;
  return Tally_GroupGetGroupLeaderID(groupId, client.worldGrp);
}

}  // namespace tally
