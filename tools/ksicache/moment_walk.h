// Goes through the facts of a recording's moments, one beside the other.
#ifndef TOOLS_KSICACHE_MOMENT_WALK_H_
#define TOOLS_KSICACHE_MOMENT_WALK_H_

#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <string>

#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/recording_file.h"
#include "tools/ksicache/lost_moments.h"

namespace ksicache {

// A moment, and how it came after the one before it.
struct WalkedMoment {
  int64_t number = 0;
  ksi::MomentFacts facts;
  std::string host;
  std::string boot;  // empty: not known
  double bytes = 0;  // its share of the blocks that its part takes
  // us since the one before it, by the clock that nobody sets; 0: not known.
  int64_t passed = 0;
  // us by which the clock on the wall was put forward since, or set back.
  int64_t step = 0;
  bool isRebooted = false;
  bool isOtherHost = false;
  // No recorder ran before it: it is much later than the moments around it would have it.
  bool isAfterGap = false;
};

class MomentWalk {
 public:
  using Part = ksi::RecordingFile::Part;

  // Calls `visit` with the moments of each part that `wants` wants, in the order in which they were
  // recorded, and `complain` with what of those parts cannot be read: once of each chunk, of which
  // then nothing behind what is damaged can.
  MomentWalk(ksi::RecordingFile& file, std::function<void(const WalkedMoment&)> visit,
             std::function<void(const LostMoments&)> complain)
      : file_(file), visit_(std::move(visit)), complain_(std::move(complain)) {}

  void Run(const std::function<bool(const Part&)>& wants);

 private:
  // What is known of the moment before.
  struct Before {
    int64_t number;
    ksi::MomentFacts facts;
    std::string host;
    std::string boot;
  };

  // By so many moments on either side it is told how far apart moments are.
  static constexpr size_t kAround = 3;

  void Walk(const Part& part);
  void Complain();
  void Add(WalkedMoment moment);
  void Compare(WalkedMoment& moment) const;
  void Pass();

  ksi::RecordingFile& file_;
  std::function<void(const WalkedMoment&)> visit_;
  std::function<void(const LostMoments&)> complain_;
  ksi::ChunkReader reader_;
  int64_t at_ = ksi::RecordingFile::kNoMoment;  // the moment that it has
  LostMoments lost_;
  std::string host_;  // of the part that is walked
  std::string boot_;
  std::optional<Before> before_;
  std::deque<int64_t> strides_;        // of the last moments that were visited
  std::deque<WalkedMoment> upcoming_;  // those to visit, as far as they have been looked at
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MOMENT_WALK_H_
