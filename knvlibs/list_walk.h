// The walks over the lists of a cache file, which end in time whatever the file holds.
#ifndef KNVLIBS_LIST_WALK_H_
#define KNVLIBS_LIST_WALK_H_

#include <cstddef>
#include <cstdint>

#include "knvlibs/param_list.h"
#include "knvlibs/source.h"
#include "knvlibs/status.h"
#include "knvlibs/walk_limit.h"

namespace ksi {

class ListWalk {
 public:
  // `size`: the bytes of what holds the lists.
  explicit ListWalk(uint64_t size) : groups_(size), volumes_(size) {}

  // A list is asked for. Fails with KSI_STATUS_METADATA_READ_ERROR if the walk that it is a step of
  // has shown that groups contain each other, or that clients or volumes are listed over and over.
  [[nodiscard]] Status Begin(const Node& node, const Keys& keys);

  // Its entries are those of `instances` from the one at `from` on.
  void End(const Node& node, const ParamList& instances, size_t from);

  // New walks begin.
  void Restart() {
    groups_.Restart();
    volumes_.Restart();
  }

  // What the walk over the groups has shown.
  [[nodiscard]] Status WalkStatus() const { return groups_.WalkStatus(); }
  // The same of the volumes, which nobody asks for but who is told.
  [[nodiscard]] bool VolumesAreEndless() const { return volumes_.WalkStatus() != kOk; }

 private:
  WalkLimit groups_;   // with their clients
  WalkLimit volumes_;  // with their regions
};

}  // namespace ksi

#endif  // KNVLIBS_LIST_WALK_H_
