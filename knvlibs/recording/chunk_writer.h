// Makes the parts of a chunk (chunk.h).
#ifndef KNVLIBS_RECORDING_CHUNK_WRITER_H_
#define KNVLIBS_RECORDING_CHUNK_WRITER_H_

#include <cstddef>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/node_writer.h"

namespace ksi {

// A part of its index, as far as it says nothing of nodes, and of what happened to each node, in
// pieces. Fails with std::length_error if there is more than a part holds.
Bytes MakePart(ByteView head, const std::vector<std::vector<Bytes>>& nodes);

class ChunkWriter {
 public:
  explicit ChunkWriter(HostIdentity host);
  ChunkWriter(const ChunkWriter&) = delete;
  ChunkWriter& operator=(const ChunkWriter&) = delete;

  const HostIdentity& Host() const { return host_; }
  size_t Count() const { return moments_.size(); }
  // REQUIRES: there is such a moment.
  const MomentFacts& At(size_t i) const { return moments_[i]; }
  const MomentFacts& Last() const { return moments_.back(); }

  // How many readings have been numbered.
  size_t Readings() const;

  // Takes the next moment of the host, with its readings in the order of SortReadings. Fails with
  // std::length_error if a chunk may not have so many, or their lists so many entries; then it is
  // as it was.
  void Add(const MomentFacts& facts, const std::vector<MomentReading>& readings);

  // The moments from `from` to the last as a part; from 0 on it starts the chunk. Fails as
  // MakePart.
  Bytes PartFrom(size_t from) const;

 private:
  Bytes HeadFrom(size_t from) const;

  HostIdentity host_;
  std::vector<MomentFacts> moments_;
  std::vector<NodeWriter> nodes_;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_CHUNK_WRITER_H_
