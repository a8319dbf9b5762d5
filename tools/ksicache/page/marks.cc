#include "tools/ksicache/page/marks.h"

#include <algorithm>
#include <iterator>
#include <map>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"
#include "tools/ksicache/failures.h"
#include "tools/ksicache/moment_walk.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {
namespace {

class Marker {
 public:
  explicit Marker(Survey& survey) : survey_(survey) {
    const auto [first, last] = std::ranges::minmax(survey.moments, {}, &SurveyedMoment::taken);
    first_ = first.taken;
    last_ = last.taken;
  }

  // Whether moments of a part may be the page's. Parts are asked about in their order, before any
  // moment behind them.
  bool Wants(const ksi::RecordingFile::Part& part) {
    if (part.first <= last_ && part.last >= first_) return true;
    unwanted_.emplace_back(part.number, part.moments);
    return false;
  }

  // The next moment of the recording.
  void Add(const WalkedMoment& moment) {
    const int64_t taken = moment.facts.taken;
    const std::optional<size_t> place = survey_.Find(taken, next_);
    if (place) AddAt(*place, moment);
    // What is of another time than the page is not missing from it.
    if (place || taken < first_ || taken > last_) number_ = moment.number;
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

  void AddAt(size_t place, const WalkedMoment& moment) {
    next_ = place + 1;
    survey_.moments[place].boot = NumberOf(moment.boot);
    if (place > 0) AddMarks(place, moment);
    marks_.refused.Add(place, moment.facts.refused);
    marks_.failed.Add(place, moment.facts.failed);
    marks_.lossy += moment.facts.loss == ksi::kOk ? 0 : 1;
  }

  void AddMarks(size_t place, const WalkedMoment& moment) {
    if (HasLost(moment.number)) {
      Put({"lost", place, ksi::TimeBetween(survey_.moments[place - 1].taken, moment.facts.taken)});
    }
    if (moment.isRebooted) Put({"reboot", place, moment.passed});
    if (moment.step != 0) {
      Put({"clock", place, moment.step});
      marks_.steps[place] = moment.step;
    }
    if (moment.isAfterGap) Put({"gap", place, moment.passed});
    if (moment.facts.skipped != 0) Put({"skipped", place, moment.passed});
  }

  // Whether moments that the page would have are missing before this one.
  bool HasLost(int64_t number) const {
    if (!number_) return false;
    int64_t missing = number - *number_ - 1;
    for (const auto& [first, count] : unwanted_) {
      if (first > *number_ && first < number) missing -= count;
    }
    return missing > 0;
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
  std::optional<int64_t> number_;                      // of the moment before
  std::vector<std::pair<int64_t, int64_t>> unwanted_;  // first moments of parts, and how many
  std::map<std::string, uint32_t> boots_;
  Marks marks_;
};

Marks MarksOfRecording(const std::string& fileName, Survey& survey, Problems& problems) {
  Marker marker(survey);
  const std::unique_ptr<ksi::RecordingFile> file = OpenRecording(fileName);
  MomentWalk walk(
      *file, [&](const WalkedMoment& moment) { marker.Add(moment); },
      [&](const LostMoments& lost) { problems.Add("damaged: " + lost.Text()); });
  walk.Run([&](const ksi::RecordingFile::Part& part) { return marker.Wants(part); });
  return marker.Take();
}

Marks MarksOfCapture(const std::string& fileName) {
  Failures failures;
  const OpenedFile opened(fileName);
  ForEachReading(opened.File(), [&](const Reading& reading) {
    if (reading.status != ksi::kOk) failures.Add(reading.status, [&] { return reading.Name(); });
  });
  Marks marks;
  marks.refused.Add(0, failures.refused.Count());
  marks.failed.Add(0, failures.failed.Count());
  return marks;
}

struct Words {
  std::string_view kind;
  const char* words;
};

constexpr Words kWords[] = {
    {"reboot", "restarted, {} between the moments"},
    {"gap", "nothing recorded in the {} before"},
    {"lost", "nothing that can be read in the {} before"},
    {"skipped", "moments before it were left out"},
};

}  // namespace

const char* WordsOf(const Mark& mark) {
  const auto* const found = std::ranges::find(kWords, mark.kind, &Words::kind);
  if (found != std::end(kWords)) return found->words;
  return mark.time > 0 ? "the clock was set forward by {}" : "the clock was set back by {}";
}

void ReadFailures::Add(size_t at, uint64_t count) {
  if (count == 0) return;
  if (count > most) moment = at;
  most = std::max(most, count);
  ++moments;
}

Marks MarksOf(const std::string& name, Survey& survey, Problems& problems) {
  const std::string fileName = FileNameOf(name);
  return IsRecording(fileName) ? MarksOfRecording(fileName, survey, problems)
                               : MarksOfCapture(fileName);
}

}  // namespace ksicache
