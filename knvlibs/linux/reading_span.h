// When a reading of a host ends and the next begins.
#ifndef KNVLIBS_LINUX_READING_SPAN_H_
#define KNVLIBS_LINUX_READING_SPAN_H_

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

#include "knvlibs/source.h"

namespace ksi {

// A reading begins with a question and lasts until nobody has asked anything for a second, or until
// its first question comes again after more than a second, or for a minute at most. So the rows of
// a report are of one moment, whoever looks again sees what has changed, and a capture that takes
// long does not start over all the time.
//
// Times count from the end of an answer: what takes long to read is not read again at once.
class ReadingSpan {
 public:
  using TimePoint = std::chrono::steady_clock::time_point;

  struct Question {
    uint16_t node = 0;
    bool isList = false;

    friend bool operator==(const Question&, const Question&) = default;
  };

  // Whether a question that is asked now begins a new reading.
  bool Begins(Question question, const Keys& keys, TimePoint now);

  // The question has its answer.
  void Answered(TimePoint now);

  // The next question begins a new reading.
  void End() { answered_.reset(); }

 private:
  bool GoesOn(Question question, const Keys& keys, TimePoint now) const;

  Question first_;
  std::string firstKeys_;
  TimePoint began_;
  std::optional<TimePoint> answered_;  // the latest question of the reading
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_READING_SPAN_H_
