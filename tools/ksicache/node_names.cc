#include "tools/ksicache/node_names.h"

#include <algorithm>
#include <cstddef>
#include <numeric>
#include <string>
#include <vector>

#include "knvlibs/catalogue.h"

namespace ksicache {
namespace {

// How many characters have to be put in, taken out or changed to make `b` of `a`.
size_t Distance(std::string_view a, std::string_view b) {
  std::vector<size_t> row(b.size() + 1);
  std::iota(row.begin(), row.end(), 0);
  for (const char c : a) {
    size_t before = row[0]++;
    for (size_t j = 0; j < b.size(); ++j) {
      const size_t changed = before + (c == b[j] ? 0 : 1);
      before = row[j + 1];
      row[j + 1] = std::min({changed, before + 1, row[j] + 1});
    }
  }
  return row.back();
}

std::string_view LastPartOf(std::string_view path) { return path.substr(path.rfind('/') + 1); }

// A line each.
std::string NodesBelow(std::string_view name) {
  std::string below;
  for (const ksi::Node& node : ksi::Catalogue()) {
    if (node.path.size() > name.size() && node.path.starts_with(name) &&
        node.path[name.size()] == '/') {
      below += "  " + std::string(node.path) + "\n";
    }
  }
  return below;
}

// The node whose path, or its last part, is like the name; empty if none is.
std::string_view Likely(std::string_view name) {
  // A name is mistyped up to a third; a longer one than any node's is no name at all.
  constexpr size_t kLongest = 128;
  if (name.size() > kLongest) return {};
  size_t nearest = name.size() / 3 + 1;
  std::string_view likely;
  for (const ksi::Node& node : ksi::Catalogue()) {
    const size_t distance =
        std::min(Distance(name, node.path), Distance(name, LastPartOf(node.path)));
    if (distance >= nearest) continue;
    nearest = distance;
    likely = node.path;
  }
  return likely;
}

}  // namespace

UsageError NoNode(std::string_view name) {
  std::string_view level = name;
  while (level.ends_with('/')) level.remove_suffix(1);
  const std::string below = NodesBelow(level);
  if (!below.empty()) {
    return UsageError(std::string(level) + " is no node, but below it are", below);
  }
  const std::string_view likely = Likely(level);
  const std::string hint = likely.empty() ? "" : "; is it " + std::string(likely) + "?";
  return UsageError("there is no node " + std::string(name) + hint);
}

}  // namespace ksicache
