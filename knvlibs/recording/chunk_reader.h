// Reads the parts of a chunk (chunk.h): first the one that starts it, then those that continue it.
// Nothing of them is trusted.
//
// Most of whoever looks at a moment wants a few of its nodes. So of a part that is taken its index
// is read, and a node when it is asked for.
#ifndef KNVLIBS_RECORDING_CHUNK_READER_H_
#define KNVLIBS_RECORDING_CHUNK_READER_H_

#include <cstddef>
#include <cstdint>
#include <memory>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/node_reader.h"
#include "knvlibs/status.h"

namespace ksi {

class ChunkReader {
 public:
  // Takes a part up to its moment `last`, or all of it if it has no more. What was taken before has
  // no moment to go on to. The status is KSI_STATUS_METADATA_READ_ERROR if it is damaged: nothing
  // is good any more then.
  [[nodiscard]] Status Take(Bytes packed, size_t last = SIZE_MAX);

  // The facts of a part's moments alone, and the host if it starts a chunk; else that stays.
  [[nodiscard]] static Status TakeFacts(ByteView part, HostIdentity& host,
                                        std::vector<MomentFacts>& facts);

  // Whether nothing has been taken.
  bool IsEmpty() const { return parts_.empty(); }

  const HostIdentity& Host() const { return host_; }

  // The bytes of what happened, more than its lists have entries.
  size_t Size() const { return size_; }

  // The moment that has been come to; none before the first.
  MomentFacts Facts() const { return moment_ < facts_.size() ? facts_[moment_] : MomentFacts(); }

  // Those of all moments of the last part.
  const std::vector<MomentFacts>& PartFacts() const { return facts_; }

  // Whether the last part has another moment, and goes on to it.
  bool HasNext() const { return moment_ + 1 < facts_.size(); }
  void Next() { ++moment_; }

  // A node at the moment, until another one is come to. Fails as Take.
  [[nodiscard]] Status ReadNode(size_t node, const NodeReader** reader);

  // Whether all that was taken of the parts of one moment, or of the last part, can be unpacked.
  // Fails as Take.
  [[nodiscard]] Status CheckSingles();
  [[nodiscard]] Status CheckLastPart() const;

  // All of it, the readings by nodes and keys. Fails as Take.
  [[nodiscard]] Status ReadAll(Moment& moment);

 private:
  struct Frame {
    ByteView packed;
    size_t size = 0;
    Bytes content;  // empty until it is wanted
  };
  // Where a node's content lies; nowhere if its size is 0.
  struct Place {
    size_t frame = 0;
    size_t from = 0;
    size_t size = 0;
  };
  struct Part {
    Bytes packed;
    std::vector<Frame> frames;
    std::vector<Place> places;  // by node
    size_t count = 0;           // of moments
  };

  [[nodiscard]] Status TakePlaces(ByteReader& in, ByteView packed, Part& part);
  [[nodiscard]] Status TakeParts(size_t node);
  [[nodiscard]] static Status UnpackFrame(const Frame& frame, Bytes& content);
  [[nodiscard]] static Status ContentOf(Part& part, size_t node, ByteView& content);
  [[nodiscard]] size_t MomentIn(size_t part) const;

  HostIdentity host_;
  std::unique_ptr<ChunkBudget> budget_ = std::make_unique<ChunkBudget>();
  std::vector<Part> parts_;
  std::vector<NodeReader> nodes_;
  static constexpr size_t kNotGood = SIZE_MAX;
  std::vector<size_t> taken_;  // how many parts of each node; kNotGood if one is damaged
  size_t size_ = 0;
  std::vector<MomentFacts> facts_;  // of the last part
  size_t moment_ = 0;               // of the last part
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_CHUNK_READER_H_
