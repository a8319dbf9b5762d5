// A host whose readings change at random, as hosts do and as none does: groups, machines and heaps
// appear, vanish and come back under the same number; reads fail and are good again; lists change
// their order; names change; figures move by little, jump, wrap and become unknown.
#ifndef TESTS_KNVLIBS_RECORDING_RANDOM_HOST_H_
#define TESTS_KNVLIBS_RECORDING_RANDOM_HOST_H_

#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "knvlibs/recording/moment.h"

namespace ksi {

class RandomHost {
 public:
  explicit RandomHost(uint32_t seed) : random_(seed) {}

  // The readings of the next moment, in their order.
  const std::vector<MomentReading>& Next();

 private:
  uint64_t Below(uint64_t bound) { return random_() % bound; }
  bool OneIn(uint64_t chance) { return Below(chance) == 0; }

  MomentReading MakeReading(uint32_t node);
  OwnKey MakeKey(Instance instance);
  void Change(MomentReading& reading);
  void ChangeRecord(const RecordedNode& node, Bytes& record);
  void ChangeList(std::vector<OwnKey>& entries, bool isOfNumbers);

  std::mt19937_64 random_;
  std::vector<MomentReading> readings_;
};

}  // namespace ksi

#endif  // TESTS_KNVLIBS_RECORDING_RANDOM_HOST_H_
