// Records, lists and statuses through every report. The first byte of an input chooses the report,
// the second its options; the rest is what the library answers.
#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "reports/reports.h"
#include "tests/fuzz/command_line.h"
#include "tests/fuzz/fed_library.h"
#include "tests/fuzz/feed.h"
#include "tests/fuzz/target.h"

namespace {

constexpr tally::ReportEntry kReports[] = {
    tally::TallyGroupStats,  tally::TallyVMStats,         tally::TallyUWStats,
    tally::TallyPShareStats, tally::TallyPShareHintStats, tally::TallySwapStats,
    tally::TallyBuddyStats,  tally::TallyCompStats,       tally::TallyLPoolStats,
    tally::TallyHeapStats,   tally::TallyGuestStats,      tally::TallyZipStats,
    tally::TallyLPageStats,  tally::TallyAsyncRemapStats, tally::TallyPMemStats,
};

// Reports pass over the options that they do not take.
std::vector<std::string> WordsOf(uint8_t options) {
  std::vector<std::string> words = {"tally"};
  if ((options & 1) != 0) words.emplace_back("-q");
  if ((options & 2) != 0) words.emplace_back("-v");
  if ((options & 4) != 0) words.emplace_back("-t");
  if ((options & 8) != 0) words.emplace_back("-s");
  if ((options & 8) != 0) words.emplace_back("name:flags:memSize:total");
  constexpr const char* kUnits[] = {"-ukb", "-umb", "-upg", "-ub"};
  words.emplace_back(kUnits[(options >> 4) & 3]);
  if ((options & 64) != 0) words.emplace_back("-l2");
  if ((options & 128) != 0) words.emplace_back("-l-1");
  return words;
}

}  // namespace

int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size < 2) return 0;
  const fuzz::FedLibrary library(std::span(data, size).subspan(2));
  fuzz::CommandLine(WordsOf(data[1])).RunOn(kReports[data[0] % std::size(kReports)]);
  return 0;
}
