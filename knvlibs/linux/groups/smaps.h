// /proc/PID/smaps_rollup and smaps: a process's memory by a walk of its page tables, as a whole and
// for each of its mappings.
#ifndef KNVLIBS_LINUX_GROUPS_SMAPS_H_
#define KNVLIBS_LINUX_GROUPS_SMAPS_H_

#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// KB, all ones where it cannot be told.
struct WalkedMemory {
  uint64_t resident = kNoValue;  // without huge pages of the pool
  uint64_t referenced = kNoValue;
  uint64_t privateClean = kNoValue;
  uint64_t privateDirty = kNoValue;
  uint64_t anonymousHuge = kNoValue;
  uint64_t sharedHuge = kNoValue;  // transparent, in shared memory
  uint64_t poolHuge = 0;           // of the pool
  uint64_t swapped = kNoValue;
  uint64_t locked = kNoValue;

  void Add(const WalkedMemory& other);
};

struct Mapping {
  uint64_t start = 0;
  uint64_t end = 0;
  bool isWritable = false;
  // Not for the children of the process, which is how QEMU maps the memory of its guest.
  bool isNotInherited = false;
  std::string name;  // of the file, or "[heap]" and the like
  WalkedMemory memory;
};

// What may not be read, which is told once, is all ones, as is what the kernel does not offer.
// Both fail with KSI_STATUS_NOT_FOUND if the process is gone.
Status ReadWalkedMemory(const LinuxHost& host, int32_t pid, WalkedMemory* memory);

// The same of each mapping; no mappings if they may not be read.
Status ReadMappings(const LinuxHost& host, int32_t pid, std::vector<Mapping>* mappings);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_SMAPS_H_
