#include "knvlibs/list_walk.h"

#include "knvlibs/node_table.h"

namespace ksi {

Status ListWalk::Begin(const Node& node, const Keys& keys) {
  switch (IdOf(node)) {
    case node::sched_groups_members_groups:
      return groups_.Ask(keys[0].number);
    case node::sched_groups_members_memClients:
    case node::sched_memClients_remapTypes:
      return groups_.WalkStatus();
    case node::memory_pmem_volumes:
      return volumes_.Ask(0);  // always the first of its walk
    case node::memory_pmem_volumes_regionStore_regions:
      return volumes_.WalkStatus();
    default:
      return kOk;
  }
}

void ListWalk::End(const Node& node, const ParamList& instances, size_t from) {
  switch (IdOf(node)) {
    case node::sched_groups_members_groups:
      return groups_.Answer(instances, from);
    case node::sched_groups_members_memClients:
    case node::sched_memClients_remapTypes:
      return groups_.PassList(instances.Count() - from);
    case node::memory_pmem_volumes:
    case node::memory_pmem_volumes_regionStore_regions:
      return volumes_.PassList(instances.Count() - from);
    default:
      return;
  }
}

}  // namespace ksi
