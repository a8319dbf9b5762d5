#include "knvlibs/linux/handlers.h"

#include "knvlibs/node_table.h"

namespace ksi {

Handlers HandlersOf(uint16_t node) {
  switch (node) {
    case node::memory_comprehensive:
      return {.value = ReadComprehensive};
    case node::sched_globalStats_memory_tally:
      return {.value = ReadGlobalTally};
    case node::sched_globalStats_memory_stateTransitions:
      return {.value = ReadStateTransitions};
    default:
      return {};
  }
}

}  // namespace ksi
