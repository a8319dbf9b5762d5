// What a run of a report has left out because it could not be read.
//
// tally goes on after such a failure, some without a word; who hands rows to programs asks here
// whether they are all.
#ifndef FRAMEWORK_LOSS_H_
#define FRAMEWORK_LOSS_H_

#include "framework/status.h"

namespace tally {

// Notes that rows are missing; of several reasons the first one stays. Passes the status on;
// kSuccess is no loss.
Status NoteLoss(Status status);

// The reason since the last call; kSuccess if nothing is missing.
[[nodiscard]] Status TakeLoss();

}  // namespace tally

#endif  // FRAMEWORK_LOSS_H_
