#include "tools/ksicache/moment_summary.h"

#include <algorithm>
#include <cstdio>
#include <limits>

#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/quantity.h"

namespace ksicache {
namespace {

constexpr int64_t kTenth = ksi::kSecond / 10;

// "12.5"
std::string Decimal(double number, int digits) {
  char text[64];
  const int size = std::snprintf(text, sizeof text, "%.*f", digits, number);
  return {text, static_cast<size_t>(size)};
}

// Of what happened before a moment, "none" if nothing did.
std::string TextOf(size_t count, const std::string& more) {
  return count == 0 ? "none" : std::to_string(count) + more;
}

std::string Milliseconds(double us) { return Decimal(us / 1000, 1); }

}  // namespace

void MomentSummary::Happening::Add(int64_t amount, int64_t taken) {
  ++count;
  if (__builtin_add_overflow(sum, amount, &sum)) sum = std::numeric_limits<int64_t>::max();
  if (count != 1 && amount < most) return;
  most = amount;
  at = taken;
}

void MomentSummary::Cost::Add(uint64_t amount) {
  if (amount == 0) return;
  ++count;
  sum += static_cast<double>(amount);
  most = std::max(most, static_cast<double>(amount));
}

std::string MomentSummary::Cost::Text() const {
  if (count == 0) return "-";
  return Milliseconds(sum / static_cast<double>(count)) + " ms, at most " + Milliseconds(most);
}

void MomentSummary::AddHost(const std::string& host) {
  if (host.empty() || hosts_.size() == kMostHosts) return;
  if (std::ranges::find(hosts_, host) == hosts_.end()) hosts_.push_back(host);
}

void MomentSummary::Add(const WalkedMoment& moment) {
  const ksi::MomentFacts& facts = moment.facts;
  AddHost(moment.host);
  if (count_ == 0) times_ = {facts.taken, facts.taken};
  times_ = {std::min(times_.first, facts.taken), std::max(times_.last, facts.taken)};
  ++count_;
  if (moment.isAfterGap) {
    gaps_.Add(moment.passed, facts.taken);
  } else if (facts.skipped == 0 && moment.passed != 0 && strides_.size() < kMostStrides) {
    ++strides_[moment.passed / kTenth + (moment.passed % kTenth >= kTenth / 2 ? 1 : 0)];
  }
  if (moment.isRebooted) reboots_.Add(0, facts.taken);
  if (moment.step > 0) putForward_.Add(moment.step, facts.taken);
  if (moment.step < 0) setBack_.Add(-moment.step, facts.taken);
  skipped_ += facts.skipped;
  refused_ += facts.refused != 0 ? 1 : 0;
  failed_ += facts.failed != 0 ? 1 : 0;
  leftOut_ += facts.loss != ksi::kOk ? 1 : 0;
  duration_.Add(facts.duration);
  cpu_.Add(facts.cpu);
  bytes_ += moment.bytes;
}

// How far apart most moments are; none if there are too few.
std::optional<int64_t> MomentSummary::Stride() const {
  const auto usual =
      std::ranges::max_element(strides_, {}, [](const auto& each) { return each.second; });
  if (usual == strides_.end() || usual->first == 0) return std::nullopt;
  return usual->first * kTenth;
}

void MomentSummary::Print() const {
  for (const std::string& host : hosts_) PrintLine("host       " + Cut(host));
  if (isDamaged_) PrintLine("damaged    some moments cannot be read, and do not count here");
  if (count_ == 0) return PrintLine("moments    none");
  const std::optional<int64_t> stride = Stride();
  const auto before = [](const Happening& what) { return " before " + ksi::TextOfTime(what.at); };
  const auto farthest = [&](const Happening& what) {
    return ", by " + TextOfDuration(what.most) + " at most" + before(what);
  };
  PrintLine("span       " + ksi::TextOfSpan(times_));
  PrintLine("moments    " + std::to_string(count_) +
            (stride ? ", one each " + Decimal(static_cast<double>(*stride) / ksi::kSecond, 1) + " s"
                    : ""));
  PrintLine("gaps       " +
            TextOf(gaps_.count, ", of " + TextOfDuration(gaps_.sum) + " in all, " +
                                    TextOfDuration(gaps_.most) + " at most" + before(gaps_)));
  PrintLine("reboots    " + TextOf(reboots_.count, ", the last" + before(reboots_)));
  PrintLine("forward    " + TextOf(putForward_.count, farthest(putForward_)));
  PrintLine("back       " + TextOf(setBack_.count, farthest(setBack_)));
  PrintLine("skipped    " + TextOf(skipped_, " that were due"));
  PrintLine("missing    in " + std::to_string(refused_) + " moments refused, in " +
            std::to_string(failed_) + " failed, in " + std::to_string(leftOut_) + " left out");
  PrintLine("took       " + duration_.Text() + "; of CPU " + cpu_.Text());
  const double each = bytes_ / static_cast<double>(count_);
  PrintLine("size       " + Decimal(bytes_, 0) + " bytes, " + Decimal(each, 0) + " a moment" +
            (stride ? ", " + Decimal(each * ksi::kDay / static_cast<double>(*stride), 0) + " a day"
                    : ""));
}

}  // namespace ksicache
