#include "knvlibs/walk_limit.h"

#include <algorithm>

namespace ksi {

Status WalkLimit::Ask(int64_t group) {
  if (!Continues(group)) {
    Restart();
    first_ = group;
    firstIsListed_ = false;
  }
  ++taken_;
  StepTo(group);
  return WalkStatus();
}

// A walk goes down to what the latest group lists, or back up and to another.
void WalkLimit::StepTo(int64_t group) {
  while (!path_.empty() && !std::ranges::binary_search(path_.back().listed, group)) {
    path_.pop_back();
  }
  path_.push_back({group, {}});
}

void WalkLimit::Answer(const ParamList& groups, size_t from) {
  taken_ += groups.Count() - from;
  for (size_t i = from; i < groups.Count() && !firstIsListed_; ++i) {
    firstIsListed_ = static_cast<int64_t>(groups.Number(i)) == first_;
  }
  std::vector<int64_t>& listed = path_.back().listed;
  for (size_t i = from; i < groups.Count(); ++i) {
    listed.push_back(static_cast<int64_t>(groups.Number(i)));
  }
  std::ranges::sort(listed);
  const auto isListed = [&](const Step& step) {
    return std::ranges::binary_search(listed, step.group);
  };
  isTangled_ = isTangled_ || std::ranges::adjacent_find(listed) != listed.end() ||
               std::ranges::any_of(path_, isListed);
}

bool WalkLimit::Continues(int64_t group) const {
  return taken_ != 0 && (group != first_ || firstIsListed_);
}

}  // namespace ksi
