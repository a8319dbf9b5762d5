// Which function answers which node on a Linux host: the functions, in the source file of the
// kernel interface they read, and the table.
#ifndef KNVLIBS_LINUX_HANDLERS_H_
#define KNVLIBS_LINUX_HANDLERS_H_

#include <cstdint>

#include "knvlibs/linux/host.h"
#include "knvlibs/param_list.h"
#include "knvlibs/source.h"

namespace ksi {

using ValueHandler = Status (*)(const LinuxHost&, const Keys&, Buffer);
using ListHandler = Status (*)(const LinuxHost&, const Keys&, ParamList&);

// Either may be null: the node has none, or Linux has no answer yet.
struct Handlers {
  ValueHandler value = nullptr;
  ListHandler list = nullptr;
};

Handlers HandlersOf(uint16_t node);

// memory.cc
Status ReadComprehensive(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadGlobalTally(const LinuxHost& host, const Keys& keys, Buffer buffer);
Status ReadStateTransitions(const LinuxHost& host, const Keys& keys, Buffer buffer);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HANDLERS_H_
