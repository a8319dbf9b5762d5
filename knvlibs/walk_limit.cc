#include "knvlibs/walk_limit.h"

namespace ksi {

Status WalkLimit::Ask(int64_t group, Time now) {
  if (!Continues(group, now)) {
    taken_ = 0;
    first_ = group;
    firstIsListed_ = false;
  }
  latest_ = now;
  ++taken_;
  return WalkStatus();
}

void WalkLimit::Answer(const ParamList& groups, size_t from) {
  taken_ += groups.Count() - from;
  for (size_t i = from; i < groups.Count() && !firstIsListed_; ++i) {
    firstIsListed_ = static_cast<int64_t>(groups.Number(i)) == first_;
  }
}

bool WalkLimit::Continues(int64_t group, Time now) const {
  if (taken_ == 0 || (group == first_ && !firstIsListed_)) return false;
  // What has failed goes on to fail, however slowly its messages are read.
  return WalkStatus() != kOk || now - latest_ < kPause;
}

}  // namespace ksi
