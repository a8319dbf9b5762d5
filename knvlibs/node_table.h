// The nodes as constants, and the type of a node's value.
#ifndef KNVLIBS_NODE_TABLE_H_
#define KNVLIBS_NODE_TABLE_H_

#include <cstdint>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>

// What a node without a value has: never completed, so that nothing can be read into it.
struct KSI_None;

namespace ksi::node {

// The identifiers of the nodes, as constants.
enum Id : uint16_t {
  kInvalid,
#define KSI_NODE(name, record, keys, entries, listKeys, meaning) name,
  KSI_NODES(KSI_NODE)
#undef KSI_NODE
};

template <Id id>
struct RecordOf;

#define KSI_NODE(name, record, keys, entries, listKeys, meaning) \
  template <>                                                    \
  struct RecordOf<name> {                                        \
    using Type = KSI_##record;                                   \
  };
KSI_NODES(KSI_NODE)
#undef KSI_NODE

// The record, or the number, that is the value of a node.
template <Id id>
using Record = typename RecordOf<id>::Type;

}  // namespace ksi::node

#endif  // KNVLIBS_NODE_TABLE_H_
