#include "tools/ksicache/retention.h"

#include <algorithm>
#include <cstdlib>

namespace ksicache {
namespace {

// Files say what they like: beyond these nothing is told from anything.
constexpr int64_t kLongest = int64_t{1} << 50;
constexpr int64_t kFarthest = int64_t{1} << 60;

}  // namespace

Retention::Retention(int64_t keep) : keep_(std::min(keep, kFarthest)) {}

void Retention::Add(int64_t chunk, Stamp stamp) {
  stamp.uptime = std::clamp(stamp.uptime, int64_t{0}, kLongest);
  stamp.taken = std::clamp(stamp.taken, -kFarthest, kFarthest);
  const int64_t offset = stamp.taken - stamp.uptime;
  const bool isNew = !IsOfLastBoot(stamp);
  if (isNew) boots_.push_back({stamp.boot, stamp.uptime, stamp.uptime, offset});
  if (isNew || std::abs(offset - evenOffset_) > kEven) {
    evenOffset_ = offset;
    evenFrom_ = stamp.uptime;
  }
  boots_.back().last = stamp.uptime;
  boots_.back().offset = offset;
  if (chunks_.empty() || chunks_.back().number != chunk) chunks_.push_back({chunk, 0, 0});
  chunks_.back().boot = boots_.size() - 1;
  chunks_.back().uptime = stamp.uptime;
}

// Without an uptime each moment stands for itself.
bool Retention::IsOfLastBoot(const Stamp& stamp) const {
  return stamp.uptime != 0 && !boots_.empty() && boots_.back().last != 0 &&
         boots_.back().last <= stamp.uptime && boots_.back().name == stamp.boot;
}

int64_t Retention::SeenToPass(const Chunk& chunk) const {
  int64_t passed = boots_[chunk.boot].last - chunk.uptime;
  for (size_t i = chunk.boot + 1; i < boots_.size() && passed <= keep_; ++i) {
    passed += boots_[i].last - boots_[i].first;
  }
  return passed;
}

int64_t Retention::PassedByWall(const Chunk& chunk) const {
  return boots_.back().last + boots_.back().offset - chunk.uptime - boots_[chunk.boot].offset;
}

bool Retention::IsTooOld(const Chunk& chunk) const {
  return SeenToPass(chunk) > keep_ || (IsClockTrusted() && PassedByWall(chunk) > keep_);
}

int64_t Retention::FirstKept(int64_t first) {
  while (chunks_.size() > 1 && (chunks_.front().number < first || IsTooOld(chunks_.front()))) {
    chunks_.pop_front();
  }
  return chunks_.empty() ? first : chunks_.front().number;
}

bool Retention::HoldsBack() const {
  return chunks_.size() > 1 && !IsClockTrusted() && PassedByWall(chunks_.front()) > keep_;
}

}  // namespace ksicache
