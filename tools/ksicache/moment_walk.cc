#include "tools/ksicache/moment_walk.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

#include "knvlibs/cache_format.h"
#include "knvlibs/times.h"
#include "tools/ksicache/progress.h"

namespace ksicache {
namespace {

// How far apart moments were due; 0 if that is not known.
int64_t StrideOf(const WalkedMoment& moment) {
  const auto due = static_cast<uint64_t>(std::max<int64_t>(moment.passed, 0));
  return static_cast<int64_t>(moment.facts.skipped >= due ? 0 : due / (moment.facts.skipped + 1));
}

void TakeSmaller(int64_t& least, int64_t stride) {
  if (stride != 0 && (least == 0 || stride < least)) least = stride;
}

}  // namespace

void MomentWalk::Run(const std::function<bool(const Part&)>& wants) {
  Progress progress("listing");
  const std::vector<Part>& parts = file_.Parts();
  for (size_t i = 0; i < parts.size(); ++i) {
    progress.Show(i, parts.size());
    if (wants(parts[i])) Walk(parts[i]);
  }
  Complain();
  while (!upcoming_.empty()) Pass();
}

void MomentWalk::Walk(const Part& part) {
  if (lost_.Take(part)) return;
  Complain();
  if (file_.CheckPart(part, reader_, at_) != ksi::kOk) {
    at_ = ksi::RecordingFile::kNoMoment;
    return lost_.Begin(part, file_.Why());
  }
  at_ = part.End() - 1;
  host_ = reader_.Host().name;
  boot_ = reader_.Host().boot;
  const size_t blocks = ksi::cache::BlocksOf(static_cast<size_t>(part.size));
  const auto bytes = static_cast<double>(blocks * ksi::cache::kBlockSize);
  const std::vector<ksi::MomentFacts>& facts = reader_.PartFacts();
  for (size_t i = 0; i < facts.size(); ++i) {
    WalkedMoment moment;
    moment.number = part.number + static_cast<int64_t>(i);
    moment.facts = facts[i];
    moment.host = host_;
    moment.boot = boot_;
    moment.bytes = bytes / static_cast<double>(facts.size());
    Add(std::move(moment));
  }
}

void MomentWalk::Complain() {
  if (!lost_.IsEmpty()) complain_(std::exchange(lost_, {}));
}

void MomentWalk::Add(WalkedMoment moment) {
  if (before_ && before_->number + 1 == moment.number) Compare(moment);
  before_ = {moment.number, moment.facts, host_, boot_};
  upcoming_.push_back(std::move(moment));
  if (upcoming_.size() > kAround) Pass();
}

void MomentWalk::Compare(WalkedMoment& moment) const {
  const ksi::MomentFacts& before = before_->facts;
  const ksi::MomentFacts& now = moment.facts;
  const int64_t onWall = now.taken - before.taken;
  moment.isOtherHost = before_->host != host_ && !before_->host.empty() && !host_.empty();
  moment.isRebooted = !moment.isOtherHost && before_->boot != boot_ && !host_.empty();
  const bool hasClock = before_->boot == boot_ && before.uptime != 0 && now.uptime != 0;
  moment.passed = std::max<int64_t>(hasClock ? now.uptime - before.uptime : onWall, 0);
  const int64_t step = hasClock ? onWall - moment.passed : std::min<int64_t>(onWall, 0);
  if (!moment.isOtherHost && (step > ksi::kSecond || step < -ksi::kSecond)) moment.step = step;
}

// Visits the next one, now that some behind it are known.
void MomentWalk::Pass() {
  WalkedMoment moment = std::move(upcoming_.front());
  upcoming_.pop_front();
  const int64_t stride = StrideOf(moment);
  int64_t earlier = 0;
  int64_t later = 0;
  for (const int64_t each : strides_) TakeSmaller(earlier, each);
  for (const WalkedMoment& each : upcoming_) TakeSmaller(later, StrideOf(each));
  // Where one recorder follows another, the one may have taken moments less often.
  const int64_t usual = std::max(earlier, later);
  moment.isAfterGap = usual != 0 && stride > usual + usual / 2;
  strides_.push_back(stride);
  if (strides_.size() > kAround) strides_.pop_front();
  visit_(moment);
}

}  // namespace ksicache
