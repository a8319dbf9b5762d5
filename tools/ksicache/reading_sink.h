// Where the readings of a host go.
#ifndef TOOLS_KSICACHE_READING_SINK_H_
#define TOOLS_KSICACHE_READING_SINK_H_

#include <cstddef>
#include <span>

#include "knvlibs/catalogue.h"
#include "knvlibs/source.h"

namespace ksicache {

// Each reading is given once. Every call may fail with an Error.
class ReadingSink {
 public:
  ReadingSink() = default;
  ReadingSink(const ReadingSink&) = delete;
  ReadingSink& operator=(const ReadingSink&) = delete;
  virtual ~ReadingSink() = default;

  virtual void AddValue(const ksi::Node& node, const ksi::Keys& keys,
                        std::span<const std::byte> record) = 0;
  virtual void AddList(const ksi::Node& node, const ksi::Keys& keys,
                       std::span<const ksi::Key> entries) = 0;
  virtual void AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                          ksi::Status status) = 0;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_READING_SINK_H_
