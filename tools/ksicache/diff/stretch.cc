#include "tools/ksicache/diff/stretch.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <optional>
#include <utility>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

// So many moments of more than these are read.
constexpr size_t kMostSamples = 200;
constexpr size_t kFewMoments = 400;

NamedMoment Open(const std::string& name, const std::string& fileName) {
  if (!IsRecording(fileName)) {
    static_cast<void>(HeadOf(fileName));  // says what is wrong with one that is nothing
    throw DataError("--since takes a recording");
  }
  return OpenNamed(name);
}

// Finds the moments backwards.
class Search {
 public:
  Search(const std::string& name, int64_t since)
      : named_(Open(name, FileNameOf(name))), since_(since) {
    stretch_.fileName = FileNameOf(name);
  }

  Stretch Run() {
    const auto& parts = named_.recording->Parts();
    if (parts.empty()) throw DataError("it has no moments yet");
    for (auto part = parts.rbegin(); part != parts.rend() && !isOver_; ++part) {
      if (part->number > named_.number) continue;
      Take(*part);
      // Chunks are of one boot.
      if (part->number == part->chunk) EndChunk(*part);
    }
    TakeChunk();
    std::ranges::reverse(stretch_.times);
    if (stretch_.times.empty()) throw DataError("none of its moments can be read");
    TellIfShort();
    return std::move(stretch_);
  }

 private:
  // What cannot be read is said when it is come to.
  void Take(const ksi::RecordingFile::Part& part) {
    std::vector<ksi::MomentFacts> facts;
    if (named_.recording->ReadFacts(part, facts) != ksi::kOk) return;
    for (size_t i = facts.size(); i-- > 0;) {
      if (part.number + static_cast<int64_t>(i) > named_.number) continue;
      if (last_.taken == 0) last_ = facts[i];
      const MomentTime time = {facts[i].taken, EvenTime(facts[i])};
      isOver_ = ksi::SecondOf(time.even) < ksi::SecondOf(last_.taken - since_);
      if (isOver_) return;
      chunk_.push_back(time);
    }
  }

  int64_t EvenTime(const ksi::MomentFacts& facts) const {
    const bool isKnown = facts.uptime != 0 && last_.uptime != 0;
    return isKnown ? last_.taken - (last_.uptime - facts.uptime) : facts.taken;
  }

  void EndChunk(const ksi::RecordingFile::Part& start) {
    ksi::HostIdentity host;
    const bool isRead = named_.recording->ReadHost(start, host) == ksi::kOk;
    if (isRead && boot_ && *boot_ != host.boot) {
      stretch_.isSinceBoot = isOver_ = true;
      chunk_.clear();
    }
    if (isRead) boot_ = host.boot;
    TakeChunk();
  }

  void TakeChunk() {
    stretch_.times.insert(stretch_.times.end(), chunk_.begin(), chunk_.end());
    chunk_.clear();
  }

  // Whether much of the time lies before the recording.
  void TellIfShort() {
    if (isOver_) return;
    const int64_t missing = stretch_.times.front().even - (last_.taken - since_);
    stretch_.isShort = missing > since_ / 20;
  }

  NamedMoment named_;
  int64_t since_;
  ksi::MomentFacts last_ = {};
  std::optional<std::string> boot_;
  std::vector<MomentTime> chunk_;  // of the chunk at hand; these and the stretch's backwards
  bool isOver_ = false;            // no earlier moment is wanted
  Stretch stretch_;
};

}  // namespace

Stretch FindStretch(const std::string& name, int64_t since) { return Search(name, since).Run(); }

std::string NameOf(const Stretch& stretch) {
  const auto [first, last] = std::ranges::minmax(stretch.times, {}, &MomentTime::taken);
  return stretch.fileName + "@" + ksi::TextOfTime(first.taken) + ".." + ksi::TextOfTime(last.taken);
}

Choice::Choice(const std::vector<MomentTime>& times)
    : from_(static_cast<double>(times.front().even)),
      step_(times.size() <= kFewMoments
                ? 0
                : static_cast<double>(times.back().even - times.front().even) / kMostSamples) {}

bool Choice::Takes(int64_t even) {
  const auto time = static_cast<double>(even);
  if (step_ == 0) return true;
  if (time < due_) return false;
  // The interval after the one that was due, or where there were no moments for long the next.
  place_ = std::max(place_ + 1, std::floor((time - from_) / step_));
  const double anywhere = static_cast<double>(random_()) / static_cast<double>(std::mt19937::max());
  due_ = from_ + (place_ + anywhere) * step_;
  return true;
}

}  // namespace ksicache
