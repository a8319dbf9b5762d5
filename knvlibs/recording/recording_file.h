// A recording: an open cache file of many moments, of which nothing is trusted.
//
// A recorder may be writing it meanwhile. What it wrote last may then be seen or not, and what it
// removes may be gone when it is read; all else is as it was.
#ifndef KNVLIBS_RECORDING_RECORDING_FILE_H_
#define KNVLIBS_RECORDING_RECORDING_FILE_H_

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "knvlibs/cache_database.h"
#include "knvlibs/recording/bytes.h"
#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/when.h"
#include "knvlibs/sqlite.h"
#include "knvlibs/status.h"

namespace ksi {

class RecordingFile {
 public:
  // The most bytes of a part.
  static constexpr int64_t kLargestPart = int64_t{64} << 20;

  // Moments that are kept together (recording/chunk.h). Moments have numbers, in the order in which
  // they were recorded.
  struct Part {
    int64_t id = 0;
    int64_t moments = 0;  // how many
    int64_t number = 0;   // of the first
    int64_t chunk = 0;    // the number of the first moment of its chunk
    int64_t first = 0;    // when the first and the last were taken, us since 1970
    int64_t last = 0;
    int64_t size = 0;   // in bytes
    int64_t block = 0;  // the first one of it

    int64_t End() const { return number + moments; }
  };

  // The statuses of CacheDatabase::Open; KSI_STATUS_INVALID_METADATA if it is a capture. `why`, if
  // not null, receives what is wrong with a damaged file.
  [[nodiscard]] static Status Make(std::unique_ptr<CacheDatabase> database,
                                   std::unique_ptr<RecordingFile>* file,
                                   std::string* why = nullptr);

  // The parts by number, none of whose moments another has. A part of one moment that has been
  // packed together with others since is none of them.
  const std::vector<Part>& Parts() const { return parts_; }

  // All rows of parts that are in use, in the order of their identifiers, those that Parts leaves
  // out too.
  const std::vector<Part>& Rows() const { return rows_; }

  // The one that has the moment with a number; null if none has.
  const Part* FindPart(int64_t number) const;

  // The number of the moment recorded next; kNoMoment after the last.
  static constexpr int64_t kNoMoment = -1;
  int64_t NumberAfter(int64_t number) const;

  // What a part holds. Every failure of this and the following is KSI_STATUS_METADATA_READ_ERROR,
  // and Why tells the reason, but for that of memory and of reading the disk.
  [[nodiscard]] Status ReadPart(const Part& part, Bytes& content);

  // The blocks of a part, in their order.
  [[nodiscard]] Status ReadBlocks(const Part& part, std::vector<int64_t>& blocks);

  // The moment with a number that a part has: to look into, or as a whole. `at`: the moment that
  // the reader has been given before; of what both have in common nothing is read again. A reader
  // that fails is empty, and begins anew.
  [[nodiscard]] Status ReadMoment(int64_t number, ChunkReader& reader, int64_t at = kNoMoment);
  [[nodiscard]] Status ReadWhole(int64_t number, ChunkReader& reader, Moment& moment,
                                 int64_t at = kNoMoment);

  // The same of the last moment of a part, and whether all that it holds can be unpacked.
  [[nodiscard]] Status CheckPart(const Part& part, ChunkReader& reader, int64_t at = kNoMoment);

  // The moment recorded last; where what was recorded last is damaged, as a loss of power leaves
  // it, the last one before that which can be read. REQUIRES: there are moments.
  [[nodiscard]] Status ReadLast(ChunkReader& reader, int64_t& number);

  // The same as a whole of the moment with `number`, which `reader` has been given.
  [[nodiscard]] Status ReadAll(int64_t number, ChunkReader& reader, Moment& moment);

  // Goes on from the moment with `number`, which `reader` has been given, to the next one that
  // there is; KSI_STATUS_NOT_FOUND after the last.
  [[nodiscard]] Status ReadNext(int64_t& number, ChunkReader& reader);

  // The facts of the moments of a part.
  [[nodiscard]] Status ReadFacts(const Part& part, std::vector<MomentFacts>& facts);

  // The host that the moments of a part are of.
  [[nodiscard]] Status ReadHost(const Part& part, HostIdentity& host);

  // When its moments were taken. Clocks may be set: none need be of the moments recorded first and
  // last. REQUIRES: there are moments.
  Span Times() const;

  // The number of the moment of the latest second that is not after that of `time`, and of those of
  // one second of the one recorded last; -1 if there is none.
  [[nodiscard]] Status FindMoment(int64_t time, int64_t& number);

  // About the bytes that have been unpacked to read moments.
  uint64_t Taken() const { return taken_; }

  // What the bytes of the file are taken by.
  struct Room {
    uint64_t moments = 0;   // blocks of Parts
    uint64_t replaced = 0;  // blocks of the other rows in use
    uint64_t free = 0;      // blocks of none
    uint64_t rest = 0;      // all but blocks: the other tables, and what leads to blocks
  };
  [[nodiscard]] Status ReadRoom(Room& room);

  const std::string& Why() const { return database_->Why(); }
  uint64_t Size() const { return database_->Size(); }
  bool IsWrittenAhead() const { return database_->IsWrittenAhead(); }

 private:
  explicit RecordingFile(std::unique_ptr<CacheDatabase> database)
      : database_(std::move(database)) {}

  [[nodiscard]] Status ReadRows();
  void ChooseParts();
  [[nodiscard]] Status Walk(const Part& part, Bytes* content, std::vector<int64_t>* blocks);
  [[nodiscard]] Status Damaged(const Part& part, const char* why);
  [[nodiscard]] Status TakePart(const Part& part, size_t last, ChunkReader& reader);
  [[nodiscard]] Status CheckFacts(const Part& part, const std::vector<MomentFacts>& facts);
  [[nodiscard]] Status ReadLastOf(int64_t chunk, ChunkReader& reader, int64_t& number);
  [[nodiscard]] Status FindIn(const Part& part, int64_t second, int64_t& number, int64_t& found);

  std::unique_ptr<CacheDatabase> database_;
  std::vector<Part> rows_;
  std::vector<Part> parts_;
  Statement block_;
  uint64_t taken_ = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_RECORDING_FILE_H_
