// What happens to one node over the moments of a chunk (chunk.h), to be written.
#ifndef KNVLIBS_RECORDING_NODE_WRITER_H_
#define KNVLIBS_RECORDING_NODE_WRITER_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"

namespace ksi {

class NodeWriter {
 public:
  // `node` outlives the writer.
  explicit NodeWriter(const RecordedNode& node) : node_(&node) {}

  // Takes the node's readings of the next moment, in the order of SortReadings.
  void Add(std::span<const MomentReading> readings);

  // How many readings have been numbered.
  size_t Readings() const { return readings_.size(); }

  // What happened from the moment `from` to the last: the sizes of the streams and the streams;
  // nothing if nothing did.
  std::vector<Bytes> PiecesFrom(size_t from) const;

 private:
  static constexpr size_t kStays = SIZE_MAX;

  // A cell that changed.
  struct Change {
    uint32_t cell;
    uint32_t moment;
    int64_t delta;
  };

  // A reading of the chunk, with what happened to it, by moments.
  struct Tracked {
    MomentReading reading;
    Bytes first;           // the record that it came with
    size_t came = 0;       // the moment that it is there from
    size_t went = kStays;  // the first one that it is not there in
    std::vector<Change> changes;
  };

  struct Edit {
    size_t reading;
    Bytes edit;
  };
  struct Event {
    size_t moment = 0;
    std::vector<size_t> gone;
    std::vector<size_t> come;
    std::vector<Edit> edits;
  };

  class Columns;

  size_t Come(const MomentReading& reading, Event& event);
  void Go(size_t number, Event& event);
  bool Compare(size_t number, const Answer& answer, Event& event);
  void CompareRecords(Tracked& tracked, const Bytes& record) const;
  void CompareLists(size_t number, const std::vector<OwnKey>& entries, Event& event);
  void PutEvent(const Event& event, ByteWriter& out) const;

  const RecordedNode* node_;
  size_t moments_ = 0;
  std::vector<Event> events_;  // of moments with any
  std::vector<Tracked> readings_;
  std::vector<size_t> current_;  // the readings that are there, in the order of SortReadings
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_NODE_WRITER_H_
