// Readers that are handed what their keys name, instead of looking it up each.
#ifndef KNVLIBS_LINUX_GROUPS_READER_OF_H_
#define KNVLIBS_LINUX_GROUPS_READER_OF_H_

#include "knvlibs/linux/groups/groups.h"
#include "knvlibs/source.h"

namespace ksi {

template <auto find, auto read>
struct ReaderOf;

// Lets `read` answer for what `find` finds by the keys, or fails with the status of `find`.
template <class Thing, class Answer,
          Status (*find)(const LinuxHost&, const Keys&, const GroupTree*&, const Thing*&),
          Status (*read)(const LinuxHost&, const GroupTree&, const Thing&, Answer&)>
struct ReaderOf<find, read> {
  [[nodiscard]] static Status Read(const LinuxHost& host, const Keys& keys, Answer& answer) {
    const GroupTree* tree = nullptr;
    const Thing* thing = nullptr;
    const Status status = find(host, keys, tree, thing);
    return status == kOk ? read(host, *tree, *thing, answer) : status;
  }
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_READER_OF_H_
