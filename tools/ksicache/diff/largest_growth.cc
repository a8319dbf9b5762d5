#include "tools/ksicache/diff/largest_growth.h"

#include <algorithm>
#include <cstddef>
#include <functional>

#include "tools/ksicache/diff/figure.h"

namespace ksicache {

void LargestGrowth::Changed(int64_t growth) { largest_ = std::max(largest_, growth); }

void LargestGrowth::Gone(std::string_view name, int64_t had) {
  names_[std::string(name)].gone.push_back(had);
}

void LargestGrowth::Came(std::string_view name, int64_t has) {
  names_[std::string(name)].came.push_back(has);
}

int64_t LargestGrowth::Find() {
  for (auto& [name, all] : names_) {
    std::ranges::sort(all.gone, std::ranges::greater());
    std::ranges::sort(all.came, std::ranges::greater());
    for (size_t i = 0; i < all.came.size(); ++i) {
      const int64_t had = i < all.gone.size() ? all.gone[i] : 0;
      Changed(Less(all.came[i], had).value_or(INT64_MAX));
    }
  }
  names_.clear();
  return largest_;
}

}  // namespace ksicache
