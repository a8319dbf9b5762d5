#include "tools/ksicache/page/marks.h"

#include <algorithm>
#include <memory>
#include <optional>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

// Half of the moments are no farther apart than this.
int64_t UsualStep(const Survey& survey) {
  std::vector<int64_t> steps;
  for (size_t i = 1; i < survey.moments.size(); ++i) {
    steps.push_back(survey.moments[i].taken - survey.moments[i - 1].taken);
  }
  if (steps.empty()) return INT64_MAX;
  const auto middle = steps.begin() + static_cast<ptrdiff_t>(steps.size() / 2);
  std::ranges::nth_element(steps, middle);
  return std::max<int64_t>(*middle, 1);
}

class Marker {
 public:
  explicit Marker(const Survey& survey) : survey_(survey), step_(UsualStep(survey)) {
    const auto [first, last] = std::ranges::minmax(survey.moments, {}, &SurveyedMoment::taken);
    first_ = first.taken;
    last_ = last.taken;
  }

  // The next moment; `boot`: what the kernel calls the time since it started.
  void Add(const ksi::MomentFacts& facts, const std::string& boot) {
    if (facts.taken < first_ || facts.taken > last_) return;
    const std::optional<size_t> place = survey_.Find(facts.taken, next_);
    if (!place) return;
    if (*place > 0 && isBeside_) Compare(*place, facts, boot);
    next_ = *place + 1;
    before_ = facts;
    boot_ = boot;
    isBeside_ = true;
    marks_.refused = std::max(marks_.refused, facts.refused);
    marks_.failed = std::max(marks_.failed, facts.failed);
    marks_.lossy += facts.loss == ksi::kOk ? 0 : 1;
  }

  Marks Take() { return std::move(marks_); }

 private:
  void Compare(size_t place, const ksi::MomentFacts& facts, const std::string& boot) {
    const int64_t passed = facts.taken - before_.taken;
    if (boot != boot_) {
      Put({"reboot", place, passed});
    } else if (before_.uptime != 0 && facts.uptime != 0) {
      // How far the clock on the wall went beyond the other.
      const int64_t set = passed - (facts.uptime - before_.uptime);
      if (set > ksi::kSecond || set < -ksi::kSecond) Put({"clock", place, set});
    }
    if (facts.skipped != 0 || passed / 5 * 2 > step_) Put({"gap", place, passed});
  }

  void Put(const Mark& mark) {
    if (marks_.all.size() < Marks::kMost) {
      marks_.all.push_back(mark);
    } else {
      ++marks_.leftOut;
    }
  }

  const Survey& survey_;
  int64_t step_;
  int64_t first_;
  int64_t last_;
  size_t next_ = 0;
  bool isBeside_ = false;
  ksi::MomentFacts before_;
  std::string boot_;
  Marks marks_;
};

}  // namespace

Marks MarksOf(const std::string& name, const Survey& survey) {
  Marker marker(survey);
  const std::optional<NamedSpan> span = SpanOf(name);
  if (!span) return marker.Take();
  const std::unique_ptr<ksi::RecordingFile> file = OpenRecording(span->fileName);
  std::string boot;
  for (const ksi::RecordingFile::Part& part : file->Parts()) {
    std::vector<ksi::MomentFacts> facts;
    ksi::HostIdentity host;
    bool isRead = file->ReadFacts(part, facts) == ksi::kOk;
    if (part.number == part.chunk) isRead = isRead && file->ReadHost(part, host) == ksi::kOk;
    if (!isRead) throw DataError("damaged: " + file->Why());
    if (part.number == part.chunk) boot = host.boot;
    for (const ksi::MomentFacts& each : facts) marker.Add(each, boot);
  }
  return marker.Take();
}

}  // namespace ksicache
