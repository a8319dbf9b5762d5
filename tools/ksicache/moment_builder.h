// Readings as a moment of a recording.
#ifndef TOOLS_KSICACHE_MOMENT_BUILDER_H_
#define TOOLS_KSICACHE_MOMENT_BUILDER_H_

#include <cstddef>
#include <vector>

#include "knvlibs/recording/moment.h"
#include "tools/ksicache/reading_sink.h"

namespace ksicache {

class MomentBuilder : public ReadingSink {
 public:
  // With room for so many readings.
  explicit MomentBuilder(size_t room = 0) { readings_.reserve(room); }

  void AddValue(const ksi::Node& node, const ksi::Keys& keys,
                std::span<const std::byte> record) override;
  void AddList(const ksi::Node& node, const ksi::Keys& keys,
               std::span<const ksi::Key> entries) override;
  void AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                  ksi::Status status) override;

  // What was added, in the order of SortReadings. Leaves nothing here.
  std::vector<ksi::MomentReading> Take();

 private:
  ksi::MomentReading& Add(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys);

  std::vector<ksi::MomentReading> readings_;
};

// Gives the readings of a moment to a sink; fails with a DataError if they are of nodes that this
// version does not know.
void PutReadings(const ksi::Moment& moment, ReadingSink& sink);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MOMENT_BUILDER_H_
