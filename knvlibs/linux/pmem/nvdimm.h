// /sys/bus/nd/devices: persistent memory. A region of Linux, a range of memory in one or several
// modules, is a volume here; the namespaces into which it is divided are the volume's regions.
#ifndef KNVLIBS_LINUX_PMEM_NVDIMM_H_
#define KNVLIBS_LINUX_PMEM_NVDIMM_H_

#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

// "namespace1.0"
struct NvdimmNamespace {
  uint64_t region;
  uint64_t number;

  // As the device and those made of it are numbered: "1.0"
  std::string Number() const { return std::to_string(region) + '.' + std::to_string(number); }
  std::string Name() const { return "namespace" + Number(); }
};

// Both in ascending order.
struct NvdimmDevices {
  std::vector<uint64_t> regions;
  std::vector<NvdimmNamespace> namespaces;
};

[[nodiscard]] Status ReadNvdimmDevices(const LinuxHost& host, NvdimmDevices& devices);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_PMEM_NVDIMM_H_
