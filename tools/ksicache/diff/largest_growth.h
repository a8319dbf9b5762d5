// By how much any of many things grew at most.
#ifndef TOOLS_KSICACHE_DIFF_LARGEST_GROWTH_H_
#define TOOLS_KSICACHE_DIFF_LARGEST_GROWTH_H_

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace ksicache {

// A thing that was started anew is another one to the kernel, and has not grown by all it has: what
// came takes the place of what has gone under its name, the largest that of the largest.
class LargestGrowth {
 public:
  void Changed(int64_t growth);
  void Gone(std::string_view name, int64_t had);
  void Came(std::string_view name, int64_t has);

  // 0 if nothing grew.
  int64_t Find();

 private:
  struct Namesakes {
    std::vector<int64_t> gone;
    std::vector<int64_t> came;
  };

  int64_t largest_ = 0;
  std::unordered_map<std::string, Namesakes> names_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_LARGEST_GROWTH_H_
