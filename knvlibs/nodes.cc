// The exported objects that hold the nodes' identifiers.
#pragma GCC visibility push(default)
#include <knvlibs/ksi_nodes.h>
#pragma GCC visibility pop

#include "knvlibs/node_table.h"

#define OBJECT(name, record, keys, entries, listKeys, meaning) \
  const uint16_t KSI_NODE_##name = ksi::node::name;
KSI_NODES(OBJECT)
