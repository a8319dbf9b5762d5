// /proc/PID/maps: the mappings of a process; and smaps: the same with what is in memory of each, by
// a walk of the process's page tables.
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
  Figure anonHugePages;
  Figure shmemPmdMapped;
  Figure hugetlb = 0;  // shared and private
  Figure swap;
  Figure ksm;  // merged pages; only Linux 6.8 and later tell

  void Add(const Smaps& other);
};

struct Mapping {
  uint64_t start = 0;
  uint64_t end = 0;
  bool isWritable = false;  // and not for code
  // Not copied to children ("dc" of VmFlags), which is how QEMU maps the memory of its guest.
  bool isDontCopy = false;
  std::string name;  // of the file, or "[heap]" and the like
  Smaps smaps;
};

enum class MappingsFile : uint8_t { kMaps, kSmaps };

// No mappings if they may not be read, which is told once. From maps they have no figures, and what
// is not copied to children is not known. Fails with KSI_STATUS_NOT_FOUND if the process is gone.
[[nodiscard]] Status ReadMappings(const LinuxHost& host, int32_t pid, MappingsFile which,
                                  std::vector<Mapping>& mappings);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_SMAPS_H_
