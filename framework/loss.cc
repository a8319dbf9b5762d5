#include "framework/loss.h"

#include <utility>

namespace tally {
namespace {

// Reports run one after the other.
Status firstLoss = kSuccess;

}  // namespace

Status NoteLoss(Status status) {
  if (firstLoss == kSuccess) firstLoss = status;
  return status;
}

Status TakeLoss() { return std::exchange(firstLoss, kSuccess); }

}  // namespace tally
