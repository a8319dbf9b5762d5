// What answers a node on a Linux host.
//
// A file that answers nodes has a table of its readers, each bound to its node; reader_tables.h
// names the tables, and LinuxSource joins them.
#ifndef KNVLIBS_LINUX_READER_H_
#define KNVLIBS_LINUX_READER_H_

#include <cstring>
#include <type_traits>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/node_table.h"
#include "knvlibs/param_list.h"
#include "knvlibs/source.h"
#include "knvlibs/status.h"

namespace ksi {

// A reader of values is a function Status(const LinuxHost&, const Keys&, Record&) for the node's
// record, which is zeroed; a reader of lists appends to the list it is given.
using ValueReader = Status (*)(const LinuxHost&, const Keys&, Buffer);
using ListReader = Status (*)(const LinuxHost&, const Keys&, ParamList&);

struct Reader {
  node::Id node = node::kInvalid;
  ValueReader value = nullptr;
  ListReader list = nullptr;
};

template <auto kRead>
struct TypedReader;

template <class R, Status (*kRead)(const LinuxHost&, const Keys&, R&)>
struct TypedReader<kRead> {
  using Record = R;

  static Status Answer(const LinuxHost& host, const Keys& keys, Buffer buffer) {
    Record record = {};
    if (buffer.size() != sizeof record) return KSI_STATUS_LENGTH_MISMATCH;
    const Status status = kRead(host, keys, record);
    if (status == kOk) std::memcpy(buffer.data(), &record, sizeof record);
    return status;
  }
};

template <node::Id kNode, auto kRead>
constexpr Reader ValueOf() {
  static_assert(std::is_same_v<typename TypedReader<kRead>::Record, node::Record<kNode>>,
                "the reader fills the record of another node");
  return {.node = kNode, .value = TypedReader<kRead>::Answer};
}

template <node::Id kNode>
constexpr Reader ListOf(ListReader read) {
  return {.node = kNode, .list = read};
}

}  // namespace ksi

#endif  // KNVLIBS_LINUX_READER_H_
