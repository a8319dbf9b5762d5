// /proc/PID: the processes, and what the kernel tells of each without walking its memory.
#ifndef KNVLIBS_LINUX_GROUPS_PROCESS_H_
#define KNVLIBS_LINUX_GROUPS_PROCESS_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// A process by its status file. The figures are in KB and have the file's names.
struct Process {
  int32_t pid = 0;
  std::string name;
  bool isKernelThread = false;
  // It has given back its memory and only waits for its parent, or is about to.
  bool isZombie = false;
  uint64_t threads = 0;
  Figure user;          // that it acts as
  uint64_t fdSize = 0;  // room for descriptors: no fewer than it has

  Figure vmSize;
  Figure vmPeak;
  Figure vmRss;  // without hugetlb
  Figure vmHwm;  // the peak of vmRss
  Figure rssAnon;
  Figure rssFile;
  Figure rssShmem;
  Figure vmPte;
  Figure vmSwap;
  Figure vmLck;  // of mappings that are locked, in memory or not
  Figure vmPin;
  Figure hugetlb = 0;

  // What is mapped and in memory.
  Figure Mapped() const { return SumOf({vmRss, hugetlb}); }
};

// The ids of all processes, in ascending order.
[[nodiscard]] Status ListProcesses(const LinuxHost& host, std::vector<int32_t>& pids);

// A process that is gone fails with KSI_STATUS_NOT_FOUND.
[[nodiscard]] Status ReadProcess(const LinuxHost& host, int32_t pid, Process& process);

// The words of its command line; none if it has given them up.
[[nodiscard]] Status ReadCommandLine(const LinuxHost& host, int32_t pid,
                                     std::vector<std::string>& words);

// Its path in the cgroup hierarchy of `controller` ("memory"), or in the unified one (""); empty
// if it has none.
[[nodiscard]] Status ReadCgroupPath(const LinuxHost& host, int32_t pid, std::string_view controller,
                                    std::string& path);

// The limit of its address space in KB; none if there is none.
[[nodiscard]] Status ReadAddressSpaceLimit(const LinuxHost& host, int32_t pid, Figure& limit);

// "/proc/PID/" and the name of a file.
std::string ProcessFile(int32_t pid, std::string_view name);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_PROCESS_H_
