// The directory that a host's files are named from.
#ifndef KNVLIBS_LINUX_HOST_HOST_ROOT_H_
#define KNVLIBS_LINUX_HOST_HOST_ROOT_H_

#include <string>
#include <string_view>

#include "knvlibs/linux/host/file_descriptor.h"

namespace ksi {

class HostRoot {
 public:
  // "/" for the machine itself, or the directory of a recorded tree, which is kept open.
  explicit HostRoot(std::string_view directory);

  bool IsThisMachine() const { return isThisMachine_; }

  // Opens what `path` names from the root ("/proc/meminfo") with these flags of open(); none, and
  // errno, if that fails. A recorded tree comes from somebody else, so nothing in it leads out: its
  // root is what links take for "/", and above it is itself.
  FileDescriptor Open(std::string_view path, int flags) const;

  // Whether `path` cannot be opened because a link on its way leads out of a recorded tree, where
  // the tree has nothing of that name.
  bool LeadsOut(std::string_view path) const;

 private:
  bool isThisMachine_;
  FileDescriptor root_;  // of a recorded tree
  int error_ = 0;        // why that is not open
};

// What Open does in a recorded tree where the kernel (before 5.6) or a sandbox does not offer it: a
// step at a time, from one directory to the next.
FileDescriptor OpenBelow(int root, std::string_view path, int flags);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_HOST_ROOT_H_
