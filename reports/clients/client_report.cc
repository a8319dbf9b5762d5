#include "reports/clients/client_report.h"

namespace tally {

Status ReadClient(uint64_t groupId, Client& client) {
  client.schedGrp = groupId;
  Status status = kSuccess;
  if ((status = Tally_GroupGetName(groupId, client.name)) ||
      (status = Tally_GroupGetParentID(groupId, client.parSchedGroup))) {
    return status;
  }
  return Tally_GroupGetGroupLeaderID(groupId, client.worldGrp);
}

}  // namespace tally
