// What a page knows of all moments before it reads any of them in full.
#ifndef TOOLS_KSICACHE_PAGE_SURVEY_H_
#define TOOLS_KSICACHE_PAGE_SURVEY_H_

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "tools/ksicache/report_run.h"

namespace ksicache {

struct SurveyedMoment {
  int64_t taken;      // us since 1970
  int64_t steady;     // the same, had nobody set the clock since the first moment
  uint64_t free;      // KB; all ones if it is not known
  size_t state;       // of the memory, among roles::States(); as many as these if it is not known
  uint32_t boot = 0;  // of which start of the host; 0 if it is not known
};

struct Survey {
  std::string host;    // of the last moment
  std::string kernel;  // when the definitions of its kernel were built
  std::vector<SurveyedMoment> moments;
  bool hasReboots = false;

  // The place of the moment that was taken then, at `from` or behind it: a recording that is still
  // written may have other moments by the time it is read again.
  // How many moments the memory was in which state, by roles::States(); last where it is not known.
  std::vector<int64_t> StateCounts() const;

  std::optional<size_t> Find(int64_t taken, size_t from) const;

  // Tells how far the clock was put forward before which moments, us: later ones than that are
  // steady without it, each after the one before.
  void Steady(const std::map<size_t, int64_t>& steps);
};

// Goes through all moments and calls `also` with each while the library answers from it. Fails with
// a DataError when there is no moment at all; a failure after the first one is given back in
// `problem`.
Survey MakeSurvey(const std::string& name, const std::function<void(const Origin&)>& also,
                  std::string& problem);

// The moment with the least free memory; the last one if that is known of none.
size_t TightestMoment(const Survey& survey);

// The moments to show in full, at most so many, in their order: the first and the last, the one
// with the least free memory of each of as many stretches as there is room for, and those of
// `wanted` before these.
std::vector<size_t> ChooseMoments(const Survey& survey, const std::vector<size_t>& wanted,
                                  size_t most);

// The moments to draw the balance of the host from: of each of `stretches` the one with the least
// and the one with the most free memory, the first and the last.
std::vector<size_t> ChoosePoints(const Survey& survey, size_t stretches);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_SURVEY_H_
