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

// A process by its status file. The figures are in KB, all ones where the kernel does not tell.
struct Process {
  int32_t pid = 0;
  std::string name;
  bool isKernelThread = false;
  // It has given back its memory and only waits to be forgotten.
  bool hasEnded = false;
  uint64_t threads = 0;

  uint64_t addressSpace = kNoValue;
  uint64_t peakAddressSpace = kNoValue;
  uint64_t resident = kNoValue;  // without huge pages of the pool
  uint64_t peakResident = kNoValue;
  uint64_t anonymous = kNoValue;  // resident
  uint64_t file = kNoValue;       // resident
  uint64_t shared = kNoValue;     // resident, in shared memory
  uint64_t pageTables = kNoValue;
  uint64_t swapped = kNoValue;
  uint64_t hugePages = 0;  // of the pool

  // What is mapped and in memory.
  uint64_t Mapped() const { return SumOf(resident, hugePages); }
};

// The ids of all processes, in ascending order.
Status ListProcesses(const LinuxHost& host, std::vector<int32_t>* pids);

// A process that is gone fails with KSI_STATUS_NOT_FOUND.
Status ReadProcess(const LinuxHost& host, int32_t pid, Process* process);

// The words of its command line; none if it has given them up.
Status ReadCommandLine(const LinuxHost& host, int32_t pid, std::vector<std::string>* words);

// Its path in the cgroup hierarchy of `controller` ("memory"), or in the unified one (""); empty
// if it has none.
Status ReadCgroupPath(const LinuxHost& host, int32_t pid, std::string_view controller,
                      std::string* path);

// The limit of its address space in KB, -1 for none.
Status ReadAddressSpaceLimit(const LinuxHost& host, int32_t pid, int64_t* limit);

// "/proc/PID/" and the name of a file.
std::string ProcessFile(int32_t pid, std::string_view name);

// `name` with '?' for the bytes that a terminal would take for commands.
std::string Printable(std::string_view name);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_PROCESS_H_
