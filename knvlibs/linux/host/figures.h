// Named figures: a kernel file that is one "name value" a line.
#ifndef KNVLIBS_LINUX_HOST_FIGURES_H_
#define KNVLIBS_LINUX_HOST_FIGURES_H_

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

class Figures {
 public:
  // /proc/meminfo, in KB (its counts of huge pages in pages).
  Status ReadMeminfo(const LinuxHost& host);

  // /proc/vmstat, in pages or events.
  Status ReadVmstat(const LinuxHost& host);

  // Any file of names and values.
  Status ReadPairs(const LinuxHost& host, std::string_view file);

  // A figure that not every kernel has.
  std::optional<uint64_t> Find(std::string_view name) const;

  // The same, `otherwise` where the kernel does not have it.
  uint64_t FindOr(std::string_view name, uint64_t otherwise) const {
    return Find(name).value_or(otherwise);
  }

  // A figure that every kernel has: fails with a warning without it.
  Status Require(std::string_view name, uint64_t* value) const;

 private:
  struct Figure {
    std::string_view name;  // in content_
    uint64_t value;
  };

  std::string file_;
  std::string content_;
  std::vector<Figure> figures_;
};

// What the kernel keeps for itself, in KB. The kernel's stacks are in vmalloc's figure.
Status ReadKernelHeap(const Figures& meminfo, uint64_t* heap);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_FIGURES_H_
