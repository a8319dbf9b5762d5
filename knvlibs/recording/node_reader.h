// What a node was at a moment of a chunk (chunk.h). Nothing of what it is told is trusted.
#ifndef KNVLIBS_RECORDING_NODE_READER_H_
#define KNVLIBS_RECORDING_NODE_READER_H_

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <unordered_map>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/source.h"
#include "knvlibs/status.h"

namespace ksi {

// What all nodes of a chunk may take together, when it is damaged: readings; entries of the lists
// that there are at a moment; bytes of what is unpacked, and of records and entries; bytes of the
// lists that are changed one after the other, with the readings that are gone through for it. The
// largest hosts need a part of it.
struct ChunkBudget {
  size_t readings = chunk::kMostReadings;
  size_t entries = chunk::kMostEntries;
  size_t bytes = size_t{256} << 20;
  size_t work = size_t{2} << 30;

  // Spends what there is of it; false if there is less.
  [[nodiscard]] static bool Spend(size_t& budget, size_t amount) {
    if (amount > budget) return false;
    budget -= amount;
    return true;
  }
};

class NodeReader {
 public:
  // Both outlive the reader.
  NodeReader(const RecordedNode& node, ChunkBudget& budget) : node_(&node), budget_(&budget) {}

  // The keys that a reading is of; an absent one is the empty text.
  using KeyPair = std::array<Key, kMaxKeys>;

  // A reading; all of it lives until the reader takes or goes on, what lists and keys name as long
  // as the contents that were taken.
  struct View {
    KeyPair keys;
    Status status;
    ByteView record;
    std::span<const Key> entries;
  };

  // Takes what happened in a part of `count` moments, up to the one at `moment`; nothing happened
  // if `content` is empty. It lives as long as the reader. What came before has been taken to its
  // end. False if it is damaged: nothing is good any more then.
  [[nodiscard]] bool Take(ByteView content, size_t count, size_t moment);

  // Goes on to a later moment of that part, or stays. False as of Take.
  [[nodiscard]] bool GoTo(size_t moment);

  // The numbers of the readings that are there, by their keys.
  const std::vector<uint32_t>& Present() const { return present_; }

  View At(uint32_t number) const;

  // The reading of these keys; false if there is none.
  [[nodiscard]] bool Find(const KeyPair& keys, View& view) const;

 private:
  using Streams = std::array<ByteReader, chunk::kStreams>;

  struct ReadingState {
    KeyPair keys;
    Status status = kOk;
    size_t came = 0;  // the moment of the part that it came in
    bool isThere = false;
  };
  struct Edit {
    uint32_t reading;
    ByteReader edit;
  };
  // What happens to the readings at a moment.
  struct Event {
    size_t moment = 0;
    std::vector<uint32_t> gone;
    uint32_t come = 0;  // from this number
    uint32_t end = 0;   // to before this one
    std::vector<Edit> edits;
  };
  // What happens to a cell.
  struct Change {
    uint32_t place;  // in the records
    uint16_t moment;
    uint8_t width;
    uint64_t delta;
  };
  static_assert(sizeof(Change) == 16);

  void Forget();
  [[nodiscard]] bool Hold(size_t bytes);
  [[nodiscard]] bool TakeEvents(ByteReader in, size_t count);
  [[nodiscard]] bool TakeCells(Streams& streams, size_t old, size_t count, size_t moment);
  std::span<std::byte> BytesOf(const RecordCell& cell, uint32_t number);
  void TakeFirst(Streams& streams, std::span<const uint32_t> come);
  [[nodiscard]] bool TakeChanges(Streams& streams, std::span<const uint32_t> members, size_t there,
                                 size_t count, size_t moment);
  [[nodiscard]] bool TakeChangesOf(Streams& streams, const RecordCell& cell, uint32_t number,
                                   size_t from, size_t count, size_t moment);
  [[nodiscard]] bool TakeGone(ByteReader& in, Event& event) const;
  [[nodiscard]] bool TakeCome(ByteReader& in, Event& event);
  [[nodiscard]] bool TakeEdits(ByteReader& in, Event& event);
  [[nodiscard]] bool Apply(const Event& event);
  [[nodiscard]] bool Apply(const Edit& edit);
  void UpdatePresent(const Event& event);

  const RecordedNode* node_;
  ChunkBudget* budget_;
  std::vector<ReadingState> readings_;
  std::vector<uint32_t> present_;
  Bytes records_;
  std::unordered_map<uint32_t, std::vector<Key>> lists_;  // those that are not empty
  // Of the last part, by moment; those from `next...` on are still to come.
  std::vector<Event> events_;
  std::vector<Change> changes_;
  size_t nextEvent_ = 0;
  size_t nextChange_ = 0;
  size_t held_ = 0;  // bytes that these take
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_NODE_READER_H_
