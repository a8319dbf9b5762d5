// The words of -r, for tests that have every report as a parameter.
#ifndef TESTS_HARNESS_REPORT_NAMES_H_
#define TESTS_HARNESS_REPORT_NAMES_H_

#include <gtest/gtest.h>

#include <string>

namespace harness {

inline constexpr const char* kReportNames[] = {
    "group-stats",      "vm-stats",    "uw-stats",         "swap-stats", "guest-stats",
    "zip-stats",        "lpage-stats", "asyncremap-stats", "comp-stats", "pshare-stats",
    "pshareHint-stats", "buddy-stats", "lpool-stats",      "heap-stats", "pmem-stats",
};

// A parameter as a test's name may have it.
inline std::string NameOf(const testing::TestParamInfo<const char*>& word) {
  std::string name = word.param;
  std::erase(name, '-');
  return name;
}

}  // namespace harness

#endif  // TESTS_HARNESS_REPORT_NAMES_H_
