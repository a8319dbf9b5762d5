// Lines of a report's output.
#ifndef TESTS_HARNESS_LINES_H_
#define TESTS_HARNESS_LINES_H_

#include <string>

namespace harness {

inline std::string Dashes(size_t count) { return std::string(count, '-') + "\n"; }

// What stands below the header of a report in CSV.
inline std::string Rows(const std::string& csv) { return csv.substr(csv.find('\n') + 1); }

}  // namespace harness

#endif  // TESTS_HARNESS_LINES_H_
