#include "knvlibs/recording/chunk.h"

#include <algorithm>

namespace ksi::chunk {

std::vector<std::vector<size_t>> FramesOf(std::span<const uint64_t> sizes) {
  std::vector<size_t> nodes;
  for (size_t node = 0; node < sizes.size(); ++node) {
    if (sizes[node] != 0) nodes.push_back(node);
  }
  std::ranges::stable_sort(nodes, {}, [sizes](size_t node) { return sizes[node]; });
  std::vector<std::vector<size_t>> frames;
  uint64_t filled = 0;
  for (const size_t node : nodes) {
    filled += std::min<uint64_t>(sizes[node], kFrameSize + 1);
    if (frames.empty() || filled > kFrameSize) {
      frames.emplace_back();
      filled = sizes[node];
    }
    frames.back().push_back(node);
  }
  return frames;
}

}  // namespace ksi::chunk
