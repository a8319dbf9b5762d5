// The kernel's heaps: its slab caches and vmalloc, which is a single range of addresses.
#ifndef KNVLIBS_LINUX_HEAPS_HEAPS_H_
#define KNVLIBS_LINUX_HEAPS_HEAPS_H_

#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// The heaps in the kernel's order, found by their names.
class Heaps {
 public:
  // Adds a heap under this name as far as it fits; a second heap of the same name gets "~2" at its
  // end, and so on.
  void Add(std::string_view givenName, KSI_HeapStats record);

  // Null if there is none of this name.
  const KSI_HeapStats* Find(std::string_view name) const;

  const std::vector<KSI_HeapStats>& Records() const { return records_; }

 private:
  std::vector<KSI_HeapStats> records_;
  std::unordered_map<std::string, size_t> index_;
};

[[nodiscard]] Status ReadHeaps(const LinuxHost& host, Heaps& heaps);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HEAPS_HEAPS_H_
