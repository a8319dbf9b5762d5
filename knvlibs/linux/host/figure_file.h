// A kernel file of named figures, one "name value" a line.
#ifndef KNVLIBS_LINUX_HOST_FIGURE_FILE_H_
#define KNVLIBS_LINUX_HOST_FIGURE_FILE_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

class FigureFile {
 public:
  // /proc/meminfo, in KB (its counts of huge pages in pages).
  [[nodiscard]] static Status ReadMeminfo(const LinuxHost& host, FigureFile& meminfo);

  // /proc/vmstat, in pages or events.
  [[nodiscard]] static Status ReadVmstat(const LinuxHost& host, FigureFile& vmstat);

  // A memory.stat of a cgroup, in bytes, pages or events.
  [[nodiscard]] static Status ReadMemoryStat(const LinuxHost& host, std::string file,
                                             FigureFile& stat);

  // A figure that not every kernel has.
  Figure Find(std::string_view name) const;

  // The same, `otherwise` where the kernel does not have it.
  uint64_t FindOr(std::string_view name, uint64_t otherwise) const {
    return Find(name).value_or(otherwise);
  }

  // A figure that every kernel has: fails with a warning without it.
  [[nodiscard]] Status Require(std::string_view name, uint64_t& value) const;

 private:
  struct Line {
    std::string_view name;  // in content_
    uint64_t value;
  };

  // "name value", a line each.
  [[nodiscard]] Status ParsePairs(const LinuxHost& host);

  std::string file_;
  std::string content_;
  std::vector<Line> lines_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_FIGURE_FILE_H_
