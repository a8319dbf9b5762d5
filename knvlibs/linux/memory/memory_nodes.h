// /sys/devices/system/node: the memory nodes.
//
// A memory node is a NUMA node of Linux that has memory. Memory nodes are numbered from 0 without
// gaps, in the order of their NUMA nodes; on a machine whose every NUMA node has memory the two
// numbers are the same.
#ifndef KNVLIBS_LINUX_MEMORY_MEMORY_NODES_H_
#define KNVLIBS_LINUX_MEMORY_MEMORY_NODES_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

#include "knvlibs/linux/host/host.h"
#include "knvlibs/status.h"

namespace ksi {

struct MemoryNodes {
  std::vector<uint64_t> numaNodes;  // by memory node, ascending
  // Whether the kernel knows NUMA nodes. One that does not has a single memory node and no
  // directory for it.
  bool numa = true;

  // The memory node of a NUMA node; none if that has no memory.
  std::optional<size_t> Of(uint64_t numaNode) const;
};

[[nodiscard]] Status ReadMemoryNodes(const LinuxHost& host, MemoryNodes& nodes);

// The memory nodes of this reading.
[[nodiscard]] Status FindMemoryNodes(const LinuxHost& host, const MemoryNodes*& nodes);

// The memory node that a key asks for.
[[nodiscard]] Status FindMemoryNode(const MemoryNodes& nodes, int64_t key, size_t& node);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_MEMORY_MEMORY_NODES_H_
