#include "tools/ksicache/missing_moments.h"

#include <algorithm>

#include "knvlibs/times.h"

namespace ksicache {

void MissingMoments::Add(const ksi::RecordingFile::Part& part) {
  if (part.End() <= end_) return;
  end_ = part.End();
  if (stretches_.empty() || stretches_.back().chunk != part.chunk) {
    stretches_.push_back({part.chunk, 0, {part.first, part.last}});
  }
  stretches_.back().moments += part.moments;
  stretches_.back().times.last = part.last;
}

std::string MissingMoments::Text() const {
  constexpr size_t kMostTold = 3;
  std::string text;
  for (size_t i = 0; i < std::min(stretches_.size(), kMostTold); ++i) {
    text += (i == 0 ? "" : ", ") + stretches_[i].Text();
  }
  if (stretches_.size() > kMostTold) {
    text += " and those of " + std::to_string(stretches_.size() - kMostTold) + " other chunks";
  }
  return text + " cannot be read";
}

std::string MissingMoments::Stretch::Text() const {
  if (moments == 1) return "1 moment of " + ksi::TextOfTime(times.first);
  return std::to_string(moments) + " moments of " + ksi::TextOfSpan(times);
}

}  // namespace ksicache
