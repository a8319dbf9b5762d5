#include "tools/ksicache/page/survey.h"

#include <algorithm>
#include <set>
#include <string_view>
#include <utility>

#include "knvlibs/times.h"
#include "reports/reports.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/escaped_text.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/moment_report.h"
#include "tools/ksicache/page/roles.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {
namespace {

constexpr uint64_t kUnknown = UINT64_MAX;

// Takes what a survey has of a moment from the host's row.
class HostFigures : public RowFormat {
 public:
  SurveyedMoment Take(int64_t taken) {
    SurveyedMoment moment = std::exchange(moment_, kNothing);
    moment.taken = taken;
    return moment;
  }

  void Begin(const RowTable& table) override {
    free_ = PlaceOf(table.columns, roles::kFree);
    state_ = PlaceOf(table.columns, roles::kState);
  }
  void Row(std::span<const Value> values) override {
    if (values[free_].type == ValueType::unsignedNumber) moment_.free = values[free_].number;
    moment_.state = roles::StateOf(values[state_].text);
  }
  void Finish() override {}

 private:
  static inline const SurveyedMoment kNothing = {0, 0, kUnknown, roles::States().size()};

  size_t free_ = 0;
  size_t state_ = 0;
  SurveyedMoment moment_ = kNothing;
};

// Takes what is known of the kernel.
class Kernel : public RowFormat {
 public:
  std::string built;

  void Begin(const RowTable& /*table*/) override {}
  void Row(std::span<const Value> values) override { built = values[0].text; }
  void Finish() override {}
};

std::string KernelOf(const Origin& origin) {
  Kernel kernel;
  RowSink sink(kernel, std::nullopt);
  sink.Expect(kMomentReport, origin);
  RunReport(kMomentReport, sink);
  return kernel.built;
}

// The first of `size` places in one of `count` stretches, as even as can be.
size_t StretchBegin(size_t stretch, size_t count, size_t size) { return stretch * size / count; }

// Calls with the first and the last place of each stretch.
template <class Visit>
void ForEachStretch(const Survey& survey, size_t count, Visit&& visit) {
  const size_t size = survey.moments.size();
  count = std::min(count, size);
  for (size_t i = 0; i < count; ++i) {
    visit(survey.moments.begin() + static_cast<ptrdiff_t>(StretchBegin(i, count, size)),
          survey.moments.begin() + static_cast<ptrdiff_t>(StretchBegin(i + 1, count, size)));
  }
}

bool HasLess(const SurveyedMoment& a, const SurveyedMoment& b) { return a.free < b.free; }

// A moment of which nothing is known is none with much.
bool HasLessKnown(const SurveyedMoment& a, const SurveyedMoment& b) {
  return b.free != kUnknown && (a.free == kUnknown || a.free < b.free);
}

}  // namespace

std::optional<size_t> Survey::Find(int64_t taken, size_t from) const {
  for (size_t i = from; i < moments.size(); ++i) {
    if (moments[i].taken == taken) return i;
  }
  return std::nullopt;
}

std::vector<int64_t> Survey::StateCounts() const {
  std::vector<int64_t> counts(roles::States().size() + 1);
  for (const SurveyedMoment& moment : moments) ++counts[moment.state];
  return counts;
}

void Survey::Steady(const std::map<size_t, int64_t>& steps) {
  int64_t ahead = 0;
  for (size_t i = 0; i < moments.size(); ++i) {
    SurveyedMoment& moment = moments[i];
    const auto step = steps.find(i);
    if (step != steps.end()) ahead = ksi::TimeBetween(-step->second, ahead);
    moment.steady = ksi::TimeBetween(ahead, moment.taken);
    if (i == 0 || moment.steady > moments[i - 1].steady) continue;
    moment.steady = moments[i - 1].steady + 1;
    ahead = ksi::TimeBetween(moment.steady, moment.taken);
  }
}

Survey MakeSurvey(const std::string& name, const std::function<void(const Origin&)>& also,
                  std::string& problem) {
  Survey survey;
  HostFigures figures;
  RowSink sink(figures, tally::DisplayUnit::kb, {roles::kFree, roles::kState});
  const tally::Report& report = *tally::FindReport(roles::kHostReport);
  try {
    ForEachMoment(name, [&](const Origin& origin) {
      survey.host = Escaped(origin.host);
      if (survey.kernel.empty()) survey.kernel = KernelOf(origin);
      sink.Expect(report, origin);
      try {
        RunReport(report, sink);
      } catch (const DataError&) {
        // It is said when the moment is read in full.
      }
      survey.moments.push_back(figures.Take(origin.taken));
      also(origin);
    });
  } catch (const DataError& error) {
    if (survey.moments.empty()) throw;
    problem = error.what();
  }
  return survey;
}

size_t TightestMoment(const Survey& survey) {
  const auto tightest = std::ranges::min_element(survey.moments, HasLess);
  if (tightest->free == kUnknown) return survey.moments.size() - 1;
  return static_cast<size_t>(tightest - survey.moments.begin());
}

std::vector<size_t> ChooseMoments(const Survey& survey, const std::vector<size_t>& wanted,
                                  size_t most) {
  const size_t size = survey.moments.size();
  std::set<size_t> chosen = {0, size - 1};
  if (most >= size) most = 2 * size;  // each of them gets a stretch of its own
  for (size_t i = 0; i < wanted.size() && chosen.size() < most / 2; ++i) chosen.insert(wanted[i]);
  const size_t room = most > chosen.size() ? most - chosen.size() : 0;
  ForEachStretch(survey, room, [&](auto begin, auto end) {
    chosen.insert(
        static_cast<size_t>(std::min_element(begin, end, HasLess) - survey.moments.begin()));
  });
  return {chosen.begin(), chosen.end()};
}

std::vector<size_t> ChoosePoints(const Survey& survey, size_t stretches) {
  std::set<size_t> chosen = {0, survey.moments.size() - 1};
  const auto add = [&](auto moment) {
    chosen.insert(static_cast<size_t>(moment - survey.moments.begin()));
  };
  ForEachStretch(survey, stretches, [&](auto begin, auto end) {
    add(std::min_element(begin, end, HasLess));
    add(std::max_element(begin, end, HasLessKnown));
  });
  return {chosen.begin(), chosen.end()};
}

}  // namespace ksicache
