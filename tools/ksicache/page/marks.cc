#include "tools/ksicache/page/marks.h"

#include <algorithm>
#include <map>
#include <memory>
#include <optional>

#include "knvlibs/recording/recording_file.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/moment_walk.h"
#include "tools/ksicache/opened_file.h"

namespace ksicache {
namespace {

class Marker {
 public:
  explicit Marker(Survey& survey) : survey_(survey) {
    const auto [first, last] = std::ranges::minmax(survey.moments, {}, &SurveyedMoment::taken);
    first_ = first.taken;
    last_ = last.taken;
  }

  bool MayHave(int64_t first, int64_t last) const { return first <= last_ && last >= first_; }

  // The next moment of the recording.
  void Add(const WalkedMoment& moment) {
    const std::optional<size_t> place = survey_.Find(moment.facts.taken, next_);
    if (!MayHave(moment.facts.taken, moment.facts.taken) || !place) return;
    next_ = *place + 1;
    survey_.moments[*place].boot = NumberOf(moment.boot);
    if (*place > 0) AddMarks(*place, moment);
    marks_.refused = std::max(marks_.refused, moment.facts.refused);
    marks_.failed = std::max(marks_.failed, moment.facts.failed);
    marks_.lossy += moment.facts.loss == ksi::kOk ? 0 : 1;
  }

  Marks Take() {
    survey_.hasReboots = boots_.size() > 1;
    return std::move(marks_);
  }

 private:
  uint32_t NumberOf(const std::string& boot) {
    if (boot.empty()) return 0;
    return boots_.try_emplace(boot, static_cast<uint32_t>(boots_.size() + 1)).first->second;
  }

  void AddMarks(size_t place, const WalkedMoment& moment) {
    if (moment.isRebooted) Put({"reboot", place, moment.passed});
    if (moment.step != 0) Put({"clock", place, moment.step});
    if (moment.isAfterGap) Put({"gap", place, moment.passed});
    if (moment.facts.skipped != 0) Put({"skipped", place, moment.passed});
  }

  void Put(const Mark& mark) {
    if (marks_.all.size() < Marks::kMost) {
      marks_.all.push_back(mark);
    } else {
      ++marks_.leftOut;
    }
  }

  Survey& survey_;
  int64_t first_;
  int64_t last_;
  size_t next_ = 0;
  std::map<std::string, uint32_t> boots_;
  Marks marks_;
};

}  // namespace

Marks MarksOf(const std::string& name, Survey& survey, Problems& problems) {
  Marker marker(survey);
  const std::string fileName = FileNameOf(name);
  if (!IsRecording(fileName)) return marker.Take();
  const std::unique_ptr<ksi::RecordingFile> file = OpenRecording(fileName);
  MomentWalk walk(
      *file, [&](const WalkedMoment& moment) { marker.Add(moment); },
      [&](const std::string& what) { problems.Add("damaged: " + what); });
  walk.Run(
      [&](const ksi::RecordingFile::Part& part) { return marker.MayHave(part.first, part.last); });
  return marker.Take();
}

}  // namespace ksicache
