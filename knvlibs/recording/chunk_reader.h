// Reads the parts of a chunk (chunk.h): first the one that starts it, then those that continue it.
// Nothing of them is trusted.
#ifndef KNVLIBS_RECORDING_CHUNK_READER_H_
#define KNVLIBS_RECORDING_CHUNK_READER_H_

#include <cstddef>
#include <cstdint>
#include <vector>

#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/status.h"

namespace ksi {

class ChunkReader {
 public:
  // What a damaged part may make its reader take: readings, bytes of their records and entries, and
  // bytes of the lists that it changes one after the other. The largest hosts need a part of it.
  static constexpr size_t kMostReadings = size_t{1} << 20;
  static constexpr size_t kMostBytes = size_t{256} << 20;
  static constexpr size_t kMostWork = size_t{2} << 30;

  // Takes a part up to its moment `last`, or all of it if it has no more. The status is
  // KSI_STATUS_METADATA_READ_ERROR if it is damaged: nothing is good any more then.
  [[nodiscard]] Status Take(ByteView part, size_t last = SIZE_MAX);

  // The facts of a part's moments alone, and the host if it starts a chunk; else that stays.
  [[nodiscard]] static Status TakeFacts(ByteView part, HostIdentity& host,
                                        std::vector<MomentFacts>& facts);

  const HostIdentity& Host() const { return host_; }

  // The last moment that was taken.
  const MomentFacts& Facts() const { return facts_; }
  // Its readings, in no certain order. Leaves nothing of them here.
  std::vector<Reading> TakeReadings();

 private:
  class Columns;

  // What there is to know of a reading of the chunk besides it.
  struct State {
    bool isThere = false;
    bool cameNow = false;  // with the part that is being taken
    bool hasCells = false;
    size_t came = 0;  // the moment of the part, if with it
  };

  [[nodiscard]] bool TakeEvents(ByteReader in, size_t count, size_t last);
  [[nodiscard]] bool TakeGone(ByteReader& in, bool isWanted);
  [[nodiscard]] bool TakeCome(ByteReader& in, size_t moment, bool isWanted);
  [[nodiscard]] bool TakeEdits(ByteReader& in, bool isWanted);

  HostIdentity host_;
  MomentFacts facts_;
  bool hasStarted_ = false;
  // By their numbers; of those that are not there nothing is kept.
  std::vector<Reading> readings_;
  std::vector<State> states_;
  size_t bytes_ = 0;
  size_t work_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_CHUNK_READER_H_
