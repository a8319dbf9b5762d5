// The moment of a recording that is so long before another as time really passed: by the clock that
// nobody sets, as far as a boot goes, and by the one on the wall between two of them.
#ifndef KNVLIBS_RECORDING_EARLIER_MOMENT_H_
#define KNVLIBS_RECORDING_EARLIER_MOMENT_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/recording_file.h"
#include "knvlibs/status.h"

namespace ksi {

class EarlierMoment {
 public:
  // Counts from the last moment. REQUIRES: there are moments.
  explicit EarlierMoment(RecordingFile& file) : file_(file) {}

  // The number of the moment `before` us before it, no more than kFarthest, or the one before that;
  // -1 if all are later. `asked`: when that was, as the clock on the wall of that moment went.
  // Times are compared in whole seconds, those of the last moment. Where the clock was not set
  // meanwhile, this is what FindMoment finds. Fails as RecordingFile.
  [[nodiscard]] Status Find(int64_t before, int64_t& number, int64_t& asked);

  // The same of a span that begins there: all moments in that second and behind it have this number
  // or a greater one, and no other has.
  [[nodiscard]] Status FindFirst(int64_t before, int64_t& number, int64_t& asked);

 private:
  using Part = RecordingFile::Part;

  // What is known of a part.
  struct Known {
    std::string boot;
    std::vector<MomentFacts> facts;
  };

  [[nodiscard]] Status Read(size_t part, Known& known);
  [[nodiscard]] Status FindPassed(int64_t before, int64_t& number, int64_t& asked);
  [[nodiscard]] Status FindByWall(int64_t time, int64_t& number, int64_t& asked);
  [[nodiscard]] Status IsByWall(int64_t number, const Known& last, bool& is);
  [[nodiscard]] Status FindByUptime(size_t part, int64_t before, int64_t& number, int64_t& asked);
  [[nodiscard]] Status FindStart(size_t part, const Known& known, size_t& start);
  [[nodiscard]] Status FindIn(size_t from, size_t to, int64_t uptime, int64_t& number,
                              int64_t& asked);

  RecordingFile& file_;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_EARLIER_MOMENT_H_
