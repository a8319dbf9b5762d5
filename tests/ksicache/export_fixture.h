// Rows that ksicache exports of the example host, its recording, and hosts made from it.
#ifndef TESTS_KSICACHE_EXPORT_FIXTURE_H_
#define TESTS_KSICACHE_EXPORT_FIXTURE_H_

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {

class ExportTest : public Ksicache {
 protected:
  using Row = std::vector<std::string>;

  static inline const std::string kExample = TALLY_EXAMPLES "/hypervisor.ksi";
  static inline const std::string kIncident = TALLY_EXAMPLES "/incident.rec";
  static inline const std::vector<std::string> kReports = {
      "group-stats", "vm-stats",   "uw-stats",    "buddy-stats", "pshare-stats",
      "swap-stats",  "comp-stats", "lpool-stats", "heap-stats",  "pshareHint-stats",
      "guest-stats", "zip-stats",  "lpage-stats", "pmem-stats",  "asyncremap-stats"};

  static harness::Result RunTally(const std::vector<std::string>& args) {
    harness::Program program = Command({});
    program.path = TALLY_PROGRAM;
    program.args = {"tally"};
    program.args.insert(program.args.end(), args.begin(), args.end());
    return harness::RunProgram(program);
  }

  static std::vector<std::string> Lines(const std::string& text) {
    std::vector<std::string> lines;
    for (size_t begin = 0; begin < text.size();) {
      const size_t end = text.find('\n', begin);
      lines.push_back(text.substr(begin, end - begin));
      begin = end == std::string::npos ? text.size() : end + 1;
    }
    return lines;
  }

  // The cells of lines without quotes.
  static std::vector<Row> Cells(const std::string& csv) {
    std::vector<Row> rows;
    for (const std::string& line : Lines(csv)) {
      Row& row = rows.emplace_back(1);
      for (const char c : line) {
        if (c == ',') {
          row.emplace_back();
        } else {
          row.back() += c;
        }
      }
    }
    return rows;
  }

  // A recording of a host that has little, at these times. `perKernel`: after so many moments the
  // host has another kernel, which begins a chunk; 0: it never has.
  std::string RecordingAt(const std::string& name, const std::vector<std::string>& times,
                          size_t perKernel = 0) const {
    std::vector<std::string> join = {"join", Path(name)};
    for (size_t i = 0; i < times.size(); ++i) {
      const std::string capture = Path(name + std::to_string(i));
      const std::string built = perKernel == 0 ? ""
                                               : R"("built":"Mar 02 2026 11:20:0)" +
                                                     std::to_string(i / perKernel) + R"(",)";
      WriteContent(capture + ".json", R"({"ksiCache":1,"host":"h",)" + built + R"("taken":")" +
                                          times[i] + R"(","readings":[
          {"node":"memory/pshare/stats","keys":[],"value":{"cow":)" +
                                          std::to_string(i) + "}}]}");
      EXPECT_EQ(Run({"load", capture + ".json", capture}).err, "");
      join.push_back(capture);
    }
    EXPECT_EQ(Run(join).err, "");
    return Path(name);
  }

  // A capture of the example host with texts in its JSON replaced.
  std::string ExampleWith(const std::string& name,
                          const std::vector<std::pair<std::string, std::string>>& changes) const {
    std::string json = FileContent(TALLY_EXAMPLE_JSON);
    for (const auto& [from, to] : changes) {
      size_t at = json.find(from);
      EXPECT_NE(at, std::string::npos) << from;
      for (; at != std::string::npos; at = json.find(from, at + to.size())) {
        json.replace(at, from.size(), to);
      }
    }
    WriteContent(Path(name + ".json"), json);
    EXPECT_EQ(Run({"load", Path(name + ".json"), Path(name)}).err, "");
    return Path(name);
  }
};

}  // namespace ksi

#endif  // TESTS_KSICACHE_EXPORT_FIXTURE_H_
