// What was read of a host at one moment.
#ifndef KNVLIBS_RECORDING_MOMENT_H_
#define KNVLIBS_RECORDING_MOMENT_H_

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <tuple>
#include <variant>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/recording/bytes.h"
#include "knvlibs/source.h"
#include "knvlibs/status.h"

namespace ksi {

// A part of a record that changes by itself: a figure, or up to 8 bytes of a text or of what has no
// known meaning.
struct RecordCell {
  static constexpr size_t kWidest = 8;

  uint16_t offset;
  uint8_t width;
  bool isFigure;

  friend bool operator==(const RecordCell&, const RecordCell&) = default;
};

// A node as those who recorded it knew it. Its cells cover its record without gaps.
struct RecordedNode {
  std::string path;
  Kind kind = Kind::kValue;
  uint16_t recordSize = 0;
  std::vector<RecordCell> cells;

  friend bool operator==(const RecordedNode&, const RecordedNode&) = default;
};

// The nodes that this version records: the values and the lists of the catalogue.
const std::vector<RecordedNode>& RecordedNodes();

// The places of the catalogue's nodes among those of a recording.
class NodePlaces {
 public:
  static constexpr size_t kNowhere = SIZE_MAX;

  explicit NodePlaces(std::span<const RecordedNode> nodes);

  // kNowhere if it is not among them.
  size_t Of(const Node& node, Kind kind) const {
    return places_[static_cast<size_t>(kind)][IdOf(node) - 1u];
  }

 private:
  std::array<std::vector<size_t>, 2> places_;  // by kind
};

// A key, or an entry of a list.
using OwnKey = std::variant<int64_t, std::string>;

Key ViewOf(const OwnKey& key);
OwnKey OwnOf(const Key& key);

// What was asked, and of what: where a node takes fewer keys, the others are the empty text.
struct Question {
  uint32_t node = 0;  // its place among the recorded nodes
  std::array<OwnKey, kMaxKeys> keys = {std::string(), std::string()};

  friend bool operator==(const Question&, const Question&) = default;
  friend bool operator<(const Question& a, const Question& b) {
    return std::tie(a.node, a.keys) < std::tie(b.node, b.keys);
  }
};

// The answer: the record or the entries, nothing if `status` is not kOk.
struct Answer {
  Status status = kOk;
  Bytes record;
  std::vector<OwnKey> entries;

  friend bool operator==(const Answer&, const Answer&) = default;
};

struct MomentReading {
  Question question;
  Answer answer;

  friend bool operator==(const MomentReading&, const MomentReading&) = default;
};

// Whose moments they are; those of one chunk have it in common.
struct HostIdentity {
  std::string signature;  // of the kernel's definitions
  std::string built;      // when they were built
  std::string name;
  std::string boot;  // the kernel's random name for the time since it started; empty: not known
  std::vector<RecordedNode> nodes;

  friend bool operator==(const HostIdentity&, const HostIdentity&) = default;
};

// What is to know of a moment besides what was read.
struct MomentFacts {
  int64_t taken = 0;      // us since 1970, by the clock on the wall
  int64_t uptime = 0;     // us since the host started, sleep included; 0: not known
  uint64_t duration = 0;  // us that reading it took
  uint64_t cpu = 0;       // us of CPU that it took, and writing the one before
  uint64_t skipped = 0;   // moments before it that were left out
  Status loss = kOk;      // why something was left out of an answer
  uint64_t refused = 0;   // reads that failed for want of rights
  uint64_t failed = 0;    // reads that failed for another reason than that and absence

  friend bool operator==(const MomentFacts&, const MomentFacts&) = default;
};

struct Moment {
  HostIdentity host;
  MomentFacts facts;
  std::vector<MomentReading> readings;
};

// Brings the readings into the order in which moments are kept: by node and then by keys.
void SortReadings(std::vector<MomentReading>& readings);

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_MOMENT_H_
