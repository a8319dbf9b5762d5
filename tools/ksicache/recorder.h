// Adds moments to a recording, one by one.
//
// A moment is written as soon as there is one, as what differs from the one before it. When some
// minutes are together they are packed anew, by column, which takes a fraction of the room; and
// after some such parts a chunk begins that stands for itself, so that any moment is found quickly
// and old ones can go. In a small file both come earlier: what is recorded of a chunk stays until
// the next one begins.
#ifndef TOOLS_KSICACHE_RECORDER_H_
#define TOOLS_KSICACHE_RECORDER_H_

#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <vector>

#include "knvlibs/recording/chunk_writer.h"
#include "knvlibs/recording/moment.h"
#include "tools/ksicache/recording_store.h"

namespace ksicache {

class Recorder {
 public:
  // The moments of a part, and of a chunk.
  static constexpr size_t kPartMoments = 40;
  static constexpr size_t kChunkMoments = 240;

  // Whether a moment is written before it is packed together with others; without, what ends the
  // process takes some more of them.
  enum class Singles { kWritten, kLeftOut };

  // Goes on where the recording ends. From the first moment of a chunk to the last are at most
  // `longestChunk` us.
  explicit Recorder(RecordingStore& store, Singles singles = Singles::kWritten,
                    int64_t longestChunk = std::numeric_limits<int64_t>::max());

  // Adds a moment, whose readings are in the order of SortReadings. One that does not fit beside
  // its chunk begins another, for which that leaves. Fails with an Error: then it is not there, and
  // a later one may be.
  void Add(const ksi::HostIdentity& host, const ksi::MomentFacts& facts,
           const std::vector<ksi::MomentReading>& readings);

  // Packs what has been added, if it is time, or anyway; what there is no room to pack stays as it
  // is until its chunk leaves. Fail with an Error, and nothing is lost.
  void Tidy();
  void Pack();

  // Packs what somebody who was stopped left at the end of the recording; the same. `recording` is
  // what the store writes, as it was when it was opened. Gives how many moments are damaged, as a
  // loss of power may leave the last ones; those stay as they are, and so do all if they cannot be
  // packed.
  size_t Adopt(ksi::RecordingFile& recording);

 private:
  bool Continues(const ksi::HostIdentity& host, const ksi::MomentFacts& facts,
                 size_t readings) const;
  void Begin(const ksi::HostIdentity& host);
  void Write(const ksi::MomentFacts& facts, const std::vector<ksi::MomentReading>& readings);

  RecordingStore& store_;
  Singles singles_;
  int64_t longestChunk_;
  std::unique_ptr<ksi::ChunkWriter> chunk_;  // none: the next moment starts one
  int64_t chunkNumber_ = 0;                  // of its first moment
  int64_t next_ = 0;                         // the number of the next moment
  size_t packed_ = 0;                        // moments of the chunk that are packed together
  size_t packedBytes_ = 0;                   // of their parts
  size_t bytes_ = 0;                         // of the parts of those that are not
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_RECORDER_H_
