#include "knvlibs/walk_limit.h"

namespace ksi {

Status WalkLimit::Ask(int64_t group) {
  if (!Continues(group)) {
    taken_ = 0;
    first_ = group;
    firstIsListed_ = false;
  }
  ++taken_;
  return WalkStatus();
}

void WalkLimit::Answer(const ParamList& groups, size_t from) {
  taken_ += groups.Count() - from;
  for (size_t i = from; i < groups.Count() && !firstIsListed_; ++i) {
    firstIsListed_ = static_cast<int64_t>(groups.Number(i)) == first_;
  }
}

bool WalkLimit::Continues(int64_t group) const {
  return taken_ != 0 && (group != first_ || firstIsListed_);
}

}  // namespace ksi
