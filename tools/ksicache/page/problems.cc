#include "tools/ksicache/page/problems.h"

#include "knvlibs/times.h"

namespace ksicache {

void Problems::Add(const std::string& text) {
  auto found = times_.find(text);
  if (found == times_.end()) {
    if (all_.size() == kMost) return;
    found = times_.try_emplace(text).first;
    all_.push_back(text);
  }
  std::set<int64_t>& times = found->second;
  if (taken_ && times.size() < kMostTimes) times.insert(*taken_);
}

std::vector<std::string> Problems::WithTimes() const {
  std::vector<std::string> texts;
  for (const std::string& text : all_) {
    const std::set<int64_t>& times = times_.at(text);
    std::string& told = texts.emplace_back(text);
    if (times.empty()) continue;
    told += ", at " + ksi::TextOfTime(*times.begin());
    if (times.size() == 1) continue;
    const bool isAll = times.size() < kMostTimes;
    told += isAll ? " to " + ksi::TextOfTime(*times.rbegin()) : " and later";
    told += ", " + std::to_string(times.size()) + (isAll ? " moments" : " moments or more");
  }
  return texts;
}

std::vector<int64_t> Problems::FirstTimes() const {
  std::vector<int64_t> firsts;
  for (const std::string& text : all_) {
    const std::set<int64_t>& times = times_.at(text);
    if (!times.empty()) firsts.push_back(*times.begin());
  }
  return firsts;
}

}  // namespace ksicache
