// How long a walk over the lists of a cache file may be.
//
// In a tree each group stands in one place. A dozen groups that list each other are a small file
// and a walk without end, and so, nearly, are lists that name the same client or volume over and
// over. A group that lists one that it stands below, or one twice, is found out at once; but who is
// listed by several, as one that was moved while the host was captured may be, is not remembered,
// for that would take memory for each. So what a walk asks for is counted: with the lists and their
// entries that a file of this size can hold, it has seen everything more than once.
#ifndef KNVLIBS_WALK_LIMIT_H_
#define KNVLIBS_WALK_LIMIT_H_

#include <cstddef>
#include <cstdint>
#include <vector>

#include "knvlibs/param_list.h"
#include "knvlibs/status.h"

namespace ksi {

class WalkLimit {
 public:
  explicit WalkLimit(uint64_t fileSize) : most_(fileSize / 8 + 2048) {}

  // The groups of `group` are asked for. KSI_STATUS_METADATA_READ_ERROR if that is more than a walk
  // may take, and from then on for the rest of the walk. A new walk begins when the first group of
  // this one is asked again and nobody has listed it; never with time, for whoever reads what is
  // made of a walk may be as slow as he likes.
  [[nodiscard]] Status Ask(int64_t group);

  // They are the entries of `groups` from the one at `from` on.
  void Answer(const ParamList& groups, size_t from);

  // A walk that has begun comes by another list, with so many entries.
  void PassList(size_t entries) {
    if (taken_ != 0) taken_ += 1 + entries;
  }

  // Begins a new walk.
  void Restart() {
    taken_ = 0;
    path_.clear();
    isTangled_ = false;
  }

  // What all that the walk asks for now fails with.
  [[nodiscard]] Status WalkStatus() const {
    return isTangled_ || taken_ > most_ ? Status{KSI_STATUS_METADATA_READ_ERROR} : kOk;
  }

 private:
  // A group that has been asked for, and what it lists, ascending.
  struct Step {
    int64_t group;
    std::vector<int64_t> listed;
  };

  bool Continues(int64_t group) const;
  void StepTo(int64_t group);

  uint64_t most_;
  uint64_t taken_ = 0;  // lists and entries; 0: no walk has begun
  int64_t first_ = 0;
  bool firstIsListed_ = false;
  std::vector<Step> path_;  // from the first group to the latest, each listed by the one before it
  bool isTangled_ = false;  // a group lists one of its path, or one twice
};

}  // namespace ksi

#endif  // KNVLIBS_WALK_LIMIT_H_
