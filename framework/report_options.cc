#include "framework/report_options.h"

#include <getopt.h>

#include <cstdlib>
#include <cstring>

#include <knvlibs/ksi.h>

namespace tally {
namespace {

// The long options of all reports; a report has those whose letter is among its short ones.
constexpr option kLongOptions[] = {
    {"gid", required_argument, nullptr, 'g'},     {"level", required_argument, nullptr, 'l'},
    {"unit", required_argument, nullptr, 'u'},    {"iFilter", required_argument, nullptr, 'i'},
    {"eFilter", required_argument, nullptr, 'e'}, {"verbose", no_argument, nullptr, 'v'},
    {"cSelect", required_argument, nullptr, 's'}, {"csvMode", no_argument, nullptr, 'q'},
    {"tags", no_argument, nullptr, 't'},
};

// Room for all of them and the end of the array.
using LongOptions = option[sizeof kLongOptions / sizeof *kLongOptions + 1];

void SelectLongOptions(const ReportFrame& frame, LongOptions& selected) {
  option* next = selected;
  for (const option& known : kLongOptions) {
    if (!frame.Takes(static_cast<char>(known.val))) continue;
    *next = known;
    if (known.val == 'v') next->val = frame.longVerbose;
    ++next;
  }
  *next = {};
}

Status ParseLevels(LevelCheck check, const char* text, uint32_t& levels) {
  // sic: C49
  levels = static_cast<uint32_t>(std::strtol(text, nullptr, 10));
  if (levels == 0) {
    Warning("Invalid level %s, must be > 0\n", text);
    return kBadParameter;
  }
  const bool belowZero = check == LevelCheck::asSigned && static_cast<int32_t>(levels) < 0;
  if (levels > kMaxLevels && !belowZero) {
    // sic: C3
    Warning("Specified level %s too high, reseting to %d\n", text, static_cast<int>(kMaxLevels));
    levels = kMaxLevels;
  }
  return kSuccess;
}

// The options whose words are kept as they are, ...
struct TextOption {
  char letter;
  const char* ReportOptions::*text;
};
constexpr TextOption kTextOptions[] = {
    {'u', &ReportOptions::unitText},
    {'i', &ReportOptions::inclusionText},
    {'e', &ReportOptions::exclusionText},
    {'s', &ReportOptions::columnMask},
};

// ... and those without one.
struct FlagOption {
  char letter;
  bool ReportOptions::*flag;
};
constexpr FlagOption kFlagOptions[] = {
    {'v', &ReportOptions::verbose},
    {'q', &ReportOptions::csvMode},
    {'t', &ReportOptions::tags},
};

// Takes the option that the scan stands at.
Status TakeOption(const ReportFrame& frame, int letter, ReportOptions& options) {
  if (letter == 'l') return ParseLevels(frame.levelCheck, optarg, options.levels);
  // sic: C49
  if (letter == 'g') options.startGid = std::strtol(optarg, nullptr, 10);
  for (const TextOption& option : kTextOptions) {
    if (option.letter == letter) options.*option.text = optarg;
  }
  for (const FlagOption& option : kFlagOptions) {
    if (option.letter == letter) options.*option.flag = true;
  }
  return kSuccess;
}

}  // namespace

bool ReportFrame::Takes(char letter) const { return std::strchr(options, letter) != nullptr; }

Status ParseReportOptions(const ReportFrame& frame, int argc, char** argv, ReportOptions& options) {
  options = {};
  options.levels = frame.defaultLevels;
  LongOptions longOptions;
  SelectLongOptions(frame, longOptions);
  // sic: C51
  for (int letter; (letter = getopt_long(argc, argv, frame.options, longOptions, nullptr)) != -1;) {
    if (Status status = TakeOption(frame, letter, options)) return status;
  }
  return kSuccess;
}

}  // namespace tally
