#include "knvlibs/linux/memory/memory_nodes.h"

#include <algorithm>
#include <string>

#include <knvlibs/ksi_records.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

constexpr std::string_view kFile = "/sys/devices/system/node/has_memory";

// Larger than any node number of Linux, so that a list of hostile length is not followed.
constexpr uint64_t kMaxNodes = 1024;

// "0-1,8": numbers and ranges, ascending.
bool ParseNodeList(std::string_view text, std::vector<uint64_t>& nodes) {
  while (!text.empty()) {
    const std::string_view range = text.substr(0, text.find(','));
    text.remove_prefix(std::min(range.size() + 1, text.size()));
    const size_t dash = range.find('-');
    uint64_t first = 0;
    if (!ParseNumber(range.substr(0, dash), first)) return false;
    uint64_t last = first;
    if (dash != std::string_view::npos && !ParseNumber(range.substr(dash + 1), last)) return false;
    if (last < first || last >= kMaxNodes || (!nodes.empty() && first <= nodes.back())) {
      return false;
    }
    for (uint64_t node = first; node <= last; ++node) nodes.push_back(node);
  }
  return !nodes.empty();
}

Status ReadMemInfo(const LinuxHost& host, const Keys& /*keys*/, KSI_MemInfo& record) {
  const MemoryNodes* nodes = nullptr;
  const Status status = FindMemoryNodes(host, nodes);
  if (status != kOk) return status;
  record.numNodes = static_cast<uint32_t>(nodes->numaNodes.size());
  return kOk;
}

Status ReadMemNode(const LinuxHost& host, const Keys& keys, KSI_MemNode& record) {
  const MemoryNodes* nodes = nullptr;
  size_t node = 0;
  Status status = FindMemoryNodes(host, nodes);
  if (status == kOk) status = FindMemoryNode(*nodes, keys[0].number, node);
  if (status != kOk) return status;
  record.numaNode = FieldOf<uint8_t>(nodes->numaNodes[node]);
  return kOk;
}

constexpr Reader kReaders[] = {
    ValueOf<node::memory_memInfo, ReadMemInfo>(),
    ValueOf<node::memory_memNodes, ReadMemNode>(),
};

}  // namespace

constinit const ReaderTable kMemoryNodeReaders = kReaders;

Status ReadMemoryNodes(const LinuxHost& host, MemoryNodes& nodes) {
  std::string content;
  const Status status = host.Read(kFile, content);
  if (status == KSI_STATUS_NOT_FOUND) {
    nodes.numa = false;
    nodes.numaNodes = {0};
    return kOk;
  }
  if (status != kOk) return status;
  Lines lines(content);
  std::string_view line;
  if (!lines.Next(line) || !ParseNodeList(line, nodes.numaNodes) || lines.Next(line)) {
    return NotUnderstood(kFile, 1);
  }
  return kOk;
}

std::optional<size_t> MemoryNodes::Of(uint64_t numaNode) const {
  const auto found = std::ranges::find(numaNodes, numaNode);
  if (found == numaNodes.end()) return std::nullopt;
  return static_cast<size_t>(found - numaNodes.begin());
}

Status FindMemoryNodes(const LinuxHost& host, const MemoryNodes*& nodes) {
  return host.Kept().memoryNodes.Get(host, nodes);
}

Status FindMemoryNode(const MemoryNodes& nodes, int64_t key, size_t& node) {
  if (key < 0 || static_cast<uint64_t>(key) >= nodes.numaNodes.size()) return KSI_STATUS_NOT_FOUND;
  node = static_cast<size_t>(key);
  return kOk;
}

}  // namespace ksi
