// /sys/fs/cgroup: the control groups and what their memory controller accounts for. The
// differences between the two versions of the interface end here.
#ifndef KNVLIBS_LINUX_GROUPS_CGROUP_H_
#define KNVLIBS_LINUX_GROUPS_CGROUP_H_

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/figure_file.h"
#include "knvlibs/linux/host/host.h"
#include "knvlibs/linux/memory/pressure.h"
#include "knvlibs/status.h"

namespace ksi {

// The file of a recorded tree that tells a cgroup's id, which on a live host is the inode number of
// its directory.
constexpr std::string_view kRecordedCgroupId = "cgroup.id";

// What the memory controller charges to one cgroup and all below it, in KB. Nothing is told of a
// cgroup that has no memory controller.
struct MemcgUsage {
  Figure current;
  Figure peak;
  Figure swap;
  Figure peakWithSwap;  // of current and swap together
  Figure kernel;        // spent by the kernel for the cgroup
  Figure active;        // on the lists of pages in use
};

// What swapping, compression and huge pages have done for one cgroup, which only version 2 tells.
// KB, or times.
struct MemcgEvents {
  Figure swapcached;
  Figure swpin;
  Figure swpout;
  Figure zswapPool;
  Figure zswapped;
  Figure zswpin;
  Figure zswpout;
  Figure zswapMax;  // none is no limit
  Figure thpAlloc;  // times
  // What is there now.
  Figure active;         // on the lists of pages in use
  Figure secPageTables;  // of KVM
};

// The swap of one cgroup and all below it, in KB.
struct MemcgSwap {
  Figure max;      // none is no limit; in version 1 that of memory and swap together
  Figure left;     // below it
  Figure current;  // only version 2 tells
};

// The files of a cgroup that tell of its huge pages of hugetlb, one for each of their sizes. None
// if these count as memory like others, as they can be mounted to since Linux 6.6.
struct HugetlbCharges {
  std::vector<std::string> files;
};
[[nodiscard]] Status ReadHugetlbCharges(const LinuxHost& host, HugetlbCharges& charges);

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
  [[nodiscard]] Status List(const LinuxHost& host, std::string_view path, int64_t& id,
                            std::vector<Child>& children) const;

  // The processes that are in the cgroup itself.
  [[nodiscard]] Status ReadProcesses(const LinuxHost& host, std::string_view path,
                                     std::vector<int32_t>& pids) const;

  // What is reserved, and the limit, in KB; none is "max". A cgroup that has no memory controller,
  // or has gone since the scan, has no reservation, 0, no limit, and no figures in what follows: it
  // is not the end of a walk over the others.
  [[nodiscard]] Status ReadReservation(const LinuxHost& host, std::string_view path,
                                       Figure& reserved) const;
  // What is taken only when there is nothing else to take; 0 in version 1.
  [[nodiscard]] Status ReadLow(const LinuxHost& host, std::string_view path, Figure& low) const;
  [[nodiscard]] Status ReadLimit(const LinuxHost& host, std::string_view path, Figure& limit) const;
  // The smallest limit on the way up, those out of sight too: only version 1 tells.
  [[nodiscard]] Status ReadHierarchicalLimit(const LinuxHost& host, std::string_view path,
                                             std::optional<Figure>& limit) const;
  // From where on it is slowed down until it has less; only version 2 does that.
  [[nodiscard]] Status ReadHigh(const LinuxHost& host, std::string_view path, Figure& high) const;
  // Only version 2 tells.
  [[nodiscard]] Status ReadPressure(const LinuxHost& host, std::string_view path,
                                    Pressure& pressure) const;
  [[nodiscard]] Status ReadUsage(const LinuxHost& host, std::string_view path,
                                 MemcgUsage& usage) const;
  // What huge pages of hugetlb are charged to it beside `current`; none where the controller for
  // them is not enabled.
  [[nodiscard]] Status ReadHugetlb(const LinuxHost& host, std::string_view path,
                                   Figure& hugetlb) const;

  [[nodiscard]] Status ReadSwap(const LinuxHost& host, std::string_view path,
                                MemcgSwap& swap) const;
  [[nodiscard]] Status ReadEvents(const LinuxHost& host, std::string_view path,
                                  MemcgEvents& events) const;

 private:
  enum class Version : uint8_t { kNone, k1, k2 };

  std::string FileOf(std::string_view path, std::string_view name) const;

  // A file that is bytes, or "max", which is none; in KB, `missing` if there is no file.
  [[nodiscard]] Status ReadAmount(const LinuxHost& host, std::string_view path,
                                  std::string_view name, Figure missing, Figure& amount) const;
  [[nodiscard]] Status ReadStat(const LinuxHost& host, std::string_view path,
                                FigureFile& stat) const;
  [[nodiscard]] Status ReadUsage1(const LinuxHost& host, std::string_view path,
                                  MemcgUsage& usage) const;
  [[nodiscard]] Status ReadUsage2(const LinuxHost& host, std::string_view path,
                                  MemcgUsage& usage) const;

  Version version_ = Version::kNone;
  std::string mount_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_GROUPS_CGROUP_H_
