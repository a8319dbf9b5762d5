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
  return KeyedGet(node, keys, record, [step](ReadStep failed, Status) {
    if (failed == ReadStep::create) Warning("%s: KSI_ParamListCreate() failure\n", step);
  });
}

}  // namespace tally

#endif  // REPORTS_HOST_HOST_RECORD_H_
