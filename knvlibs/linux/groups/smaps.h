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

// KB, by the names of the file.
struct Smaps {
  Figure rss;  // without hugetlb
  Figure referenced;
  Figure privateClean;
  Figure privateDirty;
  Figure anonHugePages;
  Figure shmemPmdMapped;
  Figure hugetlb = 0;  // shared and private
  Figure swap;
  Figure locked;

  void Add(const Smaps& other);
};

struct Mapping {
  uint64_t start = 0;
  uint64_t end = 0;
  bool isWritable = false;
  // Not copied to children ("dc" of VmFlags), which is how QEMU maps the memory of its guest.
  bool isDontCopy = false;
  std::string name;  // of the file, or "[heap]" and the like
  Smaps smaps;
};

// What may not be read, which is told once, has no figures, as has what the kernel does not offer.
// Both fail with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status ReadSmapsRollup(const LinuxHost& host, int32_t pid, Smaps& smaps);

// The same of each mapping; no mappings if they may not be read.
[[nodiscard]] Status ReadMappings(const LinuxHost& host, int32_t pid,
                                  std::vector<Mapping>& mappings);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_SMAPS_H_
