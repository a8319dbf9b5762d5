// Reads the parts of a chunk (chunk.h): first the one that starts it, then those that continue it.
// Nothing of them is trusted.
//
// Most of whoever looks at a moment wants a few of its nodes. So what a part's events tell is taken
// with the part, and the records of a node when they are asked for.
#ifndef KNVLIBS_RECORDING_CHUNK_READER_H_
#define KNVLIBS_RECORDING_CHUNK_READER_H_

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

class ChunkReader {
 public:
  // What a damaged part may make its reader take: readings, bytes of what is unpacked and
  // of their records and entries, and bytes of the lists that it changes one after the other. The
  // largest hosts need a part of it.
  static constexpr size_t kMostReadings = size_t{1} << 20;
  static constexpr size_t kMostBytes = size_t{256} << 20;
  static constexpr size_t kMostWork = size_t{2} << 30;

  ChunkReader() = default;
  ChunkReader(ChunkReader&&) = default;
  ChunkReader& operator=(ChunkReader&&) = default;

  // Takes a part up to its moment `last`, or all of it if it has no more; after a part that is not
  // taken as a whole no other follows. The status is KSI_STATUS_METADATA_READ_ERROR if it is
  // damaged: nothing is good any more then.
  [[nodiscard]] Status Take(ByteView part, size_t last = SIZE_MAX);

  // The facts of a part's moments alone, and the host if it starts a chunk; else that stays.
  [[nodiscard]] static Status TakeFacts(ByteView part, HostIdentity& host,
                                        std::vector<MomentFacts>& facts);

  const HostIdentity& Host() const { return host_; }

  // About the bytes of what has been taken.
  size_t Size() const { return bytes_ + readings_.size() * sizeof(ReadingState); }

  // The last moment that was taken.
  const MomentFacts& Facts() const { return facts_; }

  // A reading of it; all views live as long as the reader, or until it takes another part.
  struct View {
    std::array<Key, kMaxKeys> keys;  // an absent one is the empty text
    Status status;
    ByteView record;
    std::span<const Key> entries;
  };

  // The numbers of the moment's readings of a node, in the order in which they came. Fails as Take.
  [[nodiscard]] Status ReadNode(size_t node, std::vector<size_t>& numbers);

  // The reading with a number that ReadNode gave.
  View At(size_t number) const;

  // All readings, in no certain order. Fails as Take.
  [[nodiscard]] Status ReadAll(std::vector<MomentReading>& readings);

 private:
  class Columns;

  static constexpr uint32_t kStays = UINT32_MAX;

  struct ReadingState {
    std::array<Key, kMaxKeys> keys;
    Status status = kOk;
    uint32_t node = 0;
    uint32_t place = 0;        // among the node's records
    uint32_t cameIn = 0;       // the part
    uint32_t came = 0;         // the moment of it
    uint32_t wentIn = kStays;  // the part; so also of one that is not there yet at the last moment
  };

  // A part that has been taken, with the streams of each node.
  struct Part {
    Bytes changes;
    std::vector<std::array<ByteReader, chunk::kStreams>> streams;
    size_t count = 0;  // of moments
    size_t last = 0;   // that is taken
  };

  struct NodeRecords {
    std::vector<size_t> readings;  // their numbers
    size_t partsTaken = 0;         // that are in the records
    Bytes records;
  };

  [[nodiscard]] bool TakeStreams(Part& part, ByteReader& events) const;
  [[nodiscard]] bool TakeEvents(ByteReader in, const Part& part);
  [[nodiscard]] bool TakeGone(ByteReader& in, bool isWanted);
  [[nodiscard]] bool TakeCome(ByteReader& in, size_t moment, bool isWanted);
  [[nodiscard]] bool TakeEdits(ByteReader& in, bool isWanted);
  [[nodiscard]] bool TakeRecords(size_t node);

  HostIdentity host_;
  MomentFacts facts_;
  std::vector<Part> parts_;
  std::vector<ReadingState> readings_;
  std::vector<NodeRecords> nodes_;
  std::unordered_map<size_t, std::vector<Key>> lists_;  // those that are not empty
  size_t bytes_ = 0;
  size_t work_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_CHUNK_READER_H_
