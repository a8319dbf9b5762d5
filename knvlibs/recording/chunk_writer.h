// Makes the parts of a chunk (chunk.h).
#ifndef KNVLIBS_RECORDING_CHUNK_WRITER_H_
#define KNVLIBS_RECORDING_CHUNK_WRITER_H_

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"

namespace ksi {

class ChunkWriter {
 public:
  explicit ChunkWriter(HostIdentity host) : host_(std::move(host)), byNode_(host_.nodes.size()) {}

  const HostIdentity& Host() const { return host_; }
  size_t Count() const { return moments_.size(); }
  // REQUIRES: there is such a moment.
  const MomentFacts& At(size_t i) const { return moments_[i].facts; }
  const MomentFacts& Last() const { return moments_.back().facts; }

  // Takes the next moment of the host, with its readings in the order of SortReadings.
  void Add(const MomentFacts& facts, const std::vector<MomentReading>& readings);

  // The moments from `from` to the last as a part; from 0 on it starts the chunk.
  Bytes PartFrom(size_t from) const;

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
    MomentFacts facts;
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
  Bytes FactsFrom(size_t from) const;
  Bytes ChangesFrom(size_t from) const;
  Bytes EventsFrom(size_t from) const;

  HostIdentity host_;
  std::vector<Event> moments_;
  std::vector<Tracked> readings_;
  std::vector<std::vector<size_t>> byNode_;  // their numbers
  std::vector<size_t> current_;  // the readings that are there, in the order of SortReadings
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_CHUNK_WRITER_H_
