// Reading the records that describe the host as a whole.
#ifndef REPORTS_HOST_HOST_RECORD_H_
#define REPORTS_HOST_HOST_RECORD_H_

#include <cstdint>

#include "framework/param_list.h"
#include "framework/status.h"

namespace tally {

// Reads a record; only a list that cannot be made is worded, with the name of the reading step.
template <class Record>
Status ReadHostRecord(const char* step, uint16_t node, const KeyList& keys, Record& record) {
  const ReadResult result = KeyedGet(node, keys, &record, sizeof record);
  if (result.step == ReadStep::create) Warning("%s: KSI_ParamListCreate() failure\n", step);
  return result.status;
}

}  // namespace tally

#endif  // REPORTS_HOST_HOST_RECORD_H_
