// /sys/fs/cgroup: the control groups and what their memory controller accounts for. The
// differences between the two versions of the interface end here.
#ifndef KNVLIBS_LINUX_GROUPS_CGROUP_H_
#define KNVLIBS_LINUX_GROUPS_CGROUP_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/figures.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// The file of a recorded tree that tells a cgroup's id, which on a live host is the inode number of
// its directory.
constexpr std::string_view kRecordedCgroupId = "cgroup.id";

// A limit that is not set.
constexpr uint64_t kNoLimit = kNoValue;

// The statistics of one cgroup and all below it, in KB; all ones where the kernel does not tell,
// as it does for no cgroup that has no memory controller.
struct CgroupMemory {
  uint64_t current = kNoValue;
  uint64_t peak = kNoValue;
  uint64_t swapped = kNoValue;
  uint64_t peakWithSwap = kNoValue;  // of current and swapped together
  uint64_t kernel = kNoValue;        // spent by the kernel for the cgroup
  uint64_t active = kNoValue;        // on the lists of pages in use
};

// What swapping, compression and huge pages have done for one cgroup, which only version 2 tells:
// otherwise all ones. KB, or times.
struct CgroupEvents {
  uint64_t swapCached = kNoValue;
  uint64_t swappedIn = kNoValue;
  uint64_t swappedOut = kNoValue;
  uint64_t zswapPool = kNoValue;
  uint64_t zswapped = kNoValue;
  uint64_t zswapIn = kNoValue;
  uint64_t zswapOut = kNoValue;
  uint64_t zswapLimit = kNoLimit;
  uint64_t hugePagesMade = kNoValue;  // times
};

class CgroupHierarchy {
 public:
  // Finds the hierarchy that has the memory controller: version 2, else version 1, else none.
  static CgroupHierarchy Find(const LinuxHost& host);

  bool Exists() const { return version_ != Version::kNone; }

  // Whether memory can be reserved for a cgroup.
  bool HasReservations() const { return version_ == Version::k2; }

  // What /proc/PID/cgroup calls it.
  std::string_view Controller() const { return version_ == Version::k1 ? "memory" : ""; }

  // A cgroup's path is "" for the root, else "/a/b".

  // Its id, and the names of the cgroups below it, in alphabetical order. `id` comes in as the
  // inode number of the directory.
  struct Child {
    std::string name;
    uint64_t inode = 0;
  };
  Status List(const LinuxHost& host, std::string_view path, int64_t* id,
              std::vector<Child>* children) const;

  // The processes that are in the cgroup itself.
  Status ReadProcesses(const LinuxHost& host, std::string_view path,
                       std::vector<int32_t>* pids) const;

  // What is reserved, and the limit, in KB. A cgroup that has no memory controller has neither.
  // These fail with KSI_STATUS_NOT_FOUND if the cgroup is gone.
  Status ReadReservation(const LinuxHost& host, std::string_view path, uint64_t* reserved) const;
  Status ReadLimit(const LinuxHost& host, std::string_view path, uint64_t* limit) const;
  Status ReadMemory(const LinuxHost& host, std::string_view path, CgroupMemory* memory) const;
  Status ReadEvents(const LinuxHost& host, std::string_view path, CgroupEvents* events) const;

 private:
  enum class Version : uint8_t { kNone, k1, k2 };

  std::string FileOf(std::string_view path, std::string_view name) const;

  // A file that is bytes, or "max"; in KB, `missing` if there is none.
  Status ReadAmount(const LinuxHost& host, std::string_view path, std::string_view name,
                    uint64_t missing, uint64_t* amount) const;
  Status ReadStatistics(const LinuxHost& host, std::string_view path, Figures* figures) const;
  Status CheckExists(const LinuxHost& host, std::string_view path) const;
  Status ReadMemory1(const LinuxHost& host, std::string_view path, CgroupMemory* memory) const;
  Status ReadMemory2(const LinuxHost& host, std::string_view path, CgroupMemory* memory) const;

  Version version_ = Version::kNone;
  std::string mount_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_CGROUP_H_
