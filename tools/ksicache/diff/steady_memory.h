#ifndef TOOLS_KSICACHE_DIFF_STEADY_MEMORY_H_
#define TOOLS_KSICACHE_DIFF_STEADY_MEMORY_H_

#include <array>
#include <cstddef>
#include <iterator>
#include <string>
#include <vector>

#include "tools/ksicache/diff/steady.h"

namespace ksicache {

// All memory of a host, and who has it.
class MemorySampler : public Sampler {
 public:
  MemorySampler();

  void Take(const Origin& origin, Samples& samples, Complaints& complaints) override;
  void Finish(const Samples& samples, SteadyGrowths& growths) override;

 private:
  // What is known of a part, and behind which sample: the last one that has the part whole.
  struct PartSeries {
    SeriesByIdentity all;
    size_t end = 0;
  };

  void TakeHost(const HostMemory& host, Samples& samples);
  static void TakeAmount(const Amount& amount, Samples& samples, PartSeries& part);
  static SteadyGrowth HostGrowth(const Samples& samples, const Series& series);
  static void AddPart(const Samples& samples, const PartInfo& info, const PartSeries& part,
                      SteadyGrowths& growths);

  std::vector<Series> host_;
  std::array<PartSeries, std::size(kParts)> parts_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_STEADY_MEMORY_H_
